#include "geo/Angles.h"
#include "geo/TransverseMercator.h"
#include "geo/Utm.h"

#include <gtest/gtest.h>

#include <cmath>

namespace {

constexpr double kA = 6378137.0;
constexpr double kB = 6356752.3142;
constexpr double kUnset = -1.0;

struct Grid {
    uint32_t status = 0;
    int32_t zone = 0;
    char hemisphere = '?';
    double easting = kUnset;
    double northing = kUnset;
};

Grid ToUtm(double latitudeDegrees, double longitudeDegrees, int32_t requestedZone = 0)
{
    Grid grid;
    grid.status = GeodeticToUtm(DegreesToRadians(latitudeDegrees),
                                DegreesToRadians(longitudeDegrees), kA, kB, requestedZone,
                                grid.zone, grid.hemisphere, grid.easting, grid.northing);
    return grid;
}

TEST(TransverseMercator, SetUpComputesSpansOrLeavesTheRecord)
{
    TransverseMercatorParams params;
    ASSERT_EQ(SetTransverseMercatorParams(params, kA, kB, 0.0, DegreesToRadians(357.0), 0.0,
                                          0.0, 1.0), 0u);
    EXPECT_NEAR(params.dN, 10001966.0, 1.0);
    EXPECT_NEAR(params.dE, 18577794.0, 1.0);
    EXPECT_NEAR(params.lambda0, DegreesToRadians(-3.0), 1e-15);
    EXPECT_NEAR(params.bp / TransverseMercatorParams().bp, 1.0, 1e-8);

    struct Case { double a, b, phi0, lambda0, k0; uint32_t status; };
    for (const Case& c : {Case{0.0, kB, 0, 0, 1, kTmSemiMajorAxisError | kTmAxisOrderError},
                          Case{kA, -1.0, 0, 0, 1, kTmSemiMinorAxisError},
                          Case{NAN, kB, 0, 0, 1, kTmSemiMajorAxisError},
                          Case{kA, kB, 1.6, -3.2, 1, kTmOriginLatitudeError | kTmCentralMeridianError},
                          Case{kA, kB, 0, 6.3, 3.1, kTmCentralMeridianError | kTmScaleFactorError}}) {
        TransverseMercatorParams unchanged;
        unchanged.FE = 123.0;
        EXPECT_EQ(SetTransverseMercatorParams(unchanged, c.a, c.b, c.phi0, c.lambda0, 0, 0, c.k0),
                  c.status);
        EXPECT_EQ(unchanged.FE, 123.0);
    }
}

TEST(TransverseMercator, RefusalsWriteNothingWarningsDo)
{
    const TransverseMercatorParams params;
    double x = kUnset;
    double y = kUnset;
    EXPECT_EQ(TransverseMercatorForward(params, 1.6, 2.0, x, y),
              kTmLatitudeError | kTmLongitudeError);
    EXPECT_EQ(TransverseMercatorForward(params, NAN, 0.0, x, y), kTmLatitudeError);
    EXPECT_EQ(TransverseMercatorInverse(params, 4.1e7, -4.1e7, x, y),
              kTmEastingError | kTmNorthingError);
    EXPECT_EQ(x, kUnset);
    EXPECT_EQ(y, kUnset);
    EXPECT_EQ(TransverseMercatorForward(params, 0.5, DegreesToRadians(10.0), x, y),
              kTmDistortionWarning);
    EXPECT_GT(x, 0.0);
}

TEST(Utm, LatitudeLimitsAreInclusiveRadians)
{
    auto statusAt = [](double latitude) {
        Grid grid;
        return GeodeticToUtm(latitude, 0.1, kA, kB, 0, grid.zone, grid.hemisphere,
                             grid.easting, grid.northing);
    };
    EXPECT_EQ(statusAt(1.4748032179352084), 0u);
    EXPECT_EQ(statusAt(-1.4049900478554351), 0u);
    for (double refused : {DegreesToRadians(84.6), DegreesToRadians(-80.5),
                           DegreesToRadians(-80.6), static_cast<double>(NAN)})
        EXPECT_EQ(statusAt(refused), kUtmLatitudeError) << refused;
    const Grid refused = ToUtm(85.0, 400.0);
    EXPECT_EQ(refused.status, kUtmLatitudeError | kUtmLongitudeError);
    EXPECT_EQ(refused.zone, 0);
    EXPECT_EQ(refused.easting, kUnset);
}

TEST(Utm, ZoneRules)
{
    struct Case { double latitude, longitude; int32_t requested, zone; };
    for (const Case& c : {Case{10, -180, 0, 1}, {10, 180, 0, 1}, {10, 179.9, 0, 60},
                          {10, 360, 0, 31}, {10, -0.1, 0, 30},
                          {60, 5, 0, 32}, {60, 2, 0, 31}, {64, 5, 0, 31},
                          {75, 8.9, 0, 31}, {75, 9, 0, 33}, {75, 41, 0, 37}, {75, 42, 0, 38},
                          {10, 3, 30, 30}, {10, 3, 32, 32}, {10, -177, 60, 60}, {10, 177, 1, 1}}) {
        EXPECT_EQ(ToUtm(c.latitude, c.longitude, c.requested).zone, c.zone)
            << c.latitude << " " << c.longitude << " " << c.requested;
    }
    // Only neighbours may be requested, and zone 60 has no zone 61 beside it.
    for (const Case& c : {Case{10, 3, 33, 0}, {10, 3, -1, 0}, {10, 177, 61, 0}}) {
        const Grid refused = ToUtm(c.latitude, c.longitude, c.requested);
        EXPECT_EQ(refused.status, kUtmZoneOverrideError) << c.requested;
        EXPECT_EQ(refused.zone, 0);
        EXPECT_EQ(refused.easting, kUnset);
    }
}

TEST(Utm, HemispheresAndGridLimits)
{
    const Grid equator = ToUtm(0.0, 3.0);
    EXPECT_EQ(equator.hemisphere, 'N');
    EXPECT_EQ(equator.northing, 0.0);
    const Grid south = ToUtm(-1e-6, 3.0);
    EXPECT_EQ(south.hemisphere, 'S');
    EXPECT_GT(south.northing, 9999999.0);
    EXPECT_LT(south.northing, 10000000.0);

    // Four degrees west of zone 31's meridian: about 55 km, still written.
    const Grid west = ToUtm(0.5, -1.0, 31);
    EXPECT_EQ(west.status, kUtmEastingError);
    EXPECT_NEAR(west.easting, 55000.0, 1000.0);
    double latitude = kUnset;
    double longitude = kUnset;
    EXPECT_EQ(UtmToGeodetic(31, 'N', 99999.0, 1000.0, kA, kB, latitude, longitude),
              kUtmEastingError);
    EXPECT_EQ(UtmToGeodetic(0, 'X', 500000.0, -1.0, kA, kB, latitude, longitude),
              kUtmZoneError | kUtmHemisphereError | kUtmNorthingError);
    EXPECT_EQ(latitude, kUnset);
}

TEST(Utm, InverseOffsetAndUnsoundPoints)
{
    const Grid grid = ToUtm(47.3, 8.6);
    double latitude = 0.0;
    double longitude = 0.0;
    ASSERT_EQ(UtmToGeodetic(grid.zone, grid.hemisphere, grid.easting, grid.northing, kA, kB,
                            latitude, longitude), 0u);
    EXPECT_NEAR(longitude - DegreesToRadians(8.6), 5e-8, 1e-12);
    EXPECT_NEAR(latitude, DegreesToRadians(47.3), 1e-11);

    // Svalbard's zone 33 requested down to 32: 10.5 degrees from its meridian.
    const Grid far = ToUtm(80.0, 19.5, 32);
    EXPECT_EQ(UtmToGeodetic(32, 'N', far.easting, far.northing, kA, kB, latitude, longitude),
              kUtmNorthingError);
    // Here the series carries the latitude many turns past the pole; the
    // inverse must still end, folded back, and report the point unsound.
    EXPECT_EQ(UtmToGeodetic(1, 'N', 900000.0, 10000000.0, kA, kB, latitude, longitude),
              kUtmNorthingError);
    EXPECT_LE(std::fabs(latitude), kHalfPi);
}

} // namespace
