// Image subheaders and pixel data of the fixture writer in every layout the
// reader serves, drawn row by row against the values written; and the
// subheaders, rows, spans and layouts it must refuse.
#include "nitf/tests/NitfTestFile.h"
#include "tests/fixtures/BiLevelWriter.h"
#include "tests/fixtures/JpegBlockWriter.h"
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

TEST(Image, EveryLayoutDrawsThePixelsWritten)
{
    struct Case {
        std::string what;
        NitfImagePlan plan; // IC "NM": the mask table leaves out block 1 (of band 0 in IMODE "S")
        bool fileDowngradeEvent;
    };
    std::vector<Case> cases;
    // The band stride of IMODE "S" is a whole band of padded blocks, not NROWS x NCOLS.
    for (char IMODE : {'B', 'P', 'R', 'S'}) {
        cases.push_back({std::string("IMODE ") + IMODE, BlockedRgb(IMODE), false});
        cases.push_back({std::string("masked IMODE ") + IMODE, BlockedRgb(IMODE), false});
        cases.back().plan.IC = "NM";
    }
    NitfImagePlan mono;
    mono.rows = 3;
    mono.columns = 4;
    mono.IGEOLO = std::string(60, '1');
    for (bool version21 : {true, false})
        for (bool subheaderEvent : {false, true})
            for (char ICORDS : {' ', 'N'}) {
                NitfImagePlan plan = mono;
                plan.version21 = version21;
                plan.downgradeEvent = subheaderEvent && !version21;
                plan.ICORDS = ICORDS;
                plan.comments.assign(subheaderEvent ? 2 : 0, "comment");
                plan.padding = subheaderEvent ? "PAD" : ""; // bytes after the last field, counted in LISH
                plan.UDID = plan.IXSHD = subheaderEvent ? "extension data" : "";
                const std::string what = std::string(version21 ? "NITF 2.1" : "NITF 2.0") +
                                         (subheaderEvent ? " with ISDEVT" : "") + " ICORDS '" + ICORDS + "'";
                cases.push_back({what, plan, !version21 && ICORDS == 'N'});
            }
    for (const Case& c : cases) {
        const NitfImagePlan& plan = c.plan;
        const std::vector<std::string> blocks = BuildImageBlocks(plan, Ramp);
        std::vector<bool> stored(blocks.size(), true);
        stored[1 % blocks.size()] = plan.IC != "NM";
        const std::string data = plan.IC == "NM" ? BuildMaskedData(blocks, stored, 8) : JoinBlocks(blocks);
        LoadedImage loaded(BuildImageFile(plan, data, c.fileDowngradeEvent));
        ASSERT_TRUE(loaded.Open()) << c.what;
        EXPECT_EQ(loaded.image.isMasked, plan.IC == "NM") << c.what;
        EXPECT_EQ(loaded.header.fixedLayout, c.fileDowngradeEvent ? 0 : 1) << c.what;
        // "N" means no corners in NITF 2.0: no IGEOLO follows.
        EXPECT_EQ(loaded.image.IGEOLO != nullptr, plan.ICORDS == 'N' && plan.version21) << c.what;
        // IMDATOFF: the mask table's 10-byte header, the 8-bit pad pixel code and a record per block.
        const uint32_t maskTable = plan.IC == "NM" ? uint32_t(10 + 1 + 4 * blocks.size()) : 0;
        const uint32_t subheaderEnd = loaded.header.HL + loaded.header.imageSegments[0].subheaderLength;
        EXPECT_EQ(loaded.image.dataOffset, subheaderEnd + maskTable) << c.what;
        const int32_t bands = int32_t(plan.bands.size());
        const int32_t blockWidth = plan.NPPBH ? plan.NPPBH : plan.columns;
        const int32_t blockHeight = plan.NPPBV ? plan.NPPBV : plan.rows;
        for (int32_t row = 0; row < plan.rows; ++row) {
            std::vector<uint8_t> expected;
            for (int32_t column = 0; column < plan.columns; ++column)
                for (int32_t band = 0; band < bands; ++band) {
                    const size_t block = size_t(row / blockHeight * plan.NBPR + column / blockWidth +
                                                (plan.IMODE == 'S' ? band * plan.NBPR * plan.NBPC : 0));
                    expected.push_back(stored[block] ? uint8_t(Ramp(band, row, column)) : 0);
                }
            EXPECT_EQ(loaded.Row(uint32_t(row)), expected) << c.what << " row " << row;
            // A span from the middle of one block into the next.
            EXPECT_EQ(loaded.Row(uint32_t(row), 2, plan.columns - 2),
                      std::vector<uint8_t>(expected.begin() + 2 * bands, expected.end() - bands))
                << c.what << " row " << row;
        }
    }
}

