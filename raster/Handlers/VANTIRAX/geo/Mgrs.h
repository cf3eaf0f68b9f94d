// Military Grid Reference System references in the UTM area: a zone number,
// a latitude band letter, two 100 km square letters and up to five digits
// each of easting and northing within the square, converted to the UTM
// easting and northing of the square's (or sub-square's) south-west corner
// on WGS 84. Polar (UPS) references are not converted.
#pragma once

#include <cstdint>

constexpr uint32_t kMgrsRejected = 4;  // the only status other than 0
constexpr int32_t kMgrsLetterCount = 3;
constexpr int32_t kMgrsMaxPrecision = 5;
constexpr char kMgrsNoHemisphere = ' ';

// The pieces of a reference. Letters are alphabet indexes, A = 0 to Z = 25.
struct MgrsReference {
    int32_t zone = 0;                        // 0 when the reference has no zone number
    int32_t letters[kMgrsLetterCount] = {};  // latitude band, column, row
    double easting = 0.0;                    // within the 100 km square, metres
    double northing = 0.0;
    int32_t precision = 0;                   // digits in each of easting and northing
};

// Splits a NUL-terminated reference into its pieces. Returns 0 or
// kMgrsRejected; a rejected reference may leave pieces as they were (letters
// when there are not exactly three, easting, northing and precision when the
// digit count is odd or above ten).
uint32_t ParseMgrs(const char* text, MgrsReference& reference);

// Converts a reference to UTM. Returns 0 or kMgrsRejected. A reference whose
// position lies outside its latitude band still yields its zone, hemisphere,
// easting and northing; any other rejected reference yields zone 0,
// hemisphere kMgrsNoHemisphere and easting = northing = 0.
uint32_t MgrsToUtm(const char* text, int32_t& zone, char& hemisphere, double& easting,
                   double& northing);
