// The frame reader on frames written by the fixture writer: column spans,
// palettes and the rule that a line allocates nothing once a draw has started.
#include "rpf/tests/RpfTestSupport.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <atomic>
#include <cstdlib>
#include <new>

namespace {
std::atomic<size_t> allocationCount{0};
} // namespace

// Every allocation of the test program is counted. None of these is inlined:
// GCC would then see a free of a pointer from operator new.
__attribute__((noinline)) void* operator new(size_t size)
{
    ++allocationCount;
    if (void* memory = std::malloc(size ? size : 1))
        return memory;
    throw std::bad_alloc();
}
__attribute__((noinline)) void operator delete(void* memory) noexcept
{
    std::free(memory);
}
__attribute__((noinline)) void operator delete(void* memory, size_t) noexcept
{
    std::free(memory);
}

namespace {

TEST(RpfFrameReader, ServesAnyColumnSpanAndRefusesSpansOutsideTheFrame)
{
    RpfFramePlan plan;
    plan.maskedSubframes = {1};
    OpenedFrame frame(BuildRpfFrame(plan));
    ASSERT_TRUE(frame.opened);
    const std::vector<uint8_t> expected = ExpectedRpfPixels(plan);
    CRpfFrameReader& reader = frame.reader;
    // Inside one code, across code and subframe boundaries, one column, whole
    // rows, through masked subframe 1 and inside it.
    const uint32_t spans[][3] = {{5, 1, 10},      {6, 2, 2},       {7, 3, 4},          {8, 0, 3},
                                 {255, 250, 262}, {256, 255, 256}, {1535, 0, 1535},    {1000, 1535, 1535},
                                 {77, 511, 1029}, {9, 100, 799},   {3, 260, 270}};
    for (const auto& [row, first, last] : spans) {
        reader.PrepareDraw(last - first + 1);
        std::vector<uint8_t> line(last - first + 2, 0xEE);
        ASSERT_TRUE(reader.ReadLine(frame.drawReader, row, first, last, line.data()));
        const auto from = expected.begin() + row * kRpfFrameSide + first;
        EXPECT_EQ(std::vector<uint8_t>(line.begin(), line.end() - 1), std::vector<uint8_t>(from, from + line.size() - 1))
            << "row " << row << " columns " << first << ".." << last;
        EXPECT_EQ(line.back(), 0xEE) << "wrote past the span";
    }
    EXPECT_EQ(reader.codeBuffer.back(), MaskedCode); // the span inside the masked subframe
    reader.PrepareDraw(kRpfFrameSide);
    EXPECT_EQ(reader.codeCapacity, 386u);
    std::vector<uint8_t> line(kRpfFrameSide + 1);
    EXPECT_FALSE(reader.ReadLine(frame.drawReader, 1536, 0, 10, line.data()));
    EXPECT_FALSE(reader.ReadLine(frame.drawReader, 0, 0, 1536, line.data()));
    EXPECT_FALSE(reader.ReadLine(frame.drawReader, 0, 10, 9, line.data()));
    // A span wider than the draw was prepared for is refused, not overrun.
    reader.PrepareDraw(8);
    EXPECT_FALSE(reader.ReadLine(frame.drawReader, 0, 0, 100, line.data()));
    reader.ReleaseCodeBuffer();
    EXPECT_FALSE(reader.ReadLine(frame.drawReader, 0, 0, 3, line.data()));
}

TEST(RpfFrameReader, ReadLineAllocatesNothingAfterItsFirstCall)
{
    RpfFramePlan plan;
    plan.maskedSubframes = {4};
    OpenedFrame frame(BuildRpfFrame(plan));
    ASSERT_TRUE(frame.opened);
    std::vector<uint8_t> line(kRpfFrameSide);
    frame.reader.PrepareDraw(kRpfFrameSide);
    ASSERT_TRUE(frame.reader.ReadLine(frame.drawReader, 0, 0, kRpfFrameSide - 1, line.data()));
    const size_t before = allocationCount.load();
    for (uint32_t row = 1; row < kRpfFrameSide; row += 3)
        ASSERT_TRUE(frame.reader.ReadLine(frame.drawReader, row, row % 700, kRpfFrameSide - 1, line.data()));
    EXPECT_EQ(allocationCount.load(), before);
}

// The palette comes from the only table, or the first of 216 records; colour
// records also give their grey (the fourth byte). Indices past 216 are white.
TEST(RpfFrameReader, PaletteFromTheColourOrGreyTableOf216Records)
{
    struct Case {
        RpfProduct product;
        std::vector<uint32_t> records; // empty: the writer's defaults
        int selected;                  // index of the palette table, -1 none
    };
    for (const Case& c : {Case{RpfProduct::Cadrg, {}, 0}, {RpfProduct::Cib, {}, 0}, {RpfProduct::Cadrg, {32}, 0},
                          {RpfProduct::Cadrg, {32, 16}, -1}, {RpfProduct::Cadrg, {32, 216}, 1}}) {
        RpfFramePlan plan;
        plan.product = c.product;
        plan.colorTableRecords = c.records;
        const RpfFrame written = BuildRpfFrame(plan);
        OpenedFrame frame(written);
        ASSERT_TRUE(frame.opened);
        RpfColorGraySection& colors = frame.reader.colorGraySection;
        const bool colour = c.product == RpfProduct::Cadrg && c.selected >= 0;
        EXPECT_EQ(colors.FindPaletteTable(), c.selected < 0 ? nullptr : &colors.colorTables.at(size_t(c.selected)));
        EXPECT_EQ(colors.IsColorTable(), colour);
        EXPECT_EQ(colors.IsGrayTable(), c.product == RpfProduct::Cib);
        const uint32_t records = c.records.empty() ? 216 : c.records[size_t(std::max(c.selected, 0))];
        uint8_t red = 0, green = 0, blue = 0, grey = 0;
        EXPECT_EQ(colors.GetPaletteColor(records - 1, red, green, blue), colour);
        EXPECT_FALSE(colors.GetPaletteColor(records, red, green, blue));
        if (!c.records.empty())
            continue;
        const auto& rgb = written.palette[200];
        ASSERT_TRUE(colors.GetPaletteGray(200, grey));
        EXPECT_EQ(grey, colour ? (rgb[0] * 30 + rgb[1] * 59 + rgb[2] * 11) / 100 : rgb[0]);
        ASSERT_TRUE(colors.GetPaletteColor(300, red, green, blue) && colors.GetPaletteGray(217, grey));
        EXPECT_EQ(std::vector<int>({red, green, blue, grey}), std::vector<int>(4, 255));
    }
}

TEST(RpfUnpackCodes, TwelveBitCodesMostSignificantFirst)
{
    const uint8_t packed[] = {0xAB, 0xCD, 0xEF, 0x12, 0x34, 0x56};
    uint16_t codes[4] = {};
    ASSERT_TRUE(UnpackCodes(packed, 6, codes, 4, 12));
    EXPECT_EQ(std::vector<uint16_t>(codes, codes + 4), (std::vector<uint16_t>{0xABC, 0xDEF, 0x123, 0x456}));
    uint16_t untouched[2] = {7, 7};
    EXPECT_FALSE(UnpackCodes(packed, 6, untouched, 2, 11));
    EXPECT_EQ(untouched[0], 7);
    // A last code cut by the byte count takes zero bits past it, reads nothing there.
    ASSERT_TRUE(UnpackCodes(packed, 2, codes, 2, 12));
    EXPECT_EQ(codes[1], 0xD00);
}

} // namespace
