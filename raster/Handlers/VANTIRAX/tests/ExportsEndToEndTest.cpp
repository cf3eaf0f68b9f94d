// What a host meets through the loaded handler: every kind of file probed, opened and drawn, judged by GDAL; every
// file of the shared corpus; handles' descriptors and heap; images beyond the decoded-block bound.
#include "tests/GdalPeer.h"
#include "tests/SampleFiles.h"
#include "base/Limits.h"
#include "tests/fixtures/BiLevelWriter.h"
#include "tests/fixtures/JpegBlockWriter.h"
#include "tests/fixtures/Corpus.h"
#include "tests/fixtures/NitfImageWriter.h"
#include "tests/fixtures/TempFiles.h"

#include <gtest/gtest.h>

#include <cmath>
#include <fstream>
#include <malloc.h>
#include <regex>
#include <unistd.h>

// Defined by the sanitizer runtimes only (gcc ships no header for it).
extern "C" size_t __sanitizer_get_current_allocated_bytes() __attribute__((weak));

namespace {

// Bytes of heap the process holds: the sanitizer's count in sanitized builds, the C library's otherwise.
size_t HeapInUse()
{
    return __sanitizer_get_current_allocated_bytes ? __sanitizer_get_current_allocated_bytes() : mallinfo2().uordblks;
}

constexpr uint32_t kHostStatus = 77; // a value the library never writes

struct Outcome {
    const char* name;
    int32_t probe, result;
    uint32_t status, pixelKind = 0, paletteEntries = 0;
    // Served: gdal_translate options that make GDAL's samples the host's values, "=NAME" when GDAL
    // judges it by file NAME (which it must draw exactly as), or null when every row fails.
    const char* peer = "";
    unsigned shift = 0; // GDAL's samples have 16 bits: the host shows the top 8 of ABPP
    // GDAL reads IGEOLO corners as pixel centres, RPF frame corners as the outer
    // edges; the record's control points name pixels 0 and w - 1 either way.
    bool edgeCorners = false;
};

constexpr uint32_t kOk = kStatusOk, kGrey = kPixelGreyPaletted, kRgb = kPixelDirect, kIndexed = kPixelPaletted;
const Outcome kOutcomes[] = {
    {"compressed_jpeg_grey", 1, 1, kOk, kGrey, 256}, {"compressed_jpeg_colour", 1, 1, kOk, kRgb, 0},
    {"compressed_jpeg2000_grey12", 1, 1, kOk, kGrey, 256, "", 4}, {"compressed_jpeg2000_rgb_jp2", 1, 1, kOk, kRgb, 0},
    // GDAL gives black 1 and white 0 (its colour table says the reverse).
    {"compressed_bilevel_1d", 1, 1, kOk, kGrey, 256, "-scale 0 1 255 0"},
    {"compressed_bilevel_2d", 1, 1, kOk, kGrey, 256, "-scale 0 1 255 0"},
    {"cadrg_big_endian", 1, 1, kOk, kIndexed, 217, "", 0, true}, {"cib", 1, 1, kOk, kIndexed, 217, "", 0, true},
    {"cadrg_little_endian", 1, 1, kOk, kIndexed, 217, "=cadrg_big_endian", 0, true},
    {"mono_geographic", 1, 1, kOk, kGrey, 256}, {"rgb_pixel_decimal", 1, 1, kOk, kRgb, 0},
    {"rgb_row_utm", 1, 1, kOk, kRgb, 0}, {"rgb_band_sequential_mgrs_20", 1, 1, kOk, kRgb, 0},
    {"lookup_table", 1, 1, kOk, kIndexed, 200}, {"mono16", 1, 1, kOk, kGrey, 256, "", 4},
    {"masked_blocks_utm", 1, 1, kOk, kGrey, 256}, {"jpeg_streams_larger_than_blocks", 1, 1, kOk, kGrey, 256, nullptr},
    {"rpf_short_colour_table", 1, 0, kStatusFailed}, {"rpf_sections_missing", 1, 0, kStatusFailed},
    {"dpcm", 0, 1, kStatusFailed}, {"jpeg2000", 0, 1, kStatusFailed}, {"real_pixels", 0, 1, kStatusFailed},
    {"cut_header", 0, 0, kHostStatus},
};

void PrintTo(const Outcome& outcome, std::ostream* out) { *out << outcome.name; }

class Outcomes : public testing::TestWithParam<Outcome> { };

TEST_P(Outcomes, AsTheHostSeesThemAndGdalDecodes)
{
    const Outcome& expected = GetParam();
    const HandlerExports& rh = LoadHandler(VX_HANDLER_PATH);
    TempDirectory directory;
    const auto written = [&](const std::string& name) {
        WriteFile(directory / name, SampleBytes(name));
        return directory / name;
    };
    const std::string path = written(expected.name);
    EXPECT_EQ(rh.isFormat(path.c_str()), expected.probe);
    RHHandle handle{};
    handle.status = kHostStatus;
    const int32_t result = rh.open(&handle, path.c_str()); // result, status, handler attached:
    EXPECT_EQ(std::tuple(result, handle.status, handle.handler != nullptr),
              std::tuple(expected.result, expected.status, expected.status != kHostStatus));
    EXPECT_EQ(rh.close(&handle), 1);
    if (expected.status != kStatusOk)
        return;
    OpenedImage image(rh, path);
    ASSERT_TRUE(image.Ready());
    EXPECT_EQ(image.handle.pixelKind, expected.pixelKind);
    const RHPalette* palette = image.handle.palette;
    EXPECT_EQ(palette ? palette->entryCount : 0, int32_t(expected.paletteEntries));
    ASSERT_TRUE(image.DrawAll());
    EXPECT_EQ(image.failedRows, expected.peer ? 0 : image.handle.height);
    const std::vector<uint8_t>& pixels = image.pixels;
    if (expected.peer == nullptr)
        return;
    const bool byPeer = expected.peer[0] == '=';
    const std::string judged = byPeer ? written(expected.peer + 1) : path;
    EXPECT_TRUE(!byPeer || OpenDrawClose(rh, path, UINT32_MAX) == OpenDrawClose(rh, judged, UINT32_MAX));
    const GdalReport gdal = ReadWithGdal(judged);
    ASSERT_TRUE(gdal.read && gdal.width == image.handle.width && gdal.height == image.handle.height)
        << "GDAL reads " << gdal.read << ": " << gdal.width << " x " << gdal.height;
    const size_t wide = expected.shift ? 2 : 1; // 16-bit samples little endian
    const std::string samples = GdalSamples(judged, byPeer ? "" : expected.peer);
    ASSERT_EQ(samples.size(), pixels.size() * wide);
    for (size_t i = 0; i < pixels.size(); ++i) {
        const unsigned sample = uint8_t(samples[i * wide]) | (wide == 2 ? uint8_t(samples[i * wide + 1]) << 8 : 0);
        ASSERT_EQ(pixels[i], uint8_t(sample >> expected.shift)) << "byte " << i;
    }
    // A grey palette maps each value to its grey; a colour palette is GDAL's
    // colour table but for the masked value 216 (white here, GDAL's no-data).
    for (int32_t i = 0; palette != nullptr && i < std::min(palette->entryCount, 216); ++i) {
        const uint8_t* entry = palette->entries + i * 3;
        const std::array<int, 3> ours{entry[0], entry[1], entry[2]}, grey{i, i, i};
        EXPECT_EQ(ours, expected.pixelKind == kGrey ? grey : gdal.colourTable.at(size_t(i))) << i;
    }
    const RHGeoRef* geoRef = image.handle.geoRef;
    ASSERT_EQ(geoRef != nullptr, gdal.epsg != 0);
    if (geoRef == nullptr)
        return;
    EXPECT_EQ(int(geoRef->epsgCode), gdal.epsg);
    ASSERT_EQ(geoRef->controlPointCount, 3u);
    const double w = gdal.width, h = gdal.height, tolerance = std::fabs(gdal.geoTransform[1]) * 1e-3;
    for (const RHControlPoint& p : geoRef->points) {
        const double u = expected.edgeCorners ? p.column * w / (w - 1) : p.column + 0.5;
        const double v = expected.edgeCorners ? p.row * h / (h - 1) : p.row + 0.5;
        EXPECT_NEAR(gdal.X(u, v), p.worldX, tolerance) << p.column << ", " << p.row;
        EXPECT_NEAR(gdal.Y(u, v), p.worldY, tolerance) << p.column << ", " << p.row;
    }
}

INSTANTIATE_TEST_SUITE_P(EveryKind, Outcomes, testing::ValuesIn(kOutcomes),
                         [](const testing::TestParamInfo<Outcome>& info) { return std::string(info.param.name); });

// Corpus files probed, opened and drawn whole: a served file the probe accepts, and one of 8-bit
// samples gives GDAL's band-1 checksum (the catalogue's ck=). U_1125C's JPEG stream has no DQT:
// the default tables go in the coefficient order NITF lists them, which GDAL reads in another order.
TEST(CorpusWalk, EveryFileDrawsAsGdalDecodesItOrIsRefusedCleanly)
{
    VX_SKIP_WITHOUT_CORPUS();
    const HandlerExports& rh = LoadHandler(VX_HANDLER_PATH);
    std::ifstream catalogue(CorpusPath("catalogue.tsv"));
    // Columns: the file (1), its bits per pixel (12) and what GDAL reads (17).
    const std::regex row("([^\t]*)(?:\t[^\t]*){10}\t([^\t]*)(?:\t[^\t]*){4}\t(?:[^\t]*ck=(\\d+))?.*");
    size_t served = 0, compared = 0;
    std::smatch column;
    for (std::string line; std::getline(catalogue, line);) {
        if (!std::regex_match(line, column, row) || column[1] == "file")
            continue;
        SCOPED_TRACE(column[1].str());
        const std::string path = CorpusPath(column[1]);
        const bool probed = rh.isFormat(path.c_str()) == 1;
        OpenedImage image(rh, path);
        if (!image.Ready())
            continue;
        ASSERT_TRUE(image.DrawAll());
        ++served;
        EXPECT_TRUE(probed) << "opens but the probe says no";
        if (image.failedRows > 0 || column[2].str().rfind("8/8", 0) != 0 || !column[3].matched ||
            column[1] == "jitc-nitf20/U_1125C.NTF")
            continue;
        const RHHandle& h = image.handle;
        EXPECT_EQ(GdalChecksum(image.pixels.data(), h.width, h.height, image.BytesPerPixel()), std::stoul(column[3]));
        ++compared;
    }
    EXPECT_GE(served, 30u);
    EXPECT_GE(compared, 20u);
}

// One handle's life; i picks the file and the way through the exports: a file of every kind drawn
// clean; a hostile or missing one never; a draw that cannot start (a reversed span, the file gone)
// detaches the handler, and the export releases it.
void OneHandle(const HandlerExports& rh, const TempDirectory& files, unsigned i)
{
    static const std::vector<SampleFile> good = FilesOfEveryKind(), hostile = HostileFiles();
    const SampleFile& sample = good[i / 4 % good.size()];
    const std::string path = files / (sample.name + ".ntf"), vanishing = files / "vanishing";
    if (i % 4 < 2) {
        const std::string drawn = i % 4 == 0 ? path : i % 7 ? files / (hostile[i / 4 % hostile.size()].name + ".ntf")
                                                              : files / "missing";
        ASSERT_TRUE(rh.isFormat(drawn.c_str()) == 1 || i % 4 == 1) << drawn; // hostile files are probed too
        ASSERT_EQ(OpenDrawClose(rh, drawn, 4).rfind(kDrawnClean, 0) == 0, i % 4 == 0) << drawn;
        return;
    }
    const bool gone = i % 4 == 3;
    WriteFile(vanishing, sample.bytes);
    OpenedImage image(rh, vanishing);
    ASSERT_TRUE(image.Ready());
    if (gone)
        unlink(vanishing.c_str());
    const int32_t span[4] = {gone ? 0 : 10, 0, 2, 4};
    uint32_t width = 0;
    ASSERT_TRUE(rh.startDraw(&image.handle, nullptr, span, 1.0, &width) == 0 && image.handle.handler == nullptr);
}

// Ten thousand handles (after a warm-up) leave open file descriptors and heap
// in use where they were: every handle releases its handler, palette and records.
TEST(HandleHygiene, TenThousandHandlesLeaveDescriptorsAndHeapFlat)
{
    constexpr unsigned kHandles = 10000, kWarmUp = 200;
    constexpr size_t kHeapSlack = 64 * 1024; // allocator bookkeeping, not per-handle growth
    const HandlerExports& rh = LoadHandler(VX_HANDLER_PATH);
    const auto openDescriptors = [] { return std::distance(std::filesystem::directory_iterator("/proc/self/fd"), {}); };
    TempDirectory files;
    for (const auto& list : {FilesOfEveryKind(), HostileFiles()})
        for (const SampleFile& file : list)
            WriteFile(files / (file.name + ".ntf"), file.bytes);
    ptrdiff_t descriptors = 0;
    size_t heap = 0, heapHalfway = 0;
    for (unsigned i = 0; i < kWarmUp + kHandles; ++i) {
        if (i == kWarmUp)
            descriptors = openDescriptors(), heap = HeapInUse();
        heapHalfway = i == kWarmUp + kHandles / 2 ? HeapInUse() : heapHalfway;
        ASSERT_NO_FATAL_FAILURE(OneHandle(rh, files, i));
    }
    EXPECT_EQ(openDescriptors(), descriptors);
    EXPECT_LE(HeapInUse(), heap + kHeapSlack);
    EXPECT_LE(HeapInUse(), heapHalfway + kHeapSlack);
}

// Images beyond the caps open small, without decoding or allocating their declared size, and draw within the
// decoded-block bound, the handle staying good. A JPEG image of one 33000 x 33000 block, 1.01 GiB decoded (uniform,
// and arithmetic coded in a few bytes), draws its last row from a row decoder. White bi-level images: 99,999,999 x
// 100 one-bit pixels (a one-dimensionally coded strip of 64 columns stands for any width) are 1.16 GiB, whose row
// decoder's run arrays alone would take 1.6 GB; a 2 MiB bitmap whose fax decoder run arrays for 17 million columns
// would take 272 MB (such strips of a few kilobytes made it allocate over a gibibyte): their rows fail. A million
// columns decode.
TEST(MemoryLimits, ImagesBeyondTheCapsOpenSmallAndDrawWithinTheBound)
{
    constexpr int32_t kSide = 33000;
    JpegBlockPlan block{kSide, kSide};
    block.arithmetic = true;
    const Bytes jpeg = BuildNitfJpegData({EncodeJpegBlock(Bytes(kSide, 90), block)}, {});
    NitfImagePlan plan;
    plan.rows = plan.columns = kSide;
    plan.IC = "C3";
    plan.COMRAT = "00.0";
    struct Case { std::string bytes; uint32_t columns; size_t opening; int32_t row, drawn; bool fails; uint8_t value; };
    std::vector<Case> cases = {{BuildImageFile(plan, std::string(jpeg.begin(), jpeg.end())), kSide, 1u << 20,
                                kSide - 1, kSide, false, 90}};
    for (const auto& [columns, rows, twoDimensional, decodes] :
         {std::tuple{99999999u, 100u, false, false}, {17000000u, 2u, true, false}, {1000000u, 2u, true, true}}) {
        const uint32_t coded = twoDimensional ? columns : 64;
        const std::vector<uint8_t> strip =
            EncodeT4Strip(std::vector<uint8_t>((coded + 7) / 8 * rows), coded, rows, twoDimensional);
        cases.push_back({BuildImageFile(BiLevelPlan(int32_t(columns), int32_t(rows), twoDimensional),
                                        std::string(strip.begin(), strip.end())),
                         columns, 16u << 20, 0, 16, !decodes, uint8_t(decodes ? 255 : 0)}); // far below their bitmaps
    }
    for (const Case& c : cases) {
        SCOPED_TRACE(c.columns);
        TempFile file(c.bytes, ".ntf");
        const size_t before = HeapInUse();
        OpenedImage image(LoadHandler(VX_HANDLER_PATH), file.path());
        ASSERT_TRUE(image.Ready());
        EXPECT_EQ(image.handle.width, c.columns);
        EXPECT_LT(HeapInUse(), before + c.opening);
        ASSERT_TRUE(image.Draw(0, c.row, c.drawn, c.row + 1));
        EXPECT_EQ(image.failedRows, c.fails ? 1u : 0u);
        EXPECT_EQ(image.pixels, std::vector<uint8_t>(size_t(c.drawn), c.value));
        EXPECT_EQ(image.handle.status, kStatusOk);
        EXPECT_LT(HeapInUse(), before + kMaxDecodedCacheBytes + (1u << 20));
    }
}

} // namespace
