#include "geo/ImageCorners.h"

#include <gtest/gtest.h>

#include <cstring>
#include <memory>
#include <string>

namespace {

constexpr double kUnset = -999.0;
constexpr int32_t kWgs84Geographic = 4326;

// IGEOLO texts of the JITC i_3034f family, one per ICORDS form.
constexpr const char* kGeographicIgeolo =
    "325900N0850000E325900N0850001E325859N0850001E325859N0850000E";
constexpr const char* kDecimalIgeolo =
    "+32.984+085.000+32.984+085.001+32.983+085.001+32.983+085.000";
constexpr const char* kUtmIgeolo =
    "453131183651215453131443651215453131433651184453131173651185";
constexpr const char* kMgrsIgeolo =
    "45SUS131175121545SUS131435121445SUS131435118445SUS1311751184";

struct Corners {
    double x1 = kUnset, y1 = kUnset, x2 = kUnset, y2 = kUnset, x3 = kUnset, y3 = kUnset;
};

Corners Read(char icords, const char* igeolo, bool version21 = true)
{
    Corners corners;
    ReadImageCorners(ImageCornerFields{icords, igeolo, version21}, corners.x1, corners.y1,
                     corners.x2, corners.y2, corners.x3, corners.y3);
    return corners;
}

int32_t Code(char icords, const char* igeolo, bool version21 = true)
{
    return ImageCornerEpsgCode(ImageCornerFields{icords, igeolo, version21}, kWgs84Geographic);
}

void ExpectUnwritten(const Corners& corners)
{
    for (double value : {corners.x1, corners.y1, corners.x2, corners.y2, corners.x3, corners.y3})
        EXPECT_EQ(value, kUnset);
}

// Four slots from their texts; slot 3 is filler.
std::string Igeolo(const char* slot1, const char* slot2, const char* slot4,
                   const char* slot3 = "XXXXXXXXXXXXXXX")
{
    return std::string(slot1) + slot2 + slot3 + slot4;
}

TEST(ImageCorners, GeographicDegreesMinutesSeconds)
{
    const Corners corners = Read('G', kGeographicIgeolo);
    EXPECT_DOUBLE_EQ(corners.x1, 85.0);
    EXPECT_DOUBLE_EQ(corners.y1, 32.0 + 59.0 / 60.0);
    EXPECT_DOUBLE_EQ(corners.x2, 85.0 + 1.0 / 3600.0);
    EXPECT_DOUBLE_EQ(corners.y2, 32.0 + 59.0 / 60.0);
    EXPECT_DOUBLE_EQ(corners.x3, 85.0);
    EXPECT_DOUBLE_EQ(corners.y3, 32.0 + (58.0 + 59.0 / 60.0) / 60.0);
    EXPECT_EQ(Code('G', kGeographicIgeolo), kWgs84Geographic);

    const std::string west = Igeolo("351530N1203015W", "351530s1203015w", "351530S0000000E");
    const Corners hemispheres = Read('G', west.c_str());
    EXPECT_NEAR(hemispheres.y1, 35.258333333, 1e-9);
    EXPECT_NEAR(hemispheres.x1, -120.504166667, 1e-9);
    EXPECT_NEAR(hemispheres.y2, 35.258333333, 1e-9);   // lower-case letters stay positive
    EXPECT_NEAR(hemispheres.x2, 120.504166667, 1e-9);
    EXPECT_NEAR(hemispheres.y3, -35.258333333, 1e-9);
}

TEST(ImageCorners, GeocentricIsReadAsGeographic)
{
    const Corners g = Read('G', kGeographicIgeolo);
    const Corners c = Read('C', kGeographicIgeolo);
    EXPECT_EQ(std::memcmp(&g, &c, sizeof g), 0);
    EXPECT_EQ(Code('C', kGeographicIgeolo), kWgs84Geographic);
}

TEST(ImageCorners, DecimalDegrees)
{
    const Corners corners = Read('D', kDecimalIgeolo);
    EXPECT_DOUBLE_EQ(corners.y1, 32.984);
    EXPECT_DOUBLE_EQ(corners.x1, 85.0);
    EXPECT_DOUBLE_EQ(corners.x2, 85.001);
    EXPECT_DOUBLE_EQ(corners.y3, 32.983);
    EXPECT_DOUBLE_EQ(corners.x3, 85.0);
    EXPECT_EQ(Code('D', kDecimalIgeolo), kWgs84Geographic);

    const std::string signs = Igeolo("+12.345-123.456", "-00.500+000.250", "+00.000+000.000");
    const Corners signed_ = Read('D', signs.c_str());
    EXPECT_DOUBLE_EQ(signed_.y1, 12.345);
    EXPECT_DOUBLE_EQ(signed_.x1, -123.456);
    EXPECT_DOUBLE_EQ(signed_.y2, -0.5);
    EXPECT_DOUBLE_EQ(signed_.x2, 0.25);
}

TEST(ImageCorners, UtmNorthAndSouthPassMetresThrough)
{
    for (char icords : {'N', 'S'}) {
        const Corners corners = Read(icords, kUtmIgeolo);
        EXPECT_EQ(corners.x1, 313118.0);
        EXPECT_EQ(corners.y1, 3651215.0);
        EXPECT_EQ(corners.x2, 313144.0);
        EXPECT_EQ(corners.y2, 3651215.0);
        EXPECT_EQ(corners.x3, 313117.0);
        EXPECT_EQ(corners.y3, 3651185.0);
    }
    EXPECT_EQ(Code('N', kUtmIgeolo), 32645);
    EXPECT_EQ(Code('S', kUtmIgeolo), 32745);
}

TEST(ImageCorners, UtmZoneOutsideTheGridHasNoCode)
{
    for (const char* zone : {"00", "61", "-1", "  "}) {
        const std::string igeolo = Igeolo((std::string(zone) + "3131183651215").c_str(),
                                          "333131443651215", "333131173651185");
        EXPECT_EQ(Code('N', igeolo.c_str()), 0) << zone;
        EXPECT_EQ(Read('S', igeolo.c_str()).x1, 313118.0);
    }
}

TEST(ImageCorners, MgrsCornersBecomeUtm)
{
    const Corners corners = Read('U', kMgrsIgeolo);
    EXPECT_EQ(corners.x1, 313117.0);
    EXPECT_EQ(corners.y1, 3651215.0);
    EXPECT_EQ(corners.x2, 313143.0);
    EXPECT_EQ(corners.y2, 3651214.0);
    EXPECT_EQ(corners.x3, 313117.0);
    EXPECT_EQ(corners.y3, 3651184.0);
    EXPECT_EQ(Code('U', kMgrsIgeolo), 32645);

    const std::string north = Igeolo("31NEA0000000000", "31NEA0000000000", "31NEA0000000000");
    EXPECT_EQ(Code('U', north.c_str()), 32631);
    const std::string south = Igeolo("31MEV0000099999", "31NEA0000000000", "31NEA0000000000");
    EXPECT_EQ(Code('U', south.c_str()), 32731);
}

TEST(ImageCorners, MgrsCornersKeepTheirOwnZonesAndBandMisses)
{
    // The second corner lies in zone 32; the code follows the first corner.
    // The fourth is just outside band N but keeps its grid position.
    const std::string igeolo = Igeolo("31NEA1000010000", "32NKF1000010000", "31NDK0000000000");
    const Corners corners = Read('U', igeolo.c_str());
    EXPECT_EQ(corners.x2, 210000.0);
    EXPECT_EQ(corners.y2, 10000.0);
    EXPECT_EQ(corners.x3, 400000.0);
    EXPECT_EQ(corners.y3, 900000.0);
    EXPECT_EQ(Code('U', igeolo.c_str()), 32631);
}

TEST(ImageCorners, RefusedMgrsCornerIsZeroWithNoCode)
{
    const std::string igeolo = Igeolo("31UJQ5248211717", "31UDQ5248211717", "31IDQ5248211717");
    const Corners corners = Read('U', igeolo.c_str());
    EXPECT_EQ(corners.x1, 0.0);
    EXPECT_EQ(corners.y1, 0.0);
    EXPECT_EQ(corners.x2, 452482.0);
    EXPECT_EQ(corners.x3, 0.0);
    EXPECT_EQ(Code('U', igeolo.c_str()), 0);
}

TEST(ImageCorners, ThirdSlotIsNeverRead)
{
    const std::string a = Igeolo("351530N1203015W", "351530N1203015W", "351530N1203015W",
                                 "000000N0000000E");
    const std::string b = Igeolo("351530N1203015W", "351530N1203015W", "351530N1203015W",
                                 "999999S9999999W");
    const Corners ca = Read('G', a.c_str());
    const Corners cb = Read('G', b.c_str());
    EXPECT_EQ(std::memcmp(&ca, &cb, sizeof ca), 0);
}

TEST(ImageCorners, FormsWithoutCornersWriteNothing)
{
    for (char icords : {'E', 'g', ' ', '\0'}) {
        ExpectUnwritten(Read(icords, kGeographicIgeolo));
        EXPECT_EQ(Code(icords, kGeographicIgeolo), 0) << icords;
    }
    // NITF 2.0 has no UTM north form: "N" there means no corners.
    ExpectUnwritten(Read('N', kUtmIgeolo, false));
    EXPECT_EQ(Code('N', kUtmIgeolo, false), 0);
    ExpectUnwritten(Read('G', nullptr));
    EXPECT_EQ(Code('G', nullptr), 0);
}

TEST(ImageCorners, NonNumbersReadAsZero)
{
    const std::string igeolo = Igeolo("+nan   +inf    ", "+1e999 -1e999  ", "  abc   12.5   ");
    const Corners corners = Read('D', igeolo.c_str());
    EXPECT_EQ(corners.y1, 0.0);
    EXPECT_EQ(corners.x1, 0.0);
    EXPECT_EQ(corners.y2, 0.0);
    EXPECT_EQ(corners.x2, 0.0);
    EXPECT_EQ(corners.y3, 0.0);
    EXPECT_EQ(corners.x3, 12.5);
}

TEST(ImageCorners, ShortIgeoloIsNotReadPastItsEnd)
{
    // Exactly sized heap copies, so a read past the terminator is caught by
    // the address sanitizer.
    for (char icords : {'G', 'D', 'N', 'U'}) {
        const char text[] = "4531311836";
        auto igeolo = std::make_unique<char[]>(sizeof text);
        std::memcpy(igeolo.get(), text, sizeof text);
        const Corners corners = Read(icords, igeolo.get());
        EXPECT_EQ(corners.x3, 0.0) << icords;
        Code(icords, igeolo.get());
    }
}

} // namespace
