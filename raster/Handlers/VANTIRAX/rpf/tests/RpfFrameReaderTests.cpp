// The frame reader on frames written by the fixture writer: both byte orders,
// both products, masked subframes, column spans and the line allocation rule.
#include "rpf/tests/RpfTestSupport.h"

#include <gtest/gtest.h>

#include <atomic>
#include <cstdlib>
#include <new>

namespace {

std::atomic<size_t> allocatedBytes{0};

} // namespace

// Counts the bytes of every allocation of the test program, for the line
// allocation and draw width tests.
void* operator new(size_t size)
{
    size = size ? size : 1;
    allocatedBytes += size;
    if (void* memory = std::malloc(size))
        return memory;
    throw std::bad_alloc();
}
void operator delete(void* memory) noexcept
{
    std::free(memory);
}
void operator delete(void* memory, size_t) noexcept
{
    std::free(memory);
}

namespace {

void ExpectFrameDecodes(RpfProduct product, bool bigEndian, const std::set<uint32_t>& masked)
{
    RpfFramePlan plan;
    plan.product = product;
    plan.bigEndian = bigEndian;
    plan.maskedSubframes = masked;
    RpfFrame frame = BuildRpfFrame(plan);
    auto opened = OpenFrame(frame);
    ASSERT_TRUE(opened->opened);
    CRpfFrameReader& reader = opened->reader;
    EXPECT_EQ(reader.headerSection.bigEndian, bigEndian);
    EXPECT_EQ(reader.imageSection.kernelWidth, 4);
    EXPECT_EQ(reader.imageSection.kernelHeight, 4);
    EXPECT_EQ(reader.imageSection.totalColumns, kRpfFrameSide);
    EXPECT_EQ(reader.imageSection.totalRows, kRpfFrameSide);
    EXPECT_DOUBLE_EQ(reader.coverage.northWestLatitude, 40.0);
    EXPECT_DOUBLE_EQ(reader.coverage.northEastLongitude, -99.5);
    EXPECT_DOUBLE_EQ(reader.coverage.southWestLatitude, 39.5);
    EXPECT_EQ(reader.compressionSection.lookupTables.size(), 4u);
    EXPECT_EQ(DecodeWholeFrame(*opened), ExpectedRpfPixels(plan));
}

} // namespace

TEST(RpfFrameReader, DecodesEveryPixelInBothByteOrdersAndProducts)
{
    ExpectFrameDecodes(RpfProduct::Cadrg, true, {});
    ExpectFrameDecodes(RpfProduct::Cadrg, false, {});
    ExpectFrameDecodes(RpfProduct::Cib, true, {});
    ExpectFrameDecodes(RpfProduct::Cib, false, {0, 7, 35});
}

TEST(RpfFrameReader, MaskedSubframesDecodeToTheMaskedPixel)
{
    ExpectFrameDecodes(RpfProduct::Cadrg, true, {1, 14, 20, 35});

    RpfFramePlan plan;
    plan.maskedSubframes = {1};
    auto opened = OpenFrame(BuildRpfFrame(plan));
    ASSERT_TRUE(opened->opened);
    std::vector<uint8_t> expected = ExpectedRpfPixels(plan);
    CRpfFrameReader& reader = opened->reader;
    reader.PrepareDraw(700);
    // A span from subframe 0 through masked subframe 1 into subframe 2.
    std::vector<uint8_t> line(700, 0);
    ASSERT_TRUE(reader.ReadLine(opened->drawReader, 9, 100, 799, line.data()));
    EXPECT_EQ(line, std::vector<uint8_t>(expected.begin() + 9 * kRpfFrameSide + 100,
                                         expected.begin() + 9 * kRpfFrameSide + 800));
    EXPECT_EQ(line[300], kRpfMaskedPixel);
    // A span inside the masked subframe fills the whole code capacity with the masked code.
    ASSERT_TRUE(reader.ReadLine(opened->drawReader, 3, 260, 270, line.data()));
    EXPECT_EQ(std::vector<uint8_t>(line.begin(), line.begin() + 11), std::vector<uint8_t>(11, kRpfMaskedPixel));
    EXPECT_EQ(reader.codeBuffer.back(), kMaskedCode);
}

