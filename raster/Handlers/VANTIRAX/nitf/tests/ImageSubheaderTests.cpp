// The image subheader as the fixture writer lays it out in NITF 2.1 and 2.0,
// and the counts and lengths in it that the file cannot back.
#include "nitf/tests/NitfTestFile.h"
#include "tests/fixtures/NitfImageWriter.h"

#include <gtest/gtest.h>

namespace {

const std::string kGeographicCorners = "324530N0784510W324530N0784400W324415N0784400W324415N0784510W";

std::string FileOf(const NitfImagePlan& plan, bool fileDowngradeEvent = false)
{
    return BuildImageFile(plan, JoinBlocks(BuildImageBlocks(plan, Ramp)), fileDowngradeEvent);
}

TEST(ImageSubheader, ReadsEveryFieldGroupOfANitf21Subheader)
{
    NitfImagePlan plan;
    plan.rows = 5;
    plan.columns = 7;
    plan.ICORDS = 'G';
    plan.IGEOLO = kGeographicCorners;
    plan.comments = {"first comment", "second comment"};
    plan.IREP = "rgb/lut";
    plan.bands = {NitfBandPlan{"LU", 3, 4, RgbLookupTables(4)}};
    plan.NPPBH = 4;
    plan.NPPBV = 3;
    plan.NBPR = plan.NBPC = 2;
    plan.UDID = "user data";
    plan.IXSHD = "extended";
    LoadedImage loaded(FileOf(plan));
    ASSERT_TRUE(loaded.Parse());
    const CNitfImage& image = loaded.image;
    EXPECT_EQ(image.NROWS, 5);
    EXPECT_EQ(image.NCOLS, 7);
    EXPECT_EQ(image.ICORDS(), 'G');
    ASSERT_NE(image.IGEOLO, nullptr);
    EXPECT_EQ(std::string(image.IGEOLO.get()), kGeographicCorners);
    EXPECT_EQ(image.NICOM, 2);
    EXPECT_EQ(std::string(image.comments.data() + 80, 14), "second comment");
    EXPECT_TRUE(image.isRgb && !image.isMono && image.IsPaletted());
    ASSERT_EQ(image.NBANDS, 1);
    EXPECT_EQ(image.bands[0].NELUT, 4);
    EXPECT_EQ(image.bands[0].LUT.size(), 12u);
    EXPECT_EQ(image.NBPR, 2);
    EXPECT_EQ(image.NPPBV, 3);
    EXPECT_EQ(image.IMODE(), 'B');
    EXPECT_EQ(std::string(image.UDID.begin(), image.UDID.end()), "user data");
    EXPECT_EQ(std::string(image.IXSHD.begin(), image.IXSHD.end()), "extended");
    EXPECT_EQ(image.dataOffset, loaded.header.HL + loaded.header.imageSegments[0].subheaderLength);
}

// Layouts whose pixels must be found where the subheader says they start.
TEST(ImageSubheader, LayoutsOfBothVersionsLeadToThePixels)
{
    struct Case {
        const char* what;
        bool version21, subheaderEvent, fileEvent;
        char ICORDS;
        std::string padding;
    };
    for (const Case& c : {Case{"ICORDS N in NITF 2.1 has IGEOLO", true, false, false, 'N', ""},
                          {"ICORDS N in NITF 2.0 is no corners", false, false, false, 'N', ""},
                          {"ISDEVT, file header without FSDEVT", false, true, false, ' ', ""},
                          {"ISDEVT and FSDEVT", false, true, true, ' ', ""},
                          {"padding counted in LISH", true, false, false, ' ', "PAD"}}) {
        NitfImagePlan plan;
        plan.rows = 3;
        plan.columns = 4;
        plan.version21 = c.version21;
        plan.downgradeEvent = c.subheaderEvent;
        plan.ICORDS = c.ICORDS;
        plan.IGEOLO = std::string(60, '1');
        plan.padding = c.padding;
        LoadedImage loaded(FileOf(plan, c.fileEvent));
        ASSERT_TRUE(loaded.Open()) << c.what;
        EXPECT_EQ(loaded.header.fixedLayout, c.fileEvent ? 0 : 1) << c.what;
        EXPECT_EQ(loaded.image.IGEOLO != nullptr, c.version21 && c.ICORDS == 'N') << c.what;
        EXPECT_EQ(loaded.image.ICORDS(), c.version21 ? c.ICORDS : ' ') << c.what;
        for (int32_t row = 0; row < 3; ++row)
            EXPECT_EQ(loaded.Row(uint32_t(row)), (std::vector<uint8_t>{uint8_t(Ramp(0, row, 0)), uint8_t(Ramp(0, row, 1)),
                                                                       uint8_t(Ramp(0, row, 2)), uint8_t(Ramp(0, row, 3))}))
                << c.what << " row " << row;
    }
}

TEST(ImageSubheader, CompressionCodes)
{
    NitfImagePlan plan;
    plan.IC = "C5";
    plan.COMRAT = "2.50";
    LoadedImage lossless(FileOf(plan));
    ASSERT_TRUE(lossless.Parse());
    EXPECT_EQ(lossless.image.compressionKind, kLosslessJpeg);
    EXPECT_DOUBLE_EQ(lossless.image.comrat, 2.5);
    plan.IC = "C8";
    EXPECT_FALSE(LoadedImage(FileOf(plan)).Parse());
    plan.IC = "C2"; // parses, never served
    LoadedImage arithmetic(FileOf(plan));
    ASSERT_TRUE(arithmetic.Parse());
    EXPECT_EQ(arithmetic.image.compressionKind, kArithmeticDpcm);
    EXPECT_FALSE(arithmetic.image.PrepareData(arithmetic.reader, 1));
}

TEST(ImageSubheader, RefusesCountsAndLengthsBeyondTheFile)
{
    NitfImagePlan extended;
    extended.extendedBandCount = true;
    std::string bytes = BuildImageFile(extended, "x");
    bytes.replace(bytes.find("NC000001"), 8, "NC099999"); // NBANDS "0", XBANDS 99999
    EXPECT_FALSE(LoadedImage(bytes).Parse());
    NitfImagePlan lut;
    lut.IREP = "RGB/LUT";
    lut.bands = {NitfBandPlan{"LU", 3, 4, RgbLookupTables(4)}};
    bytes = BuildImageFile(lut, "x");
    bytes.replace(bytes.find("300004"), 6, "399999"); // a lookup table longer than the rest of the file
    EXPECT_FALSE(LoadedImage(bytes).Parse());
    extended.version21 = false; // NBANDS "0" in NITF 2.0, which has no XBANDS
    EXPECT_FALSE(LoadedImage(BuildImageFile(extended, "x")).Parse());
    const std::string file = FileOf(NitfImagePlan{});
    EXPECT_FALSE(LoadedImage(file.substr(0, file.size() - 200)).Parse()); // cut in the subheader
}

} // namespace
