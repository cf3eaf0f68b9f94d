// Fixed-width decimal text fields of NITF headers converted to numbers, the
// way atol/atof read them: leading blanks and a sign accepted, conversion
// stops at the first character that cannot continue the number, no number
// gives 0. Reading never passes `width` characters or a NUL.
#pragma once

#include <cstdint>

int32_t FieldToLong(const char* text, unsigned width);   // width >= 16 gives 0; so does a value past 32 bits
int64_t FieldToWide(const char* text, unsigned width);   // the same with 64-bit values, for FL and LI
double FieldToDouble(const char* text, unsigned width);  // width >= 32 gives 0.0
