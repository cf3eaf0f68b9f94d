#include "nitf/tests/NitfTestFile.h"
#include "tests/fixtures/NitfImageWriter.h"

#include <gtest/gtest.h>

#include <cstring>

namespace {

const std::string kGeographicCorners = "324530N0784510W324530N0784400W324415N0784400W324415N0784510W";

uint64_t Ramp(int32_t band, int32_t row, int32_t column)
{
    return uint64_t(band * 100 + row * 7 + column) & 0xFF;
}

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
    plan.NBPR = 2;
    plan.NBPC = 2;
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
    EXPECT_TRUE(image.isRgb);
    EXPECT_FALSE(image.isMono);
    EXPECT_TRUE(image.IsPaletted());
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

TEST(ImageSubheader, CornerFormNDependsOnTheVersion)
{
    NitfImagePlan plan;
    plan.ICORDS = 'N';
    plan.IGEOLO = std::string(60, '1');
    LoadedImage nitf21(FileOf(plan));
    ASSERT_TRUE(nitf21.Parse());
    EXPECT_NE(nitf21.image.IGEOLO, nullptr);

    plan.version21 = false; // "N" means no corners in NITF 2.0: no IGEOLO follows
    LoadedImage nitf20(FileOf(plan));
    ASSERT_TRUE(nitf20.Open());
    EXPECT_EQ(nitf20.image.ICORDS(), ' ');
    EXPECT_EQ(nitf20.image.IGEOLO, nullptr);
    EXPECT_EQ(nitf20.Row(0)[0], Ramp(0, 0, 0));
}

// ISDWNG 999998 carries ISDEVT whether or not the file header has a downgrade event.
TEST(ImageSubheader, Nitf20DowngradeEventInEitherHeaderLayout)
{
    NitfImagePlan plan;
    plan.version21 = false;
    plan.downgradeEvent = true;
    plan.rows = 3;
    plan.columns = 4;
    for (bool fileEvent : {true, false}) {
        LoadedImage loaded(FileOf(plan, fileEvent));
        ASSERT_TRUE(loaded.Open()) << fileEvent;
        EXPECT_EQ(loaded.header.fixedLayout, fileEvent ? 0 : 1);
        EXPECT_EQ(loaded.image.NROWS, 3);
        EXPECT_EQ(loaded.image.NCOLS, 4);
        EXPECT_EQ(loaded.Row(2)[3], Ramp(0, 2, 3));
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
    LoadedImage jpeg2000(FileOf(plan));
    EXPECT_FALSE(jpeg2000.Parse());

    plan.IC = "C2"; // parses, never served
    LoadedImage arithmetic(FileOf(plan));
    ASSERT_TRUE(arithmetic.Parse());
    EXPECT_EQ(arithmetic.image.compressionKind, kArithmeticDpcm);
    EXPECT_FALSE(arithmetic.image.PrepareData(arithmetic.reader, 1));
}

// Writers pad the subheader past its last field; pixels start at HL + LISH.
TEST(ImageSubheader, ImageDataStartsAfterTheDeclaredSubheaderLength)
{
    NitfImagePlan plan;
    plan.columns = 6;
    plan.padding = "PAD";
    LoadedImage loaded(FileOf(plan));
    ASSERT_TRUE(loaded.Open());
    const std::vector<uint8_t> row = loaded.Row(0);
    for (int32_t c = 0; c < 6; ++c)
        EXPECT_EQ(row[size_t(c)], Ramp(0, 0, c));
}

TEST(ImageSubheader, RefusesCountsAndLengthsBeyondTheFile)
{
    NitfImagePlan plan;
    std::string file = FileOf(plan);
    // NBANDS "0" with XBANDS 99999: far more band records than the file holds.
    NitfImagePlan extended = plan;
    extended.extendedBandCount = true;
    std::string bytes = BuildImageFile(extended, "x");
    bytes.replace(bytes.find("NC000001"), 8, "NC099999");
    LoadedImage manyBands(bytes);
    EXPECT_FALSE(manyBands.Parse());
    // A lookup table longer than the rest of the file.
    NitfImagePlan lut = plan;
    lut.IREP = "RGB/LUT";
    lut.bands = {NitfBandPlan{"LU", 3, 4, RgbLookupTables(4)}};
    bytes = BuildImageFile(lut, "x");
    const std::string lutHeader = "300004";
    bytes.replace(bytes.find(lutHeader), lutHeader.size(), "399999");
    LoadedImage longLut(bytes);
    EXPECT_FALSE(longLut.Parse());
    // NBANDS "0" in NITF 2.0, which has no XBANDS.
    extended.version21 = false;
    LoadedImage nitf20(BuildImageFile(extended, "x"));
    EXPECT_FALSE(nitf20.Parse());
    // A subheader cut short by the end of the file.
    LoadedImage truncated(file.substr(0, file.size() - 200));
    EXPECT_FALSE(truncated.Parse());
}

} // namespace
