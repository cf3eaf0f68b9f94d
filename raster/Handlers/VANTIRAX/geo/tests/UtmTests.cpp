// Transverse Mercator set-up and refusals, and the UTM rules GeoConvert's
// table does not reach: zone choice at the edges, requested zones, limits.
#include "geo/Angles.h"
#include "geo/TransverseMercator.h"
#include "geo/Utm.h"

#include <gtest/gtest.h>

#include <cmath>

namespace {

constexpr double kA = 6378137.0, kB = 6356752.3142, kUnset = -1.0;

struct Grid {
    uint32_t status = 0;
    int32_t zone = 0;
    char hemisphere = '?';
    double easting = kUnset, northing = kUnset;
};

Grid ToUtm(double latitude, double longitude, int32_t requestedZone = 0)
{
    Grid grid;
    grid.status = GeodeticToUtm(DegreesToRadians(latitude), DegreesToRadians(longitude), kA, kB, requestedZone,
                                grid.zone, grid.hemisphere, grid.easting, grid.northing);
    return grid;
}

TEST(TransverseMercator, SetUpComputesSpansOrLeavesTheRecord)
{
    TransverseMercatorParams params;
    ASSERT_EQ(SetTransverseMercatorParams(params, kA, kB, 0.0, DegreesToRadians(357.0), 0.0, 0.0, 1.0), 0u);
    EXPECT_NEAR(params.lambda0, DegreesToRadians(-3.0), 1e-15); // 357 degrees east is 3 west
    EXPECT_NEAR(params.dN, 10001966.0, 1.0);                    // the spans the inverse is held to
    EXPECT_NEAR(params.dE, 18577794.0, 1.0);
    struct Case {
        double a, b, phi0, lambda0, k0;
        uint32_t status;
    };
    for (const Case& c : {Case{0.0, kB, 0, 0, 1, kTmSemiMajorAxisError | kTmAxisOrderError},
                          Case{kA, -1.0, 0, 0, 1, kTmSemiMinorAxisError}, Case{NAN, kB, 0, 0, 1, kTmSemiMajorAxisError},
                          Case{kA, kB, 1.6, -3.2, 1, kTmOriginLatitudeError | kTmCentralMeridianError},
                          Case{kA, kB, 0, 6.3, 3.1, kTmCentralMeridianError | kTmScaleFactorError}}) {
        TransverseMercatorParams unchanged;
        unchanged.FE = 123.0;
        EXPECT_EQ(SetTransverseMercatorParams(unchanged, c.a, c.b, c.phi0, c.lambda0, 0, 0, c.k0), c.status);
        EXPECT_EQ(unchanged.FE, 123.0);
    }
    // Refusals write nothing; the distortion warning does.
    double x = kUnset, y = kUnset;
    EXPECT_EQ(TransverseMercatorForward(params, 1.6, 2.0, x, y), kTmLatitudeError | kTmLongitudeError);
    EXPECT_EQ(TransverseMercatorForward(params, NAN, 0.0, x, y), kTmLatitudeError);
    EXPECT_EQ(TransverseMercatorInverse(params, 4.1e7, -4.1e7, x, y), kTmEastingError | kTmNorthingError);
    EXPECT_EQ(x + y, 2 * kUnset);
    EXPECT_EQ(TransverseMercatorForward(TransverseMercatorParams(), 0.5, DegreesToRadians(10.0), x, y),
              kTmDistortionWarning);
    EXPECT_GT(x, 0.0);
}

TEST(Utm, ZoneRulesAndRefusedPoints)
{
    struct Case {
        double latitude, longitude;
        int32_t requested, zone;
        uint32_t status;
    };
    for (const Case& c : {Case{10, -180, 0, 1, 0}, {10, 180, 0, 1, 0}, {10, 179.9, 0, 60, 0}, {10, 360, 0, 31, 0},
                          {10, -0.1, 0, 30, 0}, {60, 5, 0, 32, 0}, {60, 2, 0, 31, 0}, {64, 5, 0, 31, 0},
                          {75, 8.9, 0, 31, 0}, {75, 9, 0, 33, 0}, {75, 41, 0, 37, 0}, {75, 42, 0, 38, 0},
                          {10, 3, 30, 30, 0}, {10, 3, 32, 32, 0}, {10, -177, 60, 60, 0}, {10, 177, 1, 1, 0},
                          {84.49, 3, 0, 31, 0}, {-80.49, 3, 0, 31, 0},
                          // Only neighbours may be requested, and zone 60 has no zone 61 beside it.
                          {10, 3, 33, 0, kUtmZoneOverrideError}, {10, 3, -1, 0, kUtmZoneOverrideError},
                          {10, 177, 61, 0, kUtmZoneOverrideError}, {84.6, 3, 0, 0, kUtmLatitudeError},
                          {-80.6, 3, 0, 0, kUtmLatitudeError}, {NAN, 3, 0, 0, kUtmLatitudeError},
                          {85, 400, 0, 0, kUtmLatitudeError | kUtmLongitudeError}}) {
        const Grid grid = ToUtm(c.latitude, c.longitude, c.requested);
        // An easting beyond 100 to 900 km (a neighbour's zone) is written and flagged.
        EXPECT_EQ(grid.status & ~kUtmEastingError, c.status) << c.latitude << " " << c.longitude << " " << c.requested;
        EXPECT_EQ(grid.zone, c.zone) << c.latitude << " " << c.longitude << " " << c.requested;
        EXPECT_EQ(grid.easting == kUnset, c.status != 0) << c.latitude << " " << c.longitude; // refusals write nothing
    }
}

TEST(Utm, HemispheresGridLimitsAndTheInverse)
{
    const Grid equator = ToUtm(0.0, 3.0), south = ToUtm(-1e-6, 3.0);
    EXPECT_EQ(equator.hemisphere, 'N');
    EXPECT_EQ(equator.northing, 0.0);
    EXPECT_EQ(south.hemisphere, 'S');
    EXPECT_GT(south.northing, 9999999.0);
    EXPECT_LT(south.northing, 10000000.0);
    // Four degrees west of zone 31's meridian: about 55 km, still written.
    const Grid west = ToUtm(0.5, -1.0, 31);
    EXPECT_EQ(west.status, kUtmEastingError);
    EXPECT_NEAR(west.easting, 55000.0, 1000.0);

    double latitude = kUnset, longitude = kUnset;
    EXPECT_EQ(UtmToGeodetic(31, 'N', 99999.0, 1000.0, kA, kB, latitude, longitude), kUtmEastingError);
    EXPECT_EQ(UtmToGeodetic(0, 'X', 500000.0, -1.0, kA, kB, latitude, longitude),
              kUtmZoneError | kUtmHemisphereError | kUtmNorthingError);
    EXPECT_EQ(latitude, kUnset);
    // Svalbard's zone 33 requested down to 32: 10.5 degrees from its meridian, no sound inverse.
    const Grid far = ToUtm(80.0, 19.5, 32);
    EXPECT_EQ(UtmToGeodetic(32, 'N', far.easting, far.northing, kA, kB, latitude, longitude), kUtmNorthingError);
    // Here the series carries the latitude many turns past the pole; the
    // inverse must still end, folded back, and report the point unsound.
    EXPECT_EQ(UtmToGeodetic(1, 'N', 900000.0, 10000000.0, kA, kB, latitude, longitude), kUtmNorthingError);
    EXPECT_LE(std::fabs(latitude), kHalfPi);
}

} // namespace
