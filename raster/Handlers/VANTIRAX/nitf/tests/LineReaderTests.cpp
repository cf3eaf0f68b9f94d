// Rows of uncompressed and masked images written by the fixture writer, and
// the rows, spans and layouts the line reader must refuse.
#include "nitf/tests/NitfTestFile.h"
#include "tests/fixtures/NitfImageWriter.h"

#include <gtest/gtest.h>

namespace {

// A 3-band RGB image of 7 x 5 in 2 x 2 blocks of 4 x 3: padded edge blocks.
NitfImagePlan BlockedRgb(char IMODE)
{
    NitfImagePlan plan;
    plan.rows = 5;
    plan.columns = 7;
    plan.IREP = "RGB";
    plan.bands = {NitfBandPlan{"R", 0, 0, ""}, NitfBandPlan{"G", 0, 0, ""}, NitfBandPlan{"B", 0, 0, ""}};
    plan.IMODE = IMODE;
    plan.NBPR = plan.NBPC = 2;
    plan.NPPBH = 4;
    plan.NPPBV = 3;
    return plan;
}

std::vector<uint8_t> RgbRow(int32_t row, int32_t first = 0, int32_t last = 6)
{
    std::vector<uint8_t> expected;
    for (int32_t c = first; c <= last; ++c)
        for (int32_t band = 0; band < 3; ++band)
            expected.push_back(uint8_t(Ramp(band, row, c)));
    return expected;
}

// The band stride of IMODE "S" is a whole band of padded blocks, not NROWS x
// NCOLS. A block left out by the mask table reads as zeros: block 1 of band 0
// in IMODE "S", of every band otherwise.
TEST(LineReader, EveryImodeGivesTheSameRowsAcrossPaddedAndMaskedBlocks)
{
    for (char IMODE : {'B', 'P', 'R', 'S'}) {
        NitfImagePlan plan = BlockedRgb(IMODE);
        const std::vector<std::string> blocks = BuildImageBlocks(plan, Ramp);
        LoadedImage loaded(BuildImageFile(plan, JoinBlocks(blocks)));
        ASSERT_TRUE(loaded.Open()) << IMODE;
        for (int32_t row = 0; row < plan.rows; ++row)
            EXPECT_EQ(loaded.Row(uint32_t(row)), RgbRow(row)) << IMODE << row;
        EXPECT_EQ(loaded.Row(4, 2, 5), RgbRow(4, 2, 5)) << IMODE; // from the middle of one block into the next

        plan.IC = "NM";
        std::vector<bool> stored(blocks.size(), true);
        stored[1] = false;
        LoadedImage masked(BuildImageFile(plan, BuildMaskedData(blocks, stored, 8)));
        ASSERT_TRUE(masked.Open()) << IMODE;
        EXPECT_TRUE(masked.image.isMasked);
        std::vector<uint8_t> expected = RgbRow(0);
        for (int32_t c = 4; c < 7; ++c)
            for (int32_t band = 0; band < (IMODE == 'S' ? 1 : 3); ++band)
                expected[size_t(c * 3 + band)] = 0;
        EXPECT_EQ(masked.Row(0), expected) << IMODE;
        EXPECT_EQ(masked.Row(4), RgbRow(4)) << IMODE;
    }
}

TEST(LineReader, WideMonochromeKeepsTheTopSignificantBits)
{
    struct Case {
        int32_t NBPP, ABPP;
        char PJUST;
        std::vector<uint64_t> pixels;
        std::vector<uint8_t> row;
    };
    for (const Case& c : {Case{16, 11, 'R', {0x07FF, 0x0400, 0x0008}, {0xFF, 0x80, 0x01}},
                          {16, 11, 'L', {0x07FF, 0x0400, 0x0008}, {0x07, 0x04, 0x00}}, // the bits at the top
                          {32, 20, 'R', {0xFFFFF, 0x80000, 0x00FFF}, {0xFF, 0x80, 0x00}}}) {
        NitfImagePlan plan;
        plan.columns = 3;
        plan.NBPP = c.NBPP;
        plan.ABPP = c.ABPP;
        plan.PJUST = c.PJUST;
        LoadedImage loaded(BuildImageFile(plan, JoinBlocks(BuildImageBlocks(plan, [&](int32_t, int32_t, int32_t column) {
                                                            return c.pixels[size_t(column)];
                                                        }))));
        ASSERT_TRUE(loaded.Open());
        EXPECT_EQ(loaded.Row(0), c.row) << c.NBPP << c.PJUST;
    }
}

TEST(LineReader, PaletteOfTheLookupTableOrAGreyRamp)
{
    struct Case {
        std::string IREP;
        int32_t NBPP;
        NitfBandPlan band;
        int32_t size;                 // palette entries
        int32_t index;                // the last entry read
        std::vector<uint8_t> colour;  // its colour
    };
    for (const Case& c : {Case{"RGB/LUT", 8, {"LU", 3, 200, RgbLookupTables(200)}, 200, 199, {199, 56, 99}},
                          {"MONO", 16, {}, 256, 77, {77, 77, 77}}, // no table, any NBPP: the grey ramp
                          {"MONO", 8, {"LU", 1, 10, "0123456789"}, 256, 9, {'9', '9', '9'}}}) {
        NitfImagePlan plan;
        plan.IREP = c.IREP;
        plan.NBPP = c.NBPP;
        plan.bands = {c.band};
        LoadedImage loaded(BuildImageFile(plan, std::string(size_t(c.NBPP / 8), '\x05')));
        ASSERT_TRUE(loaded.Open()) << c.IREP;
        EXPECT_TRUE(loaded.image.IsPaletted());
        EXPECT_EQ(loaded.image.GetPaletteSize(), c.size);
        uint8_t red = 0, green = 0, blue = 0;
        ASSERT_TRUE(loaded.image.GetPaletteEntry(c.index, red, green, blue));
        EXPECT_EQ(std::vector<uint8_t>({red, green, blue}), c.colour);
        EXPECT_FALSE(loaded.image.GetPaletteEntry(c.band.NELUT != 0 ? c.band.NELUT : 256, red, green, blue));
        EXPECT_FALSE(loaded.image.GetPaletteEntry(-1, red, green, blue));
    }
}

TEST(LineReader, RefusesRowsSpansAndLayoutsOutsideTheImageOrFile)
{
    LoadedImage loaded(BuildImageFile(BlockedRgb('P'), JoinBlocks(BuildImageBlocks(BlockedRgb('P'), Ramp))));
    ASSERT_TRUE(loaded.Open());
    std::vector<uint8_t> out(64, 0xEE);
    for (const auto& [row, first, last] : {std::tuple{5, 0, 6}, {0, 0, 7}, {0, -1, 3}, {0, 4, 3}})
        EXPECT_FALSE(loaded.image.ReadLine(loaded.reader, uint32_t(row), first, last, out.data())) << row << first << last;
    EXPECT_EQ(out, std::vector<uint8_t>(64, 0xEE));

    // Layouts the reader cannot address safely are refused when the data is prepared.
    const NitfImagePlan good = BlockedRgb('B');
    const std::string data = JoinBlocks(BuildImageBlocks(good, Ramp));
    auto prepares = [&](const NitfImagePlan& plan, const std::string& bytes) {
        LoadedImage image(BuildImageFile(plan, bytes));
        return image.Parse() && image.image.PrepareData(image.reader, uint32_t(bytes.size()));
    };
    EXPECT_TRUE(prepares(good, data));
    EXPECT_FALSE(prepares(good, data.substr(0, data.size() - 1))); // short final block
    const auto changed = [&](auto change) {
        NitfImagePlan plan = good;
        change(plan);
        return plan;
    };
    EXPECT_FALSE(prepares(changed([](NitfImagePlan& p) { p.NPPBH = 0; }), data)); // 0 wide, two blocks a row
    EXPECT_FALSE(prepares(changed([](NitfImagePlan& p) { p.NBPR = p.NBPC = 9999; }), data));
    EXPECT_FALSE(prepares(changed([](NitfImagePlan& p) { p.NBPR = 1; }), data)); // blocks not covering the image
    EXPECT_FALSE(prepares(changed([](NitfImagePlan& p) { p.IMODE = 'X'; }), data));
    const NitfImagePlan real = changed([](NitfImagePlan& p) {
        p.PVTYPE = "R";
        p.IREP = "MONO";
        p.NBPP = 32;
        p.bands.resize(1);
    });
    EXPECT_FALSE(prepares(real, std::string(7 * 5 * 4, '\0'))); // floating point
    // A mask table with more records than the file holds.
    const NitfImagePlan masked = changed([](NitfImagePlan& p) {
        p.IC = "NM";
        p.NBPR = p.NBPC = 999;
    });
    EXPECT_FALSE(LoadedImage(BuildImageFile(masked, BuildMaskedData(BuildImageBlocks(good, Ramp), {true, true, true, true}))).Parse());

    // Vector-quantised data outside a frame: served, as the file declares it, but no row decodes.
    NitfImagePlan vq;
    vq.IC = "C4";
    vq.IREP = "RGB/LUT";
    vq.bands = {NitfBandPlan{"LU", 3, 2, RgbLookupTables(2)}};
    LoadedImage unframed(BuildImageFile(vq, std::string(16, '\0')));
    ASSERT_TRUE(unframed.Open());
    EXPECT_TRUE(unframed.Row(0).empty());
}

} // namespace
