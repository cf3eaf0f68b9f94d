#include "geo/Mgrs.h"

#include "geo/Angles.h"
#include "geo/Utm.h"
#include "geo/Wgs84.h"

#include <cmath>

namespace {

constexpr int32_t kMaxZoneDigits = 2;
constexpr int32_t kMaxReferenceDigits = 2 * kMgrsMaxPrecision;
constexpr double kSquareSize = 100000.0;   // metres per square letter
constexpr double kRowCycle = 2000000.0;    // the row letters repeat every 2 000 km

enum Letter : int32_t {
    kA = 0, kC = 2, kH = 7, kI = 8, kJ = 9, kO = 14, kR = 17, kS = 18,
    kV = 21, kX = 23, kZ = 25
};
constexpr int32_t kBand = 0;
constexpr int32_t kColumn = 1;
constexpr int32_t kRow = 2;

constexpr double kBandHeight = 8.0;    // degrees
constexpr double kBandXHeight = 12.0;  // X reaches from 72 to 84 degrees north
constexpr int32_t kZoneSets = 6;

// Each zone letters its columns from one of three runs of eight letters and
// starts its rows either at A on the equator or 1 500 km further on.
struct ColumnSet {
    int32_t firstLetter;
    int32_t lastLetter;
    double rowOffset;
};
constexpr ColumnSet kColumnSets[kZoneSets] = {
    {kA, kH, 0.0}, {kJ, kR, 1500000.0}, {kS, kZ, 0.0},
    {kA, kH, 1500000.0}, {kJ, kR, 0.0}, {kS, kZ, 1500000.0},
};

bool IsDigit(char c) { return c >= '0' && c <= '9'; }
bool IsLetter(char c) { return (c >= 'A' && c <= 'Z') || (c >= 'a' && c <= 'z'); }
int32_t LetterIndex(char c) { return (c >= 'a' ? c - 'a' : c - 'A'); }

int32_t CountRun(const char* text, bool (*belongs)(char))
{
    int32_t count = 0;
    while (belongs(text[count]))
        ++count;
    return count;
}

int32_t DigitsValue(const char* digits, int32_t count)
{
    int32_t value = 0;
    for (int32_t i = 0; i < count; ++i)
        value = value * 10 + (digits[i] - '0');
    return value;
}

// Rounds a non-negative distance to a whole metre: add a half and truncate.
double RoundMetre(double metres) { return std::trunc(metres + 0.5); }

// Bands run from C at 80 degrees south in steps of 8 degrees, skipping I and O.
double BandBottomDegrees(int32_t band)
{
    double bottom = 8.0 * band - 96.0;
    if (band >= kI)
        bottom -= kBandHeight;
    if (band >= kO)
        bottom -= kBandHeight;
    return bottom;
}

double BandTopDegrees(int32_t band)
{
    return BandBottomDegrees(band) + (band == kX ? kBandXHeight : kBandHeight);
}

// Zones 32, 34 and 36 do not exist in band X: Svalbard's zones 31, 33, 35
// and 37 are widened over them.
bool IsMissingSvalbardZone(int32_t zone, int32_t band)
{
    return band == kX && (zone == 32 || zone == 34 || zone == 36);
}

// Easting of the west edge of the column's 100 km square.
double ColumnEasting(const ColumnSet& set, int32_t column)
{
    double easting = (column - set.firstLetter + 1) * kSquareSize;
    if (set.firstLetter == kJ && column > kO)
        easting -= kSquareSize;
    return easting;
}

// Northing of the row's square within the 2 000 km row cycle.
double RowNorthing(const ColumnSet& set, int32_t row)
{
    double northing = row * kSquareSize + set.rowOffset;
    if (row > kO)
        northing -= kSquareSize;
    if (row > kI)
        northing -= kSquareSize;
    double rounded = RoundMetre(northing);
    if (rounded >= kRowCycle)
        rounded -= kRowCycle;
    return rounded;
}

// The row letter names a northing only modulo 2 000 km; the band's bottom
// edge picks the cycle, so the result is the first matching northing at or
// above the band bottom's 100 km line.
double GridNorthing(double bandBottomNorthing, double rowNorthing)
{
    const double minimum = std::trunc(bandBottomNorthing / kSquareSize) * kSquareSize;
    double reducedMinimum = minimum;
    while (reducedMinimum >= kRowCycle)
        reducedMinimum -= kRowCycle;
    double offset = rowNorthing - reducedMinimum;
    if (offset < 0.0)
        offset += kRowCycle;
    return RoundMetre(minimum + offset);
}

bool WithinBand(int32_t zone, char hemisphere, double easting, double northing,
                int32_t band, int32_t precision)
{
    double latitude = 0.0;
    double longitude = 0.0;
    UtmToGeodetic(zone, hemisphere, easting, northing, kWgs84SemiMajorAxis,
                  kWgs84SemiMinorAxis, latitude, longitude);
    const double tolerance = DegreesToRadians(1.0 / std::pow(10.0, precision));
    return latitude >= DegreesToRadians(BandBottomDegrees(band)) - tolerance
        && latitude <= DegreesToRadians(BandTopDegrees(band)) + tolerance;
}

} // namespace

