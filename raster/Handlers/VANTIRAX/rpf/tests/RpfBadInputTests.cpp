// Damaged and hostile frames: every one gives a refused open or failed
// lines, never a read outside a buffer or an allocation the file cannot back.
#include "rpf/tests/RpfTestSupport.h"

#include <gtest/gtest.h>

#include <cmath>
#include <cstring>
#include <functional>

namespace {

using L = RpfFrameLayout;

// A number written over the frame at an offset from one of its parts.
struct Edit {
    uint32_t L::*part;
    uint32_t at;
    uint64_t value;
    unsigned width;
};

uint64_t Bits(double value)
{
    uint64_t bits = 0;
    std::memcpy(&bits, &value, sizeof bits);
    return bits;
}

constexpr uint32_t kCoverageRecord = 14 + 2 * 10; // the third location record: 128, 129, 130

// A field of the lookup offset record of a table (after the 6-byte subsection header).
constexpr uint32_t Lookup(uint32_t table, uint32_t field)
{
    return 6 + table * 14 + field;
}

TEST(RpfBadInput, RefusedAtOpenOrOnlyTheLinesTheDamageMeets)
{
    RpfFramePlan plan; // CADRG, big-endian, subframe 3 masked
    plan.maskedSubframes = {3};
    const RpfFrame frame = BuildRpfFrame(plan);
    const std::vector<uint8_t> expected = ExpectedRpfPixels(plan);
    const uint32_t fileSize = uint32_t(frame.bytes.size());
    struct Line {
        uint32_t row, first, last;
        bool decodes; // as the undamaged frame
    };
    struct Case {
        const char* what;
        std::vector<Edit> edits;
        bool opens;
        std::vector<Line> lines = {};
        std::function<void(OpenedFrame&)> alsoCheck = nullptr;
    };
    const Case cases[] = {
        // Spans inside one code, across code and subframe boundaries, one column, whole rows,
        // into and inside masked subframe 3.
        {"undamaged", {}, true, {{5, 1, 10, true}, {6, 2, 2, true}, {7, 3, 4, true}, {8, 0, 3, true},
          {255, 250, 262, true}, {256, 255, 256, true}, {1535, 0, 1535, true}, {1000, 1535, 1535, true},
          {77, 511, 1029, true}, {9, 600, 1100, true}, {3, 780, 790, true}}},
        {"0 image rows", {{&L::displayParameters, 0, 0, 4}}, false},
        {"0 codes per row", {{&L::displayParameters, 4, 0, 4}}, false},
        {"2^30 codes per row", {{&L::displayParameters, 4, 0x40000000, 4}}, false},
        {"kernel width 0", {{&L::imageDescription, 12, 2, 4}}, false},
        {"kernel height 0", {{&L::imageDescription, 16, 3, 4}}, false},
        {"part kernels", {{&L::imageDescription, 12, 258, 4}}, false},
        {"mask table of 65535 x 65535",
         {{&L::imageDescription, 8, 0xFFFF, 2}, {&L::imageDescription, 10, 0xFFFF, 2}}, false},
        {"location section past the file", {{&L::headerSection, 44, fileSize + 8, 4}}, false},
        {"coverage past the file", {{&L::locationSection, kCoverageRecord + 6, fileSize - 50, 4}}, false},
        {"coverage at 0xFFFFFFF0", {{&L::locationSection, kCoverageRecord + 6, 0xFFFFFFF0, 4}}, false},
        {"65535 location records", {{&L::locationSection, 6, 0xFFFF, 2}}, false},
        // No records: the coverage is read from offset 0, where "NITF" is no latitude.
        {"no location records", {{&L::locationSection, 6, 0, 2}}, false},
        {"2^28 lookup records", {{&L::lookupSubsection, Lookup(0, 2), 0x10000000, 4}}, false},
        {"65535 lookup offset records", {{&L::compressionSubheader, 2, 0xFFFF, 2}}, false},
        {"4 lookup records sharing a table of 60000",
         {{&L::lookupSubsection, Lookup(0, 2), 60000, 4}, {&L::lookupSubsection, Lookup(0, 10), 62, 4},
          {&L::lookupSubsection, Lookup(1, 2), 60000, 4}, {&L::lookupSubsection, Lookup(1, 10), 62, 4},
          {&L::lookupSubsection, Lookup(2, 2), 60000, 4}, {&L::lookupSubsection, Lookup(2, 10), 62, 4},
          {&L::lookupSubsection, Lookup(3, 2), 60000, 4}, {&L::lookupSubsection, Lookup(3, 10), 62, 4}},
         false},
        {"2^31 colour records", {{&L::colormapSubsection, 6 + 2, 0x7FFFFFFF, 4}}, false},
        {"compression algorithm 0", {{&L::compressionSubheader, 0, 0, 2}}, false},
        {"compression algorithm 3", {{&L::compressionSubheader, 0, 3, 2}}, false},
        {"compression parameter records", {{&L::compressionSubheader, 4, 1, 2}}, false},
        {"lookup record length 13", {{&L::lookupSubsection, 4, 13, 2}}, false},
        {"colour record length 16", {{&L::colormapSubsection, 4, 16, 2}}, false},
        {"latitude 90", {{&L::coverage, 0, Bits(90.0), 8}}, true},
        {"longitude -180", {{&L::coverage, 8, Bits(-180.0), 8}}, true},
        {"latitude 90.000001", {{&L::coverage, 0, Bits(90.000001), 8}}, false},
        {"longitude NaN", {{&L::coverage, 56, Bits(std::nan("")), 8}}, false},
        {"a resolution is no corner", {{&L::coverage, 64, Bits(1e9), 8}}, true},
        {"11-bit codes", {{&L::displayParameters, 8, 11, 1}}, true, {{0, 0, 1535, false}, {0, 260, 270, false}}},
        {"16-bit codes", {{&L::displayParameters, 8, 16, 1}}, true, {{0, 0, 1535, false}, {0, 260, 270, false}}},
        {"0-bit codes", {{&L::displayParameters, 8, 0, 1}}, true, {{0, 0, 1535, false}, {0, 260, 270, false}}},
        // Lookup records of 2 values decode (the rest of the kernel row masked, see below); of 8
        // values, or of 16-bit values, no line of their kernel row.
        {"2 values a record", {{&L::lookupSubsection, Lookup(1, 6), 2, 2}}, true, {{6, 0, 1535, true}},
         [](OpenedFrame& opened) { // columns 2 and 3 of each code on rows 4k + 1 show the masked pixel
             const std::vector<uint8_t> row = opened.Line(5);
             for (uint32_t column = 2; column < 256 && !row.empty(); column += 4)
                 ASSERT_EQ(row[column] + row[column + 1], 2 * kRpfMaskedPixel) << column;
         }},
        {"8 values a record", {{&L::lookupSubsection, Lookup(2, 6), 8, 2}}, true,
         {{6, 0, 1535, false}, {7, 0, 1535, true}}},
        {"16-bit values", {{&L::lookupSubsection, Lookup(3, 8), 16, 2}}, true,
         {{3, 0, 1535, false}, {4, 0, 1535, true}}},
        // 4-bit values: a masked code fills only the kernel (subframe 3), not the wider record.
        {"4-bit values", {{&L::lookupSubsection, Lookup(0, 6), 8, 2}, {&L::lookupSubsection, Lookup(0, 8), 4, 2}}, true,
         {{0, 768, 1000, true}, {0, 0, 10, false}}},
        {"subframe 4 outside the file", {{&L::maskSubsection, 6 + 4 * 4, 0x7FFFFF00, 4}}, true,
         {{10, 0, 1535, false}, {10, 0, 1023, true}, {11, 1024, 1100, false}, {300, 0, 1535, true}}},
        {"no lookup offset records", {{&L::compressionSubheader, 2, 0, 2}}, true, {{0, 0, 1535, false}}},
        {"the second compression algorithm", {{&L::compressionSubheader, 0, 2, 2}}, true,
         {{0, 0, 1535, true}, {801, 3, 1535, true}, {1535, 0, 1535, true}}},
        {"no colour tables", {{&L::colorGraySubheader, 0, 0, 1}}, true, {{0, 0, 1535, true}},
         [](OpenedFrame& opened) {
             uint8_t grey = 0;
             RpfColorGraySection& colors = opened.reader.colorGraySection;
             EXPECT_FALSE(colors.IsColorTable() || colors.IsGrayTable() || colors.GetPaletteGray(0, grey));
         }},
    };
    for (const Case& c : cases) {
        RpfFrame damaged = frame;
        for (const Edit& edit : c.edits)
            PatchRpfNumber(damaged, damaged.layout.*edit.part + edit.at, edit.value, edit.width);
        OpenedFrame opened(damaged);
        ASSERT_EQ(opened.opened, c.opens) << c.what;
        for (const Line& line : c.lines) {
            const auto from = expected.begin() + line.row * kRpfFrameSide;
            const std::vector<uint8_t> undamaged(from + line.first, from + line.last + 1);
            EXPECT_EQ(opened.Line(line.row, line.first, line.last), line.decodes ? undamaged : std::vector<uint8_t>())
                << c.what << ": row " << line.row << " columns " << line.first << ".." << line.last;
        }
        if (c.alsoCheck)
            c.alsoCheck(opened);
    }
    EXPECT_FALSE(OpenedFrame(frame.bytes, fileSize + 100).opened);
    // Cut short: before the spatial data the frame is refused; in it, the lines past the cut fail.
    const RpfFrameLayout& at = frame.layout;
    for (uint32_t cut : {at.headerSection + 20, at.locationSection + 30, at.coverage + 50, at.colormapSubsection + 200,
                         at.lookupSubsection + 40000})
        EXPECT_FALSE(OpenedFrame(frame.bytes.substr(0, cut), at.headerSection).opened) << cut;
    OpenedFrame cut(frame.bytes.substr(0, at.spatialData + 2 * kRpfSubframeBytes + 500), at.headerSection);
    ASSERT_TRUE(cut.opened);
    for (const auto& [row, first, last, decodes] :
         {std::tuple{0u, 0u, 767u, true}, {30u, 0u, 767u, false}, {0u, 0u, 1535u, false}, {1u, 0u, 511u, true}})
        EXPECT_EQ(cut.Line(row, first, last).empty(), !decodes) << row << " " << first << ".." << last;
    // A little-endian frame is held to the same ranges.
    RpfFramePlan littlePlan;
    littlePlan.product = RpfProduct::Cib;
    littlePlan.bigEndian = false;
    RpfFrame little = BuildRpfFrame(littlePlan);
    EXPECT_TRUE(OpenedFrame(little).opened);
    PatchRpfNumber(little, little.layout.coverage + 40, Bits(200.0), 8);
    EXPECT_FALSE(OpenedFrame(little).opened);
    // A component listed twice: the first record in file order counts.
    RpfFrame twice = frame;
    const uint32_t record = frame.layout.locationSection + kCoverageRecord;
    PatchRpfNumber(twice, record - 10, kCoverageSectionSubheader, 2);
    PatchRpfNumber(twice, record - 4, frame.layout.coverage, 4);
    PatchRpfNumber(twice, record + 6, 0, 4);
    OpenedFrame first(twice);
    ASSERT_TRUE(first.opened);
    EXPECT_EQ(first.reader.FindComponentLocation(kCoverageSectionSubheader), frame.layout.coverage);
    EXPECT_EQ(first.reader.FindComponentLocation(kColorConverterSubsection), 0u);
}

} // namespace
