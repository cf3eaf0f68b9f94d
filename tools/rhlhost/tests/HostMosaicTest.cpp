// rhlhost mosaic: frames placed by their corners on one EPSG 4326 grid, the
// uncovered and masked parts nodata, frames of another coordinate system refused.
#include "GdalReport.h"
#include "HostProcess.h"
#include "HostSamples.h"
#include "tests/fixtures/NitfFileWriter.h"
#include "tests/fixtures/TempFiles.h"

#include <gtest/gtest.h>

#include <cstring>
#include <fstream>

namespace {

constexpr double kDegreeTolerance = 1e-9;
constexpr double kFrameDegrees = 0.5;
constexpr uint32_t kGridSide = 2 * kRpfFrameSide;

RpfCorners CornersAt(double west, double north)
{
    RpfCorners c;
    c.northWestLongitude = c.southWestLongitude = west;
    c.northEastLongitude = c.southEastLongitude = west + kFrameDegrees;
    c.northWestLatitude = c.northEastLatitude = north;
    c.southWestLatitude = c.southEastLatitude = north - kFrameDegrees;
    return c;
}

struct Placed {
    std::string name;
    uint32_t column, row; // grid position of its first pixel
};

// Three of the four frames of a 2 x 2 block: the south-east quarter stays empty.
const std::vector<Placed> kFrames = {{"nw.ntf", 0, 0}, {"ne.ntf", kRpfFrameSide, 0}, {"sw.ntf", 0, kRpfFrameSide}};

void WriteBlock(const TempDirectory& in)
{
    WriteFile(in / "nw.ntf", FrameFile(CornersAt(-100.0, 40.0), RpfProduct::Cadrg, {0, 35}));
    WriteFile(in / "ne.ntf", FrameFile(CornersAt(-99.5, 40.0)));
    WriteFile(in / "sw.ntf", FrameFile(CornersAt(-100.0, 39.5)));
}

// The grid as the frames' dumps say it should be, nodata around them.
std::string ExpectedGrid(const TempDirectory& in)
{
    std::string grid(size_t(kGridSide) * kGridSide, char(kRpfMaskedPixel));
    for (const Placed& frame : kFrames) {
        const std::string dump = in / (frame.name + ".raw");
        EXPECT_EQ(RunHost({"dump", in / frame.name, dump}).exitCode, 0);
        const std::string pixels = ReadWholeFile(dump);
        for (uint32_t row = 0; row < kRpfFrameSide; ++row)
            std::memcpy(&grid[size_t(frame.row + row) * kGridSide + frame.column], &pixels[size_t(row) * kRpfFrameSide],
                        kRpfFrameSide);
    }
    return grid;
}

TEST(HostMosaic, FramesMeetOnOneGridWithNodataAround)
{
    TempDirectory in, out;
    WriteBlock(in);
    const std::string mosaic = out / "mosaic.tif";
    ProcessResult result = RunHost({"mosaic", "-o", mosaic, in.path()});
    ASSERT_EQ(result.exitCode, 0) << result.err;
    EXPECT_NE(result.err.find("3 frames on 3072 x 3072 pixels"), std::string::npos) << result.err;

    const GdalReport gdal = ReadWithGdal(mosaic);
    EXPECT_EQ(gdal.epsg, 4326);
    EXPECT_EQ(gdal.width, kGridSide);
    EXPECT_EQ(gdal.height, kGridSide);
    EXPECT_NEAR(gdal.X(0, 0), -100.0, kDegreeTolerance);
    EXPECT_NEAR(gdal.Y(0, 0), 40.0, kDegreeTolerance);
    EXPECT_NEAR(gdal.X(kGridSide, kGridSide), -99.0, kDegreeTolerance);
    EXPECT_NEAR(gdal.Y(kGridSide, kGridSide), 39.0, kDegreeTolerance);
    EXPECT_EQ(gdal.colourInterpretations, std::vector<std::string>{"Palette"});
    EXPECT_TRUE(gdal.hasNodata);
    EXPECT_EQ(gdal.nodata, kRpfMaskedPixel);

    const std::string raw = out / "expected.raw";
    WriteFile(raw, ExpectedGrid(in));
    EXPECT_EQ(gdal.checksums, RawChecksums(raw, kGridSide, kGridSide, 1));
}

TEST(HostMosaic, OtherCoordinateSystemsAreRefusedAndTheRestPlaced)
{
    TempDirectory in, out;
    WriteFile(in / "frame.ntf", SmallFrameFile());
    WriteFile(in / "utm.ntf", UtmRgbImage());
    WriteFile(in / "notes.txt", "not an image");
    ProcessResult result = RunHost({"mosaic", "-o", out / "m.tif", in.path()});
    EXPECT_EQ(result.exitCode, 1);
    EXPECT_NE(result.err.find("utm.ntf: EPSG:32633 (WGS 84 / UTM zone 33N, metres): a mosaic takes EPSG:4326 "
                              "frames only"),
              std::string::npos)
        << result.err;
    EXPECT_NE(result.err.find("1 frames on 1536 x 1536 pixels, 1 refused, 1 not recognised"), std::string::npos)
        << result.err;
    EXPECT_EQ(ReadWithGdal(out / "m.tif").width, kRpfFrameSide);
}

TEST(HostMosaic, FramesOfDifferentColoursBecomeRgbWithAlpha)
{
    TempDirectory in, out;
    WriteFile(in / "a.ntf", SmallFrameFile(CornersAt(-100.0, 40.0)));
    WriteFile(in / "b.ntf", FrameFile(CornersAt(-99.5, 40.0), RpfProduct::Cib));
    ASSERT_EQ(RunHost({"mosaic", "-o", out / "m.tif", in / "a.ntf", in / "b.ntf"}).exitCode, 0);
    const GdalReport gdal = ReadWithGdal(out / "m.tif");
    EXPECT_EQ(gdal.colourInterpretations, (std::vector<std::string>{"Red", "Green", "Blue", "Alpha"}));
    EXPECT_EQ(gdal.width, kGridSide);
    EXPECT_EQ(gdal.height, kRpfFrameSide);
}

TEST(HostMosaic, NothingToPlaceWritesNothing)
{
    TempDirectory in, out;
    WriteFile(in / "utm.ntf", UtmRgbImage());
    ProcessResult result = RunHost({"mosaic", "-o", out / "m.tif", in.path()});
    EXPECT_EQ(result.exitCode, 1);
    EXPECT_NE(result.err.find("no frame to place in the mosaic"), std::string::npos) << result.err;
    EXPECT_FALSE(std::ifstream(out / "m.tif").good());
}

} // namespace
