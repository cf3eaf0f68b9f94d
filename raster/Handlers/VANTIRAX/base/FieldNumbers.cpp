#include "base/FieldNumbers.h"

#include <cstdlib>
#include <cstring>

namespace {

constexpr unsigned kLongFieldLimit = 16;
constexpr unsigned kDoubleFieldLimit = 32;

// Copies at most width characters, stopping at a NUL, into a terminated buffer.
void CopyField(char* target, const char* text, unsigned width)
{
    unsigned length = 0;
    while (length < width && text[length] != '\0') {
        target[length] = text[length];
        ++length;
    }
    target[length] = '\0';
}

} // namespace

int64_t FieldToWide(const char* text, unsigned width)
{
    if (text == nullptr || width >= kLongFieldLimit)
        return 0;
    char field[kLongFieldLimit];
    CopyField(field, text, width);
    return std::strtoll(field, nullptr, 10); // 15 digits always fit
}

int32_t FieldToLong(const char* text, unsigned width)
{
    const int64_t value = FieldToWide(text, width);
    if (value > INT32_MAX || value < INT32_MIN)
        return 0;
    return static_cast<int32_t>(value);
}

double FieldToDouble(const char* text, unsigned width)
{
    if (text == nullptr || width >= kDoubleFieldLimit)
        return 0.0;
    char field[kDoubleFieldLimit];
    CopyField(field, text, width);
    return std::strtod(field, nullptr);
}
