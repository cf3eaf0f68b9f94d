// CNitfImage on files of the fixture writer in every layout it serves, drawn row by row against the values
// written, and on the subheaders, rows, spans and layouts it must refuse. With GDAL as the judge, in every draw
// order: fixture files it reads (NSIF, MULTI bands, wide RGB, packed 12-bit and 1-bit pixels), files it writes
// from them (NITF 2.1 and 2.0, with their ICORDS, IGEOLO and corners' EPSG code) and the shared corpus.
#include "geo/ImageCorners.h"
#include "nitf/NitfFileHeader.h"
#include "nitf/NitfImage.h"
#include "base/FileReader.h"
#include "tests/fixtures/BiLevelWriter.h"
#include "tests/fixtures/Command.h"
#include "tests/fixtures/Corpus.h"
#include "tests/fixtures/Jpeg2000Writer.h"
#include "tests/fixtures/JpegBlockWriter.h"
#include "tests/fixtures/NitfImageWriter.h"
#include "tests/fixtures/TempFiles.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <cstdio>
#include <filesystem>
#include <functional>
#include <map>
#include <tuple>

namespace {

// A NITF file on disk, its file header and its first image subheader read the way the handler reads them.
struct LoadedImage {
    explicit LoadedImage(const std::string& bytes) : file(bytes, ".ntf"), path(file.path()) {}
    explicit LoadedImage(const char* externalPath) : path(externalPath) {}

    bool Parse() // the file header and the first image subheader
    {
        header.SetPath(path.c_str());
        if (!header.Parse() || header.NUMI < 1)
            return false;
        reader.OpenFile(path.c_str(), kShareDenyWrite);
        return image.ReadSubheader(reader, header);
    }
    bool Open() // Parse, PrepareData, AllocLineBuffer and OpenCompressed, as an open does
    {
        if (!Parse() || !image.PrepareData(reader, header.imageSegments[0].dataLength))
            return false;
        image.AllocLineBuffer();
        image.OpenCompressed(reader, header.imageSegments[0].dataLength);
        return true;
    }
    // Columns first..last of a row (all when last is -1); empty when ReadLine fails.
    std::vector<uint8_t> Row(uint32_t row, int32_t first = 0, int32_t last = -1)
    {
        last = last < 0 ? image.NCOLS - 1 : last;
        std::vector<uint8_t> out(size_t(last - first + 1) * image.HostPixelBytes() + 1, 0xEE);
        const bool read = image.ReadLine(reader, row, first, last, out.data());
        EXPECT_EQ(out.back(), 0xEE) << "row " << row << ": wrote past column " << last;
        out.pop_back();
        return read ? out : std::vector<uint8_t>();
    }

