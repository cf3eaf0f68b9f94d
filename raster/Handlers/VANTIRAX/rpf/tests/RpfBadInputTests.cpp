// Damaged and hostile frames: every one gives a refused open or failed
// lines, never a read outside a buffer or an allocation the file cannot back.
#include "rpf/tests/RpfTestSupport.h"

#include <gtest/gtest.h>

#include <cmath>
#include <cstring>
#include <functional>

namespace {

using Patch = std::function<void(RpfFrame&)>;

// The frame every case damages: CADRG, big-endian, subframe 3 masked.
const RpfFrame& Frame()
{
    static const RpfFrame frame = [] {
        RpfFramePlan plan;
        plan.maskedSubframes = {3};
        return BuildRpfFrame(plan);
    }();
    return frame;
}

RpfFrame Patched(const Patch& patch)
{
    RpfFrame frame = Frame();
    patch(frame);
    return frame;
}

// A patch writing a number at an offset from a layout field.
Patch Put(uint32_t RpfFrameLayout::*field, uint32_t at, uint64_t value, unsigned width)
{
    return [=](RpfFrame& f) { PatchRpfNumber(f, f.layout.*field + at, value, width); };
}

Patch Each(const std::vector<Patch>& patches)
{
    return [=](RpfFrame& f) {
        for (const Patch& patch : patches)
            patch(f);
    };
}

Patch PutDouble(uint32_t at, double value)
{
    uint64_t bits = 0;
    std::memcpy(&bits, &value, sizeof bits);
    return Put(&RpfFrameLayout::coverage, at, bits, 8);
}

// A number in the lookup offset record of one table (after the 6-byte subsection header).
Patch PutLookup(uint32_t table, uint32_t at, uint64_t value, unsigned width)
{
    return Put(&RpfFrameLayout::lookupSubsection, 6 + table * 14 + at, value, width);
}
constexpr uint32_t kCoverageRecord = 14 + 2 * 10; // the third location record: 128, 129, 130

using L = RpfFrameLayout;

TEST(RpfBadInput, FieldsTheFrameCannotBeReadWithAreRefusedAtOpen)
{
    const uint32_t fileSize = uint32_t(Frame().bytes.size());
    struct Case {
        const char* what;
        Patch patch;
        bool opens;
    };
    const Case cases[] = {
        {"undamaged", [](RpfFrame&) {}, true},
        {"0 image rows", Put(&L::displayParameters, 0, 0, 4), false},
        {"0 codes per row", Put(&L::displayParameters, 4, 0, 4), false},
        {"kernel width 0", Put(&L::imageDescription, 12, 2, 4), false},
        {"kernel height 0", Put(&L::imageDescription, 16, 3, 4), false},
        {"part kernels", Put(&L::imageDescription, 12, 258, 4), false},
        {"location section past the file", Put(&L::headerSection, 44, fileSize + 8, 4), false},
        {"coverage past the file", Put(&L::locationSection, kCoverageRecord + 6, fileSize - 50, 4), false},
        {"coverage at 0xFFFFFFF0", Put(&L::locationSection, kCoverageRecord + 6, 0xFFFFFFF0, 4), false},
        {"65535 location records", Put(&L::locationSection, 6, 0xFFFF, 2), false},
        // No records: the coverage is read from offset 0, where "NITF" is no latitude.
        {"no location records", Put(&L::locationSection, 6, 0, 2), false},
        {"2^28 lookup records", PutLookup(0, 2, 0x10000000, 4), false},
        {"65535 lookup offset records", Put(&L::compressionSubheader, 2, 0xFFFF, 2), false},
        {"4 lookup records sharing a table of 60000",
         Each({PutLookup(0, 2, 60000, 4), PutLookup(0, 10, 62, 4), PutLookup(1, 2, 60000, 4), PutLookup(1, 10, 62, 4),
               PutLookup(2, 2, 60000, 4), PutLookup(2, 10, 62, 4), PutLookup(3, 2, 60000, 4), PutLookup(3, 10, 62, 4)}),
         false},
        {"2^31 colour records", Put(&L::colormapSubsection, 6 + 2, 0x7FFFFFFF, 4), false},
        {"mask table of 65535 x 65535",
         Each({Put(&L::imageDescription, 8, 0xFFFF, 2), Put(&L::imageDescription, 10, 0xFFFF, 2)}), false},
        {"2^30 codes per row", Put(&L::displayParameters, 4, 0x40000000, 4), false},
        {"compression algorithm 0", Put(&L::compressionSubheader, 0, 0, 2), false},
        {"compression algorithm 3", Put(&L::compressionSubheader, 0, 3, 2), false},
        {"compression parameter records", Put(&L::compressionSubheader, 4, 1, 2), false},
        {"lookup record length 13", Put(&L::lookupSubsection, 4, 13, 2), false},
        {"colour record length 16", Put(&L::colormapSubsection, 4, 16, 2), false},
        {"latitude 90", PutDouble(0, 90.0), true},
        {"longitude -180", PutDouble(8, -180.0), true},
        {"latitude 90.000001", PutDouble(0, 90.000001), false},
        {"longitude NaN", PutDouble(56, std::nan("")), false},
        {"a resolution is no corner", PutDouble(64, 1e9), true},
    };
    for (const Case& c : cases)
        EXPECT_EQ(OpenedFrame(Patched(c.patch)).opened, c.opens) << c.what;
    EXPECT_FALSE(OpenedFrame(Frame().bytes, fileSize + 100).opened);
    // A little-endian frame is held to the same ranges.
    RpfFramePlan little;
    little.product = RpfProduct::Cib;
    little.bigEndian = false;
    RpfFrame frame = BuildRpfFrame(little);
    EXPECT_TRUE(OpenedFrame(frame).opened);
    PutDouble(40, 200.0)(frame);
    EXPECT_FALSE(OpenedFrame(frame).opened);
}

// Damage that only some lines meet: the frame opens, those lines fail, the
// others decode as the undamaged frame does.
TEST(RpfBadInput, DamageOnlySomeLinesMeetFailsOnlyThoseLines)
{
    struct Line {
        uint32_t row, first, last;
        bool decodes;
    };
    struct Case {
        const char* what;
        Patch patch;
        std::vector<Line> lines;
    };
    const auto codeBits = [](char bits) { return [bits](RpfFrame& f) { f.bytes[f.layout.displayParameters + 8] = bits; }; };
    const Case cases[] = {
        {"11-bit codes", codeBits(11), {{0, 0, 1535, false}, {0, 260, 270, false}}},
        {"16-bit codes", codeBits(16), {{0, 0, 1535, false}, {0, 260, 270, false}}},
        {"0-bit codes", codeBits(0), {{0, 0, 1535, false}, {0, 260, 270, false}}},
        // Records of 2 values decode (see below); of 8 values, or of 16-bit values, no line of their kernel row.
        {"2 values a record", PutLookup(1, 6, 2, 2), {{6, 0, 1535, true}}},
        {"8 values a record", PutLookup(2, 6, 8, 2), {{6, 0, 1535, false}, {7, 0, 1535, true}}},
        {"16-bit values", PutLookup(3, 8, 16, 2), {{3, 0, 1535, false}, {4, 0, 1535, true}}},
        // 4-bit values: a masked code fills only the kernel (subframe 3), not the wider record.
        {"4-bit values", Each({PutLookup(0, 6, 8, 2), PutLookup(0, 8, 4, 2)}), {{0, 768, 1000, true}, {0, 0, 10, false}}},
        {"subframe 4 outside the file", Put(&L::maskSubsection, 6 + 4 * 4, 0x7FFFFF00, 4),
         {{10, 0, 1535, false}, {10, 0, 1023, true}, {11, 1024, 1100, false}, {300, 0, 1535, true}}},
        {"no lookup offset records", Put(&L::compressionSubheader, 2, 0, 2), {{0, 0, 1535, false}}},
        {"cut in the third subframe", [](RpfFrame& f) { f.bytes.resize(f.layout.spatialData + 2 * kRpfSubframeBytes + 500); },
         {{0, 0, 767, true}, {30, 0, 767, false}, {0, 0, 1535, false}, {1, 0, 511, true}}},
        {"the second compression algorithm", Put(&L::compressionSubheader, 0, 2, 2),
         {{0, 0, 1535, true}, {801, 3, 1535, true}, {1535, 0, 1535, true}}},
    };
    RpfFramePlan undamaged;
    undamaged.maskedSubframes = {3};
    const std::vector<uint8_t> expected = ExpectedRpfPixels(undamaged);
    for (const Case& c : cases) {
        OpenedFrame frame(Patched(c.patch));
        ASSERT_TRUE(frame.opened) << c.what;
        for (const Line& line : c.lines) {
            const auto from = expected.begin() + line.row * kRpfFrameSide;
            EXPECT_EQ(frame.Line(line.row, line.first, line.last),
                      line.decodes ? std::vector<uint8_t>(from + line.first, from + line.last + 1) : std::vector<uint8_t>())
                << c.what << ": row " << line.row << " columns " << line.first << ".." << line.last;
        }
    }
    const RpfFrameLayout& at = Frame().layout;
    for (uint32_t cut : {at.headerSection + 20, at.locationSection + 30, at.coverage + 50,
                         at.colormapSubsection + 200, at.lookupSubsection + 40000})
        EXPECT_FALSE(OpenedFrame(Frame().bytes.substr(0, cut), at.headerSection).opened) << cut;
}

TEST(RpfBadInput, OddButReadableSections)
{
    // Table 1 with 2 values a record: columns 2 and 3 of each code on rows 4k+1 show the masked pixel.
    OpenedFrame narrow(Patched(PutLookup(1, 6, 2, 2)));
    ASSERT_TRUE(narrow.opened);
    const std::vector<uint8_t> row5 = narrow.Line(5);
    ASSERT_FALSE(row5.empty());
    for (uint32_t column = 2; column < 256; column += 4)
        ASSERT_EQ(row5[column], kRpfMaskedPixel) << column;

    // A component listed twice: the first record in file order counts.
    OpenedFrame twice(Patched([](RpfFrame& f) {
        const uint32_t record = f.layout.locationSection + kCoverageRecord;
        PatchRpfNumber(f, record - 10, kCoverageSectionSubheader, 2);
        PatchRpfNumber(f, record - 4, f.layout.coverage, 4);
        PatchRpfNumber(f, record + 6, 0, 4);
    }));
    ASSERT_TRUE(twice.opened);
    EXPECT_EQ(twice.reader.FindComponentLocation(kCoverageSectionSubheader), Frame().layout.coverage);
    EXPECT_EQ(twice.reader.FindComponentLocation(kColorConverterSubsection), 0u);

    // No colour tables: the frame opens without a palette.
    OpenedFrame none(Patched([](RpfFrame& f) { f.bytes[f.layout.colorGraySubheader] = 0; }));
    ASSERT_TRUE(none.opened);
    EXPECT_FALSE(none.reader.colorGraySection.IsColorTable() || none.reader.colorGraySection.IsGrayTable());
    uint8_t grey = 0;
    EXPECT_FALSE(none.reader.colorGraySection.GetPaletteGray(0, grey));
}

} // namespace