uint32_t ParseMgrs(const char* text, MgrsReference& reference)
{
    if (text == nullptr)
        return kMgrsRejected;
    uint32_t status = 0;
    while (*text == ' ')
        ++text;

    const int32_t zoneDigits = CountRun(text, IsDigit);
    if (zoneDigits > kMaxZoneDigits) {
        status = kMgrsRejected;
    } else if (zoneDigits > 0) {
        reference.zone = DigitsValue(text, zoneDigits);
        if (reference.zone < kUtmFirstZone || reference.zone > kUtmLastZone)
            status = kMgrsRejected;
    } else {
        reference.zone = 0;
    }
    text += zoneDigits;

    const int32_t letterCount = CountRun(text, IsLetter);
    if (letterCount == kMgrsLetterCount) {
        for (int32_t i = 0; i < kMgrsLetterCount; ++i) {
            reference.letters[i] = LetterIndex(text[i]);
            if (reference.letters[i] == kI || reference.letters[i] == kO)
                status = kMgrsRejected;
        }
    } else {
        status = kMgrsRejected;
    }
    text += letterCount;

    const int32_t digitCount = CountRun(text, IsDigit);
    if (digitCount > kMaxReferenceDigits || digitCount % 2 != 0)
        return kMgrsRejected;
    reference.precision = digitCount / 2;
    const double unit = std::pow(10.0, kMgrsMaxPrecision - reference.precision);
    reference.easting = DigitsValue(text, reference.precision) * unit;
    reference.northing = DigitsValue(text + reference.precision, reference.precision) * unit;
    return status;
}

uint32_t MgrsToUtm(const char* text, int32_t& zone, char& hemisphere, double& easting,
                   double& northing)
{
    zone = 0;
    hemisphere = kMgrsNoHemisphere;
    easting = 0.0;
    northing = 0.0;

    MgrsReference reference;
    const uint32_t status = ParseMgrs(text, reference);
    const int32_t band = reference.letters[kBand];
    const int32_t column = reference.letters[kColumn];
    const int32_t row = reference.letters[kRow];
    // Bands A, B, Y and Z belong to the polar areas, which have no zones.
    if (status != 0 || reference.zone == 0 || band < kC || band > kX
        || IsMissingSvalbardZone(reference.zone, band))
        return kMgrsRejected;

    const ColumnSet& set = kColumnSets[(reference.zone - 1) % kZoneSets];
    if (column < set.firstLetter || column > set.lastLetter || row > kV)
        return kMgrsRejected;

    // The band's bottom edge on the central meridian fixes the hemisphere
    // and which 2 000 km cycle of row letters the band lies in.
    int32_t bandZone = 0;
    char bandHemisphere = kMgrsNoHemisphere;
    double bottomEasting = 0.0;
    double bottomNorthing = 0.0;
    GeodeticToUtm(DegreesToRadians(BandBottomDegrees(band)),
                  DegreesToRadians(6.0 * reference.zone - 183.0), kWgs84SemiMajorAxis,
                  kWgs84SemiMinorAxis, reference.zone, bandZone, bandHemisphere,
                  bottomEasting, bottomNorthing);

    zone = reference.zone;
    hemisphere = bandHemisphere;
    easting = ColumnEasting(set, column) + reference.easting;
    northing = GridNorthing(bottomNorthing, RowNorthing(set, row)) + reference.northing;
    return WithinBand(zone, hemisphere, easting, northing, band, reference.precision)
               ? 0
               : kMgrsRejected;
}
