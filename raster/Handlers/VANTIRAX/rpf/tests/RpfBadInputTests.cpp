// Damaged and hostile frames: every one gives a refused open or failed
// lines, never a read outside a buffer or an allocation the file cannot back.
#include "rpf/tests/RpfTestSupport.h"

#include <gtest/gtest.h>

#include <cmath>
#include <cstring>
#include <functional>
#include <limits>

namespace {

// Record positions inside the sections the writer lays out.
constexpr uint32_t kLocationRecords = 14;
constexpr uint32_t kCoverageRecordIndex = 2; // 128, 129, 130, ...
constexpr uint32_t kLookupRecords = 6;
constexpr uint32_t kColorRecords = 6;

uint32_t LookupRecord(const RpfFrame& frame, uint32_t table)
{
    return frame.layout.lookupSubsection + kLookupRecords + table * 14;
}

std::unique_ptr<OpenedFrame> OpenPatched(RpfFrame frame, const std::function<void(RpfFrame&)>& patch)
{
    patch(frame);
    return OpenFrame(frame);
}

bool Opens(const RpfFrame& frame, const std::function<void(RpfFrame&)>& patch)
{
    return OpenPatched(frame, patch)->opened;
}

bool LineDecodes(OpenedFrame& opened, uint32_t row, uint32_t first = 0, uint32_t last = kRpfFrameSide - 1)
{
    std::vector<uint8_t> line(kRpfFrameSide);
    opened.reader.PrepareDraw(kRpfFrameSide);
    return opened.reader.ReadLine(opened.drawReader, row, first, last, line.data());
}

void PatchDouble(RpfFrame& frame, uint32_t offset, double value)
{
    uint64_t bits = 0;
    std::memcpy(&bits, &value, sizeof bits);
    PatchRpfNumber(frame, offset, bits, 8);
}

class RpfBadInput : public ::testing::Test {
protected:
    static void SetUpTestSuite() { frame_ = new RpfFrame(BuildTestFrame(RpfProduct::Cadrg, true, {3})); }
    static void TearDownTestSuite() { delete frame_; }
    static RpfFrame* frame_;
};
RpfFrame* RpfBadInput::frame_ = nullptr;

} // namespace

TEST_F(RpfBadInput, GeometryWithoutADecodableKernelIsRefusedAtOpen)
{
    const RpfFrame& frame = *frame_;
    const uint32_t display = frame.layout.displayParameters, description = frame.layout.imageDescription;
    EXPECT_TRUE(Opens(frame, [](RpfFrame&) {}));
    EXPECT_FALSE(Opens(frame, [&](RpfFrame& f) { PatchRpfNumber(f, display, 0, 4); }));       // 0 image rows
    EXPECT_FALSE(Opens(frame, [&](RpfFrame& f) { PatchRpfNumber(f, display + 4, 0, 4); }));   // 0 codes per row
    EXPECT_FALSE(Opens(frame, [&](RpfFrame& f) { PatchRpfNumber(f, description + 12, 2, 4); })); // kernel width 0
    EXPECT_FALSE(Opens(frame, [&](RpfFrame& f) { PatchRpfNumber(f, description + 16, 3, 4); })); // kernel height 0
    EXPECT_FALSE(Opens(frame, [&](RpfFrame& f) { PatchRpfNumber(f, description + 12, 258, 4); })); // part kernels
}

TEST_F(RpfBadInput, CodeBitLengthOtherThanTwelveOpensButEveryLineFails)
{
    for (uint8_t bits : {11, 16, 0}) {
        auto opened = OpenPatched(*frame_, [&](RpfFrame& f) { f.bytes[f.layout.displayParameters + 8] = char(bits); });
        ASSERT_TRUE(opened->opened) << int(bits);
        EXPECT_FALSE(LineDecodes(*opened, 0)) << int(bits);
        EXPECT_FALSE(LineDecodes(*opened, 0, 260, 270)) << "masked subframe, " << int(bits);
    }
}

