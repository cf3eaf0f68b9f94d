// The frame reader on frames written by the fixture writer: spans it refuses,
// the table its palette comes from, the unpacking of 12-bit codes.
#include "rpf/tests/RpfTestSupport.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <cstdint>

namespace {

TEST(RpfFrameReader, RefusesSpansOutsideTheFrameOrTheDraw)
{
    OpenedFrame frame(BuildRpfFrame(RpfFramePlan{}));
    ASSERT_TRUE(frame.opened);
    CRpfFrameReader& reader = frame.reader;
    std::vector<uint8_t> line(kRpfFrameSide + 1);
    reader.PrepareDraw(kRpfFrameSide);
    EXPECT_FALSE(reader.ReadLine(frame.drawReader, 1536, 0, 10, line.data()));
    EXPECT_FALSE(reader.ReadLine(frame.drawReader, 0, 0, 1536, line.data()));
    EXPECT_FALSE(reader.ReadLine(frame.drawReader, 0, 10, 9, line.data()));
    // Draws as wide as a host may ask: the code buffer holds no more than a frame row's codes.
    for (uint32_t drawWidth : {uint32_t(INT32_MAX), UINT32_MAX}) {
        reader.PrepareDraw(drawWidth);
        EXPECT_EQ(reader.codeBuffer.size(), kRpfFrameSide / 4 + 2) << drawWidth;
        EXPECT_TRUE(reader.ReadLine(frame.drawReader, 9, 3, 700, line.data())) << drawWidth;
    }
    reader.PrepareDraw(8); // a span wider than the draw was prepared for is refused, not overrun
    EXPECT_FALSE(reader.ReadLine(frame.drawReader, 0, 0, 100, line.data()));
    reader.ReleaseCodeBuffer();
    EXPECT_FALSE(reader.ReadLine(frame.drawReader, 0, 0, 3, line.data()));
}

// The palette comes from the only table, or the first of 216 records (see
// the GDAL comparison for its entries); past it a colour table reads white.
TEST(RpfFrameReader, PaletteTableIsTheOnlyOneOrTheFirstOf216Records)
{
    struct Case {
        RpfProduct product;
        std::vector<uint32_t> records; // empty: the writer's 216, 32, 16 (CADRG) or 216 (CIB)
        int selected;                  // index of the palette table, -1 none
    };
    for (const Case& c : {Case{RpfProduct::Cadrg, {}, 0}, {RpfProduct::Cib, {}, 0}, {RpfProduct::Cadrg, {32}, 0},
                          {RpfProduct::Cadrg, {32, 16}, -1}, {RpfProduct::Cadrg, {32, 216}, 1}}) {
        RpfFramePlan plan;
        plan.product = c.product;
        plan.colorTableRecords = c.records;
        OpenedFrame frame(BuildRpfFrame(plan));
        ASSERT_TRUE(frame.opened);
        RpfColorGraySection& colors = frame.reader.colorGraySection;
        const bool colour = c.product == RpfProduct::Cadrg && c.selected >= 0;
        EXPECT_EQ(colors.FindPaletteTable(), c.selected < 0 ? nullptr : &colors.colorTables.at(size_t(c.selected)));
        EXPECT_EQ(colors.IsColorTable(), colour);
        EXPECT_EQ(colors.IsGrayTable(), c.product == RpfProduct::Cib);
        const uint32_t records = c.records.empty() ? 216 : c.records[size_t(std::max(c.selected, 0))];
        uint8_t red = 0, green = 0, blue = 0;
        EXPECT_EQ(colors.GetPaletteColor(records - 1, red, green, blue), colour);
        EXPECT_FALSE(colors.GetPaletteColor(records, red, green, blue));
        EXPECT_EQ(colour && colors.GetPaletteColor(300, red, green, blue) && red + green + blue == 3 * 255, colour);
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
