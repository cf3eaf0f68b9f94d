// rhlhost render and mosaic, read back by GDAL. A GeoTIFF has the coordinate
// system and corners that `rhlhost info` reports (the control points' world
// positions are the outer corners, so GDAL's corners equal them), the pixels
// that `rhlhost dump` delivers and the palette; a PNG shows the palette's
// colours. A mosaic places frames by their corners on one grid.
#include "Host.h"
#include "tests/GdalPeer.h"
#include "tests/SampleFiles.h"
#include "tests/fixtures/Corpus.h"
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

// Corners corpus frames and GDAL cannot judge. Zone 00 keeps its transform without a coordinate system,
// ICORDS "E" (corners spanning no area) gives no georeference; the host says so.
TEST(HostRender, CornersWithoutACoordinateSystemAreWrittenWithoutOne)
{
    const std::string& utm = SampleBytes("rgb_row_utm");
    const size_t igeolo = utm.find("335000004000000");
    ASSERT_NE(igeolo, std::string::npos);
    for (const auto& [ICORDS, warning, info] :
         {std::tuple{'N', "written without a coordinate system", "x 500000.000  y 4000000.000"},
          {'E', "written without georeference: the georeference's corners span no area", "span no area"}}) {
        TempDirectory directory;
        std::string bytes = utm;
        bytes[igeolo - 1] = ICORDS;
        for (size_t slot = 0; slot < 60; slot += 15)
            bytes.replace(igeolo + slot, 2, "00");
        WriteFile(directory / "in.ntf", bytes);
        const ProcessResult rendered = RunHost({"render", directory / "in.ntf", directory / "out.tif"});
        EXPECT_EQ(rendered.exitCode, 0) << rendered.err;
        EXPECT_NE(rendered.err.find(warning), std::string::npos) << rendered.err;
        const GdalReport gdal = ReadWithGdal(directory / "out.tif");
        EXPECT_EQ(gdal.epsg, 0);
        EXPECT_EQ(gdal.geoTransform[0] == 500000.0, ICORDS == 'N');
        const std::string text = RunHost({"info", directory / "in.ntf", "--text"}).out;
        EXPECT_NE(text.find("georef      no coordinate system (EPSG code 0)"), std::string::npos) << text;
        EXPECT_NE(text.find(info), std::string::npos) << text;
    }
}

