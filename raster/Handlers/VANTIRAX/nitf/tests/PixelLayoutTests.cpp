// Pixel layouts drawn as 8-bit rows: NSIF files, MULTI bands, wide RGB,
// packed 12-bit and 1-bit pixels. GDAL's decoding of each file, reduced to
// the top 8 of ABPP bits (1-bit values stay palette indices), is the judge.
#include "nitf/tests/NitfTestFile.h"
#include "tests/fixtures/Corpus.h"
#include "tests/fixtures/NitfImageWriter.h"

#include <gtest/gtest.h>

#include <array>
#include <cstdio>
#include <sstream>

namespace {

using Colours = std::vector<std::array<int, 3>>;

// The colour table gdalinfo lists for a band (1 is the first); empty without one.
Colours GdalColourTable(const std::string& path, int32_t band)
{
    const std::string info = RunCommand("gdalinfo '" + path + "'");
    const size_t at = info.find("Band " + std::to_string(band) + " "), table = info.find("Color Table", at);
    if (at == std::string::npos || table == std::string::npos || table > info.find("Band ", at + 1))
        return {};
    std::istringstream lines(info.substr(info.find('\n', table) + 1));
    Colours colours;
    int index = 0, red = 0, green = 0, blue = 0;
    for (std::string line; std::getline(lines, line) &&
                           std::sscanf(line.c_str(), " %d: %d,%d,%d", &index, &red, &green, &blue) == 4;)
        colours.push_back({red, green, blue});
    return colours;
}

// Every row and the palette of the opened image against GDAL's decoding of gdalPath.
void ExpectDrawnAsGdal(LoadedImage& loaded, const std::string& gdalPath)
{
    const CNitfImage& image = loaded.image;
    const std::vector<uint32_t> gdal = GdalSamples(gdalPath, image.NBPP > 8 ? 2 : 1);
    const size_t width = size_t(image.NCOLS), plane = width * size_t(image.NROWS), drawn = image.HostPixelBytes();
    ASSERT_EQ(gdal.size(), plane * size_t(image.NBANDS));
    const int32_t significant = image.ABPP >= 1 && image.ABPP <= image.NBPP && image.PJUST() != 'L' ? image.ABPP
                                                                                                      : image.NBPP;
    for (int32_t row = 0; row < image.NROWS; ++row) {
        std::vector<uint8_t> expected;
        for (size_t column = 0; column < width; ++column)
            for (size_t k = 0; k < drawn; ++k) {
                const uint32_t value = gdal[size_t(image.drawnBands[k]) * plane + size_t(row) * width + column];
                expected.push_back(image.NBPP == 1      ? uint8_t(value)
                                   : significant >= 8 ? uint8_t(value >> (significant - 8))
                                                      : uint8_t(value << (8 - significant)));
            }
        ASSERT_EQ(loaded.Row(uint32_t(row)), expected) << "row " << row;
    }
    const Colours table = GdalColourTable(gdalPath, image.drawnBands[0] + 1);
    EXPECT_EQ(image.IsPaletted() && !table.empty() ? image.GetPaletteSize() : 0, int32_t(table.size()));
    bool grey = true;
    for (size_t i = 0; i < table.size(); ++i) {
        uint8_t red = 0, green = 0, blue = 0;
        EXPECT_TRUE(image.GetPaletteEntry(int32_t(i), red, green, blue));
        EXPECT_EQ((std::array<int, 3>{red, green, blue}), table[i]) << "entry " << i;
        grey = grey && table[i][0] == table[i][1] && table[i][1] == table[i][2];
    }
    EXPECT_EQ(image.ColourPalette(), !grey);
}

// Blocks of NBPP 1 or 12: each band's block bit after bit, most significant
// first, padded to a byte; a 12-bit value's nibbles stored low byte first.
std::vector<std::string> PackedBlocks(const NitfImagePlan& plan, const PixelValue& pixel)
{
    NitfImagePlan wide = plan;
    wide.NBPP = 16;
    const size_t plane = size_t(plan.NPPBH ? plan.NPPBH : plan.columns) * size_t(plan.NPPBV ? plan.NPPBV : plan.rows);
    std::vector<std::string> blocks = BuildImageBlocks(wide, [&](int32_t band, int32_t row, int32_t column) {
        const uint64_t value = pixel(band, row, column);
        return plan.NBPP == 12 ? (value & 0xFF) << 4 | value >> 8 : value;
    });
    for (std::string& block : blocks) {
        std::string packed, bits;
        for (size_t at = 0; at < block.size(); at += 2 * plane, bits.clear()) {
            for (size_t i = at; i < at + 2 * plane; i += 2)
                for (int32_t bit = plan.NBPP - 1; bit >= 0; --bit)
                    bits += char('0' + ((uint8_t(block[i]) << 8 | uint8_t(block[i + 1])) >> bit & 1));
            bits.resize((bits.size() + 7) / 8 * 8, '0');
            for (size_t i = 0; i < bits.size(); i += 8)
                packed += char(std::stoi(bits.substr(i, 8), nullptr, 2));
        }
        block = packed;
    }
    return blocks;
}

NitfImagePlan Plan(const char* IREP, int32_t NBPP, std::vector<NitfBandPlan> bands, char IMODE = 'B')
{
    NitfImagePlan plan;
    plan.rows = 5;
    plan.columns = 7;
    // 2 x 2 blocks of 5 x 3 pixels with padded edges; GDAL reads 12-bit blocks
    // of an even pixel count only, and 1-bit images of one block.
    plan.NBPR = plan.NBPC = NBPP == 1 ? 1 : 2;
    plan.NPPBH = NBPP == 1 ? 0 : NBPP == 12 ? 4 : 5;
    plan.NPPBV = NBPP == 1 ? 0 : 3;
    plan.IREP = IREP;
    plan.NBPP = NBPP;
    plan.bands = std::move(bands);
    plan.IMODE = IMODE;
    return plan;
}

TEST(PixelLayout, WrittenLayoutsDrawAsGdalDecodesThem)
{
    VX_SKIP_WITHOUT_GDAL();
    const NitfBandPlan plain{"", 0, 0, ""}, red{"R", 0, 0, ""}, green{"G", 0, 0, ""}, blue{"B", 0, 0, ""};
    struct Case {
        const char* what;
        NitfImagePlan plan;
        const char* FHDR;
    };
    Case cases[] = {
        {"NSIF MONO", Plan("MONO", 8, {plain}), "NSIF01.00"},
        {"MULTI B,x,G,R in IMODE P: R, G, B", Plan("MULTI", 8, {blue, plain, green, red}, 'P'), "NITF02.10"},
        {"MULTI B,x,G,R in IMODE S", Plan("MULTI", 8, {blue, plain, green, red}, 'S'), "NITF02.10"},
        {"MULTI without R: the first band", Plan("MULTI", 8, {plain, red, green}, 'R'), "NITF02.10"},
        {"MONO of R,G,B bands", Plan("MONO", 16, {red, green, blue}), "NITF02.00"},
        {"RGB 16-bit ABPP 11", Plan("RGB", 16, {red, green, blue}, 'P'), "NITF02.10"},
        {"RGB 16-bit ABPP 6", Plan("RGB", 16, {red, green, blue}, 'R'), "NITF02.10"},
        {"MONO 12-bit", Plan("MONO", 12, {plain}), "NITF02.10"},
        {"MULTI 12-bit R,G,B in IMODE S", Plan("MULTI", 12, {green, red, blue}, 'S'), "NITF02.10"},
        {"MONO 1-bit", Plan("MONO", 1, {plain}), "NITF02.10"},
        {"MONO 1-bit, one table", Plan("MONO", 1, {{"", 1, 2, "\x30\xC0"}}), "NITF02.10"},
        {"RGB/LUT 1-bit", Plan("RGB/LUT", 1, {{"LU", 3, 2, RgbLookupTables(2)}}), "NITF02.10"},
        {"MULTI 1-bit: band 1 through its tables", Plan("MULTI", 1, {{"", 3, 2, RgbLookupTables(2)}, plain}),
         "NITF02.10"},
        {"MULTI 1-bit in IMODE S", Plan("MULTI", 1, {plain, plain}, 'S'), "NITF02.10"},
    };
    cases[5].plan.ABPP = 11; // values above 2^ABPP keep their bits below the top ABPP
    cases[6].plan.ABPP = 6;
    cases[8].plan.ABPP = 10;
    TempDirectory dir;
    for (Case& c : cases) {
        SCOPED_TRACE(c.what);
        NitfImagePlan& plan = c.plan;
        plan.version21 = std::string(c.FHDR) != "NITF02.00";
        const uint64_t limit = plan.NBPP == 1 ? 2 : uint64_t(1) << plan.NBPP;
        const PixelValue pixel = [&](int32_t band, int32_t row, int32_t column) {
            return uint64_t(band * 1000 + row * 7 + column * 3) * 4099 % limit;
        };
        std::string bytes = BuildImageFile(
            plan, JoinBlocks(plan.NBPP % 8 ? PackedBlocks(plan, pixel) : BuildImageBlocks(plan, pixel)));
        bytes.replace(0, 9, c.FHDR);
        const std::string path = dir / "image.ntf";
        WriteFile(path, bytes);
        LoadedImage loaded(path.c_str());
        ASSERT_TRUE(loaded.Open());
        ExpectDrawnAsGdal(loaded, path);
    }
}

TEST(PixelLayout, RefusedLayouts)
{
    const NitfBandPlan plain{"", 0, 0, ""}, red{"R", 0, 0, ""}, green{"G", 0, 0, ""}, blue{"B", 0, 0, ""};
    for (const NitfImagePlan& plan : {Plan("MULTI", 1, {red, green, blue}), Plan("RGB", 1, {red, green, blue}),
                                      Plan("MONO", 12, {plain, plain}, 'P'), Plan("MONO", 12, {plain, plain}, 'R'),
                                      Plan("RGB/LUT", 12, {{"LU", 3, 2, RgbLookupTables(2)}})}) {
        const std::string data = JoinBlocks(PackedBlocks(plan, Ramp));
        LoadedImage loaded(BuildImageFile(plan, data));
        EXPECT_TRUE(loaded.Parse());
        EXPECT_FALSE(loaded.image.PrepareData(loaded.reader, data.size())) << plan.IREP << plan.NBPP;
    }
    const NitfImagePlan packed = Plan("MONO", 12, {plain});
    const std::string data = JoinBlocks(PackedBlocks(packed, Ramp));
    EXPECT_TRUE(LoadedImage(BuildImageFile(packed, data)).Open());
    EXPECT_FALSE(LoadedImage(BuildImageFile(packed, data.substr(1))).Open()); // the last block one byte short
}

TEST(PixelLayout, CorpusFilesDrawAsGdalDecodesThem)
{
    VX_SKIP_WITHOUT_CORPUS();
    VX_SKIP_WITHOUT_GDAL();
    for (const char* name : {"jitc-nitf21/i_3034c.ntf", "jitc-nitf21/i_3034f.ntf", "jitc-nitf21/ns3034d.nsf",
                             "other/LUinBand2.ntf", "jitc-nitf21/i_3430a.ntf", "other/merlionRGB.ntf",
                             "other/merlionUnblocked.ntf", "other/rgb16.ntf", "other/fake_nsif.ntf",
                             "jitc-nitf21/ns3361c.nsf", "jitc-nitf21/ns3301j.nsf"}) {
        SCOPED_TRACE(name);
        LoadedImage loaded(CorpusPath(name).c_str());
        ASSERT_TRUE(loaded.Open());
        ExpectDrawnAsGdal(loaded, CorpusPath(name));
    }
    // rgb16.ntf with other ABPP and PJUST, FL kept: GDAL reads the samples as they stand.
    const std::string rgb16 = ReadWholeFile(CorpusPath("other/rgb16.ntf"));
    for (const char* field : {"11R", "06R", "11L"}) {
        SCOPED_TRACE(field);
        std::string bytes = rgb16;
        bytes.replace(size_t(std::stoi(rgb16.substr(354, 6))) + 368, 3, field); // HL + the position of ABPP
        LoadedImage loaded(bytes);
        ASSERT_TRUE(loaded.Open());
        ExpectDrawnAsGdal(loaded, CorpusPath("other/rgb16.ntf"));
    }
    // Floating point, 12-bit JPEG and 12-bit lossless JPEG stay refused.
    for (const char* name : {"jitc-nitf21/i_3450c.ntf", "jitc-nitf21/ns5600a.nsf", "jitc-nitf21/ns3417c.nsf",
                             "jitc-nitf21/ns3437a.nsf"})
        EXPECT_FALSE(LoadedImage(CorpusPath(name).c_str()).Open()) << name;
}

} // namespace