TEST_F(RpfBadInput, LookupRecordsNarrowerOrWiderThanTheKernel)
{
    std::vector<uint8_t> expected = ExpectedRpfPixels(RpfFramePlan{});
    // Table 1 with 2 values per record: columns 2 and 3 of each code on rows 4k+1 show the masked pixel.
    auto narrow = OpenPatched(*frame_, [](RpfFrame& f) { PatchRpfNumber(f, LookupRecord(f, 1) + 6, 2, 2); });
    ASSERT_TRUE(narrow->opened);
    std::vector<uint8_t> line(kRpfFrameSide);
    narrow->reader.PrepareDraw(kRpfFrameSide);
    ASSERT_TRUE(narrow->reader.ReadLine(narrow->drawReader, 5, 0, kRpfFrameSide - 1, line.data()));
    for (uint32_t column = 2; column < 256; column += 4)
        ASSERT_EQ(line[column], kRpfMaskedPixel) << column;
    ASSERT_TRUE(narrow->reader.ReadLine(narrow->drawReader, 6, 0, kRpfFrameSide - 1, line.data()));
    EXPECT_TRUE(std::equal(line.begin(), line.begin() + 768, expected.begin() + 6 * kRpfFrameSide));

    // Records of 8 values, or of 16-bit values, decode no line of their kernel row.
    auto wide = OpenPatched(*frame_, [](RpfFrame& f) { PatchRpfNumber(f, LookupRecord(f, 2) + 6, 8, 2); });
    ASSERT_TRUE(wide->opened);
    EXPECT_FALSE(LineDecodes(*wide, 6));
    EXPECT_TRUE(LineDecodes(*wide, 7));
    auto sixteen = OpenPatched(*frame_, [](RpfFrame& f) { PatchRpfNumber(f, LookupRecord(f, 3) + 8, 16, 2); });
    ASSERT_TRUE(sixteen->opened);
    EXPECT_FALSE(LineDecodes(*sixteen, 3));
    // A table of 4-bit values: a masked code fills only the kernel, not the wider record.
    auto nibbles = OpenPatched(*frame_, [](RpfFrame& f) {
        PatchRpfNumber(f, LookupRecord(f, 0) + 6, 8, 2);
        PatchRpfNumber(f, LookupRecord(f, 0) + 8, 4, 2);
    });
    ASSERT_TRUE(nibbles->opened);
    EXPECT_TRUE(LineDecodes(*nibbles, 0, 768, 1000)); // subframe 3 is masked
    EXPECT_FALSE(LineDecodes(*nibbles, 0, 0, 10));
}

TEST_F(RpfBadInput, LocationSectionPointingOutsideTheFile)
{
    const RpfFrame& frame = *frame_;
    const uint32_t fileSize = static_cast<uint32_t>(frame.bytes.size());
    const uint32_t coverageRecord = frame.layout.locationSection + kLocationRecords + kCoverageRecordIndex * 10;
    EXPECT_FALSE(OpenFrame(frame.bytes, fileSize + 100)->opened);
    EXPECT_FALSE(Opens(frame, [&](RpfFrame& f) { PatchRpfNumber(f, f.layout.headerSection + 44, fileSize + 8, 4); }));
    EXPECT_FALSE(Opens(frame, [&](RpfFrame& f) { PatchRpfNumber(f, coverageRecord + 6, fileSize - 50, 4); }));
    EXPECT_FALSE(Opens(frame, [&](RpfFrame& f) { PatchRpfNumber(f, coverageRecord + 6, 0xFFFFFFF0, 4); }));
    EXPECT_FALSE(Opens(frame, [&](RpfFrame& f) { PatchRpfNumber(f, f.layout.locationSection + 6, 0xFFFF, 2); }));
    // No records: the coverage is read from offset 0, where "NITF" is no latitude.
    EXPECT_FALSE(Opens(frame, [&](RpfFrame& f) { PatchRpfNumber(f, f.layout.locationSection + 6, 0, 2); }));
    // A component listed twice: the first record in file order counts.
    auto twice = OpenPatched(frame, [&](RpfFrame& f) {
        PatchRpfNumber(f, coverageRecord - 10, kCoverageSectionSubheader, 2);
        PatchRpfNumber(f, coverageRecord - 4, f.layout.coverage, 4);
        PatchRpfNumber(f, coverageRecord + 6, 0, 4);
    });
    ASSERT_TRUE(twice->opened);
    EXPECT_EQ(twice->reader.FindComponentLocation(kCoverageSectionSubheader), frame.layout.coverage);
    EXPECT_EQ(twice->reader.FindComponentLocation(kColorConverterSubsection), 0u);
}

