#include "nitf/tests/NitfTestFile.h"
#include "tests/fixtures/BiLevelWriter.h"
#include "tests/fixtures/JpegBlockWriter.h"
#include "tests/fixtures/NitfImageWriter.h"

#include <gtest/gtest.h>

namespace {

uint64_t Ramp(int32_t band, int32_t row, int32_t column)
{
    return uint64_t(band * 100 + row * 7 + column) & 0xFF;
}

// A 3-band RGB image of 7 x 5 in 2 x 2 blocks of 4 x 3: padded edge blocks.
NitfImagePlan BlockedRgb(char IMODE)
{
    NitfImagePlan plan;
    plan.rows = 5;
    plan.columns = 7;
    plan.IREP = "RGB";
    plan.bands = {NitfBandPlan{"R", 0, 0, ""}, NitfBandPlan{"G", 0, 0, ""}, NitfBandPlan{"B", 0, 0, ""}};
    plan.IMODE = IMODE;
    plan.NBPR = 2;
    plan.NBPC = 2;
    plan.NPPBH = 4;
    plan.NPPBV = 3;
    return plan;
}

std::vector<uint8_t> ExpectedRgbRow(int32_t row, int32_t first, int32_t last)
{
    std::vector<uint8_t> expected;
    for (int32_t c = first; c <= last; ++c)
        for (int32_t band = 0; band < 3; ++band)
            expected.push_back(uint8_t(Ramp(band, row, c)));
    return expected;
}

// The band stride of IMODE "S" is a whole band of padded blocks, not NROWS x NCOLS.
TEST(LineReader, EveryImodeGivesTheSameRowsAcrossPaddedBlocks)
{
    for (char IMODE : {'B', 'P', 'R', 'S'}) {
        const NitfImagePlan plan = BlockedRgb(IMODE);
        LoadedImage loaded(BuildImageFile(plan, JoinBlocks(BuildImageBlocks(plan, Ramp))));
        ASSERT_TRUE(loaded.Open()) << IMODE;
        for (int32_t row = 0; row < plan.rows; ++row)
            EXPECT_EQ(Head(loaded.Row(uint32_t(row)), 21), ExpectedRgbRow(row, 0, 6)) << IMODE << row;
        // A span from the middle of one block to the middle of the next.
        EXPECT_EQ(Head(loaded.Row(4, 2, 5), 12), ExpectedRgbRow(4, 2, 5)) << IMODE;
    }
}

// A row costs about its own bytes: the scratch buffer holds one block row, not a block.
TEST(LineReader, ScratchBufferHoldsOneRowOfABlock)
{
    NitfImagePlan plan = BlockedRgb('B');
    LoadedImage loaded(BuildImageFile(plan, JoinBlocks(BuildImageBlocks(plan, Ramp))));
    ASSERT_TRUE(loaded.Open());
    EXPECT_EQ(loaded.image.lineBuffer.size(), 3u * 4u);
}

TEST(LineReader, MaskedBlocksThatAreNotStoredComeOutAsZeros)
{
    for (char IMODE : {'B', 'P', 'S'}) {
        NitfImagePlan plan = BlockedRgb(IMODE);
        plan.IC = "NM";
        const std::vector<std::string> blocks = BuildImageBlocks(plan, Ramp);
        std::vector<bool> stored(blocks.size(), true);
        stored[1] = false; // block 1 (of band 0 in IMODE "S")
        LoadedImage loaded(BuildImageFile(plan, BuildMaskedData(blocks, stored, 8)));
        ASSERT_TRUE(loaded.Open()) << IMODE;
        EXPECT_TRUE(loaded.image.isMasked);
        std::vector<uint8_t> expected = ExpectedRgbRow(0, 0, 6);
        for (int32_t c = 4; c < 7; ++c)
            for (int32_t band = 0; band < (IMODE == 'S' ? 1 : 3); ++band)
                expected[size_t(c * 3 + band)] = 0;
        EXPECT_EQ(Head(loaded.Row(0), 21), expected) << IMODE;
        EXPECT_EQ(Head(loaded.Row(4), 21), ExpectedRgbRow(4, 0, 6)) << IMODE;
    }
}

// Block records may make blocks overlap: block 1 starts at row 32 of block 0,
// so its first strip starts where block 0's short last strip does, and must
// not be served from that strip's slot.
TEST(LineReader, OverlappingMaskedBlocksEachGiveTheirOwnRows)
{
    NitfImagePlan plan;
    plan.rows = 80;
    plan.columns = 4;
    plan.IC = "NM";
    plan.NBPC = 2;
    plan.NPPBH = 4;
    plan.NPPBV = 40;
    std::string data(288, '\0');
    for (size_t i = 0; i < data.size(); ++i)
        data[i] = char(i * 7);
    LoadedImage loaded(BuildImageFile(plan, BuildMaskTable({0, 128}) + data));
    ASSERT_TRUE(loaded.Open());
    for (uint32_t row = 0; row < 80; ++row) {
        const std::string expected = data.substr((row < 40 ? row : row - 8) * 4, 4);
        EXPECT_EQ(Head(loaded.Row(row), 4), std::vector<uint8_t>(expected.begin(), expected.end())) << row;
    }
}

TEST(LineReader, WideMonochromeKeepsTheTopSignificantBits)
{
    NitfImagePlan plan;
    plan.columns = 3;
    plan.NBPP = 16;
    plan.ABPP = 11;
    const uint64_t values[] = {0x07FF, 0x0400, 0x0008};
    auto pixel = [&](int32_t, int32_t, int32_t column) { return values[column]; };
    LoadedImage right(BuildImageFile(plan, JoinBlocks(BuildImageBlocks(plan, pixel))));
    ASSERT_TRUE(right.Open());
    EXPECT_EQ(Head(right.Row(0), 3), (std::vector<uint8_t>{0xFF, 0x80, 0x01}));

    plan.PJUST = 'L'; // the significant bits stand at the top of the pixel
    LoadedImage left(BuildImageFile(plan, JoinBlocks(BuildImageBlocks(plan, pixel))));
    ASSERT_TRUE(left.Open());
    EXPECT_EQ(Head(left.Row(0), 3), (std::vector<uint8_t>{0x07, 0x04, 0x00}));

    plan.PJUST = 'R';
    plan.NBPP = 32;
    plan.ABPP = 20; // more than 8 bits below the two top bytes
    const uint64_t wide[] = {0xFFFFF, 0x80000, 0x00FFF};
    auto widePixel = [&](int32_t, int32_t, int32_t column) { return wide[column]; };
    LoadedImage bits20(BuildImageFile(plan, JoinBlocks(BuildImageBlocks(plan, widePixel))));
    ASSERT_TRUE(bits20.Open());
    EXPECT_EQ(Head(bits20.Row(0), 3), (std::vector<uint8_t>{0xFF, 0x80, 0x00}));
}

TEST(LineReader, Palettes)
{
    NitfImagePlan plan;
    plan.IREP = "RGB/LUT";
    plan.bands = {NitfBandPlan{"LU", 3, 200, RgbLookupTables(200)}};
    LoadedImage lut(BuildImageFile(plan, "\x05"));
    ASSERT_TRUE(lut.Open());
    EXPECT_EQ(lut.image.GetPaletteSize(), 200);
    uint8_t red = 0, green = 0, blue = 0;
    ASSERT_TRUE(lut.image.GetPaletteEntry(199, red, green, blue));
    EXPECT_EQ(std::vector<uint8_t>({red, green, blue}), std::vector<uint8_t>({199, 56, 99}));
    EXPECT_FALSE(lut.image.GetPaletteEntry(200, red, green, blue)); // past the lookup data
    EXPECT_FALSE(lut.image.GetPaletteEntry(-1, red, green, blue));

    NitfImagePlan mono; // no table: the grey ramp; 256 entries whatever NELUT says
    mono.NBPP = 16;
    LoadedImage grey(BuildImageFile(mono, std::string(2, '\0')));
    ASSERT_TRUE(grey.Open());
    EXPECT_TRUE(grey.image.IsPaletted());
    EXPECT_EQ(grey.image.GetPaletteSize(), 256);
    ASSERT_TRUE(grey.image.GetPaletteEntry(77, red, green, blue));
    EXPECT_EQ(std::vector<uint8_t>({red, green, blue}), std::vector<uint8_t>({77, 77, 77}));

    mono.NBPP = 8;
    mono.bands = {NitfBandPlan{"LU", 1, 10, "0123456789"}};
    LoadedImage shortTable(BuildImageFile(mono, std::string(1, '\0')));
    ASSERT_TRUE(shortTable.Open());
    EXPECT_EQ(shortTable.image.GetPaletteSize(), 256);
    ASSERT_TRUE(shortTable.image.GetPaletteEntry(9, red, green, blue));
    EXPECT_EQ(red, '9');
    EXPECT_FALSE(shortTable.image.GetPaletteEntry(10, red, green, blue));
}

TEST(LineReader, RefusesRowsAndSpansOutsideTheImage)
{
    const NitfImagePlan plan = BlockedRgb('P');
    LoadedImage loaded(BuildImageFile(plan, JoinBlocks(BuildImageBlocks(plan, Ramp))));
    ASSERT_TRUE(loaded.Open());
    std::vector<uint8_t> out(64, 0xEE);
    EXPECT_FALSE(loaded.image.ReadLine(loaded.reader, 5, 0, 6, out.data()));
    EXPECT_FALSE(loaded.image.ReadLine(loaded.reader, 0, 0, 7, out.data()));
    EXPECT_FALSE(loaded.image.ReadLine(loaded.reader, 0, -1, 3, out.data()));
    EXPECT_FALSE(loaded.image.ReadLine(loaded.reader, 0, 4, 3, out.data()));
    EXPECT_EQ(out, std::vector<uint8_t>(64, 0xEE));
}

// Layouts the reader cannot address safely are refused when the data is prepared.
TEST(LineReader, RefusesGeometriesThatDoNotFitTheFile)
{
    const NitfImagePlan good = BlockedRgb('B');
    const std::string data = JoinBlocks(BuildImageBlocks(good, Ramp));
    auto prepares = [&](const NitfImagePlan& plan, const std::string& bytes) {
        LoadedImage loaded(BuildImageFile(plan, bytes));
        return loaded.Parse() && loaded.image.PrepareData(loaded.reader, uint32_t(bytes.size()));
    };
    EXPECT_TRUE(prepares(good, data));
    EXPECT_FALSE(prepares(good, data.substr(0, data.size() - 1))); // short final block

    NitfImagePlan plan = good;
    plan.NPPBH = 0; // a block width of 0 with two blocks per row
    EXPECT_FALSE(prepares(plan, data));
    plan = good;
    plan.NBPR = 9999; // block counts far beyond the file
    plan.NBPC = 9999;
    EXPECT_FALSE(prepares(plan, data));
    plan = good;
    plan.NBPR = 1; // blocks that do not cover the image
    EXPECT_FALSE(prepares(plan, data));
    plan = good;
    plan.IMODE = 'X';
    EXPECT_FALSE(prepares(plan, data));
    plan = good;
    plan.PVTYPE = "R";
    plan.IREP = "MONO";
    plan.NBPP = 32;
    plan.bands.resize(1);
    EXPECT_FALSE(prepares(plan, std::string(7 * 5 * 4, '\0'))); // floating point

    plan = good; // a mask table with more records than the file holds
    plan.IC = "NM";
    plan.NBPR = 999;
    plan.NBPC = 999;
    LoadedImage masked(BuildImageFile(plan, BuildMaskedData(BuildImageBlocks(good, Ramp), {true, true, true, true})));
    EXPECT_FALSE(masked.Parse());
}

// A compressed image is served only when the decoder's rows (one byte per
// pixel, or three for NBPP x NBANDS 24) are what the host reads by the pixel
// kind: one palette index, or R,G,B. An 8 x 8 frame fills a 16 x 16 "I1"
// image (each pixel twice across and down; JpegDecode tests the pixels), but
// no "C3" block.
TEST(LineReader, CompressedImagesServeOnlyRowsTheirDecoderFills)
{
    const std::vector<uint8_t> strip = EncodeT4Strip(std::vector<uint8_t>(2 * 16, 0), 16, 16, false);
    const Bytes whole = BuildNitfJpegData({EncodeJpegBlock(TestPattern(16, 16, 1, 1), {})}, {});
    const Bytes small = BuildNitfJpegData({EncodeJpegBlock(TestPattern(8, 8, 1, 2), JpegBlockPlan {8, 8})}, {});
    struct Case { const char* IC; const char* IREP; size_t bands; const Bytes& jpeg; bool served, drawn; };
    for (const Case& c : {Case{"C1", "MONO", 1, whole, true, true}, Case{"C1", "2IMO", 1, whole, false, false},
                          Case{"C3", "MONO", 1, whole, true, true}, Case{"C3", "NODISPLY", 1, whole, false, false},
                          Case{"C3", "MONO", 3, whole, false, false}, Case{"C3", "MONO", 1, small, true, false},
                          Case{"I1", "MONO", 1, small, true, true}}) {
        const bool biLevel = std::string(c.IC) == "C1";
        NitfImagePlan plan;
        plan.rows = plan.columns = 16;
        plan.IC = c.IC;
        plan.COMRAT = biLevel ? "1D  " : "00.0";
        plan.IREP = c.IREP;
        plan.NBPP = biLevel ? 1 : 8;
        plan.bands.resize(c.bands);
        LoadedImage loaded(BuildImageFile(plan, biLevel ? std::string(strip.begin(), strip.end())
                                                        : std::string(c.jpeg.begin(), c.jpeg.end())));
        const std::string what = std::string(c.IC) + " " + c.IREP + " " + std::to_string(c.bands);
        ASSERT_EQ(loaded.Open(), c.served) << what;
        EXPECT_EQ(loaded.Row(15).empty(), !c.drawn) << what;
    }
}

TEST(LineReader, CompressedKindsWithoutDecodableDataFailTheirRows)
{
    NitfImagePlan plan;
    plan.IC = "C4";
    plan.COMRAT = "    ";
    plan.IREP = "RGB/LUT";
    plan.bands = {NitfBandPlan{"LU", 3, 2, RgbLookupTables(2)}};
    LoadedImage vq(BuildImageFile(plan, std::string(16, '\0')));
    ASSERT_TRUE(vq.Open()); // served, as the file declares it, but no row decodes
    EXPECT_TRUE(vq.Row(0).empty());
}

// JPEG block streams as encoders write them, found by walking their marker
// segments: 2 x 2 blocks of 16 x 16 that must draw as libjpeg decodes each.
TEST(LineReader, JpegBlockStreamsAsEncodersWriteThem)
{
    constexpr uint32_t kSide = 16;
    struct Layout {
        const char* name;
        bool progressive, restarts, thumbnail, fill, masked;
    };
    const Layout layouts[] = {{"APP1 holding FF D9, past the 32 KiB read", false, false, true, false, false},
                              {"fill bytes before SOI", false, false, false, true, false},
                              {"progressive", true, false, false, false, false},
                              {"RSTn within the scan", false, true, false, false, false},
                              {"M3, padded, offsets out of order", false, false, false, false, true}};
    // An APP1 segment of 40000 bytes, an embedded thumbnail's SOI and EOI at its ends.
    Bytes app1 = {0xFF, 0xE1, 40002 >> 8, 40002 & 0xFF, 0xFF, 0xD8};
    app1.resize(app1.size() + 40000 - 4, 'x');
    app1.insert(app1.end(), {0xFF, 0xD9});
    for (const Layout& layout : layouts) {
        std::vector<std::string> streams;
        std::vector<Bytes> decoded;
        for (unsigned b = 0; b < 4; ++b) {
            JpegBlockPlan block;
            block.progressive = layout.progressive;
            block.restartRows = layout.restarts ? 1 : 0;
            Bytes stream = EncodeJpegBlock(TestPattern(kSide, kSide, 1, b), block);
            if (layout.thumbnail && b == 0)
                stream.insert(stream.begin() + 2, app1.begin(), app1.end());
            decoded.push_back(DecodeJpegBlock(stream, 1));
            const Bytes nitf = BuildNitfJpegData({stream}, NitfApp6Plan{2, 2, 0, 0});
            streams.emplace_back((layout.fill ? "\xFF\xFF\xFF" : "") + std::string(nitf.begin(), nitf.end()));
        }
        NitfImagePlan plan;
        plan.rows = plan.columns = 2 * kSide;
        plan.NBPR = plan.NBPC = 2;
        plan.NPPBH = plan.NPPBV = kSide;
        plan.IC = layout.masked ? "M3" : "C3";
        plan.COMRAT = "00.0";
        std::string data = JoinBlocks(streams);
        if (layout.masked) { // blocks 3, 0, 1 in this order, padding before each; block 2 not stored
            std::vector<uint32_t> records(4, 0xFFFFFFFF);
            data.clear();
            for (unsigned b : {3, 0, 1}) {
                data += std::string("\0\xFF\xD9\xFF", 4);
                records[b] = uint32_t(data.size());
                data += streams[b];
            }
            decoded[2].assign(kSide * kSide, 0);
            std::vector<uint32_t> sharing = records; // two blocks that share one stream are refused
            sharing[0] = sharing[1];
            LoadedImage shared(BuildImageFile(plan, BuildMaskTable(sharing) + data));
            EXPECT_TRUE(shared.Open() && shared.Row(0).empty());
            data = BuildMaskTable(records) + data;
        }
        LoadedImage loaded(BuildImageFile(plan, data));
        const bool opened = loaded.Open();
        Bytes ours, expected;
        for (uint32_t row = 0; opened && row < 2 * kSide; ++row) {
            const Bytes drawn = Head(loaded.Row(row), 2 * kSide);
            ours.insert(ours.end(), drawn.begin(), drawn.end());
            for (uint32_t column = 0; column < 2; ++column) {
                const auto line = decoded[row / kSide * 2 + column].begin() + row % kSide * kSide;
                expected.insert(expected.end(), line, line + kSide);
            }
        }
        EXPECT_TRUE(!ours.empty() && ours == expected) << layout.name;
    }
}

} // namespace