TEST(RpfFrameReader, ServesAnyColumnSpanAndRefusesSpansOutsideTheFrame)
{
    RpfFramePlan plan;
    auto opened = OpenFrame(BuildRpfFrame(plan));
    ASSERT_TRUE(opened->opened);
    std::vector<uint8_t> expected = ExpectedRpfPixels(plan);
    CRpfFrameReader& reader = opened->reader;
    struct Span {
        uint32_t row, first, last;
        uint32_t drawWidth = 0; // the host's span width, when not last - first + 1
    };
    // Inside one code, across code and subframe boundaries, one column, whole
    // rows; draws as wide as a host may ask, for which the code buffer still
    // holds no more than a frame row's codes.
    const Span spans[] = {{5, 1, 10},       {6, 2, 2},           {7, 3, 4},         {8, 0, 3},
                          {255, 250, 262},  {256, 255, 256},     {1535, 0, 1535},   {1000, 1535, 1535},
                          {77, 511, 1029},  {3, 0, 1535, INT32_MAX}, {9, 3, 700, UINT32_MAX}};
    const size_t frameRowOfCodes = (kRpfFrameSide / 4 + 2) * sizeof(uint16_t);
    for (const Span& span : spans) {
        uint32_t width = span.last - span.first + 1;
        const size_t before = allocatedBytes;
        reader.PrepareDraw(span.drawWidth != 0 ? span.drawWidth : width);
        EXPECT_LE(allocatedBytes - before, frameRowOfCodes) << "draw width " << span.drawWidth;
        std::vector<uint8_t> line(width + 1, 0xEE);
        ASSERT_TRUE(reader.ReadLine(opened->drawReader, span.row, span.first, span.last, line.data()));
        auto from = expected.begin() + span.row * kRpfFrameSide + span.first;
        EXPECT_EQ(std::vector<uint8_t>(line.begin(), line.end() - 1), std::vector<uint8_t>(from, from + width))
            << "row " << span.row << " columns " << span.first << ".." << span.last;
        EXPECT_EQ(line.back(), 0xEE) << "wrote past the span";
    }
    reader.PrepareDraw(kRpfFrameSide);
    EXPECT_EQ(reader.codeCapacity, 386u);
    std::vector<uint8_t> line(kRpfFrameSide + 1);
    EXPECT_FALSE(reader.ReadLine(opened->drawReader, 1536, 0, 10, line.data()));
    EXPECT_FALSE(reader.ReadLine(opened->drawReader, 0, 0, 1536, line.data()));
    EXPECT_FALSE(reader.ReadLine(opened->drawReader, 0, 10, 9, line.data()));
    // A span wider than the draw was prepared for is refused, not overrun.
    reader.PrepareDraw(8);
    EXPECT_FALSE(reader.ReadLine(opened->drawReader, 0, 0, 100, line.data()));
    reader.ReleaseCodeBuffer();
    EXPECT_FALSE(reader.ReadLine(opened->drawReader, 0, 0, 3, line.data()));
}

TEST(RpfFrameReader, ReadLineAllocatesNothingAfterItsFirstCall)
{
    auto opened = OpenFrame(BuildTestFrame(RpfProduct::Cadrg, true, {4}));
    ASSERT_TRUE(opened->opened);
    CRpfFrameReader& reader = opened->reader;
    std::vector<uint8_t> line(kRpfFrameSide);
    reader.PrepareDraw(kRpfFrameSide);
    ASSERT_TRUE(reader.ReadLine(opened->drawReader, 0, 0, kRpfFrameSide - 1, line.data()));
    size_t before = allocatedBytes.load();
    for (uint32_t row = 1; row < kRpfFrameSide; row += 3)
        ASSERT_TRUE(reader.ReadLine(opened->drawReader, row, row % 700, kRpfFrameSide - 1, line.data()));
    EXPECT_EQ(allocatedBytes.load(), before);
}

