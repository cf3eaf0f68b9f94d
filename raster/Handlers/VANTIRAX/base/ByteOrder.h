// Byte-order reversal for the binary fields of RPF frames (big-endian when the
// frame's endian indicator is 0x00), the NITF mask table, JPEG segments and
// the bi-level TIFF wrapper, which store their numbers most significant byte first.
#pragma once

#include <cstdint>
#include <cstring>

inline void ReverseBytes(void* value, unsigned width)
{
    auto* bytes = static_cast<uint8_t*>(value);
    for (unsigned low = 0, high = width - 1; low < high; ++low, --high) {
        uint8_t kept = bytes[low];
        bytes[low] = bytes[high];
        bytes[high] = kept;
    }
}

template <typename T>
inline void ReverseBytes(T& value)
{
    static_assert(sizeof(T) == 2 || sizeof(T) == 4 || sizeof(T) == 8);
    ReverseBytes(&value, sizeof(T));
}

// Reads a most-significant-byte-first unsigned number from a byte buffer.
inline uint32_t BigEndian32(const uint8_t* bytes)
{
    return (uint32_t(bytes[0]) << 24) | (uint32_t(bytes[1]) << 16) | (uint32_t(bytes[2]) << 8) | bytes[3];
}

inline uint16_t BigEndian16(const uint8_t* bytes)
{
    return static_cast<uint16_t>((bytes[0] << 8) | bytes[1]);
}

// Writes a number most significant byte first.
constexpr void PutBigEndian16(uint8_t* bytes, uint32_t value)
{
    bytes[0] = static_cast<uint8_t>(value >> 8);
    bytes[1] = static_cast<uint8_t>(value);
}

constexpr void PutBigEndian32(uint8_t* bytes, uint32_t value)
{
    PutBigEndian16(bytes, value >> 16);
    PutBigEndian16(bytes + 2, value);
}
