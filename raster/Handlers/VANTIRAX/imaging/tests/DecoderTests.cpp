// The imaging binding, and the decoder on image data placed in a file as a NITF file holds it: bi-level
// (IC "C1") T.4 strips coded by libtiff, decoded bit for bit; NITF JPEG data (IC "C3"/"M3", lossless
// "C5") coded by libjpeg and the lossless fixture writer, each stream decoding as its reference
// (libjpeg's decoding, or the samples themselves); and the data and calls it must refuse.
#include "imaging/LeadToolLibWrapper.h"
#include "base/ByteOrder.h"
#include "tests/fixtures/BiLevelWriter.h"
#include "tests/fixtures/JpegBlockWriter.h"
#include "tests/fixtures/TempFiles.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <initializer_list>
#include <set>
#include <stdexcept>
#include <string>
#include <utility>

#include <sys/resource.h>
#include <unistd.h>

namespace {

constexpr uint32_t kOffset = 137; // of the data in its file: odd, so no alignment is assumed
constexpr uint32_t kSide = 16;    // the JPEG blocks of every test

// Image data (LI bytes) at kOffset of a temporary file, opened as the decoder meets it inside a NITF file.
struct DataFile {
    explicit DataFile(const Bytes& data)
        : file(std::string(kOffset, 'x') + std::string(data.begin(), data.end()), ".ntf"), LI(uint32_t(data.size()))
    { reader.OpenFile(file.c_str(), kShareDenyWrite); }
    TempFile file;
    CFileReader reader;
    uint32_t LI;
};

bool OpenJpeg(CLeadToolLibWrapper& decoder, DataFile& file, uint32_t blocks, uint32_t NBANDS, uint32_t NCOLS,
              uint32_t NROWS, uint32_t blockWidth = 0, uint32_t blockHeight = 0, bool downsampled = false)
{
    return decoder.PrepareJpeg(file.reader, kOffset, file.LI, 8) &&
           decoder.Open(file.reader, kOffset, blocks, file.LI, 8, NBANDS, NCOLS, NROWS, false, blockWidth, blockHeight, downsampled);
}

bool OpenBiLevel(CLeadToolLibWrapper& decoder, DataFile& file, uint32_t LI, uint32_t NCOLS, uint32_t NROWS, bool oneDimensional)
{
    return decoder.PrepareBiLevel() && decoder.Open(file.reader, kOffset, 1, LI, 1, 1, NCOLS, NROWS, oneDimensional);
}

TEST(Binding, NeedsBothModulesAndEveryEntryPointAndBindsAgainAfterAReset)
{
    // The built-in modules with one entry point or one module named so the look-up misses it; then none.
    const ImagingModuleTable& builtIn = BuiltInImagingModules();
    std::vector<std::vector<ImagingEntry>> entries;
    std::vector<ImagingModule> modules(builtIn.modules, builtIn.modules + builtIn.moduleCount);
    std::vector<const char**> names{nullptr};
    for (ImagingModule& module : modules) {
        entries.emplace_back(module.entries, module.entries + module.entryCount);
        module.entries = entries.back().data();
        for (ImagingEntry& entry : entries.back())
            names.push_back(&entry.name);
        names.push_back(&module.name);
    }
    for (const char** name : names) {
        const char* kept = name ? std::exchange(*name, "missing") : "every module";
        const ImagingModuleTable partial{modules.data(), name ? modules.size() : 0};
        ResetLibrary();
        UseImagingModules(&partial);
        CLeadToolLibWrapper decoder;
        EXPECT_FALSE(EnsureLibrary() || decoder.PrepareBiLevel() || decoder.kind != kNotPrepared) << kept << " missing";
        UseImagingModules(nullptr);
        if (name)
            *name = kept;
    }
    ResetLibrary();
    ImagingBinding binding{};
    EXPECT_TRUE(!CopyBinding(binding) && binding.L_LoadMemory == nullptr);
    CLeadToolLibWrapper decoder;
    EXPECT_TRUE(decoder.PrepareBiLevel() && decoder.kind == kBiLevelDecoder && CopyBinding(binding) && binding.L_LoadMemory != nullptr);
}

// The stream with bytes set from an offset after the first marker of the given code.
Bytes SetAfterMarker(Bytes stream, uint8_t code, size_t at, std::initializer_list<uint8_t> values)
{
    for (size_t i = 2; i + at + values.size() <= stream.size(); ++i)
        if (stream[i] == 0xFF && stream[i + 1] == code)
            return std::copy(values.begin(), values.end(), stream.begin() + long(i + at)), stream;
    return stream;
}

// NITF JPEG data of blocks of side x side side by side, prepared and opened.
struct OpenedJpeg {
    DataFile file;
    CLeadToolLibWrapper decoder;
    bool opened;