TEST(RpfFrameReader, PaletteTablesOfCadrgAndCib)
{
    RpfFrame cadrg = BuildTestFrame(RpfProduct::Cadrg, true);
    auto color = OpenFrame(cadrg);
    ASSERT_TRUE(color->opened);
    RpfColorGraySection& colors = color->reader.colorGraySection;
    EXPECT_EQ(colors.colorTables.size(), 3u);
    EXPECT_TRUE(colors.IsColorTable());
    EXPECT_FALSE(colors.IsGrayTable());
    for (uint32_t index : {0u, 1u, 100u, 215u}) {
        uint8_t red = 0, green = 0, blue = 0;
        ASSERT_TRUE(colors.GetPaletteColor(index, red, green, blue));
        EXPECT_EQ((std::array<uint8_t, 3>{red, green, blue}), cadrg.palette[index]);
    }
    uint8_t red = 0, green = 0, blue = 0, grey = 0;
    EXPECT_FALSE(colors.GetPaletteColor(216, red, green, blue)); // past the 216 records
    EXPECT_TRUE(colors.GetPaletteColor(300, red, green, blue));
    EXPECT_EQ(red + green + blue, 3 * 255);
    // A colour record's grey is its fourth, monochrome byte.
    const auto& rgb = cadrg.palette[200];
    ASSERT_TRUE(colors.GetPaletteGray(200, grey));
    EXPECT_EQ(grey, (rgb[0] * 30 + rgb[1] * 59 + rgb[2] * 11) / 100);
    EXPECT_TRUE(colors.GetPaletteGray(217, grey));
    EXPECT_EQ(grey, 255);

    RpfFrame cib = BuildTestFrame(RpfProduct::Cib, false);
    auto gray = OpenFrame(cib);
    ASSERT_TRUE(gray->opened);
    EXPECT_TRUE(gray->reader.colorGraySection.IsGrayTable());
    EXPECT_FALSE(gray->reader.colorGraySection.IsColorTable());
    ASSERT_TRUE(gray->reader.colorGraySection.GetPaletteGray(215, grey));
    EXPECT_EQ(grey, cib.palette[215][0]);
    EXPECT_FALSE(gray->reader.colorGraySection.GetPaletteColor(3, red, green, blue));
}

TEST(RpfFrameReader, TableSelectionAmongSeveralTables)
{
    RpfFramePlan plan;
    plan.colorTableRecords = {32};
    auto single = OpenFrame(BuildRpfFrame(plan));
    ASSERT_TRUE(single->opened);
    uint8_t red = 0, green = 0, blue = 0;
    EXPECT_TRUE(single->reader.colorGraySection.IsColorTable());
    EXPECT_TRUE(single->reader.colorGraySection.GetPaletteColor(31, red, green, blue));
    EXPECT_FALSE(single->reader.colorGraySection.GetPaletteColor(32, red, green, blue));

    plan.colorTableRecords = {32, 16};
    auto none = OpenFrame(BuildRpfFrame(plan));
    ASSERT_TRUE(none->opened);
    EXPECT_FALSE(none->reader.colorGraySection.IsColorTable());
    EXPECT_FALSE(none->reader.colorGraySection.IsGrayTable());
    EXPECT_EQ(none->reader.colorGraySection.FindPaletteTable(), nullptr);

    plan.colorTableRecords = {32, 216};
    auto second = OpenFrame(BuildRpfFrame(plan));
    ASSERT_TRUE(second->opened);
    EXPECT_EQ(second->reader.colorGraySection.FindPaletteTable(), &second->reader.colorGraySection.colorTables[1]);
}

TEST(RpfUnpackCodes, TwelveBitCodesMostSignificantFirst)
{
    const uint8_t packed[] = {0xAB, 0xCD, 0xEF, 0x12, 0x34, 0x56};
    uint16_t codes[4] = {};
    ASSERT_TRUE(UnpackCodes(packed, 6, codes, 4, 12));
    EXPECT_EQ(codes[0], 0xABC);
    EXPECT_EQ(codes[1], 0xDEF);
    EXPECT_EQ(codes[2], 0x123);
    EXPECT_EQ(codes[3], 0x456);
    uint16_t untouched[2] = {7, 7};
    EXPECT_FALSE(UnpackCodes(packed, 6, untouched, 2, 11));
    EXPECT_EQ(untouched[0], 7);
    // A last code cut by the byte count takes zero bits past it, reads nothing there.
    uint16_t cut[2] = {};
    ASSERT_TRUE(UnpackCodes(packed, 2, cut, 2, 12));
    EXPECT_EQ(cut[1], 0xD00);
}
