// Field-level reading shared by the RPF section readers: a section's
// fixed-size fields, or a run of its records, are read whole through
// CheckedRead; their numbers (in the frame's byte order) and character
// fields are then taken from memory in order.
#pragma once

#include "base/ByteOrder.h"
#include "base/CheckedRead.h"

#include <cstdint>
#include <cstring>
#include <vector>

static_assert(__BYTE_ORDER__ == __ORDER_LITTLE_ENDIAN__,
              "RPF fields are byte-reversed for big-endian frames on a little-endian host");

class RpfFields {
public:
    RpfFields(const uint8_t* bytes, bool bigEndian) : next(bytes), bigEndian(bigEndian) {}

    // The next 1-, 2-, 4- or 8-byte field in host order: a frame whose
    // endian indicator is 0x00 stores every number most significant byte first.
    template <typename T>
    void Number(T& value)
    {
        std::memcpy(&value, next, sizeof value);
        next += sizeof value;
        if constexpr (sizeof value > 1)
            if (bigEndian)
                ReverseBytes(value);
    }

    // The next width characters, terminated.
    void Text(char* text, uint32_t width)
    {
        std::memcpy(text, next, width);
        text[width] = '\0';
        next += width;
    }

private:
    const uint8_t* next;
    bool bigEndian;
};

// Reads count records of recordBytes bytes each at location and parses each
// into its entry of records with readFields(fields, record), in the frame's
// byte order. False, with nothing allocated, when they do not all lie in the file.
template <typename Record, typename ReadFields>
bool ReadRecordTable(CFileReader& reader, uint64_t location, uint32_t count, uint32_t recordBytes, bool bigEndian,
                     std::vector<Record>& records, ReadFields readFields)
{
    const uint64_t fileSize = reader.FileSize();
    const uint64_t bytes = uint64_t(count) * recordBytes;
    if (!Readable(location, bytes, fileSize))
        return false;
    std::vector<uint8_t> stored(bytes);
    if (!CheckedRead(reader, fileSize, location, stored.data(), bytes))
        return false;
    RpfFields fields(stored.data(), bigEndian);
    records.resize(count);
    for (Record& record : records)
        readFields(fields, record);
    return true;
}
