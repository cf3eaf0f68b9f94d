// MGRS references GeoConvert's table does not hold: letter case, trailing
// text, odd precisions, band edges and every kind of reference to refuse.
#include "geo/Mgrs.h"

#include <gtest/gtest.h>

namespace {

struct Converted {
    const char* reference;
    uint32_t status;
    int32_t zone;
    char hemisphere;
    double easting, northing;
};

TEST(Mgrs, ConvertsOrRefusesEachReference)
{
    std::vector<Converted> cases = {
        {"31UDQ5248211717", 0, 31, 'N', 452482.0, 5411717.0},
        {"56HLH3356847473", 0, 56, 'S', 333568.0, 6247473.0},
        {"4QFJ1234567890", 0, 4, 'N', 612345.0, 2367890.0},
        {"  4qfj123678", 0, 4, 'N', 612300.0, 2367800.0},          // blanks first, lower case, precision 3
        {"31udq5248211717 trailing", 0, 31, 'N', 452482.0, 5411717.0}, // anything after the digits is ignored
        {"31UDQ52481171", 0, 31, 'N', 452480.0, 5411710.0},
        {"31UDQ", 0, 31, 'N', 400000.0, 5400000.0},
        {"31NEA", 0, 31, 'N', 500000.0, 0.0},  // the hemisphere follows the band
        {"31MEV", 0, 31, 'S', 500000.0, 9900000.0},
        // Band U of zone 31 spans northings 5.3 to 6.2 million metres, across
        // the 2 000 km row cycle: row A there is 6 000 km, not 4 000 km.
        {"31UDA", 0, 31, 'N', 400000.0, 6000000.0},
        {"31UDV", 0, 31, 'N', 400000.0, 5900000.0},
        // 31NDK lies at about 8.1 degrees north, just above band N (0 to 8): the
        // band check allows that much at precision 0, not at precision 5.
        {"31NDK", 0, 31, 'N', 400000.0, 900000.0},
        {"31NDK0000000000", kMgrsRejected, 31, 'N', 400000.0, 900000.0},
    };
    // Malformed, or of squares that do not exist: zones 32, 34 and 36 do not
    // reach band X, polar bands have no zone, square letters must be of the
    // zone's set (zone 31: A-H, 32: J-R, 33: S-Z; rows A-V). No position.
    for (const char* refused : {"00UDQ", "61UDQ", "UDQ12", "131UDQ", "31UD12", "31UDQQ12", "31IDQ", "31UDO",
                                "31UDQ123456789", "31UDQ12345678901", "31UDQ123456789012", "31U DQ 52482 11717", "",
                                "31", "32XNG", "34XNG", "36XNG", "31ADQ", "31BDQ", "31YDQ", "31ZDQ", "31UJQ", "32UHQ",
                                "33UHQ", "31UDW"})
        cases.push_back({refused, kMgrsRejected, 0, kMgrsNoHemisphere, 0.0, 0.0});
    for (const Converted& c : cases) {
        Converted got{c.reference, 0, 0, '?', -1.0, -1.0};
        got.status = MgrsToUtm(c.reference, got.zone, got.hemisphere, got.easting, got.northing);
        EXPECT_EQ(got.status, c.status) << c.reference;
        EXPECT_EQ(got.zone, c.zone) << c.reference;
        EXPECT_EQ(got.hemisphere, c.hemisphere) << c.reference;
        EXPECT_EQ(got.easting, c.easting) << c.reference;
        EXPECT_EQ(got.northing, c.northing) << c.reference;
    }
    int32_t zone = 0;
    char hemisphere = ' ';
    double easting = 0, northing = 0;
    for (const char* reference : {"31XEG", "33XWG", "35XNG", "37XEG"})
        EXPECT_EQ(MgrsToUtm(reference, zone, hemisphere, easting, northing), 0u) << reference;
    // 31NDL at about 9.05 degrees is beyond even the 1-degree tolerance.
    EXPECT_EQ(MgrsToUtm("31NDL", zone, hemisphere, easting, northing), kMgrsRejected);
    EXPECT_EQ(MgrsToUtm(nullptr, zone, hemisphere, easting, northing), kMgrsRejected);
}

} // namespace
