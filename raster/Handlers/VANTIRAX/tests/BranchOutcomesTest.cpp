// What the host reads after RH_Open for each kind of file, and the rows it is
// then given: RPF frames and plain NITF images written by the fixture writers.
#include "tests/fixtures/HandlerLoader.h"
#include "tests/fixtures/NitfImageWriter.h"
#include "tests/fixtures/RpfFrameWriter.h"
#include "tests/fixtures/TempFiles.h"

#include <gtest/gtest.h>

#include <cstdlib>

namespace {

const HandlerExports& Handler()
{
    return LoadHandler(VX_HANDLER_PATH);
}

std::vector<uint8_t> PaletteOf(const RHHandle& handle)
{
    if (handle.palette == nullptr || handle.palette->entryCount <= 0)
        return {};
    return std::vector<uint8_t>(handle.palette->entries, handle.palette->entries + handle.palette->entryCount * 3);
}

TEST(RpfFrameOutcomes, CadrgFrameWithMaskedSubframes)
{
    RpfFramePlan layout;
    layout.indexImage = PatternIndexImage();
    layout.maskedSubframes = {0, 7, 35};
    RpfFrame frame = BuildRpfFrame(layout);
    TempFile file(frame.bytes, ".ntf");

    OpenedImage image(Handler(), file.path());
    ASSERT_TRUE(image.Ready());
    EXPECT_EQ(image.handle.width, 1536u);
    EXPECT_EQ(image.handle.height, 1536u);
    EXPECT_EQ(image.handle.pixelKind, kPixelPaletted);
    std::vector<uint8_t> palette = PaletteOf(image.handle);
    ASSERT_EQ(palette.size(), 217u * 3);
    for (size_t i = 0; i < 216; ++i)
        ASSERT_EQ(std::vector<uint8_t>(palette.begin() + i * 3, palette.begin() + i * 3 + 3),
                  std::vector<uint8_t>(frame.palette[i].begin(), frame.palette[i].end()))
            << i;
    EXPECT_EQ(std::vector<uint8_t>(palette.end() - 3, palette.end()), std::vector<uint8_t>(3, 255));

    const RHGeoRef* geoRef = image.handle.geoRef;
    ASSERT_NE(geoRef, nullptr);
    EXPECT_EQ(geoRef->epsgCode, 4326u);
    EXPECT_EQ(geoRef->controlPointCount, 3u);
    const double expected[3][4] = {{0, 0, -100, 40}, {1535, 0, -99.5, 40}, {0, 1535, -100, 39.5}};
    for (int i = 0; i < 3; ++i) {
        EXPECT_DOUBLE_EQ(geoRef->points[i].column, expected[i][0]);
        EXPECT_DOUBLE_EQ(geoRef->points[i].row, expected[i][1]);
        EXPECT_DOUBLE_EQ(geoRef->points[i].worldX, expected[i][2]);
        EXPECT_DOUBLE_EQ(geoRef->points[i].worldY, expected[i][3]);
    }

    std::vector<uint8_t> pixels;
    uint32_t failedRows = 0;
    ASSERT_TRUE(image.DrawAll(pixels, failedRows));
    EXPECT_EQ(failedRows, 0u);
    EXPECT_TRUE(pixels == ExpectedRpfPixels(layout));

    // A window inside the frame: the same pixels, any column span.
    ASSERT_TRUE(image.Draw(100, 1000, 777, 1004, pixels, failedRows));
    std::vector<uint8_t> whole = ExpectedRpfPixels(layout);
    for (int row = 0; row < 4; ++row)
        ASSERT_TRUE(std::equal(pixels.begin() + row * 677, pixels.begin() + (row + 1) * 677,
                               whole.begin() + (1000 + row) * 1536 + 100))
            << row;
}

TEST(RpfFrameOutcomes, LittleEndianCibFrameHasAGreyPalette)
{
    RpfFramePlan layout;
    layout.product = RpfProduct::Cib;
    layout.bigEndian = false;
    layout.indexImage = PatternIndexImage();
    TempFile file(BuildRpfFrame(layout).bytes, ".ntf");
    OpenedImage image(Handler(), file.path());
    ASSERT_TRUE(image.Ready());
    EXPECT_EQ(image.handle.pixelKind, kPixelPaletted);
    std::vector<uint8_t> palette = PaletteOf(image.handle);
    ASSERT_EQ(palette.size(), 217u * 3);
    for (size_t i = 0; i < 217; ++i)
        ASSERT_TRUE(palette[i * 3] == palette[i * 3 + 1] && palette[i * 3] == palette[i * 3 + 2]) << i;
    std::vector<uint8_t> pixels;
    uint32_t failedRows = 0;
    ASSERT_TRUE(image.DrawAll(pixels, failedRows));
    EXPECT_TRUE(pixels == ExpectedRpfPixels(layout));
}

TEST(RpfFrameOutcomes, ShortColourTableFailsThePaletteBuild)
{
    RpfFramePlan layout;
    layout.indexImage = std::vector<uint8_t>(kRpfFrameSide * kRpfFrameSide, 3);
    layout.colorTableRecords = {32};
    TempFile file(BuildRpfFrame(layout).bytes, ".ntf");
    OpenedImage image(Handler(), file.path());
    EXPECT_EQ(image.result, 0);
    EXPECT_EQ(image.handle.status, kStatusFailed);
    EXPECT_NE(image.handle.handler, nullptr);
}

TEST(RpfFrameOutcomes, StandInHostDumpsTheIndexImage)
{
    RpfFramePlan layout;
    layout.indexImage = PatternIndexImage();
    layout.maskedSubframes = {14};
    TempFile file(BuildRpfFrame(layout).bytes, ".ntf");
    TempFile dump(".raw");
    std::string command = std::string(VX_HOST_PATH) + " --handler " + VX_HANDLER_PATH + " dump " + file.path() +
                          " " + dump.path();
    ASSERT_EQ(std::system(command.c_str()), 0);
    std::string bytes = ReadWholeFile(dump.path());
    EXPECT_TRUE(std::vector<uint8_t>(bytes.begin(), bytes.end()) == ExpectedRpfPixels(layout));
}

// A plain NITF file holding one image of the given layout with a ramp of values.
std::string PlainImage(const NitfImagePlan& layout)
{
    PixelValue ramp = [](int32_t band, int32_t row, int32_t column) {
        return uint64_t(band * 50 + row * 3 + column) & 0xFF;
    };
    return BuildImageFile(layout, JoinBlocks(BuildImageBlocks(layout, ramp)));
}

NitfImagePlan Rgb(int32_t rows, int32_t columns)
{
    NitfImagePlan layout;
    layout.rows = rows;
    layout.columns = columns;
    layout.IREP = "RGB";
    layout.bands = {NitfBandPlan{"R", 0, 0, ""}, NitfBandPlan{"G", 0, 0, ""}, NitfBandPlan{"B", 0, 0, ""}};
    return layout;
}

TEST(PlainNitfOutcomes, ThreeBandRgbIsDirectWithoutPalette)
{
    NitfImagePlan layout = Rgb(6, 9);
    layout.IMODE = 'P';
    TempFile file(PlainImage(layout), ".ntf");
    OpenedImage image(Handler(), file.path());
    ASSERT_TRUE(image.Ready());
    EXPECT_EQ(image.handle.pixelKind, kPixelDirect);
    EXPECT_EQ(image.handle.palette, nullptr);
    EXPECT_EQ(image.handle.geoRef, nullptr); // ICORDS blank
    std::vector<uint8_t> pixels;
    uint32_t failedRows = 0;
    ASSERT_TRUE(image.DrawAll(pixels, failedRows));
    ASSERT_EQ(pixels.size(), 6u * 9 * 3);
    EXPECT_EQ(pixels[(2 * 9 + 4) * 3 + 1], 50 + 2 * 3 + 4); // green of row 2, column 4
}

TEST(PlainNitfOutcomes, LookupTableSizesThePalette)
{
    NitfImagePlan layout;
    layout.rows = layout.columns = 8;
    layout.IREP = "RGB/LUT";
    layout.bands = {NitfBandPlan{"LU", 3, 200, RgbLookupTables(200)}};
    TempFile file(PlainImage(layout), ".ntf");
    OpenedImage image(Handler(), file.path());
    ASSERT_TRUE(image.Ready());
    EXPECT_EQ(image.handle.pixelKind, kPixelPaletted);
    std::vector<uint8_t> palette = PaletteOf(image.handle);
    ASSERT_EQ(palette.size(), 200u * 3);
    EXPECT_EQ(palette[199 * 3 + 1], 255 - 199);
}

TEST(PlainNitfOutcomes, SixteenBitMonoIsGreyPaletted)
{
    NitfImagePlan layout;
    layout.rows = layout.columns = 4;
    layout.NBPP = 16;
    layout.ABPP = 11;
    TempFile file(PlainImage(layout), ".ntf");
    OpenedImage image(Handler(), file.path());
    ASSERT_TRUE(image.Ready());
    EXPECT_EQ(image.handle.pixelKind, kPixelGreyPaletted);
    std::vector<uint8_t> palette = PaletteOf(image.handle);
    ASSERT_EQ(palette.size(), 256u * 3);
    EXPECT_EQ(palette[77 * 3], 77);
    EXPECT_EQ(palette[77 * 3 + 2], 77);
}

// The record the host reads: the corners in their own units, and an EPSG
// code only when the corners name their coordinate system (0 otherwise).
TEST(PlainNitfOutcomes, CornersAndTheirEpsgCode)
{
    struct Case {
        char icords;
        const char* igeolo;
        uint32_t epsg;
        double points[3][2]; // world x, y of (0, 0), (19, 0), (0, 9)
    };
    const Case cases[] = {
        {'G', "400000N1000000W400000N0993000W393000N0993000W393000N1000000W", 4326,
         {{-100, 40}, {-99.5, 40}, {-100, 39.5}}},
        {'N', "335000004400000335010004400000335010004399000335000004399000", 32633,
         {{500000, 4400000}, {501000, 4400000}, {500000, 4399000}}},
        // Zone 00, an unknown form, a first MGRS corner in zone 32's missing
        // band X: corners (or none) and no code, never metres called degrees.
        {'N', "005000004400000005010004400000005010004399000005000004399000", 0,
         {{500000, 4400000}, {501000, 4400000}, {500000, 4399000}}},
        {'E', "400000N1000000W400000N0993000W393000N0993000W393000N1000000W", 0, {}},
        {'U', "32XNL000000000033XVL000000000033XVL000000000033XVL0000000000", 0,
         {{0, 0}, {400000, 9000000}, {400000, 9000000}}},
        // Across the 180 degree meridian: the east corners keep running east.
        {'G', "200000N1790000E200000N1790000W200000N1790000W190000N1790000E", 4326,
         {{179, 20}, {181, 20}, {179, 19}}},
        // Geocentric latitudes become geodetic.
        {'C', "325900N0850000E325900N0855803E321457N0855803E321457N0850000E", 4326,
         {{85, 33.1593159397}, {85.9675, 33.1593159397}, {85, 32.4230942273}}},
    };
    for (const Case& c : cases) {
        NitfImagePlan layout = Rgb(10, 20);
        layout.ICORDS = c.icords;
        layout.IGEOLO = c.igeolo;
        TempFile file(PlainImage(layout), ".ntf");
        OpenedImage image(Handler(), file.path());
        ASSERT_TRUE(image.Ready()) << c.igeolo;
        const RHGeoRef* geoRef = image.handle.geoRef;
        ASSERT_NE(geoRef, nullptr) << c.igeolo;
        EXPECT_EQ(geoRef->epsgCode, c.epsg) << c.igeolo;
        for (int i = 0; i < 3; ++i) {
            EXPECT_DOUBLE_EQ(geoRef->points[i].column, i == 1 ? 19 : 0);
            EXPECT_DOUBLE_EQ(geoRef->points[i].row, i == 2 ? 9 : 0);
            EXPECT_NEAR(geoRef->points[i].worldX, c.points[i][0], 1e-7) << c.igeolo << " point " << i;
            EXPECT_NEAR(geoRef->points[i].worldY, c.points[i][1], 1e-7) << c.igeolo << " point " << i;
        }
    }
}

TEST(PlainNitfOutcomes, UnservedCompressionCodes)
{
    NitfImagePlan layout;
    layout.rows = layout.columns = 8;
    layout.COMRAT = "00.0";
    layout.IC = "C2"; // parses, but is never served: result 1, status 5
    TempFile c2(BuildImageFile(layout, std::string(64, '\0')), ".ntf");
    OpenedImage dpcm(Handler(), c2.path());
    EXPECT_EQ(dpcm.result, 1);
    EXPECT_EQ(dpcm.handle.status, kStatusFailed);
    EXPECT_EQ(Handler().isFormat(c2.c_str()), 0);

    layout.IC = "C8"; // not even parsed: result 0, status 5
    TempFile c8(BuildImageFile(layout, std::string(64, '\0')), ".ntf");
    OpenedImage jpeg2000(Handler(), c8.path());
    EXPECT_EQ(jpeg2000.result, 0);
    EXPECT_EQ(jpeg2000.handle.status, kStatusFailed);
    EXPECT_NE(jpeg2000.handle.handler, nullptr);
}

} // namespace
