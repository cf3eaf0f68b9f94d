// Conversions checked against a table computed by GeoConvert (an exact
// Transverse Mercator); make_geoconvert_table.py writes the table, which
// covers every latitude band, zones 1 to 60, both hemispheres, MGRS
// precisions 0 to 5 and the Norway and Svalbard zones.
#include "geo/Angles.h"
#include "geo/Mgrs.h"
#include "geo/Utm.h"

#include <gtest/gtest.h>

#include <cmath>
#include <fstream>
#include <sstream>
#include <string>
#include <vector>

namespace {

constexpr double kA = 6378137.0, kB = 6356752.3142;
constexpr double kEarthRadius = 6371000.0;        // metres per radian of difference
constexpr double kInverseMeridianOffset = 5.0e-8; // radians east, by design of the inverse

struct Row {
    std::string mgrs;
    double latitude = 0, longitude = 0; // degrees ("utm" rows)
    int32_t requestedZone = 0, zone = 0;
    char hemisphere = ' ';
    double easting = 0, northing = 0; // "mgrs" rows: the square's south-west corner
};

std::vector<Row> LoadRows(const std::string& kind)
{
    std::ifstream file(VX_SOURCE_DIR "/raster/Handlers/VANTIRAX/geo/tests/data/geoconvert_reference.txt");
    std::vector<Row> rows;
    for (std::string line, rowKind; std::getline(file, line);) {
        std::istringstream fields(line);
        Row row;
        if (!(fields >> rowKind) || rowKind != kind)
            continue;
        if (kind == "utm")
            fields >> row.latitude >> row.longitude >> row.requestedZone;
        else
            fields >> row.mgrs;
        fields >> row.zone >> row.hemisphere >> row.easting >> row.northing;
        rows.push_back(row);
    }
    return rows;
}

// Largest differences allowed, in metres, by distance from the central
// meridian. Measured against the table: 0.054 mm up to 5 degrees (the
// ellipsoid's semi-minor axis is given to 0.1 mm), then for the inverse
// 0.30 mm up to 6, 1.1 mm up to 7, 4.8 mm up to 8 and 12.1 mm up to 9
// degrees; the forward direction stays under 0.25 mm throughout.
double ToleranceAt(double degrees)
{
    return degrees <= 6 ? 0.001 : degrees <= 7 ? 0.002 : degrees <= 8 ? 0.008 : degrees <= 9 ? 0.020 : 0.0;
}

TEST(GeoConvertReference, GeodeticToUtmAndBack)
{
    const std::vector<Row> rows = LoadRows("utm");
    ASSERT_GE(rows.size(), 300u);
    for (const Row& row : rows) {
        SCOPED_TRACE(::testing::Message() << row.latitude << " " << row.longitude << " zone " << row.requestedZone);
        int32_t zone = 0;
        char hemisphere = ' ';
        double easting = 0, northing = 0, latitude = 0, longitude = 0;
        const double degrees = std::fabs(std::fmod(row.longitude - (6.0 * row.zone - 183.0) + 540.0, 360.0) - 180.0);
        const uint32_t status = GeodeticToUtm(DegreesToRadians(row.latitude), DegreesToRadians(row.longitude), kA, kB,
                                              row.requestedZone, zone, hemisphere, easting, northing);
        EXPECT_EQ(status & ~kUtmEastingError, 0u);
        EXPECT_EQ(zone, row.zone);
        EXPECT_EQ(hemisphere, row.hemisphere);
        EXPECT_NEAR(easting, row.easting, ToleranceAt(degrees));
        EXPECT_NEAR(northing, row.northing, ToleranceAt(degrees));

        const uint32_t back =
            UtmToGeodetic(row.zone, row.hemisphere, row.easting, row.northing, kA, kB, latitude, longitude);
        if (row.easting < 100000.0 || row.easting > 900000.0) {
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

// GeoConvert's square centres, less half a square, are the corners this
// conversion gives; the grid arithmetic is exact.
TEST(GeoConvertReference, MgrsToUtm)
{
    const std::vector<Row> rows = LoadRows("mgrs");
    ASSERT_GE(rows.size(), 300u);
    for (const Row& row : rows) {
        int32_t zone = 0;
        char hemisphere = ' ';
        double easting = 0, northing = 0;
        EXPECT_EQ(MgrsToUtm(row.mgrs.c_str(), zone, hemisphere, easting, northing), 0u) << row.mgrs;
        EXPECT_EQ(zone, row.zone) << row.mgrs;
        EXPECT_EQ(hemisphere, row.hemisphere) << row.mgrs;
        EXPECT_EQ(easting, row.easting) << row.mgrs;
        EXPECT_EQ(northing, row.northing) << row.mgrs;
    }
}

} // namespace
