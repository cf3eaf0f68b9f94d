// rhlhost render and mosaic, read back by GDAL. A GeoTIFF has the coordinate
// system and corners that `rhlhost info` reports (the control points' world
// positions are the outer corners, so GDAL's corners equal them), the pixels
// that `rhlhost dump` delivers and the palette; a PNG shows the palette's
// colours. A mosaic places frames by their corners on one grid.
#include "Host.h"
#include "tests/GdalPeer.h"
#include "tests/SampleFiles.h"
#include "tests/fixtures/NitfFileWriter.h"
#include "tests/fixtures/TempFiles.h"

#include <gtest/gtest.h>

#include <cmath>
#include <cstring>

namespace {

struct Rendering {
    const char* sample;
    const char* window; // X0,Y0,X1,Y1 or empty
    std::vector<std::string> colours;
    bool nodata; // the masked value 216 is the TIFF's nodata value
};

void PrintTo(const Rendering& r, std::ostream* out)
{
    *out << r.sample << (*r.window ? " window " : "") << r.window;
}

class HostRender : public testing::TestWithParam<Rendering> { };

TEST_P(HostRender, GdalReadsWhatInfoAndDumpSay)
{
    const Rendering& r = GetParam();
    TempDirectory directory;
    const std::string input = directory / "in.ntf", tiff = directory / "out.tif", png = directory / "out.png";
    WriteFile(input, SampleBytes(r.sample));
    for (const std::string& output : {tiff, png, directory / "dump.raw"}) {
        std::vector<std::string> args = {output == png || output == tiff ? "render" : "dump", input, output};
        if (*r.window)
            args.insert(args.end(), {"--window", r.window});
        ASSERT_EQ(RunHost(args).exitCode, 0) << output;
    }
    const HostInfo info = ReadHostInfo(input);
    const GdalReport gdal = ReadWithGdal(tiff);
    int32_t x0 = 0, y0 = 0, x1 = int32_t(info.width), y1 = int32_t(info.height);
    std::sscanf(r.window, "%d,%d,%d,%d", &x0, &y0, &x1, &y1);
    const uint32_t w = uint32_t(x1 - x0), h = uint32_t(y1 - y0);
    ASSERT_EQ(gdal.width, w);
    ASSERT_EQ(gdal.height, h);
    EXPECT_EQ(gdal.colourInterpretations, r.colours);
    EXPECT_EQ(gdal.epsg, info.epsg);
    ASSERT_EQ(info.points.size(), info.epsg ? 3u : 0u);
    for (const auto& [a, b] : {std::pair{0u, 0u}, {w, 0u}, {0u, h}, {w, h}})
        for (int axis = 2; info.epsg && axis < 4; ++axis) {
            const auto& p = info.points;
            const double host = p[0][axis] + (x0 + a) * (p[1][axis] - p[0][axis]) / info.width +
                (y0 + b) * (p[2][axis] - p[0][axis]) / info.height;
            EXPECT_NEAR(axis == 2 ? gdal.X(a, b) : gdal.Y(a, b), host, 1e-4 * std::fabs(gdal.geoTransform[1]))
                << "corner " << a << ", " << b;
        }
    // The dump's bytes, grey palettes mapped to their greys, sum as GDAL sums
    // the TIFF's bands; the PNG shows colour palettes as their colours.
    const bool paletted = r.colours[0] == "Palette";
    std::string dump = ReadWholeFile(directory / "dump.raw"), shown;
    for (char& value : dump) {
        if (r.colours[0] == "Gray" && !info.palette.empty())
            value = char(info.palette.at(uint8_t(value))[0]);
        for (size_t c = 0; paletted && c < 3; ++c)
            shown += char(info.palette.at(uint8_t(value))[c]);
    }
    const auto sums = [&](const std::string& pixels, size_t bands) {
        std::vector<uint32_t> sums;
        for (size_t band = 0; band < bands; ++band)
            sums.push_back(GdalChecksum(reinterpret_cast<const uint8_t*>(pixels.data()) + band, w, h, bands));
        return sums;
    };
    EXPECT_EQ(gdal.checksums, sums(dump, r.colours.size()));
    EXPECT_EQ(ReadWithGdal(png).checksums, paletted ? sums(shown, 3) : gdal.checksums);
    EXPECT_EQ(gdal.hasNodata, r.nodata);
    EXPECT_TRUE(!r.nodata || gdal.nodata == kRpfMaskedPixel);
    for (size_t i = 0; paletted && i < info.palette.size(); ++i)
        EXPECT_EQ(gdal.colourTable.at(i), info.palette[i]) << "entry " << i;
}

const std::vector<std::string> kPalette = {"Palette"}, kGray = {"Gray"}, kRgb = {"Red", "Green", "Blue"};

INSTANTIATE_TEST_SUITE_P(Samples, HostRender,
                         testing::Values(Rendering{"cadrg_big_endian", "", kPalette, true},
                                         Rendering{"cadrg_big_endian", "100,200,400,300", kPalette, true},
                                         Rendering{"cib", "", kGray, false},
                                         Rendering{"lookup_table", "", kPalette, false},
                                         Rendering{"rgb_row_utm", "", kRgb, false},
                                         Rendering{"rgb_pixel_decimal", "33,5,80,69", kRgb, false},
                                         Rendering{"compressed_bilevel_2d", "", kGray, false}),
                         [](const testing::TestParamInfo<Rendering>& info) {
                             return std::string(info.param.sample) + (*info.param.window ? "_window" : "");
                         });

RpfCorners CornersAt(double west, double north)
{
    RpfCorners c;
    c.northWestLongitude = c.southWestLongitude = west;
    c.northEastLongitude = c.southEastLongitude = west + 0.5;
    c.northWestLatitude = c.northEastLatitude = north;
    c.southWestLatitude = c.southEastLatitude = north - 0.5;
    return c;
}

// Three frames of a 2 x 2 block, the south-east quarter empty: paletted with
// nodata around and in the masked subframes, the pixels the frames' dumps hold.
TEST(HostMosaic, FramesMeetOnOneGridWithNodataAround)
{
    constexpr uint32_t side = 2 * kRpfFrameSide;
    TempDirectory in, out;
    std::string expected(size_t(side) * side, char(kRpfMaskedPixel));
    const struct {
        const char* name;
        double west, north;
        uint32_t column, row;
    } frames[] = {
        {"nw", -100.0, 40.0, 0, 0}, {"ne", -99.5, 40.0, kRpfFrameSide, 0}, {"sw", -100.0, 39.5, 0, kRpfFrameSide}};
    for (const auto& f : frames) {
        const std::string path = in / (std::string(f.name) + ".ntf"), dump = out / (std::string(f.name) + ".raw");
        WriteFile(path, FrameFile(CornersAt(f.west, f.north), RpfProduct::Cadrg, {0, 35}));
        ASSERT_EQ(RunHost({"dump", path, dump}).exitCode, 0);
        const std::string pixels = ReadWholeFile(dump);
        for (uint32_t row = 0; row < kRpfFrameSide; ++row)
            std::memcpy(&expected[size_t(f.row + row) * side + f.column], &pixels[size_t(row) * kRpfFrameSide],
                        kRpfFrameSide);
    }
    const ProcessResult result = RunHost({"mosaic", "-o", out / "m.tif", in.path()});
    ASSERT_EQ(result.exitCode, 0) << result.err;
    const GdalReport gdal = ReadWithGdal(out / "m.tif");
    EXPECT_EQ(gdal.epsg, 4326);
    ASSERT_EQ(gdal.width, side);
    ASSERT_EQ(gdal.height, side);
    for (const auto& [x, y] : {std::pair{0.0, 0.0}, {double(side), double(side)}}) {
        EXPECT_NEAR(gdal.X(x, y), x ? -99.0 : -100.0, 1e-9);
        EXPECT_NEAR(gdal.Y(x, y), y ? 39.0 : 40.0, 1e-9);
    }
    EXPECT_EQ(gdal.colourInterpretations, kPalette);
    EXPECT_TRUE(gdal.hasNodata && gdal.nodata == kRpfMaskedPixel);
    EXPECT_EQ(gdal.checksums,
              std::vector<uint32_t>{GdalChecksum(reinterpret_cast<const uint8_t*>(expected.data()), side, side)});

    // Frames of different palettes: RGB with an alpha band.
    WriteFile(in / "cib.ntf", FrameFile(CornersAt(-99.5, 39.5), RpfProduct::Cib));
    ASSERT_EQ(RunHost({"mosaic", "-o", out / "rgba.tif", in.path()}).exitCode, 0);
    const GdalReport rgba = ReadWithGdal(out / "rgba.tif");
    EXPECT_EQ(rgba.colourInterpretations, (std::vector<std::string>{"Red", "Green", "Blue", "Alpha"}));
    EXPECT_EQ(rgba.width, side);
}

} // namespace
