#include "geo/Mgrs.h"

#include <gtest/gtest.h>

namespace {

struct UtmResult {
    uint32_t status;
    int32_t zone;
    char hemisphere;
    double easting;
    double northing;
};

UtmResult Convert(const char* reference)
{
    UtmResult result{};
    result.status = MgrsToUtm(reference, result.zone, result.hemisphere, result.easting,
                              result.northing);
    return result;
}

void ExpectConverted(const char* reference, int32_t zone, char hemisphere, double easting,
                     double northing)
{
    SCOPED_TRACE(reference);
    const UtmResult result = Convert(reference);
    EXPECT_EQ(result.status, 0u);
    EXPECT_EQ(result.zone, zone);
    EXPECT_EQ(result.hemisphere, hemisphere);
    EXPECT_EQ(result.easting, easting);
    EXPECT_EQ(result.northing, northing);
}

// A reference refused before its grid position is known gives no position.
void ExpectRefused(const char* reference)
{
    SCOPED_TRACE(reference);
    const UtmResult result = Convert(reference);
    EXPECT_EQ(result.status, kMgrsRejected);
    EXPECT_EQ(result.zone, 0);
    EXPECT_EQ(result.hemisphere, kMgrsNoHemisphere);
    EXPECT_EQ(result.easting, 0.0);
    EXPECT_EQ(result.northing, 0.0);
}

TEST(Mgrs, WorkedConversions)
{
    ExpectConverted("31UDQ5248211717", 31, 'N', 452482.0, 5411717.0);
    ExpectConverted("56HLH3356847473", 56, 'S', 333568.0, 6247473.0);
    ExpectConverted("4QFJ1234567890", 4, 'N', 612345.0, 2367890.0);
    ExpectConverted("31UDQ", 31, 'N', 400000.0, 5400000.0);
}

TEST(Mgrs, ParsesPiecesAndPrecision)
{
    MgrsReference reference;
    EXPECT_EQ(ParseMgrs("  4qfj123678", reference), 0u);
    EXPECT_EQ(reference.zone, 4);
    EXPECT_EQ(reference.letters[0], 'Q' - 'A');
    EXPECT_EQ(reference.letters[1], 'F' - 'A');
    EXPECT_EQ(reference.letters[2], 'J' - 'A');
    EXPECT_EQ(reference.precision, 3);
    EXPECT_EQ(reference.easting, 12300.0);
    EXPECT_EQ(reference.northing, 67800.0);

    // Anything after the digits is ignored.
    ExpectConverted("31udq5248211717 trailing", 31, 'N', 452482.0, 5411717.0);
    ExpectConverted("31UDQ52481171", 31, 'N', 452480.0, 5411710.0);
}

TEST(Mgrs, RefusesMalformedReferences)
{
    for (const char* reference :
         {"00UDQ", "61UDQ", "UDQ12", "131UDQ", "31UD12", "31UDQQ12", "31IDQ", "31UDO",
          "31UDQ123456789", "31UDQ12345678901", "31UDQ123456789012", "31U DQ 52482 11717",
          "", "31"}) {
        ExpectRefused(reference);
    }
    EXPECT_EQ(Convert(nullptr).status, kMgrsRejected);
}

// Zones 32, 34 and 36 do not reach band X; polar band letters have no zone;
// square letters must be of the zone's set (zone 31: A-H, 32: J-R, 33: S-Z;
// rows A-V). None of these gives a position.
TEST(Mgrs, RefusesSquaresThatDoNotExist)
{
    for (const char* reference : {"32XNG", "34XNG", "36XNG", "31ADQ", "31BDQ", "31YDQ", "31ZDQ",
                                  "31UJQ", "32UHQ", "33UHQ", "31UDW"})
        ExpectRefused(reference);
    for (const char* reference : {"31XEG", "33XWG", "35XNG", "37XEG"})
        EXPECT_EQ(Convert(reference).status, 0u) << reference;
}

TEST(Mgrs, HemisphereFollowsTheBand)
{
    const UtmResult north = Convert("31NEA");
    EXPECT_EQ(north.status, 0u);
    EXPECT_EQ(north.hemisphere, 'N');
    EXPECT_EQ(north.northing, 0.0);
    const UtmResult south = Convert("31MEV");
    EXPECT_EQ(south.status, 0u);
    EXPECT_EQ(south.hemisphere, 'S');
    EXPECT_EQ(south.northing, 9900000.0);
}

TEST(Mgrs, RowLettersWrapWithinTheBand)
{
    // Band U of zone 31 spans northings 5.3 to 6.2 million metres, across the
    // 2 000 km row cycle: row A there is 6 000 km, not 4 000 km.
    ExpectConverted("31UDA", 31, 'N', 400000.0, 6000000.0);
    ExpectConverted("31UDV", 31, 'N', 400000.0, 5900000.0);
}

TEST(Mgrs, BandCheckToleranceShrinksWithPrecision)
{
    // 31NDK lies at about 8.1 degrees north, just above band N (0 to 8).
    ExpectConverted("31NDK", 31, 'N', 400000.0, 900000.0);
    const UtmResult precise = Convert("31NDK0000000000");
    EXPECT_EQ(precise.status, kMgrsRejected);
    EXPECT_EQ(precise.zone, 31);
    EXPECT_EQ(precise.easting, 400000.0);
    EXPECT_EQ(precise.northing, 900000.0);
    // 31NDL at about 9.05 degrees is beyond even the 1-degree tolerance.
    EXPECT_EQ(Convert("31NDL").status, kMgrsRejected);
}

} // namespace
