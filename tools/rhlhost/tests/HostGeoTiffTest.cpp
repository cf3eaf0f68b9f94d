// rhlhost render to GeoTIFF, read back by GDAL: the coordinate system and the
// corners that `rhlhost info` reports, and the pixels that `rhlhost dump`
// delivers. The control points' world positions are the image's outer
// corners, so GDAL's corner coordinates equal them and one pixel spans a
// width-th of the top edge.
#include "GdalReport.h"
#include "HostProcess.h"
#include "HostSamples.h"
#include "tests/fixtures/NitfFileWriter.h"
#include "tests/fixtures/TempFiles.h"

#include <gtest/gtest.h>

#include <filesystem>

namespace {

constexpr double kDegreeTolerance = 1e-9;
constexpr double kMetreTolerance = 1e-3;

struct Rendered {
    TempDirectory directory;
    std::string input, tiff, raw;
    GdalReport gdal;
    HostInfo info;
};

// Writes the file, renders and dumps it (optionally a window) and reads both back.
void Render(const std::string& bytes, Rendered& r, const std::vector<std::string>& window = {})
{
    r.input = r.directory / "input.ntf";
    r.tiff = r.directory / "out.tif";
    r.raw = r.directory / "dump.raw";
    WriteFile(r.input, bytes);
    std::vector<std::string> render = {"render", r.input, r.tiff}, dump = {"dump", r.input, r.raw};
    render.insert(render.end(), window.begin(), window.end());
    dump.insert(dump.end(), window.begin(), window.end());
    ProcessResult rendered = RunHost(render);
    ASSERT_EQ(rendered.exitCode, 0) << rendered.err;
    ASSERT_EQ(RunHost(dump).exitCode, 0);
    r.gdal = ReadWithGdal(r.tiff);
    r.info = ReadHostInfo(r.input);
    ASSERT_TRUE(r.gdal.read);
    ASSERT_EQ(r.info.points.size(), 3u);
}

// GDAL's upper-left, upper-right and lower-left corners against the control points.
void ExpectCornersMatch(const Rendered& r, double tolerance)
{
    const GdalReport& g = r.gdal;
    const double w = g.width, h = g.height;
    const double corners[3][2] = {{g.X(0, 0), g.Y(0, 0)}, {g.X(w, 0), g.Y(w, 0)}, {g.X(0, h), g.Y(0, h)}};
    for (size_t i = 0; i < 3; ++i) {
        EXPECT_NEAR(corners[i][0], r.info.points[i][2], tolerance) << "point " << i;
        EXPECT_NEAR(corners[i][1], r.info.points[i][3], tolerance) << "point " << i;
    }
}

TEST(HostGeoTiff, CadrgFrameKeepsItsCornersPaletteAndIndices)
{
    Rendered r;
    Render(FrameFile(), r);
    EXPECT_EQ(r.gdal.epsg, 4326);
    EXPECT_EQ(r.gdal.width, kRpfFrameSide);
    ExpectCornersMatch(r, kDegreeTolerance);
    EXPECT_NEAR(r.gdal.X(kRpfFrameSide, kRpfFrameSide), -99.5, kDegreeTolerance);
    EXPECT_NEAR(r.gdal.Y(kRpfFrameSide, kRpfFrameSide), 39.5, kDegreeTolerance);
    EXPECT_NEAR(r.gdal.geoTransform[1], 0.5 / kRpfFrameSide, 1e-15) << "a pixel is a 1536th of the frame";

    ASSERT_EQ(r.gdal.colourInterpretations, std::vector<std::string>{"Palette"});
    ASSERT_GE(r.gdal.colourTable.size(), r.info.palette.size());
    for (size_t i = 0; i < r.info.palette.size(); ++i)
        EXPECT_EQ(r.gdal.colourTable[i], r.info.palette[i]) << "entry " << i;
    EXPECT_TRUE(r.gdal.hasNodata);
    EXPECT_EQ(r.gdal.nodata, kRpfMaskedPixel);
    EXPECT_EQ(r.gdal.checksums, RawChecksums(r.raw, kRpfFrameSide, kRpfFrameSide, 1));
}

TEST(HostGeoTiff, CibFrameBecomesGreyValues)
{
    Rendered r;
    Render(FrameFile({}, RpfProduct::Cib, {7}), r);
    EXPECT_EQ(r.gdal.colourInterpretations, std::vector<std::string>{"Gray"});
    ExpectCornersMatch(r, kDegreeTolerance);
    // The dump holds indices: map them through the grey palette for GDAL to sum.
    std::string indices = ReadWholeFile(r.raw);
    for (char& value : indices)
        value = char(r.info.palette.at(uint8_t(value))[0]);
    WriteFile(r.raw, indices);
    EXPECT_EQ(r.gdal.checksums, RawChecksums(r.raw, kRpfFrameSide, kRpfFrameSide, 1));
}

TEST(HostGeoTiff, UtmRgbImageKeepsItsZoneAndMetres)
{
    Rendered r;
    Render(UtmRgbImage(), r);
    EXPECT_EQ(r.gdal.epsg, 32633);
    EXPECT_EQ(r.gdal.colourInterpretations, (std::vector<std::string>{"Red", "Green", "Blue"}));
    ExpectCornersMatch(r, kMetreTolerance);
    EXPECT_NEAR(r.gdal.geoTransform[1], kUtmPixel, 1e-9);
    EXPECT_EQ(r.gdal.checksums, RawChecksums(r.raw, r.gdal.width, r.gdal.height, 3));
}

TEST(HostGeoTiff, RotatedCornersGiveAFullTransform)
{
    Rendered r;
    Render(RotatedGreyImage(), r);
    EXPECT_EQ(r.gdal.epsg, 4326);
    EXPECT_NE(r.gdal.geoTransform[2], 0.0);
    EXPECT_NE(r.gdal.geoTransform[4], 0.0);
    ExpectCornersMatch(r, kDegreeTolerance);
    EXPECT_EQ(r.gdal.checksums, RawChecksums(r.raw, r.gdal.width, r.gdal.height, 1));
}

TEST(HostGeoTiff, WindowIsShiftedOnTheSameGrid)
{
    Rendered whole, window;
    Render(FrameFile(), whole);
    Render(FrameFile(), window, {"--window", "100,200,400,300"});
    EXPECT_EQ(window.gdal.width, 300u);
    EXPECT_EQ(window.gdal.height, 100u);
    EXPECT_NEAR(window.gdal.X(0, 0), whole.gdal.X(100, 200), kDegreeTolerance);
    EXPECT_NEAR(window.gdal.Y(0, 0), whole.gdal.Y(100, 200), kDegreeTolerance);
    EXPECT_NEAR(window.gdal.X(300, 100), whole.gdal.X(400, 300), kDegreeTolerance);
    EXPECT_NEAR(window.gdal.Y(300, 100), whole.gdal.Y(400, 300), kDegreeTolerance);
    EXPECT_EQ(window.gdal.checksums, RawChecksums(window.raw, 300, 100, 1));
}

TEST(HostGeoTiff, PngShowsThePaletteColours)
{
    TempDirectory directory;
    const std::string input = directory / "frame.ntf";
    WriteFile(input, FrameFile());
    ASSERT_EQ(RunHost({"render", input, directory / "a.png", "--window", "0,0,64,64"}).exitCode, 0);
    ASSERT_EQ(RunHost({"render", input, directory / "a.tif", "--window", "0,0,64,64"}).exitCode, 0);
    const GdalReport png = ReadWithGdal(directory / "a.png");
    ASSERT_EQ(png.checksums.size(), 3u);
    // The PNG's colours are the TIFF's palette entries: GDAL expands the TIFF to RGB.
    ASSERT_EQ(RunProgram({"gdal_translate", "-q", "-expand", "rgb", directory / "a.tif", directory / "rgb.tif"})
                  .exitCode,
              0);
    EXPECT_EQ(png.checksums, ReadWithGdal(directory / "rgb.tif").checksums);
}

TEST(HostGeoTiff, InfoTextNamesSizeKindPaletteAndCorners)
{
    TempDirectory directory;
    const std::string frame = directory / "frame.ntf", utm = directory / "utm.ntf";
    WriteFile(frame, FrameFile());
    WriteFile(utm, UtmRgbImage());
    const std::string text = RunHost({"info", frame, "--text"}).out;
    EXPECT_NE(text.find("1536 x 1536 pixels"), std::string::npos) << text;
    EXPECT_NE(text.find("217 entries"), std::string::npos) << text;
    EXPECT_NE(text.find("EPSG:4326"), std::string::npos) << text;
    EXPECT_NE(text.find("longitude -100.000000000  latitude 40.000000000"), std::string::npos) << text;
    EXPECT_NE(text.find("longitude -99.500000000  latitude 39.500000000"), std::string::npos) << text;
    const std::string utmText = RunHost({"info", utm, "--text"}).out;
    EXPECT_NE(utmText.find("EPSG:32633 (WGS 84 / UTM zone 33N, metres)"), std::string::npos) << utmText;
    EXPECT_NE(utmText.find("three bytes per pixel"), std::string::npos) << utmText;
}

TEST(HostGeoTiff, UnwritableOutputLeavesNothing)
{
    TempDirectory directory;
    const std::string input = directory / "frame.ntf";
    WriteFile(input, SmallFrameFile());
    // A regular file where a directory should be: unwritable even for root.
    const std::string output = input + "/out.tif";
    ProcessResult result = RunHost({"render", input, output});
    EXPECT_EQ(result.exitCode, 1);
    EXPECT_NE(result.err.find("cannot write " + output), std::string::npos) << result.err;
    ProcessResult refused = RunHost({"render", directory / "missing.ntf", directory / "out.tif"});
    EXPECT_EQ(refused.exitCode, 1);
    EXPECT_FALSE(std::filesystem::exists(directory / "out.tif"));
    EXPECT_EQ(std::distance(std::filesystem::directory_iterator(directory.path()), {}), 1);
}

} // namespace
