// Arithmetic on counts, lengths and offsets read from files, checked for
// overflow before anything is sized or read from the result.
#pragma once

#include <cstdint>

// product *= factor; false when the product would pass limit.
inline bool MultiplyWithin(uint64_t& product, uint64_t factor, uint64_t limit)
{
    if (factor != 0 && product > limit / factor)
        return false;
    product *= factor;
    return product <= limit;
}

// True when length units from start lie wholly inside size units.
constexpr bool SpanWithin(uint64_t start, uint64_t length, uint64_t size)
{
    return start <= size && length <= size - start;
}