TEST_F(RpfBadInput, MaskEntryOutsideTheFileFailsOnlyItsLines)
{
    auto opened = OpenPatched(*frame_, [](RpfFrame& f) {
        PatchRpfNumber(f, f.layout.maskSubsection + 6 + 4 * 4, 0x7FFFFF00, 4); // subframe 4
    });
    ASSERT_TRUE(opened->opened);
    EXPECT_FALSE(LineDecodes(*opened, 10));
    EXPECT_TRUE(LineDecodes(*opened, 10, 0, 1023));
    EXPECT_FALSE(LineDecodes(*opened, 11, 1024, 1100));
    EXPECT_TRUE(LineDecodes(*opened, 300)); // the reader stays usable
}

TEST_F(RpfBadInput, CountsNeedingMoreMemoryThanTheFileHolds)
{
    const RpfFrame& frame = *frame_;
    EXPECT_FALSE(Opens(frame, [](RpfFrame& f) { PatchRpfNumber(f, LookupRecord(f, 0) + 2, 0x10000000, 4); }));
    EXPECT_FALSE(Opens(frame, [](RpfFrame& f) { PatchRpfNumber(f, f.layout.compressionSubheader + 2, 0xFFFF, 2); }));
    // Four offset records sharing one table of 60,000 records would each claim most of the file.
    EXPECT_FALSE(Opens(frame, [](RpfFrame& f) {
        for (uint32_t table = 0; table < 4; ++table) {
            PatchRpfNumber(f, LookupRecord(f, table) + 2, 60000, 4);
            PatchRpfNumber(f, LookupRecord(f, table) + 10, 62, 4);
        }
    }));
    EXPECT_FALSE(Opens(frame, [](RpfFrame& f) {
        PatchRpfNumber(f, f.layout.colormapSubsection + kColorRecords + 2, 0x7FFFFFFF, 4);
    }));
    EXPECT_FALSE(Opens(frame, [](RpfFrame& f) { // a mask table of 65535 x 65535 entries
        PatchRpfNumber(f, f.layout.imageDescription + 8, 0xFFFF, 2);
        PatchRpfNumber(f, f.layout.imageDescription + 10, 0xFFFF, 2);
    }));
    EXPECT_FALSE(Opens(frame, [](RpfFrame& f) { PatchRpfNumber(f, f.layout.displayParameters + 4, 0x40000000, 4); }));
}

TEST_F(RpfBadInput, TruncatedFrames)
{
    const RpfFrame& frame = *frame_;
    for (uint32_t cut : {frame.layout.headerSection + 20, frame.layout.locationSection + 30,
                         frame.layout.coverage + 50, frame.layout.colormapSubsection + 200,
                         frame.layout.lookupSubsection + 40000})
        EXPECT_FALSE(OpenFrame(frame.bytes.substr(0, cut), frame.layout.headerSection)->opened) << cut;
    // Cut inside the spatial data: the frame opens; lines past the cut fail.
    auto opened = OpenFrame(frame.bytes.substr(0, frame.layout.spatialData + 2 * kRpfSubframeBytes + 500),
                            frame.layout.headerSection);
    ASSERT_TRUE(opened->opened);
    EXPECT_TRUE(LineDecodes(*opened, 0, 0, 767));
    EXPECT_FALSE(LineDecodes(*opened, 30, 0, 767));
    EXPECT_FALSE(LineDecodes(*opened, 0));
    EXPECT_TRUE(LineDecodes(*opened, 1, 0, 511));
}