    OpenedJpeg(const Bytes& data, uint32_t blocks, uint32_t bands = 1, bool downsampled = false, uint32_t side = kSide)
        : file(data), opened(OpenJpeg(decoder, file, blocks, bands, side * blocks, side, side, side, downsampled)) {}
    // Columns first to last of a row of a block, one byte per band; empty when GetRow fails.
    Bytes Row(uint32_t block, uint32_t row, uint32_t first = 0, uint32_t last = kSide - 1, uint32_t bands = 1)
    {
        Bytes pixels((last - first + 1) * bands);
        return decoder.GetRow(file.reader, block, row, first, last, uint32_t(pixels.size()), pixels.data()) ? pixels : Bytes{};
    }
};

// Each stream draws every row of its 16 x 16 block as its reference, or none (nothing expected), and a
// span that starts mid-block. Colour coded as R,G,B or YCbCr. Lossless: every predictor, grey and colour,
// restart intervals, a point transform dropping two low bits. Tables left out are the NITF defaults of
// the APP6 quality; without a quality only a DHT may be missing. A comment in front pushes the frame
// header past the first 100 bytes the table scan reads. Frames that do not fill the block, but an "I1"
// frame's rows are its pixels repeated (across, down) times. No rows: more components than bands, a frame
// larger than the block, 65535 x 65535 declared in a small stream, lossless streams cut in half or of
// 12-bit samples; 32000 x 32000 declared over a few bytes of data (C3 decoded by rows stops where the
// data ends, C5 beyond the bound is not decoded).
TEST(JpegDecode, StreamsDecodeAsTheirReference)
{
    struct Case { std::string what; Bytes stream, expected; uint32_t bands = 1; uint8_t quality = 0, streamColor = 0; bool downsampled = false; };
    std::vector<Case> cases;
    for (bool rgbCoding : {false, true}) {
        const Bytes stream = EncodeJpegBlock(TestPattern(kSide, kSide, 3, 2), JpegBlockPlan{kSide, kSide, 3, rgbCoding});
        cases.push_back({rgbCoding ? "R,G,B" : "YCbCr", stream, DecodeJpegBlock(stream, 3), 3, 0, uint8_t(2 - rgbCoding)});
    }
    for (int predictor = 1; predictor <= 7; ++predictor)
        for (int components : {1, 3}) {
            const int shift = predictor == 6 && components == 1 ? 2 : 0;
            Bytes pixels = TestPattern(kSide, kSide, components, unsigned(predictor));
            const Bytes stream = EncodeJpegBlock(pixels, {kSide, kSide, components, false, predictor, shift, predictor == 4 ? 4u : 0u});
            for (uint8_t& value : pixels)
                value &= uint8_t(0xFF << shift);
            cases.push_back({"lossless predictor " + std::to_string(predictor), stream, pixels, uint32_t(components)});
        }
    const Bytes grey = TestPattern(kSide, kSide, 1, 7);
    const std::string comment = std::string("\xFF\xFE\x00\x5F", 4) + std::string(0x5D, 'c');
    for (uint8_t quality = 1; quality <= 5; ++quality) {
        const Bytes complete = DecodeJpegBlock(EncodeJpegBlock(grey, JpegBlockPlan{kSide, kSide, 1, false, 0, 0, 0, quality}), 1);
        for (auto [keepDqt, keepDht] : {std::pair{true, true}, {false, false}, {false, true}, {true, false}}) {
            Bytes stream = EncodeJpegBlock(grey, JpegBlockPlan{kSide, kSide, 1, false, 0, 0, 0, quality, keepDqt, keepDht});
            stream.insert(stream.begin() + 2, comment.begin(), quality % 2 ? comment.begin() : comment.end());
            const std::string what = std::string(quality % 2 ? "" : "commented, ") + (keepDqt ? "DQT " : "") +
                                     (keepDht ? "DHT " : "") + "quality " + std::to_string(quality);
            cases.push_back({what, stream, complete, 1, quality});
            cases.push_back({what + " not in APP6", stream, keepDqt ? complete : Bytes{}});
        }
    }
    struct Fill { const char* what; uint32_t width, height; int components; bool downsampled; uint32_t across, down; };
    for (const Fill& f : {Fill{"8 rows of a 16-row block", kSide, 8, 1, false, 0, 0}, {"8 columns", 8, kSide, 1, false, 0, 0},
                          {"three components in a one-band image", kSide, kSide, 3, false, 0, 0}, {"I1 whole", kSide, kSide, 1, true, 1, 1},
                          {"I1 5 columns: each 4 times", 5, kSide, 1, true, 4, 1}, {"I1 2 x 2: each 8 times", 2, 2, 1, true, 8, 8},
                          {"I1 halved across, quartered down", 8, 4, 1, true, 2, 4}, {"I1 three components", 8, 8, 3, true, 0, 0},
                          {"I1 1 column: 16 times is more than 8", 1, kSide, 1, true, 0, 0}}) {
        const Bytes frame = EncodeJpegBlock(TestPattern(f.width, f.height, f.components, 21), {f.width, f.height, f.components});
        const Bytes decoded = DecodeJpegBlock(frame, f.components);
        Bytes expected;
        for (uint32_t i = 0; f.across != 0 && i < kSide * kSide; ++i)
            expected.push_back(decoded[(i / kSide / f.down) * f.width + i % kSide / f.across]);
        cases.push_back({f.what, frame, expected, 1, 0, 0, f.downsampled});
    }
    const Bytes lossless = EncodeJpegBlock(grey, JpegBlockPlan{kSide, kSide, 1, false, 1});
    Bytes halfLossless(lossless.begin(), lossless.begin() + long(lossless.size() / 2));
    halfLossless.insert(halfLossless.end(), {0xFF, 0xD9});
    const Bytes baseline = EncodeJpegBlock(grey, {}), large = EncodeJpegBlock(TestPattern(32, 32, 1, 4), {32, 32});
    for (const auto& [what, stream] : {std::pair{"a frame larger than the block", large},
                                       {"65535 x 65535", SetAfterMarker(baseline, 0xC0, 5, {0xFF, 0xFF, 0xFF, 0xFF})},
                                       {"lossless, cut in half", halfLossless}, {"lossless, 12-bit samples", SetAfterMarker(lossless, 0xC3, 4, {12})},
                                       {"C3 32000 x 32000", SetAfterMarker(baseline, 0xC0, 5, {0x7D, 0, 0x7D, 0})},
                                       {"C5 32000 x 32000", SetAfterMarker(lossless, 0xC3, 5, {0x7D, 0, 0x7D, 0})}})
        cases.push_back({what, stream, {}});
    // The pages the process first touches tell whether a case wrote far more rows than it has data for
    // (a sanitizer's shadow memory takes a few of its own).
    const long mostPagesTouched = (768L << 20) / sysconf(_SC_PAGESIZE);
    for (const Case& c : cases) {
        SCOPED_TRACE(c.what + ", " + std::to_string(c.bands) + " bands");
        rusage before{}, after{};
        getrusage(RUSAGE_SELF, &before);
        OpenedJpeg image(BuildNitfJpegData({c.stream}, NitfApp6Plan{1, 1, c.quality, c.streamColor}), 1, c.bands,
                         c.downsampled, c.what.find("32000") == std::string::npos ? kSide : 32000);
        ASSERT_EQ(image.opened && !image.Row(0, 0, 0, kSide - 1, c.bands).empty(), !c.expected.empty());
        getrusage(RUSAGE_SELF, &after);
        EXPECT_LT(after.ru_minflt - before.ru_minflt, mostPagesTouched);
        for (uint32_t row = 0; row < kSide && image.opened; ++row) {
            const auto at = c.expected.begin() + row * kSide * c.bands;
            EXPECT_EQ(image.Row(0, row, 0, kSide - 1, c.bands), c.expected.empty() ? Bytes{} : Bytes(at, at + kSide * c.bands));
            EXPECT_EQ(image.Row(0, row, 3, 12, c.bands), c.expected.empty() ? Bytes{} : Bytes(at + 3 * c.bands, at + 13 * c.bands))
                << "row " << row;
        }
        EXPECT_TRUE(c.expected.empty() || image.decoder.loaderConverted == (c.bands == 3 ? 1 : 0)) << "converted";
    }
}

// A stream cut anywhere in its scan: the rows decoded before the cut come out as libjpeg decodes the
// whole stream, the rest fail. Entropy-coded data overwritten: whatever libjpeg makes of it, no crash and
// no hang. Streams are found as their rows are asked for: a block without EOI fails its rows, and without
// a mask table so does every block after it, while those before it draw. Only a first stream that breaks
// before its scan is damaged data at open. A second Open without FreeBitmaps is refused. Preparing needs
// the NITF APP6 segment (identifier "NITF") at the data offset and 8-bit samples; opening needs a
// prepared decoder. More blocks than the data can hold: refused before anything is allocated.
TEST(JpegDecode, DamagedStreamsAndDecodersNotPreparedFailCleanly)
{
    const Bytes pattern = TestPattern(kSide, kSide, 1, 4), stream = EncodeJpegBlock(pattern, {}), decoded = DecodeJpegBlock(stream, 1);
    size_t scan = 2;
    while (!(stream[scan] == 0xFF && stream[scan + 1] == 0xDA))
        scan += 2 + ((stream[scan + 2] << 8) | stream[scan + 3]);
    std::set<uint32_t> rowsGiven;
    for (size_t cut = scan + 14; cut + 2 < stream.size(); cut += 3) {
        Bytes shortStream(stream.begin(), stream.begin() + long(cut));
        shortStream.insert(shortStream.end(), {0xFF, 0xD9});
        OpenedJpeg image(BuildNitfJpegData({shortStream}, {}), 1);
        uint32_t rows = 0; // given before the first that fails
        for (uint32_t row = 0; row < kSide; ++row) {
            const Bytes given = image.Row(0, row);
            rows += rows == row && !given.empty();
            EXPECT_EQ(given, row < rows ? Bytes(decoded.begin() + row * kSide, decoded.begin() + (row + 1) * kSide) : Bytes{})
                << "cut at " << cut << ", row " << row;
        }
        rowsGiven.insert(rows);
    }
    EXPECT_EQ(rowsGiven, (std::set<uint32_t>{0, 8}));
    Bytes corrupt = stream;
    for (size_t at = corrupt.size() - 40; at < corrupt.size() - 2; ++at)
        corrupt[at] = uint8_t(at * 97);
    OpenedJpeg damaged(BuildNitfJpegData({corrupt}, {}), 1);
    EXPECT_TRUE(!damaged.opened || !damaged.Row(0, 0).empty());
    Bytes data = BuildNitfJpegData({stream, EncodeJpegBlock(pattern, {kSide, kSide, 1, false, 0, 0, 0, 0, true, true, false}), stream}, NitfApp6Plan{3, 1, 0, 0});
    for (size_t size : {data.size(), size_t(100)}) {
        DataFile file(Bytes(data.begin(), data.begin() + long(size)));
        CLeadToolLibWrapper decoder;
        try {
            EXPECT_TRUE(OpenJpeg(decoder, file, 3, 1, 48, 16));
            EXPECT_EQ(size, data.size()) << "no exception";
        } catch (const std::runtime_error& error) {
            EXPECT_STREQ(error.what(), kDamagedImageText);
            continue;
        }
        EXPECT_EQ(decoder.app6[12] | (decoder.app6[13] << 8), 3); // blocks per row, host order
        Bytes row(kSide), span(40, 0xEE);
        for (uint32_t block : {3, 2, 0, 1})
            EXPECT_EQ(decoder.GetRow(file.reader, block, 0, 0, kSide - 1, kSide, row.data()), block == 0) << block;
        // Columns 10 to 15 of row 5: six bytes asked, the rest untouched; more asked: only what is there.
        for (uint32_t asked : {6u, 40u})
            EXPECT_TRUE(decoder.GetRow(file.reader, 0, 5, 10, 15, asked, span.data()) &&
                        Bytes(span.begin(), span.begin() + 6) == Bytes(&decoded[90], &decoded[96]) && span[6] == 0xEE) << asked;
        EXPECT_FALSE(decoder.GetRow(file.reader, 0, kSide, 0, 0, 1, row.data()) ||
                     decoder.GetRow(file.reader, 0, 0, kSide, kSide, 1, row.data()));
        EXPECT_THROW(decoder.Open(file.reader, kOffset, 3, 0, 8, 1, 48, 16, false), std::runtime_error);
        decoder.FreeBitmaps();
        EXPECT_FALSE(decoder.GetRow(file.reader, 0, 0, 0, kSide - 1, kSide, row.data()));
    }
    DataFile file(data);
    CLeadToolLibWrapper decoder, huge;
    EXPECT_FALSE(decoder.PrepareJpeg(file.reader, kOffset, 0, 12) || decoder.PrepareJpeg(file.reader, kOffset, 0, 16) ||
                 decoder.PrepareJpeg(file.reader, kOffset + 1, 0, 8) ||
                 decoder.Open(file.reader, kOffset, 1, 0, 8, 1, kSide, kSide, false));
    ASSERT_TRUE(decoder.PrepareJpeg(file.reader, kOffset, 0, 8));
    EXPECT_FALSE(decoder.Open(file.reader, kOffset, 1, 0, 12, 1, kSide, kSide, false));
    ASSERT_TRUE(huge.PrepareJpeg(file.reader, kOffset, 0, 8));
    EXPECT_FALSE(huge.Open(file.reader, kOffset, 0xFFFFFFFF, 0, 8, 1, kSide, kSide, false));
    EXPECT_EQ(huge.HeldBytes(), 0u);
    data[2 + 4] = 'X'; // "XITF"
    OpenedJpeg other(data, 1);
    EXPECT_TRUE(!other.opened && other.decoder.kind == kNotPrepared);
}

// One block larger than the bound, decoded by a row decoder into a band of rows: drawn top down, bottom
// up and in jumps over a window (spans starting inside a byte), its rows are those decoded whole (none
// where only a whole decode is made), no byte is written past a span, block 1 of 1 is refused, and the
// bound holds. JPEG: 1024 x 256. Bi-level 1-D and 2-D strips: 1021 x 2048 (rows of no whole number of
// bytes) decoded bit for bit, a set bit black; the TIFF header names the coding and LI. LI beyond the
// file, and more rows than the strip has bits: refused before decoding. Garbage, or a strip cut short:
// whatever comes out, no crash.
TEST(RowDecoding, BlocksBeyondTheBoundDrawAsDecodedWholeInAnyOrder)
{
    constexpr uint32_t kWide = 1024, kBound = 192 << 10, kBiLevelWide = 1021, kStride = 128;
    const auto jpeg = [&](int components, void (*change)(JpegBlockPlan&), uint8_t quality) {
        JpegBlockPlan plan{kWide, 256, components};
        change(plan);
        Bytes stream = EncodeJpegBlock(TestPattern(kWide, 256, components, 9), plan);
        if (!plan.keepEoi) // cut in its scan
            stream.resize(stream.size() * 2 / 3), stream.insert(stream.end(), {0xFF, 0xD9});
        return BuildNitfJpegData({stream}, NitfApp6Plan{1, 1, quality, uint8_t(components == 3 ? 2 : 0)});
    };
    const Bytes packed = TestPattern(kStride, 2048, 1, 9);
    struct Case { const char* what; Bytes data; int components; bool byRows, oneDimensional = false; };
    for (const Case& c : {Case{"bi-level 2-D", EncodeT4Strip(packed, kBiLevelWide, 2048, true), 0, true},
                          {"bi-level 1-D", EncodeT4Strip(packed, kBiLevelWide, 2048, false), 0, true, true},
                          {"grey", jpeg(1, [](JpegBlockPlan&) {}, 0), 1, true},
                          {"colour, restarts", jpeg(3, [](JpegBlockPlan& p) { p.restartRows = 3; }, 0), 3, true},
                          {"no tables", jpeg(1, [](JpegBlockPlan& p) { p.keepDqt = p.keepDht = false; }, 2), 1, true},
                          {"cut short", jpeg(1, [](JpegBlockPlan& p) { p.keepEoi = false; }, 0), 1, true},
                          {"progressive", jpeg(1, [](JpegBlockPlan& p) { p.progressive = true; }, 0), 1, false},
                          {"lossless", jpeg(1, [](JpegBlockPlan& p) { p.predictor = 1; }, 0), 1, false}}) {
        SCOPED_TRACE(c.what);
        const uint32_t rows = c.components ? 256 : 2048, width = c.components ? kWide : kBiLevelWide;
        const uint32_t bytes = c.components ? kWide * c.components : kStride, pixel = uint32_t(std::max(c.components, 1));
        DataFile file(c.data);
        CLeadToolLibWrapper whole, byRows;
        byRows.cacheBound = kBound;
        for (CLeadToolLibWrapper* decoder : {&whole, &byRows})
            ASSERT_TRUE(c.components ? OpenJpeg(*decoder, file, 1, uint32_t(c.components), kWide, rows, kWide, rows)
                                     : OpenBiLevel(*decoder, file, file.LI, width, rows, c.oneDimensional));
        const auto row = [&](CLeadToolLibWrapper& decoder, uint32_t y, uint32_t first, uint32_t last, uint32_t block = 0) {
            Bytes out(size_t(last - first + 1) * pixel + 1, 0x11);
            const bool given = decoder.GetRow(file.reader, block, y, first, last, bytes, out.data());
            EXPECT_EQ(out.back(), 0x11) << "wrote past the span";
            return given ? Bytes(out.begin(), out.end() - 1) : Bytes{};
        };
        std::vector<Bytes> expected;
        for (uint32_t y = 0; y < rows; ++y)
            expected.push_back(row(whole, y, 0, width - 1));
        EXPECT_TRUE(!expected[0].empty() && expected[rows - 1].empty() == (std::string(c.what) == "cut short"));
        EXPECT_TRUE(row(whole, 0, 0, width - 1, 1).empty());
        const uint32_t jumps[] = {rows / 2, 3, rows - 1, 100, 101, 0, rows / 3};
        for (uint32_t i = 0; i < 2 * rows + 7; ++i) {
            const uint32_t y = i < rows ? rows - 1 - i : i < 2 * rows ? i - rows : jumps[i - 2 * rows];
            const size_t first = i < 2 * rows ? 0 : 100;
            const Bytes& all = c.byRows ? expected[y] : Bytes{};
            ASSERT_EQ(row(byRows, y, uint32_t(first), width - 1 - uint32_t(first)),
                      all.empty() ? all : Bytes(all.begin() + long(first * pixel), all.end() - long(first * pixel)))
                << "row " << y;
            ASSERT_LE(byRows.HeldBytes(), kBound);
        }
        if (c.components)
            continue;
        for (uint32_t y = 0; y < rows; ++y)
            for (uint32_t x = 0; x < width; ++x)
                ASSERT_EQ(expected[y][x], (packed[y * kStride + x / 8] & (0x80 >> (x % 8))) ? 0 : 255) << x << "," << y;
        EXPECT_EQ(BigEndian32(whole.tiffHeader + kTiffT4OptionsValue), c.oneDimensional ? 4u : 5u);
        EXPECT_EQ(BigEndian32(whole.tiffHeader + kTiffStripByteCountsValue), file.LI);
        CLeadToolLibWrapper refused;
        EXPECT_FALSE(OpenBiLevel(refused, file, file.LI + 1, width, rows, c.oneDimensional));
        refused.FreeBitmaps();
        EXPECT_FALSE(OpenBiLevel(refused, file, file.LI, width, file.LI * 8 + 8, c.oneDimensional) || refused.HeldBytes() != 0);
        for (const Bytes& data : {TestPattern(file.LI, 1, 1, 5), Bytes(c.data.begin(), c.data.begin() + long(c.data.size() / 3))}) {
            DataFile damagedFile(data);
            CLeadToolLibWrapper damaged;
            OpenBiLevel(damaged, damagedFile, damagedFile.LI, width, rows, c.oneDimensional);
            damaged.GetRow(damagedFile.reader, 0, rows - 1, 0, width - 1, kStride, Bytes(width).data());
        }
    }
}

} // namespace
