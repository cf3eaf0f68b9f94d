// The RPF coverage section: the frame's corners in degrees, latitude before
// longitude, then its resolutions and intervals.
#pragma once

#include "base/FileReader.h"

#include <cstdint>

struct RpfCoverage {
    double northWestLatitude = 0, northWestLongitude = 0;
    double southWestLatitude = 0, southWestLongitude = 0;
    double northEastLatitude = 0, northEastLongitude = 0;
    double southEastLatitude = 0, southEastLongitude = 0;
    double verticalResolution = 0, horizontalResolution = 0;
    double latitudeInterval = 0, longitudeInterval = 0;

    // Reads the 96 bytes at location; false on a failed read or a corner
    // outside -90..90 degrees of latitude or -180..180 of longitude (NaN included).
    bool ReadCoverage(CFileReader& reader, uint32_t location, bool bigEndian);
};