TEST_F(RpfBadInput, CompressionSectionChecks)
{
    const RpfFrame& frame = *frame_;
    const uint32_t subheader = frame.layout.compressionSubheader;
    EXPECT_FALSE(Opens(frame, [&](RpfFrame& f) { PatchRpfNumber(f, subheader, 0, 2); }));
    EXPECT_FALSE(Opens(frame, [&](RpfFrame& f) { PatchRpfNumber(f, subheader, 3, 2); }));
    EXPECT_FALSE(Opens(frame, [&](RpfFrame& f) { PatchRpfNumber(f, subheader + 4, 1, 2); }));
    EXPECT_FALSE(Opens(frame, [&](RpfFrame& f) { PatchRpfNumber(f, f.layout.lookupSubsection + 4, 13, 2); }));
    auto second = OpenPatched(frame, [&](RpfFrame& f) { PatchRpfNumber(f, subheader, 2, 2); });
    ASSERT_TRUE(second->opened);
    RpfFramePlan plan;
    plan.maskedSubframes = {3};
    EXPECT_EQ(DecodeWholeFrame(*second), ExpectedRpfPixels(plan));
    auto tableless = OpenPatched(frame, [&](RpfFrame& f) { PatchRpfNumber(f, subheader + 2, 0, 2); });
    ASSERT_TRUE(tableless->opened);
    EXPECT_FALSE(LineDecodes(*tableless, 0));
}

TEST_F(RpfBadInput, ColorSectionChecks)
{
    const RpfFrame& frame = *frame_;
    EXPECT_FALSE(Opens(frame, [](RpfFrame& f) { PatchRpfNumber(f, f.layout.colormapSubsection + 4, 16, 2); }));
    auto none = OpenPatched(frame, [](RpfFrame& f) { f.bytes[f.layout.colorGraySubheader] = 0; });
    ASSERT_TRUE(none->opened);
    EXPECT_FALSE(none->reader.colorGraySection.IsColorTable());
    EXPECT_FALSE(none->reader.colorGraySection.IsGrayTable());
    uint8_t grey = 0;
    EXPECT_FALSE(none->reader.colorGraySection.GetPaletteGray(0, grey));
}

TEST_F(RpfBadInput, CoverageCornerRangesInBothByteOrders)
{
    const uint32_t coverage = frame_->layout.coverage;
    EXPECT_TRUE(Opens(*frame_, [&](RpfFrame& f) { PatchDouble(f, coverage, 90.0); }));
    EXPECT_TRUE(Opens(*frame_, [&](RpfFrame& f) { PatchDouble(f, coverage + 8, -180.0); }));
    EXPECT_FALSE(Opens(*frame_, [&](RpfFrame& f) { PatchDouble(f, coverage, 90.000001); }));
    EXPECT_FALSE(Opens(*frame_, [&](RpfFrame& f) { PatchDouble(f, coverage + 56, std::nan("")); }));
    // The resolutions and intervals are not corners.
    EXPECT_TRUE(Opens(*frame_, [&](RpfFrame& f) { PatchDouble(f, coverage + 64, 1e9); }));
    // A little-endian frame is held to the same ranges.
    RpfFrame little = BuildTestFrame(RpfProduct::Cib, false);
    EXPECT_TRUE(Opens(little, [](RpfFrame&) {}));
    EXPECT_FALSE(Opens(little, [&](RpfFrame& f) { PatchDouble(f, f.layout.coverage + 40, 200.0); }));
}