    TempFile file{std::string(), ".ntf"};
    std::string path;
    CNitfImage image;
    CNitfFileHeader header;
    CFileReader reader;
};

uint64_t Ramp(int32_t band, int32_t row, int32_t column)
{
    return uint64_t(band * 100 + row * 7 + column) & 0xFF;
}

// A MONO image of rows x columns in NBPR x NBPC blocks of NPPBH x NPPBV (0: the image's), coded as IC says.
NitfImagePlan Plan(int32_t rows, int32_t columns, const std::string& IC = "NC", int32_t NBPR = 1, int32_t NBPC = 1,
                   int32_t NPPBH = 0, int32_t NPPBV = 0)
{
    NitfImagePlan plan;
    plan.rows = rows, plan.columns = columns, plan.IC = IC, plan.COMRAT = IC == "C1" ? "1D  " : "00.0";
    plan.NBPP = IC == "C1" ? 1 : 8, plan.NBPR = NBPR, plan.NBPC = NBPC, plan.NPPBH = NPPBH, plan.NPPBV = NPPBV;
    return plan;
}

// 7 x 5 in 2 x 2 blocks of 4 x 3 with padded edges (GDAL reads 12-bit blocks of an even pixel count only),
// 1-bit images in one block (all GDAL reads).
NitfImagePlan Layout(const char* IREP, int32_t NBPP, std::vector<NitfBandPlan> bands, char IMODE = 'B', int32_t ABPP = 0)
{
    const bool oneBlock = NBPP == 1;
    NitfImagePlan plan = Plan(5, 7, "NC", oneBlock ? 1 : 2, oneBlock ? 1 : 2, oneBlock ? 0 : 4, oneBlock ? 0 : 3);
    plan.IREP = IREP, plan.NBPP = NBPP, plan.ABPP = ABPP, plan.bands = std::move(bands), plan.IMODE = IMODE;
    return plan;
}

const NitfBandPlan plain{"", 0, 0, ""}, red{"R", 0, 0, ""}, green{"G", 0, 0, ""}, blue{"B", 0, 0, ""};
const NitfBandPlan rgbLut{"LU", 3, 2, RgbLookupTables(2)};
const std::vector<NitfBandPlan> kRgbBands = {red, green, blue};

// The writer's 16-bit blocks repacked to NBPP 1 or 12: each band's block bit after bit, padded to a byte;
// a 12-bit value's low byte first, then its high nibble.
std::vector<std::string> PackedBlocks(NitfImagePlan plan, const PixelValue& pixel)
{
    const int32_t bits = plan.NBPP;
    plan.NBPP = 16;
    const size_t plane = size_t(plan.NPPBH ? plan.NPPBH : plan.columns) * size_t(plan.NPPBV ? plan.NPPBV : plan.rows);
    std::vector<std::string> blocks = BuildImageBlocks(plan, [&](int32_t band, int32_t row, int32_t column) {
        const uint64_t value = pixel(band, row, column);
        return bits == 12 ? (value & 0xFF) << 4 | value >> 8 : value;
    });
    for (std::string& block : blocks) {
        std::string packed, stream;
        for (size_t i = 0; i < block.size(); i += 2) {
            for (int32_t bit = bits - 1; bit >= 0; --bit)
                stream += char('0' + ((uint8_t(block[i]) << 8 | uint8_t(block[i + 1])) >> bit & 1));
            if ((i + 2) % (2 * plane) == 0)
                for (stream.resize((stream.size() + 7) / 8 * 8, '0'); !stream.empty(); stream.erase(0, 8))
                    packed += char(std::stoi(stream.substr(0, 8), nullptr, 2));
        }
        block = packed;
    }
    return blocks;
}

// The plan's file, its pixels spread over the range of NBPP or over the lookup table.
std::string WrittenFile(const NitfImagePlan& plan)
{
    const uint64_t limit = plan.bands[0].NELUT ? uint64_t(plan.bands[0].NELUT) : uint64_t(1) << plan.NBPP;
    const PixelValue pixel = [limit](int32_t band, int32_t row, int32_t column) {
        return uint64_t(band * 1000 + row * 7 + column * 3) * 4099 % limit;
    };
    return BuildImageFile(plan, JoinBlocks(plan.NBPP % 8 ? PackedBlocks(plan, pixel) : BuildImageBlocks(plan, pixel)));
}

TEST(Image, EveryLayoutDrawsThePixelsWritten)

{
    std::vector<std::pair<NitfImagePlan, bool>> cases; // with FSDEVT in the file header or not
    // IC "NM": the mask table leaves out block 1 (of band 0 in IMODE "S"), drawn as 0. The band stride
    // of IMODE "S" is a whole band of padded blocks, not NROWS x NCOLS.
    for (const char* IC : {"NC", "NM"})
        for (char IMODE : {'B', 'P', 'R', 'S'}) {
            cases.push_back({Layout("RGB", 8, kRgbBands, IMODE), false});
            cases.back().first.IC = IC;
        }
    for (bool version21 : {true, false})
        for (bool subheaderEvent : {false, true})
            for (char ICORDS : {' ', 'N'}) {
                NitfImagePlan plan = Plan(3, 4);
                plan.version21 = version21, plan.downgradeEvent = subheaderEvent && !version21, plan.ICORDS = ICORDS;
                plan.IGEOLO = std::string(60, '1'), plan.comments.assign(subheaderEvent ? 2 : 0, "comment");
                plan.padding = subheaderEvent ? "PAD" : ""; // bytes after the last field, counted in LISH
                plan.UDID = plan.IXSHD = subheaderEvent ? "extension data" : "";
                cases.push_back({plan, !version21 && ICORDS == 'N'});
            }
    for (const auto& [plan, fileDowngradeEvent] : cases) {
        SCOPED_TRACE(plan.IC + " IMODE " + plan.IMODE + (plan.version21 ? " 2.1" : " 2.0") + " ICORDS '" +
                     plan.ICORDS + "' ICOM " + std::to_string(plan.comments.size()));
        const std::vector<std::string> blocks = BuildImageBlocks(plan, Ramp);
        std::vector<bool> stored(blocks.size(), true);
        stored[1 % blocks.size()] = plan.IC != "NM";
        const std::string data = plan.IC == "NM" ? BuildMaskedData(blocks, stored, 8) : JoinBlocks(blocks);
        LoadedImage loaded(BuildImageFile(plan, data, fileDowngradeEvent));
        ASSERT_TRUE(loaded.Open());
        EXPECT_EQ(loaded.image.isMasked, plan.IC == "NM");
        EXPECT_EQ(loaded.header.fixedLayout, fileDowngradeEvent ? 0 : 1);
        // "N" means no corners in NITF 2.0: no IGEOLO follows.
        EXPECT_EQ(loaded.image.IGEOLO != nullptr, plan.ICORDS == 'N' && plan.version21);
        // IMDATOFF: the mask table's 10-byte header, the 8-bit pad pixel code and a record per block.
        const uint32_t maskTable = plan.IC == "NM" ? uint32_t(10 + 1 + 4 * blocks.size()) : 0;
        const uint32_t subheaderEnd = loaded.header.HL + loaded.header.imageSegments[0].subheaderLength;
        EXPECT_EQ(loaded.image.dataOffset, subheaderEnd + maskTable);
        const int32_t bands = int32_t(plan.bands.size()), blockWidth = plan.NPPBH ? plan.NPPBH : plan.columns;
        for (int32_t row = 0; row < plan.rows; ++row) {
            std::vector<uint8_t> expected;
            for (int32_t i = 0; i < plan.columns * bands; ++i) { // i: column x bands + band
                const int32_t column = i / bands, band = i % bands, blockRow = plan.NPPBV ? row / plan.NPPBV : 0;
                const int32_t bandBlocks = plan.IMODE == 'S' ? band * plan.NBPR * plan.NBPC : 0;
                const int32_t block = blockRow * plan.NBPR + column / blockWidth + bandBlocks;
                expected.push_back(stored[size_t(block)] ? uint8_t(Ramp(band, row, column)) : 0);
            }
            EXPECT_EQ(loaded.Row(uint32_t(row)), expected) << "row " << row; // then a span across a block edge:
            EXPECT_EQ(loaded.Row(uint32_t(row), 2, plan.columns - 2),
                      Bytes(expected.begin() + 2 * bands, expected.end() - bands));
        }
        // Spans outside the image are refused, without a byte written.
        std::vector<uint8_t> out(64, 0xEE);
        for (const auto& [row, first, last] :
             {std::tuple{plan.rows, 0, 2}, {0, 0, plan.columns}, {0, -1, 2}, {0, 3, 2}})
            EXPECT_FALSE(loaded.image.ReadLine(loaded.reader, uint32_t(row), first, last, out.data()))
                << row << " " << first << ".." << last;
        EXPECT_EQ(out, std::vector<uint8_t>(64, 0xEE));
    }
}

// Subheaders the file cannot back, and layouts the reader cannot address safely: refused by the parse
// (stage 0) or when the data is prepared (stage 1), each for its reason; prepared, its last row fails (stage 2)
// or is drawn (3). A compressed image is served only when the decoder's rows (one byte per pixel, or three for
// NBPP x NBANDS 24) are what the host reads by the pixel kind. An 8 x 8 frame fills a 16 x 16 "I1" image
// (JpegDecode tests the pixels), but no "C3" block. Arithmetic DPCM, and "C8" data that is no JPEG 2000
// codestream, are not served; vector-quantised data outside an RPF frame draws no row.
TEST(Image, RefusesWhatTheFileCannotBackAndWhatIsNotServed)
{
    const std::vector<std::string> blocks = BuildImageBlocks(Layout("RGB", 8, kRgbBands), Ramp);
    const std::string data = JoinBlocks(blocks);
    using Change = std::function<void(NitfImagePlan&)>;
    using R = Refusal;
    const auto As = [](const NitfImagePlan& plan) { return [plan](NitfImagePlan& p) { p = plan; }; };
    const auto coded = [&As](const char* IC, const char* IREP = "MONO", size_t bands = 1) {
        NitfImagePlan plan = Plan(16, 16, IC);
        plan.IREP = IREP, plan.bands.resize(bands);
        return As(plan);
    };
    const auto text = [](const Bytes& bytes) { return std::string(bytes.begin(), bytes.end()); };
    JpegBlockPlan lossless;
    lossless.predictor = 1;
    const std::string strip = text(EncodeT4Strip(Bytes(2 * 16, 0), 16, 16, false));
    const std::string whole = text(BuildNitfJpegData({EncodeJpegBlock(TestPattern(16, 16, 1, 1), {})}, {}));
    const std::string small =
        text(BuildNitfJpegData({EncodeJpegBlock(TestPattern(8, 8, 1, 2), JpegBlockPlan{8, 8})}, {}));
    const std::string sof3 = text(BuildNitfJpegData({EncodeJpegBlock(TestPattern(16, 16, 1, 3), lossless)}, {}));
    // data "": the blocks as written ("packed": repacked); row: the last row drawn; palette: its entries, colour
    // that of entry index; find replaced in the file; cut: bytes cut from its end.
    struct Case {
        std::string what; int stage; Refusal why; Change change = nullptr; std::string data = ""; Bytes row = {};
        int32_t palette = 0, index = 0; Bytes colour = {}; std::string find = "", replace = ""; size_t cut = 0;
    };
    // A row of three pixels: wide samples keep the top 8 of their ABPP bits (at the top of NBPP with PJUST "L");
    // the palette is the lookup table's, or without one a grey ramp whatever NBPP.
    const auto row = [&As](const char* IREP, int32_t NBPP, int32_t ABPP, char PJUST, NitfBandPlan band,
                           std::vector<uint64_t> pixels, Bytes drawn, int32_t palette, int32_t index, Bytes colour) {
        NitfImagePlan plan = Plan(1, 3);
        plan.IREP = IREP, plan.NBPP = NBPP, plan.ABPP = ABPP, plan.PJUST = PJUST, plan.bands = {band};
        const auto pixel = [&pixels](int32_t, int32_t, int32_t column) { return pixels[size_t(column)]; };
        return Case{std::string(IREP) + " NBPP " + std::to_string(NBPP) + " PJUST " + PJUST, 3, R::kNone, As(plan),
                    JoinBlocks(BuildImageBlocks(plan, pixel)), drawn, palette, index, colour};
    };
    const NitfBandPlan grey{};
    for (const Case& c : std::vector<Case>{
             {"as written", 3, R::kNone},
             {"cut in the subheader", 0, R::kSubheaderInvalid, {}, "", {}, 0, 0, {}, "", "", data.size() + 100},
             {"XBANDS 99999", 0, R::kBandsInvalid, [](NitfImagePlan& p) { p.extendedBandCount = true; }, "", {}, 0, 0,
              {}, "NC000003", "NC099999"},
             {"IC C9", 0, R::kUnservedCompression, [](NitfImagePlan& p) { p.IC = "C9"; }},
             {"IC C2", 1, R::kUnservedCompression, [](NitfImagePlan& p) { p.IC = "C2"; }},
             {"NBPP 7", 1, R::kUnservedDepth, [](NitfImagePlan& p) { p.NBPP = 7; }},
             {"IREP NODISPLY", 1, R::kUnservedRepresentation, [](NitfImagePlan& p) { p.IREP = "NODISPLY"; }},
             {"NBANDS 0 in NITF 2.0, which has no XBANDS", 0, R::kBandsInvalid,
              [](NitfImagePlan& p) { p.extendedBandCount = true; p.version21 = false; }},
             {"a lookup table longer than the rest of the file", 0, R::kBandsInvalid,
              [](NitfImagePlan& p) { p.IREP = "RGB/LUT"; p.bands = {{"LU", 3, 4, RgbLookupTables(4)}}; }, "", {}, 0, 0,
              {}, "300004", "399999"},
             {"short final block", 1, R::kDataOutsideFile, {}, data.substr(0, data.size() - 1)},
             {"0 wide, two blocks a row", 1, R::kBlockGeometryInvalid, [](NitfImagePlan& p) { p.NPPBH = 0; }},
             {"9999 x 9999 blocks", 1, R::kDataOutsideFile, [](NitfImagePlan& p) { p.NBPR = p.NBPC = 9999; }},
             {"blocks not covering the image", 1, R::kBlockGeometryInvalid, [](NitfImagePlan& p) { p.NBPR = 1; }},
             {"IMODE X", 1, R::kBlockGeometryInvalid, [](NitfImagePlan& p) { p.IMODE = 'X'; }},
             {"floating point", 1, R::kUnservedPixelType,
              [](NitfImagePlan& p) { p.PVTYPE = "R"; p.IREP = "MONO"; p.NBPP = 32; p.bands.resize(1); },
              std::string(7 * 5 * 4, '\0')},
             {"a mask table of more records than the file holds", 0, R::kMaskTableInvalid,
              [](NitfImagePlan& p) { p.IC = "NM"; p.NBPR = p.NBPC = 999; },
              BuildMaskedData(blocks, std::vector<bool>(4, true))},
             // Packed pixels: 1-bit colours, 12-bit bands packed together, and data a byte short.
             {"NBPP 1 MULTI", 1, R::kUnservedDepth, As(Layout("MULTI", 1, kRgbBands)), "packed"},
             {"NBPP 1 RGB", 1, R::kUnservedDepth, As(Layout("RGB", 1, kRgbBands)), "packed"},
             {"NBPP 12 IMODE P", 1, R::kUnservedDepth, As(Layout("MONO", 12, {plain, plain}, 'P')), "packed"},
             {"NBPP 12 IMODE R", 1, R::kUnservedDepth, As(Layout("MONO", 12, {plain, plain}, 'R')), "packed"},
             {"NBPP 12 RGB/LUT", 1, R::kUnservedDepth, As(Layout("RGB/LUT", 12, {rgbLut})), "packed"},
             {"NBPP 12", 3, R::kNone, As(Layout("MONO", 12, {plain})), "packed"},
             {"NBPP 12, a byte short", 1, R::kDataOutsideFile, As(Layout("MONO", 12, {plain})), "packed, a byte short"},
             {"C1", 3, R::kNone, coded("C1"), strip},
             {"C1 IREP 2IMO", 1, R::kUnservedRepresentation, coded("C1", "2IMO"), strip},
             {"C3", 3, R::kNone, coded("C3"), whole},
             {"C3 IREP NODISPLY", 1, R::kUnservedRepresentation, coded("C3", "NODISPLY"), whole},
             {"C3 NBANDS 3", 1, R::kUnservedRepresentation, coded("C3", "MONO", 3), whole},
             {"C3 of a smaller frame", 2, R::kNone, coded("C3"), small},
             {"I1 of a smaller frame", 3, R::kNone, coded("I1"), small}, {"C5", 3, R::kNone, coded("C5"), sof3},
             {"C2", 1, R::kUnservedCompression, coded("C2"), whole},
             {"C8 of no codestream", 1, R::kCompressedDataInvalid, coded("C8"), whole},
             {"C4", 2, R::kNone, coded("C4"), whole},
             row("MONO", 16, 11, 'R', grey, {0x07FF, 0x0400, 0x0008}, {0xFF, 0x80, 0x01}, 256, 77, {77, 77, 77}),
             row("MONO", 16, 11, 'L', grey, {0x07FF, 0x0400, 0x0008}, {0x07, 0x04, 0x00}, 256, 255, {255, 255, 255}),
             row("MONO", 32, 20, 'R', grey, {0xFFFFF, 0x80000, 0x00FFF}, {0xFF, 0x80, 0x00}, 256, 0, {0, 0, 0}),
             row("rgb/lut", 8, 0, 'R', {"LU", 3, 200, RgbLookupTables(200)}, {5, 199, 0}, {5, 199, 0}, 200, 199,
                 {199, 56, 99}),
             row("MONO", 8, 0, 'R', {"LU", 1, 10, "0123456789"}, {9, 0, 5}, {9, 0, 5}, 256, 9, {'9', '9', '9'})}) {
        NitfImagePlan plan = Layout("RGB", 8, kRgbBands);
        if (c.change)
            c.change(plan);
        std::string stored = c.data.empty() ? data : c.data;
        if (stored.rfind("packed", 0) == 0)
            stored = JoinBlocks(PackedBlocks(plan, Ramp)).substr(stored == "packed" ? 0 : 1);
        std::string bytes = BuildImageFile(plan, stored);
        const size_t at = bytes.find(c.find);
        ASSERT_NE(at, std::string::npos) << c.what;
        std::string file = bytes.replace(at, c.find.size(), c.replace).substr(0, bytes.size() - c.cut);
        // FL keeps matching the cut file: the image is what it refuses.
        LoadedImage loaded(file.replace(342, 12, Digits(file.size(), 12)));
        const bool parsed = loaded.Parse(), prepared = parsed && loaded.image.PrepareData(loaded.reader, stored.size());
        if (prepared) // as an open does; then the last row
            loaded.image.AllocLineBuffer(), loaded.image.OpenCompressed(loaded.reader, stored.size());
        const Bytes last = prepared ? loaded.Row(uint32_t(loaded.image.NROWS - 1)) : Bytes();
        const int stage = !parsed ? 0 : !prepared ? 1 : last.empty() ? 2 : 3;
        EXPECT_EQ(std::tuple(stage, loaded.image.refusal), std::tuple(c.stage, c.why)) << c.what;
        EXPECT_EQ(last, c.row.empty() ? last : c.row) << c.what;
        if (c.palette == 0)
            continue;
        uint8_t rgb[3] = {}, none = 0;
        const bool entry = loaded.image.GetPaletteEntry(c.index, rgb[0], rgb[1], rgb[2]);
        const int32_t past = plan.bands[0].NELUT != 0 ? plan.bands[0].NELUT : 256; // the first entry past the table
        const bool outside = loaded.image.GetPaletteEntry(past, none, none, none) ||
                             loaded.image.GetPaletteEntry(-1, none, none, none);
        EXPECT_EQ(std::tuple(loaded.image.IsPaletted(), loaded.image.GetPaletteSize(), entry, Bytes(rgb, rgb + 3), outside),
                  std::tuple(true, c.palette, true, c.colour, false)) << c.what;
    }
}

// JPEG block streams as encoders write them, found by walking their marker segments: 2 x 2 blocks of
// 16 x 16 that must draw as libjpeg decodes each. Masked: blocks 3, 0, 1 stored in this order with
// padding before each, block 2 left out; two blocks that share one stream are refused.
TEST(Image, JpegBlockStreamsAsEncodersWriteThem)
{
    constexpr uint32_t kSide = 16;
    // An APP1 segment of 40000 bytes, an embedded thumbnail's SOI and EOI at its ends.
    Bytes app1 = {0xFF, 0xE1, 40002 >> 8, 40002 & 0xFF, 0xFF, 0xD8};
    app1.resize(app1.size() + 40000 - 4, 'x');
    app1.insert(app1.end(), {0xFF, 0xD9});
    enum Stream { kThumbnail, kFill, kProgressive, kRestarts, kMasked };
    const char* const what[] = {"APP1 holding FF D9, past the 32 KiB read", "fill bytes before SOI", "progressive",
                                "RSTn within the scan", "M3, padded, offsets out of order"};
    for (int layout = kThumbnail; layout <= kMasked; ++layout) {
        SCOPED_TRACE(what[layout]);
        std::vector<std::string> streams;
        std::vector<Bytes> decoded;
        for (unsigned b = 0; b < 4; ++b) {
            JpegBlockPlan block;
            block.progressive = layout == kProgressive;
            block.restartRows = layout == kRestarts ? 1 : 0;
            Bytes stream = EncodeJpegBlock(TestPattern(kSide, kSide, 1, b), block);
            if (layout == kThumbnail && b == 0)
                stream.insert(stream.begin() + 2, app1.begin(), app1.end());
            decoded.push_back(DecodeJpegBlock(stream, 1));
            const Bytes nitf = BuildNitfJpegData({stream}, NitfApp6Plan{2, 2, 0, 0});
            streams.emplace_back((layout == kFill ? "\xFF\xFF\xFF" : "") + std::string(nitf.begin(), nitf.end()));
        }
        const NitfImagePlan plan = Plan(2 * kSide, 2 * kSide, layout == kMasked ? "M3" : "C3", 2, 2, kSide, kSide);
        std::string data = JoinBlocks(streams);
        if (layout == kMasked) {
            std::vector<uint32_t> records(4, kBlockNotStored);
            data.clear();
            for (unsigned b : {3, 0, 1}) // each after its padding
                records[b] = uint32_t((data += std::string("\0\xFF\xD9\xFF", 4)).size()), data += streams[b];
            decoded[2].assign(kSide * kSide, 0);
            LoadedImage shared(BuildImageFile(plan, BuildMaskTable({records[1], records[1], records[2], records[3]}) + data));
            EXPECT_TRUE(shared.Open() && shared.Row(0).empty());
            data = BuildMaskTable(records) + data;
        }
        LoadedImage loaded(BuildImageFile(plan, data));
        ASSERT_TRUE(loaded.Open());
        for (uint32_t row = 0; row < 2 * kSide; ++row) {
            Bytes expected;
            for (uint32_t column = 0; column < 2 * kSide; ++column)
                expected.push_back(decoded[row / kSide * 2 + column / kSide][row % kSide * kSide + column % kSide]);
            EXPECT_EQ(loaded.Row(row), expected) << "row " << row;
        }
    }
}

// JPEG 2000 in 2 x 2 tiles of 16 on a 32 x 24 image: drawn as written, refused at open when its header
// disagrees with the subheader or could not be backed by the data, or served with the rows of a tile
// that does not decode failing (the last tile cut off; one tile of 10^10 pixels, never decoded).
TEST(Image, Jpeg2000HeadersAgreeWithTheSubheaderOrAreRefused)
{
    std::vector<uint16_t> samples(32 * 24);
    for (size_t i = 0; i < samples.size(); ++i)
        samples[i] = uint16_t(i * 7 % 256);
    const std::string codestream = EncodeJpeg2000(32, 24, 1, 8, 16, samples);
    const auto siz = [&](size_t at, const std::string& bytes) { return std::string(codestream).replace(at, bytes.size(), bytes); };
    const std::string huge("\0\x01\x86\xA0", 4); // 100000
    enum Outcome { kDrawn, kRefused, kLastTileFails, kRowsFail };
    struct Case { const char* what; std::string data; Outcome outcome; int32_t side = 0, NBPP = 8; size_t bands = 1; };
    for (const Case& c : std::vector<Case>{
             {"as written", codestream, kDrawn}, {"in a JP2 file", Jp2File(codestream), kDrawn},
             {"NCOLS 24", codestream, kRefused, 24}, {"NBANDS 3", codestream, kRefused, 0, 8, 3},
             {"NBPP 4", codestream, kRefused, 0, 4}, {"17-bit samples", siz(42, "\x10"), kRefused},
             {"signed samples", siz(42, "\x87"), kRefused}, {"tiles 0 wide", siz(24, std::string(4, '\0')), kRefused},
             {"tiles of a pixel, more than the data holds", siz(24, std::string("\0\0\0\1\0\0\0\1", 8)), kRefused},
             {"a jp2c box past the end", Jp2File(codestream + "x").substr(0, codestream.size() + 20), kRefused},
             {"the last tile cut off", codestream.substr(0, codestream.size() - 40), kLastTileFails},
             {"one tile of 100000 x 100000", siz(24, huge + huge).replace(8, 8, huge + huge), kRowsFail, 100000}}) {
        NitfImagePlan plan = c.side ? Plan(c.side, c.side, "C8") : Plan(24, 32, "C8", 2, 2, 16, 16);
        plan.NBPP = c.NBPP, plan.bands.resize(c.bands);
        LoadedImage loaded(BuildImageFile(plan, c.data));
        ASSERT_EQ(loaded.Open(), c.outcome != kRefused) << c.what;
        for (uint32_t row = 0; c.outcome != kRefused && row < 24; ++row) {
            const bool fails = c.outcome == kRowsFail || (c.outcome == kLastTileFails && row >= 16);
            EXPECT_EQ(loaded.Row(row, 0, 31), fails ? Bytes() : Bytes(samples.begin() + row * 32, samples.begin() + row * 32 + 32))
                << c.what << " row " << row;
        }
    }
}

// Block records may make blocks overlap: block 1 starts at row 32 of block 0,
// so its first strip starts where block 0's short last strip does, and must
// not be served from that strip's slot.
TEST(Image, OverlappingMaskedBlocksEachGiveTheirOwnRows)
{
    std::string data(288, '\0');
    for (size_t i = 0; i < data.size(); ++i)
        data[i] = char(i * 7);
    LoadedImage loaded(BuildImageFile(Plan(80, 4, "NM", 1, 2, 4, 40), BuildMaskTable({0, 128}) + data));
    ASSERT_TRUE(loaded.Open());
    for (uint32_t row = 0; row < 80; ++row) {
        const std::string expected = data.substr((row < 40 ? row : row - 8) * 4, 4);
        EXPECT_EQ(loaded.Row(row), std::vector<uint8_t>(expected.begin(), expected.end())) << row;
    }
}

constexpr int32_t kNoOracle = -1; // GDAL gave fewer samples than the image has
constexpr int32_t kRowFailed = 256;

// The largest difference between our rows, drawn bottom up then top down with a window of each, and GDAL's
// samples of the bands drawn: wide ones reduced to the top 8 of their ABPP bits (of NBPP with PJUST "L") as ours
// are, 1-bit ones kept as palette indices; GDAL's bi-level 1 is a clear bit, which is white here.
int32_t WorstDifference(LoadedImage& loaded)
{
    const CNitfImage& image = loaded.image;
    const size_t bands = image.HostPixelBytes(); // the bands drawnBands names, or the decoder's
    const int32_t bits = image.ABPP >= 1 && image.ABPP <= image.NBPP && image.PJUST() != 'L' ? image.ABPP : image.NBPP;
    const size_t columns = size_t(image.NCOLS), plane = columns * size_t(image.NROWS), sampleBytes = (image.NBPP + 7) / 8;
    TempDirectory dir; // GDAL's samples, band sequential, little-endian
    RunCommand("gdal_translate -q -of ENVI '" + loaded.path + "' " + dir / "decoded.raw");
    const std::string decoded = ReadWholeFile(dir / "decoded.raw");
    std::vector<uint32_t> gdal((decoded.size() + sampleBytes - 1) / sampleBytes);
    for (size_t i = 0; i < decoded.size(); ++i)
        gdal[i / sampleBytes] |= uint32_t(uint8_t(decoded[i])) << (8 * (i % sampleBytes));
    if (gdal.size() < plane * size_t(image.NBANDS))
        return kNoOracle;
    int32_t worst = 0;
    for (size_t drawn = 0; drawn < 2 * size_t(image.NROWS); ++drawn) {
        const size_t row = drawn < size_t(image.NROWS) ? size_t(image.NROWS) - 1 - drawn : drawn - size_t(image.NROWS);
        const std::vector<uint8_t> ours = loaded.Row(uint32_t(row));
        if (ours.empty())
            return kRowFailed;
        const int32_t first = image.NCOLS / 3, last = image.NCOLS - 1 - first;
        EXPECT_EQ(loaded.Row(uint32_t(row), first, last),
                  std::vector<uint8_t>(ours.begin() + first * long(bands), ours.begin() + (last + 1) * long(bands)));
        for (size_t i = 0; i < columns * bands; ++i) { // i: column x bands + band
            const size_t band = image.drawnBandCount == int32_t(bands) ? size_t(image.drawnBands[i % bands]) : i % bands;
            const uint32_t value = gdal[band * plane + row * columns + i / bands];
            const uint32_t expected = image.compressionKind == kBiLevel ? (value ? 0 : 255)
                                      : image.NBPP <= 8 ? value
                                      : (bits >= 8 ? value >> (bits - 8) : value << (8 - bits)) & 0xFF;
            worst = std::max(worst, std::abs(int32_t(ours[i]) - int32_t(expected)));
        }
    }
    return worst;
}

// The palette against gdalinfo's colour table of the first band drawn ("  i: r,g,b,a" an entry). Reading a table
// of fewer than 256 entries, GDAL adds a transparent one, which is not in the file.
void ExpectPaletteAsGdal(const CNitfImage& image, const std::string& path)
{
    const std::string info = RunCommand("gdalinfo '" + path + "'");
    const size_t band = info.find("Band " + std::to_string(image.drawnBands[0] + 1) + " "),
                 table = info.find("Color Table", band);
    std::vector<std::vector<int>> gdal;
    int index = 0, r = 0, g = 0, b = 0, a = 0;
    for (size_t at = table < info.find("Band ", band + 1) ? info.find('\n', table) + 1 : std::string::npos;
         at < info.size() && std::sscanf(&info[at], " %d: %d,%d,%d,%d", &index, &r, &g, &b, &a) == 5;
         at = info.find('\n', at) + 1)
        gdal.push_back({r, g, b, a});
    if (!gdal.empty() && gdal.size() <= 256 && gdal.back()[3] == 0)
        gdal.pop_back();
    bool grey = true;
    for (size_t i = 0; i < gdal.size(); ++i) {
        uint8_t rgb[3] = {};
        EXPECT_TRUE(image.GetPaletteEntry(int32_t(i), rgb[0], rgb[1], rgb[2]));
        EXPECT_EQ(std::vector<int>(rgb, rgb + 3), std::vector<int>(gdal[i].begin(), gdal[i].begin() + 3)) << "entry " << i;
        grey = grey && gdal[i][0] == gdal[i][1] && gdal[i][1] == gdal[i][2];
    }
    EXPECT_EQ(gdal.size(), gdal.empty() ? 0 : size_t(image.GetPaletteSize()));
    EXPECT_EQ(image.ColourPalette(), !grey);
}

TEST(Corpus, ServedFilesDrawAsGdalDecodesThemAndTheRestAreRefused)
{
    VX_SKIP_WITHOUT_CORPUS();
    const bool gdal = CommandSucceeds("gdal_translate --version");
    std::map<std::string, std::string> outcomes;
    for (const char* folder : {"jitc-nitf20", "jitc-nitf21", "other", "damaged", "jitc-jpeg2000"})
        for (const auto& entry : std::filesystem::directory_iterator(CorpusPath(folder))) {
            const std::string name = std::string(folder) + "/" + entry.path().filename().string();
            LoadedImage loaded(entry.path().c_str());
            const bool served = loaded.Open();
            std::string& outcome = outcomes[name] = served ? "served" : "refused";
            EXPECT_TRUE(served || loaded.Row(0).empty()) << name; // a refused image serves no row
            // Vector-quantised images are served but never decoded here: their rows fail.
            if (!served || !gdal || loaded.image.compressionKind == kVectorQuantized)
                continue;
            const int32_t worst = WorstDifference(loaded);
            for (int32_t row = 0; worst == kNoOracle && row < loaded.image.NROWS; ++row)
                loaded.Row(uint32_t(row)); // GDAL cannot decode it: every row still reads safely
            // Streams without a DQT get the default quantisation table, which GDAL
            // loads in another coefficient order: that file differs by design.
            EXPECT_LE(worst, name == "jitc-nitf20/U_1125C.NTF" ? 255 : 0) << name;
            outcome += worst == kNoOracle ? ", GDAL cannot decode it" : " worst " + std::to_string(worst);
        }
    // Files that exercise what this library must serve: padded subheaders (rgb.ntf), band-sequential blocks
    // (i_3301a), every IMODE, wide MONO, downgrade events (U_1125C), bi-level (1-D and 2-D) and JPEG blocks,
    // fill bytes before SOI (i_3025b).
    for (const char* name : {"other/rgb.ntf", "jitc-nitf21/i_3301a.ntf", "jitc-nitf21/i_3301h.ntf", "other/WithBE.ntf",
                             "jitc-nitf20/U_3010A.NTF", "jitc-nitf21/i_3201c.ntf", "jitc-nitf21/i_3405a.ntf",
                             "jitc-nitf20/U_1125C.NTF", "jitc-nitf21/i_3041a.ntf", "jitc-nitf20/U_1036A.NTF",
                             "jitc-nitf21/i_3309a.ntf", "jitc-nitf21/i_3008a.ntf", "jitc-nitf21/i_3015a.ntf",
                             "jitc-nitf21/i_3018a.ntf", "jitc-nitf20/U_2001A.NTF", "jitc-nitf21/i_3025b.ntf"})
        EXPECT_EQ(outcomes[name].rfind("served", 0), 0u) << name;
    // NSIF, MULTI bands, wide RGB, lookup tables (in band 2 of LUinBand2): drawn as GDAL draws them, GDAL's palette.
    for (const char* name : {"jitc-nitf21/i_3034c.ntf", "jitc-nitf21/i_3034f.ntf", "jitc-nitf21/ns3034d.nsf",
                             "other/LUinBand2.ntf", "jitc-nitf21/i_3430a.ntf", "other/merlionRGB.ntf",
                             "other/merlionUnblocked.ntf", "other/rgb16.ntf", "other/fake_nsif.ntf",
                             "jitc-nitf21/ns3361c.nsf", "jitc-nitf21/ns3301j.nsf"}) {
        EXPECT_EQ(outcomes[name].rfind(gdal ? "served worst 0" : "served", 0), 0u) << name;
        LoadedImage loaded(CorpusPath(name).c_str());
        if (gdal && loaded.Open())
            ExpectPaletteAsGdal(loaded.image, loaded.path);
    }
    // Floating point, 12-bit JPEG and 12-bit lossless JPEG stay refused.
    for (const char* name : {"jitc-nitf21/i_3450c.ntf", "jitc-nitf21/ns5600a.nsf", "jitc-nitf21/ns3417c.nsf",
                             "jitc-nitf21/ns3437a.nsf"})
        EXPECT_EQ(outcomes[name], "refused") << name;
    for (const auto& [name, outcome] : outcomes)
        std::printf("%-45s %s\n", name.c_str(), outcome.c_str());
}

// i_3113g ("I1"): a 512 x 512 stream for a 1023 x 1023 image, which GDAL cannot decode: every row
// is libjpeg's decoding of the stream, each pixel twice across and down.
TEST(Corpus, DownsampledJpegDrawsFromItsFrame)
{
    VX_SKIP_WITHOUT_CORPUS();
    LoadedImage loaded(CorpusPath("jitc-nitf21/i_3113g.ntf").c_str());
    ASSERT_TRUE(loaded.Open());
    const std::string file = ReadWholeFile(loaded.path);
    const size_t start = loaded.image.dataOffset, end = file.find("\xFF\xD9", start);
    ASSERT_NE(end, std::string::npos);
    const Bytes frame = DecodeJpegBlock(Bytes(file.begin() + long(start), file.begin() + long(end) + 2), 1);
    ASSERT_EQ(frame.size(), 512u * 512u);
    for (uint32_t row = 0; row < 1023; ++row) {
        Bytes expected;
        for (uint32_t column = 0; column < 1023; ++column)
            expected.push_back(frame[row / 2 * 512 + column / 2]);
        ASSERT_EQ(loaded.Row(row), expected) << "row " << row;
    }
}

// With FHDR, fixture files GDAL reads as they stand: NSIF, MULTI bands shown as R, G, B or (no B) the first band,
// wide RGB with values above 2^ABPP, packed 12-bit and 1-bit pixels, 1-bit colours from band 1's lookup tables.
// Without, files GDAL writes from fixture files with gdal_translate's options, in NITF 2.1 and 2.0 (which has no
// ICORDS "N" or "S"). Each with its ICORDS, IGEOLO, the EPSG code of its corners and GDAL's palette (reading a
// table of fewer than 256 entries, GDAL adds a transparent one, which it writes).
TEST(GdalMatrix, RowsEqualGdalsDecodingOfFixtureFilesAndOfTheFilesItWrites)
{
    VX_SKIP_WITHOUT_GDAL();
    NitfImagePlan mono = Plan(23, 37);
    mono.ICORDS = 'G', mono.IGEOLO = "330000N0850000E330000N0850213E325937N0850213E325937N0850000E";
    NitfImagePlan unplaced = mono, wide = mono, rgb = mono, lut256 = mono, lut200 = mono;
    unplaced.ICORDS = ' ', wide.NBPP = 16, wide.ABPP = 11, rgb.IREP = "RGB", rgb.bands = kRgbBands;
    lut256.IREP = lut200.IREP = "RGB/LUT";
    lut256.bands = {{"LU", 3, 256, RgbLookupTables(256)}};
    lut200.bands = {{"LU", 3, 200, RgbLookupTables(200)}};
    NitfImagePlan north = rgb, south = rgb;
    north.ICORDS = 'N', north.IGEOLO = "335000004400000335011104400000335011104399310335000004399310"; // zone 33
    south.ICORDS = 'S', south.IGEOLO = "335000006000000335011106000000335011105999310335000005999310"; // 30 m pixels
    struct Case { NitfImagePlan plan; std::string FHDR, options = ""; int32_t epsg = 0; };
    const std::string v21 = "NITF02.10", bs16 = "-co BLOCKSIZE=16";
    for (Case c : std::vector<Case>{
             {Layout("MONO", 8, {plain}), "NSIF01.00"}, {Layout("MULTI", 8, {blue, plain, green, red}, 'P'), v21},
             {Layout("MULTI", 8, {blue, plain, green, red}, 'S'), v21}, {Layout("MULTI", 8, {plain, red, green}, 'R'), v21},
             {Layout("MONO", 16, {red, green, blue}), "NITF02.00"}, {Layout("RGB", 16, kRgbBands, 'P', 11), v21},
             {Layout("RGB", 16, kRgbBands, 'R', 6), v21}, {Layout("MONO", 12, {plain}), v21},
             {Layout("MULTI", 12, {green, red, blue}, 'S', 10), v21}, {Layout("MONO", 1, {plain}), v21},
             {Layout("MONO", 1, {{"", 1, 2, "\x30\xC0"}}), v21}, {Layout("RGB/LUT", 1, {rgbLut}), v21},
             {Layout("MULTI", 1, {{"", 3, 2, RgbLookupTables(2)}, plain}), v21}, {Layout("MULTI", 1, {plain, plain}, 'S'), v21},
             {unplaced, ""}, {mono, "", bs16, 4326}, {mono, "", "-co ICORDS=D -co BLOCKXSIZE=32 -co BLOCKYSIZE=8", 4326},
             {wide, "", "-co ABPP=11 " + bs16, 4326}, {rgb, "", bs16, 4326}, {lut256, "", "", 4326},
             {lut200, "", bs16, 4326}, {mono, "", "-co IC=C3 " + bs16, 4326}, {unplaced, "", "-co IC=M3 " + bs16},
             {rgb, "", "-co IC=C3 " + bs16, 4326}, {rgb, "", "-co IC=M3", 4326}, {north, "", "", 32633},
             {south, "", "", 32733}})
        for (const std::string version : {"NITF02.10", "NITF02.00"}) {
            const bool written = !c.FHDR.empty(); // by the fixture writer, as GDAL reads it
            if (written ? version != v21 : version == "NITF02.00" && (c.plan.ICORDS == 'N' || c.plan.ICORDS == 'S'))
                continue;
            SCOPED_TRACE(c.plan.IREP + " NBPP " + std::to_string(c.plan.NBPP) + " IMODE " + c.plan.IMODE + " " +
                         (written ? c.FHDR : version + " " + c.options));
            c.plan.version21 = c.FHDR != "NITF02.00";
            const TempFile source(WrittenFile(c.plan).replace(0, 9, written ? c.FHDR : v21), ".ntf");
            TempDirectory dir;
            if (!written)
                RunCommand("gdal_translate -q -of NITF -co FHDR=" + version + " " + c.options + " " + source.path() +
                           " " + dir / "image.ntf");
            LoadedImage loaded(written ? source.c_str() : (dir / "image.ntf").c_str());
            ASSERT_TRUE(loaded.Open());
            const CNitfImage& image = loaded.image;
            // M3: the blocks are found by the mask table.
            EXPECT_EQ(std::tuple(image.isMasked, image.NROWS, image.NCOLS, size_t(image.NBANDS)),
                      std::tuple(c.options.find("IC=M3") != std::string::npos, c.plan.rows, c.plan.columns,
                                 c.plan.bands.size()));
            EXPECT_EQ(WorstDifference(loaded), 0);
            ExpectPaletteAsGdal(image, loaded.path);
            const std::string info = RunCommand("gdalinfo " + loaded.path);
            const auto metadata = [&info](const std::string& key) {
                const size_t at = info.find("  " + key + "="), start = at + key.size() + 3;
                return at == std::string::npos ? std::string() : info.substr(start, info.find('\n', start) - start);
            };
            EXPECT_EQ(std::string(1, image.ICORDS()), metadata("NITF_ICORDS").empty() ? " " : metadata("NITF_ICORDS"));
            EXPECT_EQ(image.IGEOLO != nullptr ? std::string(image.IGEOLO.get()) : "", metadata("NITF_IGEOLO"));
            EXPECT_EQ(ImageCornerEpsgCode(ImageCornerFields{image.ICORDS(), image.IGEOLO.get(), true}, 4326), c.epsg);
        }
}

} // namespace
