#include "geo/Angles.h"
#include "geo/TransverseMercator.h"
#include "geo/Utm.h"

#include <gtest/gtest.h>

#include <cmath>
#include <limits>
#include <utility>

namespace {

constexpr double kA = 6378137.0;
constexpr double kB = 6356752.3142;
constexpr double kUnset = -1.0;

struct Grid {
    uint32_t status;
    int32_t zone = 0;
    char hemisphere = '?';
    double easting = kUnset;
    double northing = kUnset;
};

Grid ToUtm(double latitudeDegrees, double longitudeDegrees, int32_t requestedZone = 0)
{
    Grid grid{};
    grid.zone = 0;
    grid.hemisphere = '?';
    grid.easting = kUnset;
    grid.northing = kUnset;
    grid.status = GeodeticToUtm(DegreesToRadians(latitudeDegrees),
                                DegreesToRadians(longitudeDegrees), kA, kB, requestedZone,
                                grid.zone, grid.hemisphere, grid.easting, grid.northing);
    return grid;
}

int32_t ZoneOf(double latitudeDegrees, double longitudeDegrees, int32_t requestedZone = 0)
{
    return ToUtm(latitudeDegrees, longitudeDegrees, requestedZone).zone;
}

TEST(TransverseMercator, WgsSetUpMatchesTheDefaultsAndSpans)
{
    const TransverseMercatorParams defaults;
    TransverseMercatorParams params;
    ASSERT_EQ(SetTransverseMercatorParams(params, kA, kB, 0.0, 0.0, 0.0, 0.0, 1.0), 0u);
    // The defaults are WGS 84 with b to more decimals; they agree to 1e-8.
    for (const auto& [set, preset] : {std::pair{params.es, defaults.es}, {params.ebs, defaults.ebs},
                                      {params.ap, defaults.ap}, {params.bp, defaults.bp},
                                      {params.cp, defaults.cp}, {params.dp, defaults.dp},
                                      {params.ep, defaults.ep}})
        EXPECT_NEAR(set / preset, 1.0, 1e-8);
    EXPECT_NEAR(params.dN, 10001966.0, 1.0);
    EXPECT_NEAR(params.dE, 18577794.0, 1.0);

    ASSERT_EQ(SetTransverseMercatorParams(params, kA, kB, 0.0, DegreesToRadians(357.0), 0.0,
                                          0.0, 1.0), 0u);
    EXPECT_NEAR(params.lambda0, DegreesToRadians(-3.0), 1e-15);
}

TEST(TransverseMercator, RefusedSetUpLeavesTheRecord)
{
    const double nan = std::numeric_limits<double>::quiet_NaN();
    struct Case { double a, b, phi0, lambda0, k0; uint32_t status; };
    for (const Case& c : {Case{0.0, kB, 0.0, 0.0, 1.0, kTmSemiMajorAxisError | kTmAxisOrderError},
                          Case{kA, -1.0, 0.0, 0.0, 1.0, kTmSemiMinorAxisError},
                          Case{kB, kA, 0.0, 0.0, 1.0, kTmAxisOrderError},
                          Case{kA, kB, 1.6, 0.0, 1.0, kTmOriginLatitudeError},
                          Case{kA, kB, 0.0, -3.2, 1.0, kTmCentralMeridianError},
                          Case{kA, kB, 0.0, 6.3, 1.0, kTmCentralMeridianError},
                          Case{kA, kB, 0.0, 0.0, 0.29, kTmScaleFactorError},
                          Case{nan, kB, 0.0, 0.0, 1.0, kTmSemiMajorAxisError}}) {
        TransverseMercatorParams params;
        params.FE = 123.0;
        EXPECT_EQ(SetTransverseMercatorParams(params, c.a, c.b, c.phi0, c.lambda0, 0.0, 0.0,
                                              c.k0), c.status);
        EXPECT_EQ(params.FE, 123.0);
        EXPECT_EQ(params.a, 6378137.0);
    }
}

TEST(TransverseMercator, ForwardAndInverseRefuseWithoutWriting)
{
    const TransverseMercatorParams params;
    double x = kUnset;
    double y = kUnset;
    EXPECT_EQ(TransverseMercatorForward(params, 1.6, 0.0, x, y), kTmLatitudeError);
    EXPECT_EQ(TransverseMercatorForward(params, 1.6, 2.0, x, y),
              kTmLatitudeError | kTmLongitudeError);
    EXPECT_EQ(TransverseMercatorForward(params, std::nan(""), 0.0, x, y), kTmLatitudeError);
    EXPECT_EQ(TransverseMercatorInverse(params, 4.1e7, 0.0, x, y), kTmEastingError);
    EXPECT_EQ(TransverseMercatorInverse(params, 0.0, -4.1e7, x, y), kTmNorthingError);
    EXPECT_EQ(x, kUnset);
    EXPECT_EQ(y, kUnset);
    // 10 degrees out: a warning, and the values are produced.
    EXPECT_EQ(TransverseMercatorForward(params, 0.5, DegreesToRadians(10.0), x, y),
              kTmDistortionWarning);
    EXPECT_GT(x, 0.0);
}

TEST(Utm, LatitudeLimitsAreInclusiveRadians)
{
    auto latitudeStatus = [](double latitude) {
        int32_t zone = 0;
        char hemisphere = '?';
        double easting = 0.0;
        double northing = 0.0;
        return GeodeticToUtm(latitude, 0.1, kA, kB, 0, zone, hemisphere, easting, northing)
             & kUtmLatitudeError;
    };
    EXPECT_EQ(latitudeStatus(1.4748032179352084), 0u);
    EXPECT_EQ(latitudeStatus(DegreesToRadians(84.6)), kUtmLatitudeError);
    EXPECT_EQ(latitudeStatus(-1.4049900478554351), 0u);
    EXPECT_EQ(latitudeStatus(DegreesToRadians(-80.5)), kUtmLatitudeError);
    EXPECT_EQ(latitudeStatus(DegreesToRadians(-80.6)), kUtmLatitudeError);
    EXPECT_EQ(latitudeStatus(std::nan("")), kUtmLatitudeError);

    const Grid refused = ToUtm(85.0, 400.0);
    EXPECT_EQ(refused.status, kUtmLatitudeError | kUtmLongitudeError);
    EXPECT_EQ(refused.zone, 0);
    EXPECT_EQ(refused.easting, kUnset);
}

TEST(Utm, ZonesAtTheAntimeridianAndBeyond)
{
    EXPECT_EQ(ZoneOf(10.0, -180.0), 1);
    EXPECT_EQ(ZoneOf(10.0, 180.0), 1);
    EXPECT_EQ(ZoneOf(10.0, 179.9), 60);
    EXPECT_EQ(ZoneOf(10.0, 360.0), 31);
    EXPECT_EQ(ZoneOf(10.0, -0.1), 30);
}

TEST(Utm, NorwayAndSvalbardZones)
{
    EXPECT_EQ(ZoneOf(60.0, 5.0), 32);
    EXPECT_EQ(ZoneOf(60.0, 2.0), 31);
    EXPECT_EQ(ZoneOf(64.0, 5.0), 31);
    EXPECT_EQ(ZoneOf(75.0, 8.9), 31);
    EXPECT_EQ(ZoneOf(75.0, 9.0), 33);
    EXPECT_EQ(ZoneOf(75.0, 41.0), 37);
    EXPECT_EQ(ZoneOf(75.0, 42.0), 38);
}

TEST(Utm, RequestedZones)
{
    EXPECT_EQ(ZoneOf(10.0, 3.0, 30), 30);
    EXPECT_EQ(ZoneOf(10.0, 3.0, 32), 32);
    EXPECT_EQ(ZoneOf(10.0, -177.0, 60), 60);
    EXPECT_EQ(ZoneOf(10.0, 177.0, 1), 1);
    for (int32_t requested : {33, 61, -1}) {
        const Grid refused = ToUtm(10.0, 3.0, requested);
        EXPECT_EQ(refused.status, kUtmZoneOverrideError) << requested;
        EXPECT_EQ(refused.zone, 0);
        EXPECT_EQ(refused.easting, kUnset);
    }
    // Zone 60 has no zone 61 beside it.
    EXPECT_EQ(ToUtm(10.0, 177.0, 61).status, kUtmZoneOverrideError);
}

TEST(Utm, EquatorIsNorth)
{
    const Grid equator = ToUtm(0.0, 3.0);
    EXPECT_EQ(equator.hemisphere, 'N');
    EXPECT_EQ(equator.northing, 0.0);
    EXPECT_NEAR(equator.easting, 500000.0, 1e-6);
    const Grid south = ToUtm(-1e-6, 3.0);
    EXPECT_EQ(south.hemisphere, 'S');
    EXPECT_LT(south.northing, 10000000.0);
    EXPECT_GT(south.northing, 9999999.0);
}

TEST(Utm, EastingLimitsInBothDirections)
{
    // Four degrees west of zone 31's meridian on the equator is about 55 km.
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
    EXPECT_EQ(longitude, kUnset);
}

TEST(Utm, RoundTripOffsetsTheLongitude)
{
    const Grid grid = ToUtm(47.3, 8.6);
    ASSERT_EQ(grid.status, 0u);
    double latitude = 0.0;
    double longitude = 0.0;
    ASSERT_EQ(UtmToGeodetic(grid.zone, grid.hemisphere, grid.easting, grid.northing, kA, kB,
                            latitude, longitude), 0u);
    EXPECT_NEAR(longitude - DegreesToRadians(8.6), 5e-8, 1e-12);
    EXPECT_NEAR(latitude, DegreesToRadians(47.3), 1e-11);  // well under a millimetre
}

TEST(Utm, FarFromTheMeridianTheInverseReportsNorthing)
{
    // Svalbard's zone 33 requested down to 32: 10.5 degrees from its meridian.
    const Grid grid = ToUtm(80.0, 19.5, 32);
    ASSERT_EQ(grid.zone, 32);
    double latitude = 0.0;
    double longitude = 0.0;
    EXPECT_EQ(UtmToGeodetic(32, 'N', grid.easting, grid.northing, kA, kB, latitude, longitude),
              kUtmNorthingError);
}

// Near the northing limit far east the series folds latitudes over the pole
// many turns; the inverse must still end and report the point unsound.
TEST(Utm, InverseBeyondThePoleEnds)
{
    double latitude = 0.0;
    double longitude = 0.0;
    EXPECT_EQ(UtmToGeodetic(1, 'N', 900000.0, 10000000.0, kA, kB, latitude, longitude),
              kUtmNorthingError);
    EXPECT_LE(std::fabs(latitude), kHalfPi);
}

} // namespace
