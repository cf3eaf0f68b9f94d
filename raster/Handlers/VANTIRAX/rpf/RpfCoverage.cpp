#include "rpf/RpfCoverage.h"

#include "rpf/RpfFieldReader.h"

namespace {

constexpr unsigned kCoverageValues = 12;
constexpr unsigned kCornerValues = 8; // four (latitude, longitude) pairs
constexpr double kMaxLatitude = 90.0;
constexpr double kMaxLongitude = 180.0;

// Written so that a NaN fails.
bool InRange(double value, double limit)
{
    return value >= -limit && value <= limit;
}

} // namespace

bool RpfCoverage::ReadCoverage(CFileReader& reader, uint32_t location, bool bigEndian)
{
    double values[kCoverageValues];
    if (!CheckedRead(reader, reader.FileSize(), location, values, sizeof values))
        return false;
    for (unsigned index = 0; index < kCoverageValues; ++index) {
        if (bigEndian)
            ReverseBytes(values[index]);
        bool latitude = index % 2 == 0;
        if (index < kCornerValues && !InRange(values[index], latitude ? kMaxLatitude : kMaxLongitude))
            return false;
    }
    northWestLatitude = values[0];
    northWestLongitude = values[1];
    southWestLatitude = values[2];
    southWestLongitude = values[3];
    northEastLatitude = values[4];
    northEastLongitude = values[5];
    southEastLatitude = values[6];
    southEastLongitude = values[7];
    verticalResolution = values[8];
    horizontalResolution = values[9];
    latitudeInterval = values[10];
    longitudeInterval = values[11];
    return true;
}
