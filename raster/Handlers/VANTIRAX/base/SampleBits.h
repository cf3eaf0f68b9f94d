// How a sample wider than 8 bits is shown in 8.
#pragma once

#include <cstdint>

// The 8 most significant of a value's `significant` low bits.
inline uint8_t TopByte(uint64_t value, int32_t significant)
{
    constexpr int32_t kByteBits = 8;
    const uint64_t top = significant >= kByteBits ? value >> (significant - kByteBits)
                                                  : value << (kByteBits - significant);
    return static_cast<uint8_t>(top & 0xFF);
}
