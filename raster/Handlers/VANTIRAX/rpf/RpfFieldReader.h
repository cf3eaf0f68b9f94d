// Field-level reading shared by the RPF section readers: numbers in the
// frame's byte order, NUL-terminated character fields, and seeks that are
// checked against the file before they are made.
#pragma once

#include "base/ByteOrder.h"
#include "base/CheckedMath.h"
#include "base/FileReader.h"
#include "base/Limits.h"

#include <cstdint>

static_assert(__BYTE_ORDER__ == __ORDER_LITTLE_ENDIAN__,
              "RPF fields are byte-reversed for big-endian frames on a little-endian host");

// Reads one 2-, 4- or 8-byte field and brings it into host order: a frame
// whose endian indicator is 0x00 stores every number most significant byte first.
template <typename T>
inline void ReadNumber(CFileReader& reader, T& value, bool bigEndian)
{
    reader.ReadBytes(&value, sizeof value);
    if (bigEndian)
        ReverseBytes(value);
}

// Reads a character field of width bytes into text and terminates it.
inline void ReadText(CFileReader& reader, char* text, uint32_t width)
{
    reader.ReadBytes(text, width);
    text[width] = '\0';
}

// True when length bytes from location lie wholly inside a file of fileSize bytes.
constexpr bool FitsInFile(uint64_t location, uint64_t length, uint64_t fileSize)
{
    return SpanWithin(location, length, fileSize);
}

// Seeks to an absolute location; false (without seeking) when the location
// lies past the end of the file or beyond what the reader can seek to.
inline bool SeekToLocation(CFileReader& reader, uint64_t location)
{
    if (location > kLargestReaderOffset || location > reader.FileSize())
        return false;
    reader.SeekTo(static_cast<int32_t>(location), kSeekSet);
    return !reader.Failed();
}
