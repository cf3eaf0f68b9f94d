// SubheaderCursor: reads consecutive fields of a NITF subheader through a
// file reader and refuses any field that would run past the end of the file,
// so every length and count read from the file can be checked against the
// bytes that are really there before anything is allocated for it.
#pragma once

#include "base/FileReader.h"

#include <cstdint>

class SubheaderCursor {
public:
    SubheaderCursor(CFileReader& reader, uint64_t fileSize) : reader(reader), fileSize(fileSize) {}

    bool SeekTo(uint64_t offset)
    {
        if (offset > fileSize || offset > kLargestReaderOffset)
            return false;
        reader.SeekTo(static_cast<int32_t>(offset), kSeekSet);
        return reader.error != kSeekFailed && reader.position == offset;
    }
    bool Skip(uint64_t count) { return count <= Remaining() && SeekTo(Position() + count); }

    // Reads count bytes; false when they are not all in the file.
    bool Read(void* target, uint64_t count)
    {
        if (count > Remaining())
            return false;
        const uint32_t start = reader.position;
        reader.ReadBytes(target, static_cast<uint32_t>(count));
        return reader.error != kSeekFailed && reader.position - start == count;
    }

    // A decimal text field of width characters (at most 15).
    bool Number(unsigned width, int32_t& value);
    // A most-significant-byte-first binary number of 2 or 4 bytes.
    bool Binary(unsigned width, uint32_t& value);

    uint32_t Position() const { return reader.position; }
    uint64_t Remaining() const { return Position() < fileSize ? fileSize - Position() : 0; }

private:
    CFileReader& reader;
    uint64_t fileSize;
};
