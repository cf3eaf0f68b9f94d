#include "geo/ImageCorners.h"

#include <gtest/gtest.h>

#include <array>
#include <memory>
#include <string>

namespace {

constexpr double kUnset = -999.0;
constexpr int32_t kGeographic = 4326;

// IGEOLO texts of the JITC i_3034f family, one per ICORDS form.
constexpr const char* kGeographicIgeolo =
    "325900N0850000E325900N0850001E325859N0850001E325859N0850000E";
constexpr const char* kDecimalIgeolo =
    "+32.984+085.000+32.984+085.001+32.983+085.001+32.983+085.000";
constexpr const char* kUtmIgeolo =
    "453131183651215453131443651215453131433651184453131173651185";
constexpr const char* kMgrsIgeolo =
    "45SUS131175121545SUS131435121445SUS131435118445SUS1311751184";

using Corners = std::array<double, 6>;  // x1, y1, x2, y2, x3, y3
constexpr Corners kUnwritten = {kUnset, kUnset, kUnset, kUnset, kUnset, kUnset};

Corners Read(char icords, const char* igeolo, bool version21 = true)
{
    Corners c = kUnwritten;
    ReadImageCorners(ImageCornerFields{icords, igeolo, version21}, c[0], c[1], c[2], c[3], c[4],
                     c[5]);
    return c;
}

int32_t Code(char icords, const char* igeolo, bool version21 = true)
{
    return ImageCornerEpsgCode(ImageCornerFields{icords, igeolo, version21}, kGeographic);
}

// Slots 1, 2 and 4 of an IGEOLO; slot 3 is filler.
std::string Igeolo(const char* slot1, const char* slot2, const char* slot4,
                   const char* slot3 = "XXXXXXXXXXXXXXX")
{
    return std::string(slot1) + slot2 + slot3 + slot4;
}

TEST(ImageCorners, GeographicAndGeocentric)
{
    const Corners expected = {85.0, 32.0 + 59.0 / 60.0, 85.0 + 1.0 / 3600.0,
                              32.0 + 59.0 / 60.0, 85.0, 32.0 + (58.0 + 59.0 / 60.0) / 60.0};
    EXPECT_EQ(Read('G', kGeographicIgeolo), expected);
    // "C" latitudes are geocentric: the geodetic latitudes of the same points
    // (GeographicLib's CartConvert of these gives back 32d59'00" and 32d58'59"
    // geocentric); longitudes stay.
    const Corners geodetic = Read('C', kGeographicIgeolo);
    const Corners geodeticExpected = {85.0, 33.1593159397, 85.0 + 1.0 / 3600.0, 33.1593159397, 85.0, 33.1590374062};
    for (size_t i = 0; i < geodetic.size(); ++i)
        EXPECT_NEAR(geodetic[i], geodeticExpected[i], 1e-9) << i;
    for (char icords : {'G', 'C'})
        EXPECT_EQ(Code(icords, kGeographicIgeolo), kGeographic);
    const std::string poles = Igeolo("900000N0000000E", "900000S0000000E", "000000N0000000E");
    EXPECT_EQ(Read('C', poles.c_str()), (Corners{0.0, 90.0, 0.0, -90.0, 0.0, 0.0}));
    // Only upper-case S and W turn the sign.
    const std::string west = Igeolo("351530N0203015W", "351530s0203015w", "351530S0000000E");
    const Corners c = Read('G', west.c_str());
    EXPECT_NEAR(c[0], -20.504166667, 1e-9);
    EXPECT_NEAR(c[1], 35.258333333, 1e-9);
    EXPECT_NEAR(c[2], 20.504166667, 1e-9);
    EXPECT_NEAR(c[3], 35.258333333, 1e-9);
    EXPECT_NEAR(c[5], -35.258333333, 1e-9);
}

// Corners within 180 degrees of the first keep their longitude; those across
// the 180 degree meridian from it move a whole turn, in every degree form.
TEST(ImageCorners, LongitudesKeepRunningAcross180Degrees)
{
    struct Case {
        char icords;
        std::string igeolo;
        Corners expected;
    };
    const Case cases[] = {
        // JITC i_3004g: 160E to 160W.
        {'G', Igeolo("200000N1600000E", "200000N1600000W", "200000S1600000E"), {160, 20, 200, 20, 160, -20}},
        // Running west: a turn less.
        {'D', Igeolo("+10.000-179.500", "+10.000+179.500", "+09.000-179.500"), {-179.5, 10, -180.5, 10, -179.5, 9}},
        // Rotated a quarter turn: the first corner is the north-east one.
        {'D', Igeolo("+10.000+179.500", "+09.000+179.500", "+10.000-179.500"), {179.5, 10, 179.5, 9, 180.5, 10}},
        // South up, and one just 180 degrees wide: as written.
        {'D', Igeolo("-10.000+020.000", "-10.000+010.000", "+10.000+020.000"), {20, -10, 10, -10, 20, 10}},
        {'D', Igeolo("+10.000-090.000", "+10.000+090.000", "+09.000-090.000"), {-90, 10, 90, 10, -90, 9}},
    };
    for (const Case& c : cases) {
        const Corners corners = Read(c.icords, c.igeolo.c_str());
        for (size_t i = 0; i < corners.size(); ++i)
            EXPECT_NEAR(corners[i], c.expected[i], 1e-9) << c.igeolo << " value " << i;
    }
}

TEST(ImageCorners, DecimalDegrees)
{
    EXPECT_EQ(Read('D', kDecimalIgeolo), (Corners{85.0, 32.984, 85.001, 32.984, 85.0, 32.983}));
    EXPECT_EQ(Code('D', kDecimalIgeolo), kGeographic);
    const std::string signs = Igeolo("+12.345-123.456", "-00.500+000.250", "+nan   +inf    ");
    // Non-numbers ("nan", "inf") read as no number: 0.
    EXPECT_EQ(Read('D', signs.c_str()), (Corners{-123.456, 12.345, 0.25, -0.5, 0.0, 0.0}));
}

TEST(ImageCorners, UtmPassesMetresThrough)
{
    const Corners expected = {313118.0, 3651215.0, 313144.0, 3651215.0, 313117.0, 3651185.0};
    EXPECT_EQ(Read('N', kUtmIgeolo), expected);
    EXPECT_EQ(Read('S', kUtmIgeolo), expected);
    EXPECT_EQ(Code('N', kUtmIgeolo), 32645);
    EXPECT_EQ(Code('S', kUtmIgeolo), 32745);
    for (const char* zone : {"00", "61", "-1", "  "}) {
        const std::string igeolo = std::string(zone) + (kUtmIgeolo + 2);
        EXPECT_EQ(Code('N', igeolo.c_str()), 0) << zone;
        EXPECT_EQ(Read('S', igeolo.c_str()), expected);
    }
}

TEST(ImageCorners, MgrsBecomesUtm)
{
    EXPECT_EQ(Read('U', kMgrsIgeolo),
              (Corners{313117.0, 3651215.0, 313143.0, 3651214.0, 313117.0, 3651184.0}));
    EXPECT_EQ(Code('U', kMgrsIgeolo), 32645);
    const std::string south = Igeolo("31MEV0000099999", "31NEA0000000000", "31NEA0000000000");
    EXPECT_EQ(Code('U', south.c_str()), 32731);

    // Each corner keeps its own zone (the second is in zone 32) while the code
    // follows the first; the fourth lies just outside band N and keeps its
    // position; a refused reference is (0, 0), and no code when first.
    const std::string mixed = Igeolo("31NEA1000010000", "32NKF1000010000", "31NDK0000000000");
    EXPECT_EQ(Read('U', mixed.c_str()),
              (Corners{510000.0, 10000.0, 210000.0, 10000.0, 400000.0, 900000.0}));
    EXPECT_EQ(Code('U', mixed.c_str()), 32631);
    const std::string refused = Igeolo("31UJQ5248211717", "31UDQ5248211717", "31IDQ5248211717");
    EXPECT_EQ(Read('U', refused.c_str()), (Corners{0.0, 0.0, 452482.0, 5411717.0, 0.0, 0.0}));
    EXPECT_EQ(Code('U', refused.c_str()), 0);
    // Zone 32 has no band X (Svalbard): no code, whatever the other corners.
    const std::string svalbard = Igeolo("32XNL0000000000", "33XVL0000000000", "33XVL0000000000");
    EXPECT_EQ(Code('U', svalbard.c_str()), 0);
}

TEST(ImageCorners, ThirdSlotIsNeverRead)
{
    const std::string a = Igeolo("351530N1203015W", "351530N1203015W", "351530N1203015W",
                                 "000000N0000000E");
    const std::string b = Igeolo("351530N1203015W", "351530N1203015W", "351530N1203015W",
                                 "999999S9999999W");
    EXPECT_EQ(Read('G', a.c_str()), Read('G', b.c_str()));
}

TEST(ImageCorners, FormsWithoutCornersWriteNothing)
{
    for (char icords : {'E', 'g', ' ', '\0'}) {
        EXPECT_EQ(Read(icords, kGeographicIgeolo), kUnwritten) << icords;
        EXPECT_EQ(Code(icords, kGeographicIgeolo), 0) << icords;
    }
    // In NITF 2.0, "N" means no corners.
    EXPECT_EQ(Read('N', kUtmIgeolo, false), kUnwritten);
    EXPECT_EQ(Code('N', kUtmIgeolo, false), 0);
    EXPECT_EQ(Read('G', nullptr), kUnwritten);
    EXPECT_EQ(Code('G', nullptr), 0);
}

// Exactly sized heap copies: a read past the terminator trips the address
// sanitizer.
TEST(ImageCorners, ShortIgeoloIsNotReadPastItsEnd)
{
    for (char icords : {'G', 'D', 'N', 'U'}) {
        const std::string text = "4531311836";
        auto igeolo = std::make_unique<char[]>(text.size() + 1);
        text.copy(igeolo.get(), text.size());
        EXPECT_EQ(Read(icords, igeolo.get())[5], 0.0) << icords;
        Code(icords, igeolo.get());
    }
}

} // namespace
