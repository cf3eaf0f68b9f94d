// Written frames decode to their index image and, like corpus frames, to GDAL's indices, colours and corners
// (masked: 216, GDAL's no-data, black there, white here); hostile frames never read out of bounds.
#include "base/FileReader.h"
#include "rpf/RpfFrameReader.h"
#include "tests/GdalPeer.h"
#include "tests/fixtures/Command.h"
#include "tests/fixtures/Corpus.h"
#include "tests/fixtures/NitfFileWriter.h"
#include "tests/fixtures/RpfFrameWriter.h"
#include "tests/fixtures/TempFiles.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <cstring>
#include <filesystem>
#include <functional>

namespace {

// A frame in a temporary file, opened and drawn through two CFileReaders as the RPF branch does: Line gives
// columns first..last of a row in a draw of that width, All every row in one draw; empty when a line fails.
struct OpenedFrame {
    OpenedFrame(const std::string& bytes, uint32_t headerSection) : file(bytes, ".ntf")
    {
        openReader.OpenFile(file.c_str(), kShareDenyWrite);
        opened = reader.Open(openReader, headerSection);
        drawReader.OpenFile(file.c_str(), kShareDenyWrite);
    }
    explicit OpenedFrame(const RpfFrame& frame) : OpenedFrame(frame.bytes, frame.layout.headerSection) {}
    std::vector<uint8_t> Line(uint32_t row, uint32_t first = 0, uint32_t last = kRpfFrameSide - 1)
    {
        std::vector<uint8_t> line(last - first + 2, 0xEE);
        // A draw as wide as the frame: spans outside it or reversed must be
        // refused by ReadLine itself, not by a code buffer too small for them.
        reader.PrepareDraw(std::max(last - first + 1, kRpfFrameSide));
        lineRead = reader.ReadLine(drawReader, row, first, last, line.data());
        EXPECT_EQ(line.back(), 0xEE) << "row " << row << ": wrote past column " << last;
        line.pop_back();
        return lineRead ? line : std::vector<uint8_t>();
    }
    std::vector<uint8_t> All()
    {
        std::vector<uint8_t> pixels(size_t(kRpfFrameSide) * kRpfFrameSide);
        reader.PrepareDraw(kRpfFrameSide);
        for (uint32_t row = 0; row < kRpfFrameSide; ++row)
            if (!reader.ReadLine(drawReader, row, 0, kRpfFrameSide - 1, &pixels[size_t(row) * kRpfFrameSide]))
                return {};
        reader.ReleaseCodeBuffer();
        return pixels;
    }
    TempFile file;
    CFileReader openReader{0}, drawReader{0};
    CRpfFrameReader reader;
    bool opened = false;
    bool lineRead = false; // whether the last Line was read
};

using L = RpfFrameLayout;
struct Edit { uint32_t L::*part; uint32_t at; uint64_t value; unsigned width; }; // a number written over the frame
constexpr uint32_t kCoverageRecord = 14 + 2 * 10; // the third location record: 128, 129, 130

TEST(RpfBadInput, RefusedAtOpenOrOnlyTheLinesTheDamageMeets)
{
    const RpfFramePlan plan{RpfProduct::Cadrg, true, {}, {3}, {}, {}}; // subframe 3 masked
    const RpfFrame frame = BuildRpfFrame(plan);
    const std::vector<uint8_t> expected = ExpectedRpfPixels(plan);
    const uint32_t fileSize = uint32_t(frame.bytes.size());
    struct Line { uint32_t row, first, last; bool decodes; }; // decodes as the undamaged frame
    struct Case { const char* what; std::vector<Edit> edits; Refusal why; std::vector<Line> lines = {};
                  std::function<void(OpenedFrame&)> alsoCheck = nullptr; size_t cutTo = 0; };
    const auto Bits = [](double value) { uint64_t bits = 0; std::memcpy(&bits, &value, 8); return bits; };
    const auto Lookup = [](uint32_t table, uint32_t field) { return 6 + table * 14 + field; }; // after the header
    const std::vector<Line> codeRowFails = {{0, 0, 1535, false}, {0, 260, 270, false}};
    auto display = &L::displayParameters, image = &L::imageDescription, corners = &L::coverage;
    auto location = &L::locationSection, lookup = &L::lookupSubsection, codec = &L::compressionSubheader;
    std::vector<Edit> sharing; // 4 lookup records sharing a table of 60000
    for (uint32_t table = 0; table < 4; ++table)
        sharing.insert(sharing.end(), {{lookup, Lookup(table, 2), 60000, 4}, {lookup, Lookup(table, 10), 62, 4}});
    const RpfFrameLayout& at = frame.layout;
    const Refusal kOk = Refusal::kNone, kBad = Refusal::kRpfSectionInvalid, kMissing = Refusal::kRpfSectionMissing;
    const Case cases[] = {
        // Cut short: before the spatial data the frame is refused; in it, the lines past the cut fail.
        {"cut", {}, kBad, {}, {}, at.headerSection + 20}, {"cut", {}, kBad, {}, {}, at.locationSection + 30},
        {"cut", {}, kBad, {}, {}, at.coverage + 50}, {"cut", {}, kBad, {}, {}, at.colormapSubsection + 200},
        {"cut", {}, kBad, {}, {}, at.lookupSubsection + 40000},
        {"cut in the third subframe", {}, kOk, {{0, 0, 767, true}, {30, 0, 767, false}, {0, 0, 1535, false},
         {1, 0, 511, true}}, {}, at.spatialData + 2 * kRpfSubframeBytes + 500},
        // Spans in a code, across codes and subframes, whole rows, in masked subframe 3; outside or reversed.
        {"undamaged", {}, kOk, {{0, 10, 9, false}, {5, 1, 10, true}, {6, 2, 2, true}, {7, 3, 4, true}, {8, 0, 3, true},
          {255, 250, 262, true}, {256, 255, 256, true}, {1535, 0, 1535, true}, {1000, 1535, 1535, true},
          {77, 511, 1029, true}, {9, 600, 1100, true}, {3, 780, 790, true}, {1536, 0, 10, false},
          {0, 0, 1536, false}}},
        {"0 rows", {{display, 0, 0, 4}}, kBad}, {"0 codes a row", {{display, 4, 0, 4}}, kBad},
        {"2^30 codes a row", {{display, 4, 0x40000000, 4}}, kBad}, {"kernel width 0", {{image, 12, 2, 4}}, kBad},
        {"kernel height 0", {{image, 16, 3, 4}}, kBad}, {"part kernels", {{image, 12, 258, 4}}, kBad},
        {"mask table of 65535 x 65535", {{image, 8, 0xFFFF, 2}, {image, 10, 0xFFFF, 2}}, kBad},
        {"location section past the file", {{&L::headerSection, 44, fileSize + 8, 4}}, kBad},
        {"coverage past the file", {{location, kCoverageRecord + 6, fileSize - 50, 4}}, kBad},
        {"coverage at 0xFFFFFFF0", {{location, kCoverageRecord + 6, 0xFFFFFFF0, 4}}, kBad},
        // No location records: the coverage is read from offset 0, where "NITF" is no latitude.
        {"65535 location records", {{location, 6, 0xFFFF, 2}}, kBad}, {"none", {{location, 6, 0, 2}}, kMissing},
        {"2^28 lookup records", {{lookup, Lookup(0, 2), 0x10000000, 4}}, kBad}, {"sharing", sharing, kBad},
        {"65535 offsets", {{codec, 2, 0xFFFF, 2}}, kBad}, {"compression algorithm 0", {{codec, 0, 0, 2}}, kBad},
        {"2^31 colours", {{&L::colormapSubsection, 8, 0x7FFFFFFF, 4}}, kBad}, {"3", {{codec, 0, 3, 2}}, kBad},
        {"parameter records", {{codec, 4, 1, 2}}, kBad}, {"0-bit codes", {{display, 8, 0, 1}}, kOk, codeRowFails},
        {"lookup length 13", {{lookup, 4, 13, 2}}, kBad}, {"colour 16", {{&L::colormapSubsection, 4, 16, 2}}, kBad},
        {"latitude 90", {{corners, 0, Bits(90.0), 8}}, kOk}, {"longitude -180", {{corners, 8, Bits(-180.0), 8}}, kOk},
        {"latitude > 90", {{corners, 0, Bits(90.000001), 8}}, kBad}, {"NaN", {{corners, 56, Bits(NAN), 8}}, kBad},
        {"a resolution is no corner", {{corners, 64, Bits(1e9), 8}}, kOk},
        {"11-bit codes", {{display, 8, 11, 1}}, kOk, codeRowFails}, {"16", {{display, 8, 16, 1}}, kOk, codeRowFails},
        // Lookup records of 2 values decode (columns 2 and 3 of each code on rows 4k + 1 masked);
        // of 8 values, or of 16-bit values, no line of their kernel row.
        {"2 values a record", {{lookup, Lookup(1, 6), 2, 2}}, kOk, {{6, 0, 1535, true}}, [](OpenedFrame& opened) {
             const std::vector<uint8_t> row = opened.Line(5);
             for (uint32_t column = 2; column < 256 && !row.empty(); column += 4)
                 ASSERT_EQ(row[column] + row[column + 1], 2 * kRpfMaskedPixel) << column;
         }},
        {"8 values a record", {{lookup, Lookup(2, 6), 8, 2}}, kOk, {{6, 0, 1535, false}, {7, 0, 1535, true}}},
        {"16-bit values", {{lookup, Lookup(3, 8), 16, 2}}, kOk, {{3, 0, 1535, false}, {4, 0, 1535, true}}},
        // 4-bit values: a masked code fills only the kernel (subframe 3), not the wider record.
        {"4-bit values", {{lookup, Lookup(0, 6), 8, 2}, {lookup, Lookup(0, 8), 4, 2}}, kOk,
         {{0, 768, 1000, true}, {0, 0, 10, false}}},
        {"subframe 4 outside the file", {{&L::maskSubsection, 6 + 4 * 4, 0x7FFFFF00, 4}}, kOk,
         {{10, 0, 1535, false}, {10, 0, 1023, true}, {11, 1024, 1100, false}, {300, 0, 1535, true}}},
        {"no lookup offset records", {{codec, 2, 0, 2}}, kOk, {{0, 0, 1535, false}}},
        {"the second compression algorithm", {{codec, 0, 2, 2}}, kOk,
         {{0, 0, 1535, true}, {801, 3, 1535, true}, {1535, 0, 1535, true}}},
        {"no colour tables", {{&L::colorGraySubheader, 0, 0, 1}}, kOk, {{0, 0, 1535, true}}, [](OpenedFrame& opened) {
             uint8_t grey = 0;
             RpfColorGraySection& colors = opened.reader.colorGraySection;
             EXPECT_FALSE(colors.IsColorTable() || colors.IsGrayTable() || colors.GetPaletteGray(0, grey));
         }},
        // A component listed twice: the first record in file order counts.
        {"coverage twice", {{location, kCoverageRecord - 10, kCoverageSectionSubheader, 2},
          {location, kCoverageRecord - 4, frame.layout.coverage, 4}, {location, kCoverageRecord + 6, 0, 4}}, kOk, {},
         [&frame](OpenedFrame& opened) {
             EXPECT_EQ(opened.reader.FindComponentLocation(kCoverageSectionSubheader), frame.layout.coverage);
             EXPECT_EQ(opened.reader.FindComponentLocation(kColorConverterSubsection), 0u);
         }},
    };
    for (const Case& c : cases) {
        RpfFrame damaged = frame;
        for (const Edit& edit : c.edits)
            PatchRpfNumber(damaged, damaged.layout.*edit.part + edit.at, edit.value, edit.width);
        damaged.bytes.resize(c.cutTo ? c.cutTo : damaged.bytes.size());
        OpenedFrame opened(damaged);
        ASSERT_EQ(opened.opened, c.why == kOk) << c.what << " " << c.cutTo;
        EXPECT_EQ(opened.reader.refusal, c.why) << c.what;
        for (const Line& line : c.lines) {
            const uint8_t* from = expected.data() + size_t(line.row) * kRpfFrameSide;
            const std::vector<uint8_t> undamaged(from + line.first, from + (line.decodes ? line.last + 1 : line.first));
            EXPECT_EQ(opened.Line(line.row, line.first, line.last), undamaged)
                << c.what << ": row " << line.row << " columns " << line.first << ".." << line.last;
            EXPECT_EQ(opened.lineRead, line.decodes) << c.what << ": row " << line.row; // a reversed span draws nothing
        }
        if (c.alsoCheck)
            c.alsoCheck(opened);
    }
    EXPECT_FALSE(OpenedFrame(frame.bytes, fileSize + 100).opened);
    // Draws as wide as a host may ask: a frame row's codes at most; a span wider than the draw: refused.
    OpenedFrame whole(frame);
    CRpfFrameReader& reader = whole.reader;
    std::vector<uint8_t> line(kRpfFrameSide + 1);
    for (uint32_t drawWidth : {uint32_t(INT32_MAX), UINT32_MAX}) {
        reader.PrepareDraw(drawWidth);
        EXPECT_TRUE(reader.codeBuffer.size() == kRpfFrameSide / 4 + 2 &&
                    reader.ReadLine(whole.drawReader, 9, 3, 700, line.data())) << drawWidth;
    }
    reader.PrepareDraw(8);
    EXPECT_FALSE(reader.ReadLine(whole.drawReader, 0, 0, 100, line.data()));
    reader.ReleaseCodeBuffer();
    EXPECT_FALSE(reader.ReadLine(whole.drawReader, 0, 0, 3, line.data()));
    // A little-endian frame (opened by RpfFrames.WrittenFrames*) is held to the same ranges.
    RpfFrame little = BuildRpfFrame(RpfFramePlan{RpfProduct::Cib, false, {}, {}, {}, {}});
    PatchRpfNumber(little, little.layout.coverage + 40, Bits(200.0), 8);
    EXPECT_FALSE(OpenedFrame(little).opened);
}

// The palette comes from the only table, or the first of 216 records; past it a colour table reads white.
TEST(RpfFrameReader, PaletteTableIsTheOnlyOneOrTheFirstOf216Records)
{
    struct Case { RpfProduct product; std::vector<uint32_t> records; int selected; }; // -1: no palette table
    for (const Case& c : {Case{RpfProduct::Cadrg, {}, 0}, {RpfProduct::Cib, {}, 0}, {RpfProduct::Cadrg, {32}, 0},
                          {RpfProduct::Cadrg, {32, 16}, -1}, {RpfProduct::Cadrg, {32, 216}, 1}}) {
        OpenedFrame frame(BuildRpfFrame(RpfFramePlan{c.product, true, {}, {}, {}, c.records}));
        ASSERT_TRUE(frame.opened);
        RpfColorGraySection& colors = frame.reader.colorGraySection;
        const bool colour = c.product == RpfProduct::Cadrg && c.selected >= 0;
        EXPECT_EQ(colors.FindPaletteTable(), c.selected < 0 ? nullptr : &colors.colorTables.at(size_t(c.selected)));
        EXPECT_TRUE(colors.IsColorTable() == colour && colors.IsGrayTable() == (c.product == RpfProduct::Cib));
        const uint32_t records = c.records.empty() ? 216 : c.records[size_t(std::max(c.selected, 0))];
        uint8_t red = 0, green = 0, blue = 0;
        EXPECT_TRUE(colors.GetPaletteColor(records - 1, red, green, blue) == colour &&
                    !colors.GetPaletteColor(records, red, green, blue));
        EXPECT_EQ(colour && colors.GetPaletteColor(300, red, green, blue) && red + green + blue == 3 * 255, colour);
    }
}

// Their order is judged by every decoded frame; here the refused width and a last code cut short.
TEST(RpfUnpackCodes, RefusesOtherWidthsAndReadsNothingPastTheBytes)
{
    const uint8_t packed[] = {0xAB, 0xCD, 0xEF, 0x12, 0x34, 0x56};
    uint16_t codes[2] = {7, 7};
    EXPECT_TRUE(!UnpackCodes(packed, 6, codes, 2, 11) && codes[0] == 7);
    // A last code cut by the byte count takes zero bits past it.
    ASSERT_TRUE(UnpackCodes(packed, 2, codes, 2, 12));
    EXPECT_EQ(codes[0] * 0x1000 + codes[1], 0xABC * 0x1000 + 0xD00);
}

// GDAL's indices (216: its no-data), palette and degree corners against ours; false if it cannot decode.
bool MatchesGdal(OpenedFrame& ours, const std::string& path, const std::vector<uint8_t>& pixels)
{
    const std::string indices = GdalSamples(path, "-b 1");
    const GdalReport gdal = ReadWithGdal(path);
    if (indices.size() != pixels.size() || !gdal.read)
        return false;
    size_t differing = 0;
    for (size_t i = 0; i < pixels.size(); ++i)
        differing += pixels[i] != uint8_t(indices[i]) || (pixels[i] == kRpfMaskedPixel && gdal.nodata != 216);
    EXPECT_EQ(differing, 0u);
    RpfColorGraySection& colors = ours.reader.colorGraySection;
    EXPECT_GE(gdal.colourTable.size(), size_t(kRpfMaskedPixel));
    for (uint32_t i = 0; i < kRpfMaskedPixel && i < gdal.colourTable.size(); ++i) {
        uint8_t red = 0, green = 0, blue = 0;
        const bool colour = colors.IsColorTable();
        EXPECT_TRUE(colour ? colors.GetPaletteColor(i, red, green, blue) : colors.GetPaletteGray(i, red));
        EXPECT_EQ((std::array<int, 3>{red, colour ? green : red, colour ? blue : red}), gdal.colourTable[i]) << i;
    }
    const RpfCoverage& c = ours.reader.coverage;
    const double side = kRpfFrameSide, corners[3][4] = {{c.northWestLongitude, c.northWestLatitude, 0, 0},
                                                        {c.northEastLongitude, c.northEastLatitude, side, 0},
                                                        {c.southWestLongitude, c.southWestLatitude, 0, side}};
    for (const auto& [x, y, column, row] : corners)
        EXPECT_TRUE(gdal.epsg != 4326 || (std::fabs(gdal.X(column, row) - x) <= 1e-7 &&
                                          std::fabs(gdal.Y(column, row) - y) <= 1e-7)) << x << ", " << y;
    return true;
}

TEST(RpfFrames, WrittenFramesDecodeToTheirIndicesAsGdalDecodesThem)
{
    const bool gdal = CommandSucceeds("gdal_translate --version");
    const RpfCorners southern{-33.25, 151.0, -33.75, 151.0, -33.25, 151.75, -33.75, 151.75}; // NW, SW, NE, SE
    using P = RpfProduct;
    for (const RpfFramePlan& plan :
         {RpfFramePlan{P::Cadrg, true, {}, {}, {}, {}}, {P::Cadrg, true, {}, {2, 15, 30}, southern, {}},
          {P::Cib, true, {}, {}, southern, {}}, {P::Cib, true, {}, {0, 35}, {}, {}},
          {P::Cadrg, false, {}, {1, 14, 20, 35}, {}, {}}, {P::Cib, false, {}, {0, 7, 35}, {}, {}}}) {
        OpenedFrame frame(BuildRpfFrame(plan));
        ASSERT_TRUE(frame.opened);
        EXPECT_TRUE(frame.reader.headerSection.bigEndian == plan.bigEndian &&
                    frame.reader.coverage.southEastLatitude == plan.corners.southEastLatitude &&
                    frame.reader.coverage.southEastLongitude == plan.corners.southEastLongitude);
        const std::vector<uint8_t> pixels = frame.All();
        EXPECT_EQ(pixels, ExpectedRpfPixels(plan));
        // GDAL reads big-endian frames only, adding entry 216 to the table as its no-data value.
        EXPECT_TRUE(!gdal || !plan.bigEndian || MatchesGdal(frame, frame.file.path(), pixels));
    }
}

// Every corpus frame matches GDAL wherever both decode; otherwise its lines fail cleanly or decode.
TEST(RpfFrames, CorpusFramesOpenAndMatchGdalOrAreRefused)
{
    VX_SKIP_WITHOUT_CORPUS();
    VX_SKIP_WITHOUT_GDAL();
    size_t framesMatched = 0;
    for (const auto& entry : std::filesystem::recursive_directory_iterator(CorpusPath("rpf"))) {
        const std::string bytes = entry.is_regular_file() ? ReadWholeFile(entry.path().string()) : "";
        const size_t tag = bytes.substr(0, 2000).find("RPFHDR");
        if (tag == std::string::npos)
            continue; // a table of contents or another file beside the frames
        SCOPED_TRACE(entry.path().string());
        OpenedFrame frame(bytes, uint32_t(tag + 11));
        const std::vector<uint8_t> pixels = frame.opened ? frame.All() : std::vector<uint8_t>();
        framesMatched += frame.opened && !pixels.empty() && MatchesGdal(frame, entry.path().string(), pixels);
        for (uint32_t row = 0; row < kRpfFrameSide; row += 97) // refused or not GDAL's: fail cleanly or decode
            frame.Line(row);
    }
    EXPECT_GE(framesMatched, 3u);
}

} // namespace