TEST(Image, WideMonochromeKeepsTheTopSignificantBits)
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
        const PixelValue pixel = [&](int32_t, int32_t, int32_t column) { return c.pixels[size_t(column)]; };
        LoadedImage loaded(BuildImageFile(plan, JoinBlocks(BuildImageBlocks(plan, pixel))));
        ASSERT_TRUE(loaded.Open());
        EXPECT_EQ(loaded.Row(0), c.row) << c.NBPP << c.PJUST;
    }
}

TEST(Image, PaletteOfTheLookupTableOrAGreyRamp)
{
    struct Case {
        std::string IREP;
        int32_t NBPP;
        NitfBandPlan band;
        int32_t size, index;         // palette entries, the last entry read
        std::vector<uint8_t> colour; // its colour
    };
    for (const Case& c : {Case{"rgb/lut", 8, {"LU", 3, 200, RgbLookupTables(200)}, 200, 199, {199, 56, 99}},
                          {"MONO", 16, {"", 0, 0, ""}, 256, 77, {77, 77, 77}}, // no table, any NBPP: the grey ramp
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

TEST(Image, RefusesWhatTheFileCannotBackAndWhatIsNotServed)
{
    NitfImagePlan extended;
    extended.extendedBandCount = true;
    std::string bytes = BuildImageFile(extended, "x");
    bytes.replace(bytes.find("NC000001"), 8, "NC099999"); // NBANDS "0", XBANDS 99999
    EXPECT_FALSE(LoadedImage(bytes).Parse());
    extended.version21 = false; // NBANDS "0" in NITF 2.0, which has no XBANDS
    EXPECT_FALSE(LoadedImage(BuildImageFile(extended, "x")).Parse());
    NitfImagePlan lut;
    lut.IREP = "RGB/LUT";
    lut.bands = {NitfBandPlan{"LU", 3, 4, RgbLookupTables(4)}};
    bytes = BuildImageFile(lut, "x");
    bytes.replace(bytes.find("300004"), 6, "399999"); // a lookup table longer than the rest of the file
    EXPECT_FALSE(LoadedImage(bytes).Parse());
    bytes = BuildImageFile(NitfImagePlan{}, "x");
    EXPECT_FALSE(LoadedImage(bytes.substr(0, bytes.size() - 200)).Parse()); // cut in the subheader

    // Compression: C8 is refused, C2 parses but is not served, C4 outside a frame serves no row.
    NitfImagePlan compressed;
    compressed.IC = "C5";
    LoadedImage lossless(BuildImageFile(compressed, "x"));
    ASSERT_TRUE(lossless.Parse());
    EXPECT_EQ(lossless.image.compressionKind, kLosslessJpeg);
    compressed.IC = "C8";
    EXPECT_FALSE(LoadedImage(BuildImageFile(compressed, "x")).Parse());
    compressed.IC = "C2";
    LoadedImage arithmetic(BuildImageFile(compressed, "x"));
    ASSERT_TRUE(arithmetic.Parse());
    EXPECT_EQ(arithmetic.image.compressionKind, kArithmeticDpcm);
    EXPECT_FALSE(arithmetic.image.PrepareData(arithmetic.reader, 1));
    compressed.IC = "C4";
    compressed.IREP = "RGB/LUT";
    compressed.bands = lut.bands;
    LoadedImage unframed(BuildImageFile(compressed, std::string(16, '\0')));
    ASSERT_TRUE(unframed.Open());
    EXPECT_TRUE(unframed.Row(0).empty());

    LoadedImage loaded(BuildImageFile(BlockedRgb('P'), JoinBlocks(BuildImageBlocks(BlockedRgb('P'), Ramp))));
    ASSERT_TRUE(loaded.Open());
    std::vector<uint8_t> out(64, 0xEE);
    for (const auto& [row, first, last] : {std::tuple{5, 0, 6}, {0, 0, 7}, {0, -1, 3}, {0, 4, 3}})
        EXPECT_FALSE(loaded.image.ReadLine(loaded.reader, uint32_t(row), first, last, out.data()))
            << row << " " << first << ".." << last;
    EXPECT_EQ(out, std::vector<uint8_t>(64, 0xEE));

    // Layouts the reader cannot address safely are refused when the data is prepared.
    const NitfImagePlan good = BlockedRgb('B');
    const std::vector<std::string> blocks = BuildImageBlocks(good, Ramp);
    const std::string data = JoinBlocks(blocks);
    struct Layout {
        const char* what;
        void (*change)(NitfImagePlan&);
        std::string data;
        bool prepares;
    };
    for (const Layout& c : std::vector<Layout>{
             {"as written", [](NitfImagePlan&) {}, data, true},
             {"short final block", [](NitfImagePlan&) {}, data.substr(0, data.size() - 1), false},
             {"0 wide, two blocks a row", [](NitfImagePlan& p) { p.NPPBH = 0; }, data, false},
             {"9999 x 9999 blocks", [](NitfImagePlan& p) { p.NBPR = p.NBPC = 9999; }, data, false},
             {"blocks not covering the image", [](NitfImagePlan& p) { p.NBPR = 1; }, data, false},
             {"IMODE X", [](NitfImagePlan& p) { p.IMODE = 'X'; }, data, false},
             {"floating point",
              [](NitfImagePlan& p) {
                  p.PVTYPE = "R";
                  p.IREP = "MONO";
                  p.NBPP = 32;
                  p.bands.resize(1);
              },
              std::string(7 * 5 * 4, '\0'), false},
             {"a mask table of more records than the file holds",
              [](NitfImagePlan& p) {
                  p.IC = "NM";
                  p.NBPR = p.NBPC = 999;
              },
              BuildMaskedData(blocks, {true, true, true, true}), false}}) {
        NitfImagePlan plan = good;
        c.change(plan);
        LoadedImage image(BuildImageFile(plan, c.data));
        EXPECT_EQ(image.Parse() && image.image.PrepareData(image.reader, uint32_t(c.data.size())), c.prepares)
            << c.what;
    }
}

// A compressed image is served only when the decoder's rows (one byte per pixel, or three for
// NBPP x NBANDS 24) are what the host reads by the pixel kind. An 8 x 8 frame fills a 16 x 16
// "I1" image (JpegDecode tests the pixels), but no "C3" block.
TEST(Image, CompressedImagesServeOnlyRowsTheirDecoderFills)
{
    const std::vector<uint8_t> strip = EncodeT4Strip(std::vector<uint8_t>(2 * 16, 0), 16, 16, false);
    const Bytes whole = BuildNitfJpegData({EncodeJpegBlock(TestPattern(16, 16, 1, 1), {})}, {});
    const Bytes small = BuildNitfJpegData({EncodeJpegBlock(TestPattern(8, 8, 1, 2), JpegBlockPlan{8, 8})}, {});
    struct Case { const char *IC, *IREP; size_t bands; const Bytes& jpeg; bool served, drawn; };
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

// JPEG block streams as encoders write them, found by walking their marker
// segments: 2 x 2 blocks of 16 x 16 that must draw as libjpeg decodes each.
TEST(Image, JpegBlockStreamsAsEncodersWriteThem)
{
    constexpr uint32_t kSide = 16;
    struct Layout { const char* what; bool progressive, restarts, thumbnail, fill, masked; };
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
        EXPECT_TRUE(!ours.empty() && ours == expected) << layout.what;
    }
}

} // namespace
// Block records may make blocks overlap: block 1 starts at row 32 of block 0,
// so its first strip starts where block 0's short last strip does, and must
// not be served from that strip's slot.
TEST(Image, OverlappingMaskedBlocksEachGiveTheirOwnRows)
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
