#include "base/CheckedRead.h"

#include "base/ByteOrder.h"
#include "base/FieldNumbers.h"

bool CheckedRead(CFileReader& reader, uint64_t fileSize, uint64_t offset, void* buffer, uint64_t count)
{
    if (!reader.HoldsFile() || !Readable(offset, count, fileSize))
        return false;
    if (count == 0)
        return true;
    // Reads that follow one another in the file (the fields of a header, the
    // bands of a row stored by row) need no seek between them.
    if (reader.position != offset)
        reader.SeekTo(static_cast<int64_t>(offset), kSeekSet);
    if (reader.error == kSeekFailed)
        return false;
    reader.ReadBytes(buffer, static_cast<uint32_t>(count));
    return reader.position == offset + count;
}

bool FileCursor::SeekTo(uint64_t offset)
{
    if (offset > reach)
        return false;
    position = offset;
    return true;
}

bool FileCursor::Read(void* target, uint64_t count)
{
    if (!CheckedRead(reader, reach, position, target, count))
        return false;
    position += count;
    return true;
}

bool FileCursor::Number(unsigned width, int32_t& value)
{
    int64_t wide = 0;
    if (!Number(width, wide))
        return false;
    value = wide > INT32_MAX || wide < INT32_MIN ? 0 : static_cast<int32_t>(wide);
    return true;
}

bool FileCursor::Number(unsigned width, int64_t& value)
{
    char field[16];
    if (width >= sizeof field || !Read(field, width))
        return false;
    value = FieldToWide(field, width);
    return true;
}

bool FileCursor::Binary(unsigned width, uint32_t& value)
{
    uint8_t field[4];
    if ((width != 2 && width != 4) || !Read(field, width))
        return false;
    value = width == 4 ? BigEndian32(field) : BigEndian16(field);
    return true;
}
