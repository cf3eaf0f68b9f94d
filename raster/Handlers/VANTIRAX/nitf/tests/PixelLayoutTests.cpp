// Pixel layouts drawn as 8-bit rows (NSIF, MULTI bands, wide RGB, packed 12-bit
// and 1-bit pixels), judged by GDAL's decoding of each file.
#include "nitf/tests/NitfTestFile.h"
#include "tests/fixtures/Corpus.h"
#include "tests/fixtures/NitfImageWriter.h"

#include <gtest/gtest.h>

#include <cstdio>

namespace {

// Rows against GDAL's samples of the bands shown, reduced to the top 8 of ABPP
// bits (1-bit ones stay palette indices); the palette against its colour table.
void ExpectDrawnAsGdal(LoadedImage& loaded, const std::string& path)
{
    const CNitfImage& image = loaded.image;
    const std::vector<uint32_t> gdal = GdalSamples(path, image.NBPP > 8 ? 2 : 1);
    const size_t width = size_t(image.NCOLS), plane = width * size_t(image.NROWS);
    ASSERT_EQ(gdal.size(), plane * size_t(image.NBANDS));
    const int32_t bits = image.ABPP >= 1 && image.ABPP <= image.NBPP && image.PJUST() != 'L' ? image.ABPP : image.NBPP;
    for (int32_t row = 0; row < image.NROWS; ++row) {
        std::vector<uint8_t> expected;
        for (size_t column = 0; column < width; ++column)
            for (uint32_t k = 0; k < image.HostPixelBytes(); ++k) {
                const uint32_t value = gdal[size_t(image.drawnBands[k]) * plane + size_t(row) * width + column];
                expected.push_back(
                    uint8_t(image.NBPP == 1 ? value : bits >= 8 ? value >> (bits - 8) : value << (8 - bits)));
            }
        ASSERT_EQ(loaded.Row(uint32_t(row)), expected) << "row " << row;
    }
    const std::string info = RunCommand("gdalinfo '" + path + "'"); // "  i: r,g,b,a" a colour
    const size_t band = info.find("Band " + std::to_string(image.drawnBands[0] + 1) + " "),
                 table = info.find("Color Table", band);
    int32_t entries = 0, index = 0, colour[3] = {};
    bool grey = true;
    for (size_t at = table < info.find("Band ", band + 1) ? info.find('\n', table) + 1 : std::string::npos;
         at < info.size() && std::sscanf(&info[at], " %d: %d,%d,%d", &index, &colour[0], &colour[1], &colour[2]) == 4;
         at = info.find('\n', at) + 1, ++entries) {
        uint8_t rgb[3] = {};
        EXPECT_TRUE(image.GetPaletteEntry(entries, rgb[0], rgb[1], rgb[2]));
        EXPECT_EQ(std::vector<int>(rgb, rgb + 3), std::vector<int>(colour, colour + 3)) << "entry " << entries;
        grey = grey && colour[0] == colour[1] && colour[1] == colour[2];
    }
    EXPECT_EQ(entries, entries == 0 ? 0 : image.GetPaletteSize());
    EXPECT_EQ(image.ColourPalette(), !grey);
}

// The writer's 16-bit blocks repacked to NBPP 1 or 12: each band's block bit
// after bit, padded to a byte; a 12-bit value's low byte first, then its high nibble.
std::vector<std::string> PackedBlocks(NitfImagePlan plan, const PixelValue& pixel)
{
    const int32_t bits = plan.NBPP;
    plan.NBPP = 16;
    const size_t plane = size_t(plan.NPPBH ? plan.NPPBH : plan.columns) * size_t(plan.NPPBV ? plan.NPPBV : plan.rows);
    std::vector<std::string> blocks = BuildImageBlocks(plan, [&](int32_t band, int32_t row, int32_t column) {
        const uint64_t value = pixel(band, row, column);
        return bits == 12 ? (value & 0xFF) << 4 | value >> 8 : value;
    });
    for (std::string& block : blocks) {
        std::string packed, stream;
        for (size_t i = 0; i < block.size(); i += 2) {
            for (int32_t bit = bits - 1; bit >= 0; --bit)
                stream += char('0' + ((uint8_t(block[i]) << 8 | uint8_t(block[i + 1])) >> bit & 1));
            if ((i + 2) % (2 * plane) == 0)
                for (stream.resize((stream.size() + 7) / 8 * 8, '0'); !stream.empty(); stream.erase(0, 8))
                    packed += char(std::stoi(stream.substr(0, 8), nullptr, 2));
        }
        block = packed;
    }
    return blocks;
}

// 7 x 5 in 2 x 2 blocks of 5 x 3 with padded edges; GDAL reads 12-bit blocks of
// an even pixel count only (4 x 3 here) and 1-bit images of one block.
NitfImagePlan Plan(const char* IREP, int32_t NBPP, std::vector<NitfBandPlan> bands, char IMODE = 'B', int32_t ABPP = 0)
{
    NitfImagePlan plan;
    plan.rows = 5;
    plan.columns = 7;
    plan.NBPR = plan.NBPC = NBPP == 1 ? 1 : 2;
    plan.NPPBH = NBPP == 1 ? 0 : NBPP == 12 ? 4 : 5;
    plan.NPPBV = NBPP == 1 ? 0 : 3;
    plan.IREP = IREP;
    plan.NBPP = NBPP;
    plan.ABPP = ABPP;
    plan.bands = std::move(bands);
    plan.IMODE = IMODE;
    return plan;
}

const NitfBandPlan plain{"", 0, 0, ""}, red{"R", 0, 0, ""}, green{"G", 0, 0, ""}, blue{"B", 0, 0, ""};
const NitfBandPlan rgbLut{"LU", 3, 2, RgbLookupTables(2)};

TEST(PixelLayout, WrittenLayoutsDrawAsGdalDecodesThem)
{
    VX_SKIP_WITHOUT_GDAL();
    const std::pair<const char*, NitfImagePlan> cases[] = {
        {"NSIF01.00", Plan("MONO", 8, {plain})},
        {"NITF02.10", Plan("MULTI", 8, {blue, plain, green, red}, 'P')}, // shown as R, G, B
        {"NITF02.10", Plan("MULTI", 8, {blue, plain, green, red}, 'S')},
        {"NITF02.10", Plan("MULTI", 8, {plain, red, green}, 'R')}, // no B: the first band
        {"NITF02.00", Plan("MONO", 16, {red, green, blue})},
        {"NITF02.10", Plan("RGB", 16, {red, green, blue}, 'P', 11)}, // values above 2^ABPP
        {"NITF02.10", Plan("RGB", 16, {red, green, blue}, 'R', 6)},
        {"NITF02.10", Plan("MONO", 12, {plain})},
        {"NITF02.10", Plan("MULTI", 12, {green, red, blue}, 'S', 10)},
        {"NITF02.10", Plan("MONO", 1, {plain})},
        {"NITF02.10", Plan("MONO", 1, {{"", 1, 2, "\x30\xC0"}})},
        {"NITF02.10", Plan("RGB/LUT", 1, {rgbLut})},
        {"NITF02.10", Plan("MULTI", 1, {{"", 3, 2, RgbLookupTables(2)}, plain})}, // colours of band 1's tables
        {"NITF02.10", Plan("MULTI", 1, {plain, plain}, 'S')},
    };
    TempDirectory dir;
    for (auto [FHDR, plan] : cases) {
        SCOPED_TRACE(plan.IREP + " " + std::to_string(plan.NBPP) + " " + plan.IMODE);
        plan.version21 = std::string(FHDR) != "NITF02.00";
        const PixelValue pixel = [&](int32_t band, int32_t row, int32_t column) {
            const uint64_t limit = plan.NBPP == 1 ? 2 : uint64_t(1) << plan.NBPP;
            return uint64_t(band * 1000 + row * 7 + column * 3) * 4099 % limit;
        };
        std::string bytes =
            BuildImageFile(plan, JoinBlocks(plan.NBPP % 8 ? PackedBlocks(plan, pixel) : BuildImageBlocks(plan, pixel)));
        WriteFile(dir / "image.ntf", bytes.replace(0, 9, FHDR));
        LoadedImage loaded((dir / "image.ntf").c_str());
        ASSERT_TRUE(loaded.Open());
        ExpectDrawnAsGdal(loaded, dir / "image.ntf");
    }
}

TEST(PixelLayout, RefusesOneBitColoursPackedBandsTogetherAndShortPackedData)
{
    for (const NitfImagePlan& plan : {Plan("MULTI", 1, {red, green, blue}), Plan("RGB", 1, {red, green, blue}),
                                      Plan("MONO", 12, {plain, plain}, 'P'), Plan("MONO", 12, {plain, plain}, 'R'),
                                      Plan("RGB/LUT", 12, {rgbLut}), Plan("MONO", 12, {plain})}) {
        std::string data = JoinBlocks(PackedBlocks(plan, Ramp));
        EXPECT_TRUE(LoadedImage(BuildImageFile(plan, data)).Open() == (plan.bands.size() == 1 && plan.IREP == "MONO"));
        EXPECT_FALSE(LoadedImage(BuildImageFile(plan, data.erase(0, 1))).Open()); // the last block one byte short
    }
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
    // Floating point, 12-bit JPEG and 12-bit lossless JPEG stay refused.
    for (const char* name : {"jitc-nitf21/i_3450c.ntf", "jitc-nitf21/ns5600a.nsf", "jitc-nitf21/ns3417c.nsf",
                             "jitc-nitf21/ns3437a.nsf"})
        EXPECT_FALSE(LoadedImage(CorpusPath(name).c_str()).Open()) << name;
}

} // namespace
