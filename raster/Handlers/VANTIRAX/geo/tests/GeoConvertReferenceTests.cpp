// Conversions checked against a table computed by GeoConvert (an exact
// Transverse Mercator); make_geoconvert_table.py writes the table.
#include "geo/Angles.h"
#include "geo/Mgrs.h"
#include "geo/Utm.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <fstream>
#include <sstream>
#include <string>
#include <vector>

namespace {

constexpr double kA = 6378137.0;
constexpr double kB = 6356752.3142;
constexpr double kEarthRadius = 6371000.0;        // metres per radian, for angle differences
constexpr double kInverseMeridianOffset = 5.0e-8; // radians east, by design of the inverse

struct UtmRow {
    double latitude, longitude;  // degrees
    int32_t requestedZone, zone;
    char hemisphere;
    double easting, northing;
};

struct MgrsRow {
    std::string reference;
    int32_t zone;
    char hemisphere;
    double easting, northing;  // south-west corner of the square
};

struct ReferenceTable {
    std::vector<UtmRow> utm;
    std::vector<MgrsRow> mgrs;
};

ReferenceTable LoadTable()
{
    ReferenceTable table;
    std::ifstream file(VX_SOURCE_DIR "/raster/Handlers/VANTIRAX/geo/tests/data/"
                                     "geoconvert_reference.txt");
    std::string line;
    while (std::getline(file, line)) {
        std::istringstream fields(line);
        std::string kind;
        fields >> kind;
        if (kind == "utm") {
            UtmRow row{};
            fields >> row.latitude >> row.longitude >> row.requestedZone >> row.zone
                >> row.hemisphere >> row.easting >> row.northing;
            table.utm.push_back(row);
        } else if (kind == "mgrs") {
            MgrsRow row{};
            fields >> row.reference >> row.zone >> row.hemisphere >> row.easting
                >> row.northing;
            table.mgrs.push_back(row);
        }
    }
    return table;
}

const ReferenceTable& Table()
{
    static const ReferenceTable table = LoadTable();
    return table;
}

double DegreesFromCentralMeridian(double longitude, int32_t zone)
{
    const double difference = std::fmod(longitude - (6.0 * zone - 183.0) + 540.0, 360.0) - 180.0;
    return std::fabs(difference);
}

// Largest differences allowed, in metres, by distance from the central
// meridian. Measured against the table: 0.054 mm up to 5 degrees (the
// ellipsoid's semi-minor axis is given to 0.1 mm), then for the inverse
// 0.30 mm up to 6, 1.1 mm up to 7, 4.8 mm up to 8 and 12.1 mm up to 9
// degrees; the forward direction stays under 0.25 mm throughout.
struct Tolerance {
    double degrees;
    double metres;
};
constexpr Tolerance kTolerances[] = {
    {6.0, 0.001}, {7.0, 0.002}, {8.0, 0.008}, {9.0, 0.020},
};

double ToleranceAt(double degrees)
{
    for (const Tolerance& tolerance : kTolerances) {
        if (degrees <= tolerance.degrees)
            return tolerance.metres;
    }
    return 0.0;
}

// Every latitude band and precision is present, in both hemispheres.
TEST(GeoConvertReference, TableCoversTheGrid)
{
    ASSERT_GE(Table().utm.size(), 300u);
    std::string bands;
    std::vector<bool> precisions(kMgrsMaxPrecision + 1, false);
    bool hemispheres[2] = {};
    for (const MgrsRow& row : Table().mgrs) {
        MgrsReference reference;
        ASSERT_EQ(ParseMgrs(row.reference.c_str(), reference), 0u) << row.reference;
        const char band = static_cast<char>('A' + reference.letters[0]);
        if (bands.find(band) == std::string::npos)
            bands += band;
        precisions[reference.precision] = true;
        hemispheres[row.hemisphere == 'S'] = true;
    }
    std::sort(bands.begin(), bands.end());
    EXPECT_EQ(bands, "CDEFGHJKLMNPQRSTUVWX");
    EXPECT_EQ(std::count(precisions.begin(), precisions.end(), true), kMgrsMaxPrecision + 1);
    EXPECT_TRUE(hemispheres[0] && hemispheres[1]);
}

TEST(GeoConvertReference, GeodeticToUtm)
{
    for (const UtmRow& row : Table().utm) {
        SCOPED_TRACE(::testing::Message() << row.latitude << " " << row.longitude << " zone "
                                          << row.requestedZone);
        int32_t zone = 0;
        char hemisphere = ' ';
        double easting = 0.0;
        double northing = 0.0;
        const uint32_t status = GeodeticToUtm(
            DegreesToRadians(row.latitude), DegreesToRadians(row.longitude), kA, kB,
            row.requestedZone, zone, hemisphere, easting, northing);
        EXPECT_EQ(status & ~kUtmEastingError, 0u);
        EXPECT_EQ(zone, row.zone);
        EXPECT_EQ(hemisphere, row.hemisphere);
        const double tolerance = ToleranceAt(DegreesFromCentralMeridian(row.longitude, zone));
        EXPECT_NEAR(easting, row.easting, tolerance);
        EXPECT_NEAR(northing, row.northing, tolerance);
    }
}

TEST(GeoConvertReference, UtmToGeodetic)
{
    for (const UtmRow& row : Table().utm) {
        SCOPED_TRACE(::testing::Message() << row.zone << row.hemisphere << " " << row.easting
                                          << " " << row.northing);
        double latitude = 0.0;
        double longitude = 0.0;
        const uint32_t status = UtmToGeodetic(row.zone, row.hemisphere, row.easting,
                                              row.northing, kA, kB, latitude, longitude);
        const double degrees = DegreesFromCentralMeridian(row.longitude, row.zone);
        if (row.easting < 100000.0 || row.easting > 900000.0) {
            EXPECT_EQ(status, kUtmEastingError);
            continue;
        }
        EXPECT_EQ(status, degrees > 9.0 ? kUtmNorthingError : 0u);
        const double tolerance = ToleranceAt(degrees);
        const double longitudeError = std::remainder(
            longitude - kInverseMeridianOffset - DegreesToRadians(row.longitude), kTwoPi);
        EXPECT_NEAR((latitude - DegreesToRadians(row.latitude)) * kEarthRadius, 0.0, tolerance);
        EXPECT_NEAR(longitudeError * std::cos(latitude) * kEarthRadius, 0.0, tolerance);
    }
}

// GeoConvert's square centres, less half a square, are the corners this
// conversion gives; the grid arithmetic is exact.
TEST(GeoConvertReference, MgrsToUtm)
{
    for (const MgrsRow& row : Table().mgrs) {
        SCOPED_TRACE(row.reference);
        int32_t zone = 0;
        char hemisphere = ' ';
        double easting = 0.0;
        double northing = 0.0;
        EXPECT_EQ(MgrsToUtm(row.reference.c_str(), zone, hemisphere, easting, northing), 0u);
        EXPECT_EQ(zone, row.zone);
        EXPECT_EQ(hemisphere, row.hemisphere);
        EXPECT_EQ(easting, row.easting);
        EXPECT_EQ(northing, row.northing);
    }
}

} // namespace