// Across the 180 degree meridian or of geocentric latitudes: the corners the host reads, a GeoTIFF
// of positive pixel width at them, and GDAL's corners of the file itself (RPF coverage corners at
// the outer corners as here, IGEOLO corners at the corner pixels' centres).
TEST(HostRender, ImagesAcross180DegreesAndOfGeocentricLatitudesArePlacedAsGdalPlacesThem)
{
    RpfCorners frame;
    frame.northWestLongitude = frame.southWestLongitude = 179.75;
    frame.northEastLongitude = frame.southEastLongitude = -179.75;
    TempDirectory directory;
    WriteFile(directory / "frame.ntf", SmallFrameFile(frame));
    const struct {
        std::string path;
        bool gdalAtPixelCentres;
        double gdalEastBehind, west, north, east, south; // GDAL's east corners lie that far west of ours
    } placements[] = {// GDAL leaves the fixture frame's east corners at -179.75, mirrored.
                      {directory / "frame.ntf", false, 360, 179.75, 40, 180.25, 39.5},
                      // A CADRG frame from 173.1E to 170.7W.
                      {CorpusPath("jitc-nitf20/U_3058B.NTF"), false, 0, 173.0769231, 62.3076923, 189.32643, 51.9230769},
                      // 160E to 160W: GDAL 3.6 leaves the east corners at -160, mirrored.
                      {CorpusPath("jitc-nitf21/i_3004g.ntf"), true, 360, 160, 20, 200, -20},
                      // ICORDS "C": 32d59'00" and 32d14'57" geocentric.
                      {CorpusPath("jitc-nitf20/U_1001A.NTF"), true, 0, 85, 33.15932, 85.9675, 32.4230942}};
    for (const auto& p : placements) {
        if (&p != placements)
            VX_SKIP_WITHOUT_CORPUS();
        SCOPED_TRACE(p.path);
        const std::vector<std::array<double, 4>> ours = ReadHostInfo(p.path).points;
        ASSERT_EQ(ours.size(), 3u);
        EXPECT_NEAR(ours[0][2], p.west, 1e-5);
        EXPECT_NEAR(ours[0][3], p.north, 1e-5);
        EXPECT_NEAR(ours[1][2], p.east, 1e-5);
        EXPECT_NEAR(ours[2][3], p.south, 1e-5);
        ASSERT_EQ(RunHost({"render", p.path, directory / "out.tif"}).exitCode, 0);
        const GdalReport tiff = ReadWithGdal(directory / "out.tif"), source = ReadWithGdal(p.path);
        EXPECT_GT(tiff.geoTransform[1], 0.0);
        EXPECT_NEAR(tiff.X(0, 0), ours[0][2], 1e-6);
        EXPECT_NEAR(tiff.X(tiff.width, 0), ours[1][2], 1e-6);
        EXPECT_NEAR(tiff.Y(0, tiff.height), ours[2][3], 1e-6);
        ASSERT_TRUE(source.read);
        const double in = p.gdalAtPixelCentres ? 0.5 : 0.0, w = source.width, h = source.height;
        EXPECT_NEAR(source.X(in, in), ours[0][2], 1e-6);
        EXPECT_NEAR(source.Y(in, in), ours[0][3], 1e-6);
        EXPECT_NEAR(source.X(w - in, in), ours[1][2] - p.gdalEastBehind, 1e-6);
        EXPECT_NEAR(source.Y(in, h - in), ours[2][3], 1e-6);
    }
}

// A frame's corners as its coverage section states them: longitudes past 180
// degrees written west of Greenwich.
RpfCorners CornersAt(double west, double north)
{
    const auto stated = [](double longitude) { return longitude > 180.0 ? longitude - 360.0 : longitude; };
    RpfCorners c;
    c.northWestLongitude = c.southWestLongitude = stated(west);
    c.northEastLongitude = c.southEastLongitude = stated(west + 0.5);
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

// Frames on both sides of the 180 degree meridian and one across it: one
// longitude range, from 179.25 to 180.75 degrees east, each frame where its dump says.
TEST(HostMosaic, FramesAcross180DegreesStayInOnePiece)
{
    constexpr uint32_t width = 3 * kRpfFrameSide;
    TempDirectory in, out;
    std::string expected(size_t(width) * kRpfFrameSide, '\0');
    for (uint32_t i = 0; i < 3; ++i) {
        const std::string path = in / (std::to_string(i) + ".ntf"), dump = out / (std::to_string(i) + ".raw");
        WriteFile(path, SmallFrameFile(CornersAt(179.25 + 0.5 * i, 40.0)));
        ASSERT_EQ(RunHost({"dump", path, dump}).exitCode, 0);
        const std::string pixels = ReadWholeFile(dump);
        for (uint32_t row = 0; row < kRpfFrameSide; ++row)
            std::memcpy(&expected[size_t(row) * width + i * kRpfFrameSide], &pixels[size_t(row) * kRpfFrameSide],
                        kRpfFrameSide);
    }
    const ProcessResult result = RunHost({"mosaic", "-o", out / "m.tif", in.path()});
    ASSERT_EQ(result.exitCode, 0) << result.err;
    EXPECT_NE(result.err.find("3 frames on 4608 x 1536 pixels"), std::string::npos) << result.err;
    const GdalReport gdal = ReadWithGdal(out / "m.tif");
    EXPECT_NEAR(gdal.X(0, 0), 179.25, 1e-9);
    EXPECT_NEAR(gdal.X(gdal.width, 0), 180.75, 1e-9);
    EXPECT_EQ(gdal.checksums, std::vector<uint32_t>{GdalChecksum(reinterpret_cast<const uint8_t*>(expected.data()),
                                                                 width, kRpfFrameSide)});
}

} // namespace
