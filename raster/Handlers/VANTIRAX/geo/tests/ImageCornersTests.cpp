// IGEOLO read in each ICORDS form: corners 1, 2 and 4 (slot 3 is never read)
// as x, y pairs, and the EPSG code of their coordinate system.
#include "geo/ImageCorners.h"

#include <gtest/gtest.h>

#include <array>
#include <cstring>
#include <memory>
#include <string>

namespace {

using Corners = std::array<double, 6>; // x1, y1, x2, y2, x4, y4
constexpr double kUnset = -999.0;
constexpr Corners kUnwritten = {kUnset, kUnset, kUnset, kUnset, kUnset, kUnset};

// IGEOLO of slots 1, 2 and 4; slot 3 is filler.
std::string Igeolo(const char* slot1, const char* slot2, const char* slot4, const char* slot3 = "XXXXXXXXXXXXXXX")
{
    return std::string(slot1) + slot2 + slot3 + slot4;
}

Corners Read(const ImageCornerFields& fields)
{
    Corners got = kUnwritten;
    ReadImageCorners(fields, got[0], got[1], got[2], got[3], got[4], got[5]);
    return got;
}

TEST(ImageCorners, EachFormGivesItsCornersAndCodeAndNoneIsReadPastIgeolo)
{
    // The IGEOLO texts of the JITC i_3034f family, one per ICORDS form.
    const std::string geographic = "325900N0850000E325900N0850001E325859N0850001E325859N0850000E";
    const std::string utm = "453131183651215453131443651215453131433651184453131173651185";
    const Corners utmCorners = {313118, 3651215, 313144, 3651215, 313117, 3651185};
    const Corners degrees = {85, 32 + 59.0 / 60, 85 + 1.0 / 3600, 32 + 59.0 / 60, 85, 32 + (58 + 59.0 / 60) / 60};
    const double d = 35.0 + 15.0 / 60.0 + 30.0 / 3600.0, m = 20.0 + 30.0 / 60.0 + 15.0 / 3600.0;
    const std::string sw = Igeolo("351530N0203015W", "351530s0203015w", "351530S0000000E", "000000N0000000E");
    const std::string sw9 = Igeolo("351530N0203015W", "351530s0203015w", "351530S0000000E", "999999S9999999W");
    struct Case { char ICORDS; std::string IGEOLO; Corners corners; int32_t code; bool version21 = true; };
    const Case cases[] = {
        {'G', geographic, degrees, 4326},
        // Only upper-case S and W turn the sign; the third slot is never read.
        {'G', sw, {-m, d, m, d, 0.0, -d}, 4326}, {'G', sw9, {-m, d, m, d, 0.0, -d}, 4326},
        // "C" latitudes are geocentric: the geodetic latitudes of the same points (GeographicLib's
        // CartConvert of these gives back 32d59'00" and 32d58'59" geocentric); longitudes stay.
        {'C', geographic, {85.0, 33.1593159397, 85.0 + 1.0 / 3600.0, 33.1593159397, 85.0, 33.1590374062}, 4326},
        {'C', Igeolo("900000N0000000E", "900000S0000000E", "000000N0000000E"), {0, 90, 0, -90, 0, 0}, 4326},
        // Corners across the 180 degree meridian from the first move a whole turn: JITC i_3004g (160E to
        // 160W), running west, rotated a quarter turn; south up and one just 180 degrees wide stay.
        {'G', Igeolo("200000N1600000E", "200000N1600000W", "200000S1600000E"), {160, 20, 200, 20, 160, -20}, 4326},
        {'D', Igeolo("+10.000-179.500", "+10.000+179.500", "+09.000-179.500"), 
         {-179.5, 10, -180.5, 10, -179.5, 9}, 4326},
        {'D', Igeolo("+10.000+179.500", "+09.000+179.500", "+10.000-179.500"), {179.5, 10, 179.5, 9, 180.5, 10}, 4326},
        {'D', Igeolo("-10.000+020.000", "-10.000+010.000", "+10.000+020.000"), {20, -10, 10, -10, 20, 10}, 4326},
        {'D', Igeolo("+10.000-090.000", "+10.000+090.000", "+09.000-090.000"), {-90, 10, 90, 10, -90, 9}, 4326},
        {'D', "+32.984+085.000+32.984+085.001+32.983+085.001+32.983+085.000", 
         {85, 32.984, 85.001, 32.984, 85, 32.983}, 4326},
        // Non-numbers ("nan", "inf") read as no number: 0.
        {'D', Igeolo("+12.345-123.456", "-00.500+000.250", "+nan   +inf    "), 
         {-123.456, 12.345, 0.25, -0.5, 0, 0}, 4326},
        {'N', utm, utmCorners, 32645}, {'S', utm, utmCorners, 32745},
        {'N', utm, kUnwritten, 0, false}, // in NITF 2.0 "N" means no corners
        // Zones outside 1-60 have no code (not 32600 or 32761), the metres pass.
        {'N', "00" + utm.substr(2), utmCorners, 0}, {'N', "61" + utm.substr(2), utmCorners, 0},
        {'S', "-1" + utm.substr(2), utmCorners, 0}, {'N', "  " + utm.substr(2), utmCorners, 0},
        {'U', "45SUS131175121545SUS131435121445SUS131435118445SUS1311751184",
         {313117.0, 3651215.0, 313143.0, 3651214.0, 313117.0, 3651184.0}, 32645},
        {'U', Igeolo("31MEV0000099999", "31NEA0000000000", "31NEA0000000000"), {5e5, 9999999, 5e5, 0, 5e5, 0}, 32731},
        // Each corner keeps its own zone (the second is in zone 32) while the code follows the
        // first; the fourth lies just outside band N and keeps its position; a refused reference
        // is (0, 0), and no code when first (zone 32 has no band X, Svalbard).
        {'U', Igeolo("31NEA1000010000", "32NKF1000010000", "31NDK0000000000"), {51e4, 1e4, 21e4, 1e4, 4e5, 9e5}, 32631},
        {'U', Igeolo("31UJQ5248211717", "31UDQ5248211717", "31IDQ5248211717"), {0, 0, 452482, 5411717, 0, 0}, 0},
        {'U', Igeolo("32XNL0000000000", "33XVL0000000000", "33XVL0000000000"), {0, 0, 4e5, 9e6, 4e5, 9e6}, 0},
        {'E', geographic, kUnwritten, 0}, {'g', geographic, kUnwritten, 0}, {' ', geographic, kUnwritten, 0},
        {'\0', geographic, kUnwritten, 0},
    };
    for (const Case& c : cases) {
        const ImageCornerFields fields{c.ICORDS, c.IGEOLO.c_str(), c.version21};
        const Corners got = Read(fields);
        for (size_t i = 0; i < got.size(); ++i)
            EXPECT_NEAR(got[i], c.corners[i], 1e-9) << c.ICORDS << " " << c.IGEOLO << " value " << i;
        EXPECT_EQ(ImageCornerEpsgCode(fields, 4326), c.code) << c.ICORDS << " " << c.IGEOLO;
    }
    // Without IGEOLO nothing is written; a short one is not read past its end (exactly sized
    // heap copies: a read past the terminator trips the address sanitizer).
    EXPECT_TRUE(Read({'G', nullptr, true}) == kUnwritten && ImageCornerEpsgCode({'G', nullptr, true}, 4326) == 0);
    for (char icords : {'G', 'D', 'N', 'U'}) {
        const std::unique_ptr<char[]> igeolo(std::strcpy(new char[11], "4531311836"));
        EXPECT_EQ(Read(ImageCornerFields{icords, igeolo.get(), true})[5], 0.0) << icords;
        ImageCornerEpsgCode(ImageCornerFields{icords, igeolo.get(), true}, 4326);
    }
}

} // namespace
