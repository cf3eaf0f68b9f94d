// UTM, MGRS and the Transverse Mercator beneath them against GeoConvert's table (written by
// make_geoconvert_table.py: every band, zones 1 to 60 and their edges, MGRS precisions 0 to 5, Norway
// and Svalbard), then what it does not reach: requested zones, limits, band edges, refusals.
#include "geo/Angles.h"
#include "geo/Mgrs.h"
#include "geo/TransverseMercator.h"
#include "geo/Utm.h"

#include <gtest/gtest.h>

#include <cmath>
#include <fstream>
#include <sstream>
#include <string>
#include <tuple>
#include <vector>

namespace {

constexpr double kA = 6378137.0, kB = 6356752.3142, kUnset = -1.0;
constexpr double kEarthRadius = 6371000.0;        // metres per radian of difference
constexpr double kInverseMeridianOffset = 5.0e-8; // radians east, by design of the inverse

using Grid = std::tuple<uint32_t, int32_t, char, double, double>; // status, zone, hemisphere, easting, northing

Grid ToUtm(double latitude, double longitude, int32_t requestedZone = 0)
{
    Grid g{0, 0, '?', kUnset, kUnset};
    auto& [status, zone, hemisphere, easting, northing] = g;
    status = GeodeticToUtm(DegreesToRadians(latitude), DegreesToRadians(longitude), kA, kB, requestedZone, zone,
                           hemisphere, easting, northing);
    return g;
}

Grid FromMgrs(const char* reference)
{
    Grid g{0, 0, '?', kUnset, kUnset};
    auto& [status, zone, hemisphere, easting, northing] = g;
    status = MgrsToUtm(reference, zone, hemisphere, easting, northing);
    return g;
}

// "utm latitude longitude requestedZone" or "mgrs reference", then GeoConvert's zone, hemisphere,
// easting and northing (for MGRS the square's south-west corner); status 0.
struct Row { std::string mgrs; double latitude = 0, longitude = 0; int32_t requestedZone = 0; Grid grid; };

std::vector<Row> LoadRows(const std::string& kind)
{
    std::ifstream file(VX_SOURCE_DIR "/raster/Handlers/VANTIRAX/geo/tests/data/geoconvert_reference.txt");
    std::vector<Row> rows;
    for (std::string line, rowKind; std::getline(file, line);) {
        std::istringstream fields(line);
        Row row;
        auto& [status, zone, hemisphere, easting, northing] = row.grid;
        if ((fields >> rowKind) && rowKind == kind &&
            ((kind == "utm" ? fields >> row.latitude >> row.longitude >> row.requestedZone : fields >> row.mgrs) >>
             zone >> hemisphere >> easting >> northing))
            rows.push_back(row);
    }
    EXPECT_GE(rows.size(), 300u) << kind;
    return rows;
}

// Largest differences allowed, in metres, by degrees from the central meridian. Measured: 0.054 mm up
// to 5 (the semi-minor axis is given to 0.1 mm), then for the inverse 0.30 mm up to 6, 1.1 mm up to 7,
// 4.8 mm up to 8 and 12.1 mm up to 9; the forward direction stays under 0.25 mm throughout.
double ToleranceAt(double degrees)
{
    return degrees <= 6 ? 0.001 : degrees <= 7 ? 0.002 : degrees <= 8 ? 0.008 : degrees <= 9 ? 0.020 : 0.0;
}

TEST(GeoConvertReference, GeodeticToUtmAndBack)
{
    for (const Row& row : LoadRows("utm")) {
        SCOPED_TRACE(::testing::Message() << row.latitude << " " << row.longitude << " zone " << row.requestedZone);
        const auto [unused, zone, hemisphere, easting, northing] = row.grid;
        const auto [status, gotZone, gotHemisphere, gotEasting, gotNorthing] =
            ToUtm(row.latitude, row.longitude, row.requestedZone);
        const double degrees = std::fabs(std::fmod(row.longitude - (6.0 * zone - 183.0) + 540.0, 360.0) - 180.0);
        EXPECT_TRUE((status & ~kUtmEastingError) == 0 && gotZone == zone && gotHemisphere == hemisphere);
        EXPECT_NEAR(gotEasting, easting, ToleranceAt(degrees));
        EXPECT_NEAR(gotNorthing, northing, ToleranceAt(degrees));
        double latitude = 0, longitude = 0;
        const uint32_t back = UtmToGeodetic(zone, hemisphere, easting, northing, kA, kB, latitude, longitude);
        if (easting < 100000.0 || easting > 900000.0) {
            EXPECT_EQ(back, kUtmEastingError);
            continue;
        }
        EXPECT_EQ(back, degrees > 9.0 ? kUtmNorthingError : 0u);
        const double longitudeError =
            std::remainder(longitude - kInverseMeridianOffset - DegreesToRadians(row.longitude), kTwoPi);
        EXPECT_NEAR((latitude - DegreesToRadians(row.latitude)) * kEarthRadius, 0.0, ToleranceAt(degrees));
        EXPECT_NEAR(longitudeError * std::cos(latitude) * kEarthRadius, 0.0, ToleranceAt(degrees));
    }
}

// GeoConvert's square centres, less half a square, are the corners this conversion
// gives: the grid arithmetic is exact. Then references the table does not hold.
TEST(Mgrs, ConvertsOrRefusesEachReference)
{
    for (const Row& row : LoadRows("mgrs"))
        EXPECT_EQ(FromMgrs(row.mgrs.c_str()), row.grid) << row.mgrs;
    std::vector<std::pair<const char*, Grid>> cases = {
        {"  4qfj123678", {0, 4, 'N', 612300, 2367800}}, // blanks first
        {"31udq5248211717 trailing", {0, 31, 'N', 452482, 5411717}}, // anything after the digits is ignored
        // 31NDK lies at about 8.1 degrees north, just above band N (0 to 8): the
        // band check allows that much at precision 0, not at precision 5.
        {"31NDK", {0, 31, 'N', 400000, 900000}}, {"31NDK0000000000", {kMgrsRejected, 31, 'N', 400000, 900000}},
    };
    // Malformed, or of squares that do not exist: zones 32, 34 and 36 do not reach band X, polar bands have no zone,
    // square letters must be of the zone's set (zone 31: A-H, 32: J-R, 33: S-Z; rows A-V). No position.
    for (const char* refused : {"00UDQ", "61UDQ", "UDQ12", "131UDQ", "31UD12", "31UDQQ12", "31IDQ", "31UDO",
                                "31UDQ123456789", "31UDQ12345678901", "31UDQ123456789012", "31U DQ 52482 11717", "",
                                "31", "32XNG", "34XNG", "36XNG", "31ADQ", "31BDQ", "31YDQ", "31ZDQ", "31UJQ", "32UHQ",
                                "33UHQ", "31UDW"})
        cases.push_back({refused, {kMgrsRejected, 0, kMgrsNoHemisphere, 0, 0}});
    for (const auto& [reference, grid] : cases)
        EXPECT_EQ(FromMgrs(reference), grid) << reference;
    // 31NDL at about 9.05 degrees is beyond even the 1-degree tolerance.
    EXPECT_TRUE(std::get<0>(FromMgrs("31NDL")) == kMgrsRejected && std::get<0>(FromMgrs(nullptr)) == kMgrsRejected);
}

TEST(TransverseMercator, SetUpComputesSpansOrLeavesTheRecordAndRefusalsWriteNothing)
{
    TransverseMercatorParams params;
    ASSERT_EQ(SetTransverseMercatorParams(params, kA, kB, 0.0, DegreesToRadians(357.0), 0.0, 0.0, 1.0), 0u);
    EXPECT_NEAR(params.lambda0, DegreesToRadians(-3.0), 1e-15); // 357 degrees east is 3 west
    EXPECT_TRUE(std::fabs(params.dN - 10001966.0) < 1 && std::fabs(params.dE - 18577794.0) < 1); // the inverse's spans
    struct Case { double a, b, phi0, lambda0, k0; uint32_t status; };
    for (const Case& c : {Case{0.0, kB, 0, 0, 1, kTmSemiMajorAxisError | kTmAxisOrderError},
                          {kA, -1.0, 0, 0, 1, kTmSemiMinorAxisError}, {NAN, kB, 0, 0, 1, kTmSemiMajorAxisError},
                          {kA, kB, 1.6, -3.2, 1, kTmOriginLatitudeError | kTmCentralMeridianError},
                          {kA, kB, 0, 6.3, 3.1, kTmCentralMeridianError | kTmScaleFactorError}}) {
        TransverseMercatorParams unchanged;
        unchanged.FE = 123.0;
        EXPECT_TRUE(SetTransverseMercatorParams(unchanged, c.a, c.b, c.phi0, c.lambda0, 0, 0, c.k0) == c.status &&
                    unchanged.FE == 123.0) << c.a << " " << c.b << " " << c.lambda0;
    }
    double x = kUnset, y = kUnset; // refusals write nothing; the distortion warning does
    EXPECT_EQ(TransverseMercatorForward(params, 1.6, 2.0, x, y), kTmLatitudeError | kTmLongitudeError);
    EXPECT_EQ(TransverseMercatorForward(params, NAN, 0.0, x, y), kTmLatitudeError);
    EXPECT_EQ(TransverseMercatorInverse(params, 4.1e7, -4.1e7, x, y), kTmEastingError | kTmNorthingError);
    EXPECT_EQ(x + y, 2 * kUnset);
    EXPECT_EQ(TransverseMercatorForward(TransverseMercatorParams(), 0.5, DegreesToRadians(10), x, y),
              kTmDistortionWarning);
    EXPECT_GT(x, 0.0);
}

// Requested zones (only neighbours; zone 60 has none called 61) and the latitude limits.
TEST(Utm, ZoneRulesAndRefusedPoints)
{
    struct Case { double latitude, longitude; int32_t requested, zone; uint32_t status; };
    for (const Case& c : {Case{10, 3, 30, 30, 0}, {10, 3, 32, 32, 0}, {10, -177, 60, 60, 0}, {10, 177, 1, 1, 0},
                          {84.49, 3, 0, 31, 0}, {-80.49, 3, 0, 31, 0}, {10, 3, 33, 0, kUtmZoneOverrideError},
                          {10, 3, -1, 0, kUtmZoneOverrideError}, {10, 177, 61, 0, kUtmZoneOverrideError},
                          {84.6, 3, 0, 0, kUtmLatitudeError}, {-80.6, 3, 0, 0, kUtmLatitudeError},
                          {NAN, 3, 0, 0, kUtmLatitudeError}, {85, 400, 0, 0, kUtmLatitudeError | kUtmLongitudeError}}) {
        const auto [status, zone, hemisphere, easting, northing] = ToUtm(c.latitude, c.longitude, c.requested);
        // An easting beyond 100 to 900 km (a neighbour's zone) is written and flagged; refusals write nothing.
        EXPECT_TRUE((status & ~kUtmEastingError) == c.status && zone == c.zone &&
                    (easting == kUnset) == (c.status != 0)) << c.latitude << " " << c.longitude << " " << c.requested;
    }
}

TEST(Utm, HemispheresGridLimitsAndTheInverse)
{
    EXPECT_EQ(std::get<4>(ToUtm(0.0, 3.0)), 0.0); // exactly; its hemisphere and just south are GeoConvert rows
    // Four degrees west of zone 31's meridian: about 55 km, still written.
    const Grid west = ToUtm(0.5, -1.0, 31);
    EXPECT_TRUE(std::get<0>(west) == kUtmEastingError && std::fabs(std::get<3>(west) - 55000.0) < 1000.0);
    double latitude = kUnset, longitude = kUnset;
    EXPECT_EQ(UtmToGeodetic(31, 'N', 99999.0, 1000.0, kA, kB, latitude, longitude), kUtmEastingError);
    EXPECT_EQ(UtmToGeodetic(0, 'X', 500000.0, -1.0, kA, kB, latitude, longitude),
              kUtmZoneError | kUtmHemisphereError | kUtmNorthingError);
    EXPECT_EQ(latitude, kUnset);
    // No sound inverse: Svalbard's zone 33 requested down to 32 (10.5 degrees from its meridian), and a point the
    // series carries many turns past the pole, where the inverse must still end, folded back.
    const Grid far = ToUtm(80.0, 19.5, 32);
    EXPECT_EQ(UtmToGeodetic(32, 'N', std::get<3>(far), std::get<4>(far), kA, kB, latitude, longitude),
              kUtmNorthingError);
    EXPECT_EQ(UtmToGeodetic(1, 'N', 900000.0, 10000000.0, kA, kB, latitude, longitude), kUtmNorthingError);
    EXPECT_LE(std::fabs(latitude), kHalfPi);
}

} // namespace
