// Transverse Mercator projection on an ellipsoid, by the classic series in
// powers of the longitude difference (sixth order in the latitude terms,
// eighth in the arc). Accurate to well under a millimetre within a few
// degrees of the central meridian; it degrades further out, and points more
// than 9 degrees away carry a warning bit.
#pragma once

#include "geo/Wgs84.h"

#include <cstdint>

// Projection status bits.
constexpr uint32_t kTmLatitudeError = 0x0001;      // forward: latitude outside [-pi/2, pi/2]
constexpr uint32_t kTmLongitudeError = 0x0002;     // forward: more than pi/2 from the central meridian
constexpr uint32_t kTmEastingError = 0x0004;       // inverse: easting beyond FE +- dE
constexpr uint32_t kTmNorthingError = 0x0008;      // inverse: northing beyond FN +- dN
constexpr uint32_t kTmOriginLatitudeError = 0x0010;
constexpr uint32_t kTmCentralMeridianError = 0x0020;
constexpr uint32_t kTmSemiMajorAxisError = 0x0040;
constexpr uint32_t kTmSemiMinorAxisError = 0x0080;
constexpr uint32_t kTmAxisOrderError = 0x0100;     // b greater than a
constexpr uint32_t kTmScaleFactorError = 0x0200;
constexpr uint32_t kTmDistortionWarning = 0x0400;  // more than 9 degrees from the central meridian

// Parameters of one projection; the defaults are WGS 84 on the Greenwich
// meridian at unit scale. Angles in radians, distances in metres.
struct TransverseMercatorParams {
    double a = kWgs84SemiMajorAxis;       // semi-major axis
    double b = kWgs84SemiMinorAxis;       // semi-minor axis
    double es = kWgs84EccentricitySquared; // first eccentricity squared
    double ebs = (a * a - b * b) / (b * b); // second eccentricity squared
    double phi0 = 0.0;                    // latitude of origin
    double lambda0 = 0.0;                 // central meridian, within [-pi, pi]
    double FN = 0.0;                      // false northing
    double FE = 0.0;                      // false easting
    double k0 = 1.0;                      // scale factor on the central meridian
    double ap = 6367449.1458008;          // meridional arc coefficients
    double bp = 16038.508696861;
    double cp = 16.832613334334;
    double dp = 0.021984404273757;
    double ep = 0.000031148371319283;
    double dE = 40000000.0;               // largest |easting - FE| the inverse accepts
    double dN = 40000000.0;               // largest |northing - FN| the inverse accepts
};

// Replaces every field from the ellipsoid and projection constants, or leaves
// the record unchanged and returns the set-up error bits.
uint32_t SetTransverseMercatorParams(TransverseMercatorParams& params, double a, double b,
                                     double phi0, double lambda0, double FE, double FN, double k0);

// Geodetic to grid. Easting and northing are written only when no error bit is
// returned (the distortion warning alone still writes them).
uint32_t TransverseMercatorForward(const TransverseMercatorParams& params, double latitude,
                                   double longitude, double& easting, double& northing);

// Grid to geodetic, with the same rule for its outputs.
uint32_t TransverseMercatorInverse(const TransverseMercatorParams& params, double easting,
                                   double northing, double& latitude, double& longitude);
