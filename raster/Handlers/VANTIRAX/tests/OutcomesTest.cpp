// What a host meets through the loaded handler for every kind of file: the
// probe's answer and RH_Open's result and status; for a served file its pixel
// kind, palette size, georeference record and every row, judged by GDAL on
// the same file: the rows as the host shows them (palettes applied), the
// EPSG code and the control points on GDAL's grid.
#include "tests/GdalPeer.h"
#include "tests/SampleFiles.h"
#include "tests/fixtures/NitfFileWriter.h"
#include "tests/fixtures/TempFiles.h"

#include <gtest/gtest.h>

#include <cmath>
#include <map>

namespace {

constexpr uint32_t kHostStatus = 77; // a value the library never writes

struct Outcome {
    const char* name;
    int32_t probe, result;
    uint32_t status, pixelKind = 0, paletteEntries = 0;
    // Served: gdal_translate options that make GDAL's samples the host's
    // values, "=NAME" for a file that must draw exactly as file NAME does,
    // or null for a file whose every row fails.
    const char* peer = "";
    unsigned shift = 0; // GDAL's samples have 16 bits: the host shows the top 8 of ABPP
    // GDAL reads IGEOLO corners as pixel centres, RPF frame corners as the
    // outer edges; the record's control points name pixels 0 and w - 1 either way.
    bool edgeCorners = false;
};

const Outcome kOutcomes[] = {
    {"compressed_jpeg_grey", 1, 1, kStatusOk, kPixelGreyPaletted, 256},
    {"compressed_jpeg_colour", 1, 1, kStatusOk, kPixelDirect, 0},
    // GDAL gives black 1 and white 0 (its colour table says the reverse).
    {"compressed_bilevel_1d", 1, 1, kStatusOk, kPixelGreyPaletted, 256, "-scale 0 1 255 0"},
    {"compressed_bilevel_2d", 1, 1, kStatusOk, kPixelGreyPaletted, 256, "-scale 0 1 255 0"},
    {"cadrg_big_endian", 1, 1, kStatusOk, kPixelPaletted, 217, "", 0, true},
    {"cadrg_little_endian", 1, 1, kStatusOk, kPixelPaletted, 217, "=cadrg_big_endian"},
    {"cib", 1, 1, kStatusOk, kPixelPaletted, 217, "", 0, true},
    {"mono_geographic", 1, 1, kStatusOk, kPixelGreyPaletted, 256},
    {"rgb_pixel_decimal", 1, 1, kStatusOk, kPixelDirect, 0},
    {"rgb_row_utm", 1, 1, kStatusOk, kPixelDirect, 0},
    {"rgb_band_sequential_mgrs_20", 1, 1, kStatusOk, kPixelDirect, 0},
    {"lookup_table", 1, 1, kStatusOk, kPixelPaletted, 200},
    {"mono16", 1, 1, kStatusOk, kPixelGreyPaletted, 256, "", 4},
    {"masked_blocks_utm", 1, 1, kStatusOk, kPixelGreyPaletted, 256},
    {"rpf_short_colour_table", 1, 0, kStatusFailed},
    {"rpf_sections_missing", 1, 0, kStatusFailed},
    {"dpcm", 0, 1, kStatusFailed},
    {"jpeg2000", 0, 0, kStatusFailed},
    {"real_pixels", 0, 1, kStatusFailed},
    {"cut_header", 0, 0, kHostStatus},
    {"jpeg_streams_larger_than_blocks", 1, 1, kStatusOk, kPixelGreyPaletted, 256, nullptr},
};

const std::string& PathOf(const std::string& name)
{
    static TempDirectory directory;
    static std::map<std::string, std::string> paths;
    if (paths.count(name) == 0)
        WriteFile(paths[name] = directory / (name + ".ntf"), SampleBytes(name));
    return paths[name];
}

// GDAL's band-sequential samples, pixel interleaved as the host's rows are.
std::vector<uint8_t> GdalPixels(const std::string& samples, size_t pixelCount, size_t bands, unsigned shift)
{
    const size_t width = shift > 0 ? 2 : 1;
    std::vector<uint8_t> pixels;
    for (size_t i = 0; i < pixelCount * bands; ++i) {
        const size_t at = (i % bands * pixelCount + i / bands) * width;
        pixels.push_back(uint8_t((uint8_t(samples[at]) | (width == 2 ? uint8_t(samples[at + 1]) << 8 : 0)) >> shift));
    }
    return pixels;
}

void PrintTo(const Outcome& outcome, std::ostream* out)
{
    *out << outcome.name;
}

class Outcomes : public testing::TestWithParam<Outcome> { };

TEST_P(Outcomes, AsTheHostSeesThemAndGdalDecodes)
{
    const Outcome& expected = GetParam();
    const HandlerExports& rh = LoadHandler(VX_HANDLER_PATH);
    const std::string& path = PathOf(expected.name);
    EXPECT_EQ(rh.isFormat(path.c_str()), expected.probe);
    RHHandle handle{};
    handle.status = kHostStatus;
    EXPECT_EQ(rh.open(&handle, path.c_str()), expected.result);
    EXPECT_EQ(handle.status, expected.status);
    EXPECT_EQ(handle.handler != nullptr, expected.status != kHostStatus) << "handler attached";
    EXPECT_EQ(rh.close(&handle), 1);
    if (expected.status != kStatusOk)
        return;
    OpenedImage image(rh, path);
    ASSERT_TRUE(image.Ready());
    EXPECT_EQ(image.handle.pixelKind, expected.pixelKind);
    EXPECT_EQ(image.handle.palette ? image.handle.palette->entryCount : 0, int32_t(expected.paletteEntries));
    std::vector<uint8_t> pixels;
    uint32_t failedRows = 0;
    ASSERT_TRUE(image.DrawAll(pixels, failedRows));
    EXPECT_EQ(failedRows, expected.peer ? 0 : image.handle.height);
    if (expected.peer == nullptr)
        return;
    if (expected.peer[0] == '=') {
        EXPECT_TRUE(OpenDrawClose(rh, path, UINT32_MAX) ==
                    OpenDrawClose(rh, PathOf(expected.peer + 1), UINT32_MAX));
        return;
    }
    const GdalReport gdal = ReadWithGdal(path);
    ASSERT_TRUE(gdal.read);
    ASSERT_EQ(gdal.width, image.handle.width);
    ASSERT_EQ(gdal.height, image.handle.height);
    const size_t bands = image.BytesPerPixel(), pixelCount = pixels.size() / bands;
    const std::vector<uint8_t> gdalPixels =
        GdalPixels(GdalSamples(path, expected.peer), pixelCount, bands, expected.shift);
    const size_t at = size_t(std::mismatch(pixels.begin(), pixels.end(), gdalPixels.begin(), gdalPixels.end()).first -
                             pixels.begin());
    EXPECT_EQ(at, pixels.size()) << "pixel " << at / bands << " of " << pixelCount;
    // A grey palette maps each value to its grey; a colour palette is GDAL's
    // colour table but for the masked value 216 (white here, GDAL's no-data).
    for (int32_t i = 0; image.handle.palette != nullptr && i < std::min(image.handle.palette->entryCount, 216); ++i) {
        const uint8_t* entry = image.handle.palette->entries + i * 3;
        const std::array<int, 3> ours{entry[0], entry[1], entry[2]};
        const std::array<int, 3> grey{i, i, i};
        EXPECT_EQ(ours, expected.pixelKind == kPixelGreyPaletted ? grey : gdal.colourTable.at(size_t(i))) << i;
    }

    const RHGeoRef* geoRef = image.handle.geoRef;
    ASSERT_EQ(geoRef != nullptr, gdal.epsg != 0);
    if (geoRef == nullptr)
        return;
    EXPECT_EQ(int(geoRef->epsgCode), gdal.epsg);
    ASSERT_EQ(geoRef->controlPointCount, 3u);
    const double w = gdal.width, h = gdal.height, tolerance = std::fabs(gdal.geoTransform[1]) * 1e-3;
    for (const RHControlPoint& point : geoRef->points) {
        const double u = expected.edgeCorners ? point.column * w / (w - 1) : point.column + 0.5;
        const double v = expected.edgeCorners ? point.row * h / (h - 1) : point.row + 0.5;
        EXPECT_NEAR(gdal.X(u, v), point.worldX, tolerance) << point.column << ", " << point.row;
        EXPECT_NEAR(gdal.Y(u, v), point.worldY, tolerance) << point.column << ", " << point.row;
    }
}

INSTANTIATE_TEST_SUITE_P(EveryKind, Outcomes, testing::ValuesIn(kOutcomes),
                         [](const testing::TestParamInfo<Outcome>& info) { return std::string(info.param.name); });

// Corners GDAL does not judge: an EPSG code only when they name their coordinate system (0 otherwise:
// zone 00, an unknown form, a first MGRS corner in zone 32's missing band X; never metres called
// degrees); east corners across the 180 degree meridian keep running east; "C" latitudes become geodetic.
TEST(Outcomes, CornersAndTheirEpsgCode)
{
    struct Case { char ICORDS; const char* IGEOLO; uint32_t epsg; double points[3][2]; };
    const Case cases[] = {
        {'N', "005000004400000005010004400000005010004399000005000004399000", 0,
         {{500000, 4400000}, {501000, 4400000}, {500000, 4399000}}},
        {'E', "400000N1000000W400000N0993000W393000N0993000W393000N1000000W", 0, {}},
        {'U', "32XNL000000000033XVL000000000033XVL000000000033XVL0000000000", 0,
         {{0, 0}, {400000, 9000000}, {400000, 9000000}}},
        {'G', "200000N1790000E200000N1790000W200000N1790000W190000N1790000E", 4326, {{179, 20}, {181, 20}, {179, 19}}},
        {'C', "325900N0850000E325900N0855803E321457N0855803E321457N0850000E", 4326,
         {{85, 33.1593159397}, {85.9675, 33.1593159397}, {85, 32.4230942273}}}};
    const std::string& sample = SampleBytes("mono_geographic");
    const size_t igeolo = sample.find("324530N0784510W");
    ASSERT_NE(igeolo, std::string::npos);
    TempDirectory directory;
    for (const Case& c : cases) {
        std::string bytes = sample;
        bytes[igeolo - 1] = c.ICORDS;
        WriteFile(directory / "corners.ntf", bytes.replace(igeolo, 60, c.IGEOLO));
        OpenedImage image(LoadHandler(VX_HANDLER_PATH), directory / "corners.ntf");
        ASSERT_TRUE(image.Ready() && image.handle.geoRef != nullptr) << c.IGEOLO;
        EXPECT_EQ(image.handle.geoRef->epsgCode, c.epsg) << c.IGEOLO;
        for (int i = 0; i < 3; ++i) {
            EXPECT_NEAR(image.handle.geoRef->points[i].worldX, c.points[i][0], 1e-7) << c.IGEOLO << " point " << i;
            EXPECT_NEAR(image.handle.geoRef->points[i].worldY, c.points[i][1], 1e-7) << c.IGEOLO << " point " << i;
        }
    }
}

} // namespace
