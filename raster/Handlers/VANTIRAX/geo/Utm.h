// Universal Transverse Mercator: zone choice (with the southern Norway and
// Svalbard exceptions), false easting and northing, the 0.9996 scale and the
// latitude limits of the UTM area, over the Transverse Mercator projection.
// Angles in radians, distances in metres.
#pragma once

#include <cstdint>

// UTM status bits.
constexpr uint32_t kUtmLatitudeError = 0x0001;       // outside [-80.5, 84.5] degrees
constexpr uint32_t kUtmLongitudeError = 0x0002;      // outside [-pi, 2 pi]
constexpr uint32_t kUtmEastingError = 0x0004;        // outside [100 000, 900 000] m
constexpr uint32_t kUtmNorthingError = 0x0008;       // outside [0, 10 000 000] m, or no sound inverse
constexpr uint32_t kUtmZoneError = 0x0010;           // outside 1 to 60
constexpr uint32_t kUtmHemisphereError = 0x0020;     // neither 'N' nor 'S'
constexpr uint32_t kUtmZoneOverrideError = 0x0040;   // requested zone not allowed for the point

constexpr int32_t kUtmFirstZone = 1;
constexpr int32_t kUtmLastZone = 60;
constexpr int32_t kUtmNoRequestedZone = 0;

// Converts a geodetic position. A requested zone other than 0 replaces the
// natural zone when it is a neighbour of it (60 and 1 are neighbours).
// Zone and hemisphere are written unless the position or the requested zone
// is refused; easting and northing are then written even when they fall
// outside the UTM grid limits (bits 4 and 8).
uint32_t GeodeticToUtm(double latitude, double longitude, double a, double b,
                       int32_t requestedZone, int32_t& zone, char& hemisphere,
                       double& easting, double& northing);

// Converts a UTM position. Latitude and longitude are written unless the
// inputs are refused (bits 4 to 32); the longitude then lies 5e-8 radian east
// of the exact inverse of GeodeticToUtm.
uint32_t UtmToGeodetic(int32_t zone, char hemisphere, double easting, double northing,
                       double a, double b, double& latitude, double& longitude);
