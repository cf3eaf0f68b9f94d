#include "imaging/LeadToolLibWrapper.h"
#include "imaging/tests/DecoderTestFile.h"
#include "tests/fixtures/JpegBlockWriter.h"
#include "tests/fixtures/LosslessJpegWriter.h"

#include <gtest/gtest.h>

#include <set>
#include <stdexcept>

#include <sys/resource.h>
#include <unistd.h>

namespace {

// The block size of the tests' images.
constexpr uint32_t kSide = 16;

struct OpenedJpeg {
    DecoderTestFile file;
    CLeadToolLibWrapper decoder;
    bool prepared = false;
    bool opened = false;

    OpenedJpeg(const Bytes& data, uint32_t blocks, uint32_t bands = 1, uint32_t side = kSide,
               bool downsampled = false)
        : file(data)
    {
        prepared = decoder.PrepareJpeg(file.reader, kTestDataOffset, uint32_t(data.size()), 8);
        if (prepared)
            opened = decoder.Open(file.reader, kTestDataOffset, blocks, uint32_t(data.size()), 8, bands,
                                  side * blocks, side, false, side, side, downsampled);
    }

    // Columns first to last of a row of a grey block; empty when GetRow fails.
    Bytes Row(uint32_t block, uint32_t row, uint32_t first = 0, uint32_t last = kSide - 1)
    {
        Bytes pixels(last - first + 1);
        return decoder.GetRow(block, row, first, last, uint32_t(pixels.size()), pixels.data()) ? pixels : Bytes {};
    }

    // Every row of a block, as GetRow delivers them.
    Bytes Block(uint32_t block, uint32_t bands = 1)
    {
        Bytes pixels(kSide * kSide * bands);
        for (uint32_t row = 0; row < kSide; ++row)
            EXPECT_TRUE(decoder.GetRow(block, row, 0, kSide - 1, kSide * bands, pixels.data() + row * kSide * bands));
        return pixels;
    }
};

// Sets the width and height of the frame header with the given SOF code.
void SetFrameSize(Bytes& stream, uint8_t frameCode, uint16_t width, uint16_t height)
{
    for (size_t at = 2; at + 8 < stream.size(); ++at)
        if (stream[at] == 0xFF && stream[at + 1] == frameCode) {
            stream[at + 5] = uint8_t(height >> 8);
            stream[at + 6] = uint8_t(height);
            stream[at + 7] = uint8_t(width >> 8);
            stream[at + 8] = uint8_t(width);
            return;
        }
    ADD_FAILURE() << "no frame header";
}

TEST(JpegDecode, FourSelfContainedBlocksDecodeAsLibjpegDoes)
{
    std::vector<Bytes> blocks;
    for (unsigned i = 0; i < 4; ++i)
        blocks.push_back(EncodeJpegBlock(TestPattern(kSide, kSide, 1, i), JpegBlockPlan {}));
    OpenedJpeg image(BuildNitfJpegData(blocks, NitfApp6Plan {4, 1, 0, 0}), 4);
    ASSERT_TRUE(image.prepared);
    ASSERT_TRUE(image.opened);
    EXPECT_EQ(image.decoder.app6[12] | (image.decoder.app6[13] << 8), 4);   // blocks per row, host order
    for (unsigned i = 0; i < 4; ++i)
        EXPECT_EQ(image.Block(i), DecodeJpegBlock(blocks[i], 1)) << "block " << i;
    EXPECT_FALSE(image.decoder.GetRow(4, 0, 0, kSide - 1, kSide, image.Block(0).data()));
}

TEST(JpegDecode, MissingTablesAreTakenFromTheQualityByte)
{
    Bytes pattern = TestPattern(kSide, kSide, 1, 7);
    JpegBlockPlan withTables;
    withTables.defaultQuality = 3;
    Bytes complete = EncodeJpegBlock(pattern, withTables);
    Bytes expected = OpenedJpeg(BuildNitfJpegData({complete}, {}), 1).Block(0);
    EXPECT_EQ(expected, DecodeJpegBlock(complete, 1));

    for (auto [keepDqt, keepDht] : {std::pair{false, false}, {false, true}, {true, false}}) {
        JpegBlockPlan bare = withTables;
        bare.keepDqt = keepDqt;
        bare.keepDht = keepDht;
        Bytes data = BuildNitfJpegData({EncodeJpegBlock(pattern, bare)}, NitfApp6Plan {1, 1, 3, 0});
        OpenedJpeg image(data, 1);
        ASSERT_TRUE(image.opened) << keepDqt << keepDht;
        EXPECT_EQ(image.Block(0), expected);

        // Without a quality there is no default DQT; a DHT alone needs none.
        data[2 + 20] = 0;
        OpenedJpeg unqualified(data, 1);
        EXPECT_EQ(unqualified.opened, keepDqt) << keepDqt << keepDht;
    }
}

TEST(JpegDecode, LastBlockWithoutEndOfImageIsDamaged)
{
    JpegBlockPlan open;
    open.keepEoi = false;
    Bytes pattern = TestPattern(kSide, kSide, 1, 1);
    Bytes data = BuildNitfJpegData({EncodeJpegBlock(pattern, {}), EncodeJpegBlock(pattern, open)}, {});
    DecoderTestFile file(data);
    CLeadToolLibWrapper decoder;
    ASSERT_TRUE(decoder.PrepareJpeg(file.reader, kTestDataOffset, 0, 8));
    try {
        decoder.Open(file.reader, kTestDataOffset, 2, uint32_t(data.size()), 8, 1, 32, 16, false);
        FAIL() << "no exception";
    } catch (const std::runtime_error& error) {
        EXPECT_STREQ(error.what(), kDamagedImageText);
    }
    // The first block stays decoded; a second Open without FreeBitmaps is refused.
    Bytes row(kSide);
    EXPECT_TRUE(decoder.GetRow(0, 0, 0, kSide - 1, kSide, row.data()));
    EXPECT_THROW(decoder.Open(file.reader, kTestDataOffset, 2, 0, 8, 1, 32, 16, false), std::runtime_error);
    decoder.FreeBitmaps();
    EXPECT_FALSE(decoder.GetRow(0, 0, 0, kSide - 1, kSide, row.data()));
}

TEST(JpegDecode, ColourReachesTheCallerAsRgb)
{
    Bytes pattern = TestPattern(kSide, kSide, 3, 2);
    for (bool rgbCoding : {false, true}) {
        JpegBlockPlan plan;
        plan.components = 3;
        plan.rgbCoding = rgbCoding;
        Bytes block = EncodeJpegBlock(pattern, plan);
        OpenedJpeg image(BuildNitfJpegData({block}, NitfApp6Plan {1, 1, 0, uint8_t(rgbCoding ? 1 : 2)}), 1, 3);
        ASSERT_TRUE(image.opened);
        EXPECT_EQ(image.decoder.loaderConverted, 1);
        EXPECT_EQ(image.Block(0, 3), DecodeJpegBlock(block, 3)) << "R,G,B coding " << rgbCoding;
    }
}

TEST(JpegDecode, RowSpansStayWithinTheCallersBytes)
{
    Bytes data = BuildNitfJpegData({EncodeJpegBlock(TestPattern(kSide, kSide, 1, 3), {})}, {});
    OpenedJpeg image(data, 1);
    ASSERT_TRUE(image.opened);
    Bytes full = image.Block(0);
    Bytes span(12, 0xEE);
    // Columns 10 to 15 of row 5: six bytes asked, the rest untouched.
    ASSERT_TRUE(image.decoder.GetRow(0, 5, 10, 15, 6, span.data()));
    EXPECT_EQ(Bytes(span.begin(), span.begin() + 6), Bytes(full.begin() + 5 * kSide + 10, full.begin() + 6 * kSide));
    EXPECT_EQ(span[6], 0xEE);
    // More bytes than the row holds from that column: only what is there.
    Bytes wide(40, 0xEE);
    ASSERT_TRUE(image.decoder.GetRow(0, 5, 10, 15, 40, wide.data()));
    EXPECT_EQ(wide[6], 0xEE);
    EXPECT_FALSE(image.decoder.GetRow(0, kSide, 0, 0, 1, wide.data()));
    EXPECT_FALSE(image.decoder.GetRow(0, 0, kSide, kSide, 1, wide.data()));
}

TEST(JpegDecode, HostileStreamsFailCleanly)
{
    Bytes pattern = TestPattern(kSide, kSide, 1, 4);
    // A frame larger than the block the caller gives.
    JpegBlockPlan large;
    large.width = large.height = 2 * kSide;
    Bytes big = EncodeJpegBlock(TestPattern(2 * kSide, 2 * kSide, 1, 4), large);
    EXPECT_FALSE(OpenedJpeg(BuildNitfJpegData({big}, {}), 1).opened);

    // A frame header declaring 65535 x 65535 in a small stream, no block size given.
    Bytes absurd = EncodeJpegBlock(pattern, {});
    SetFrameSize(absurd, 0xC0, 0xFFFF, 0xFFFF);
    {
        Bytes data = BuildNitfJpegData({absurd}, {});
        DecoderTestFile file(data);
        CLeadToolLibWrapper decoder;
        ASSERT_TRUE(decoder.PrepareJpeg(file.reader, kTestDataOffset, 0, 8));
        EXPECT_FALSE(decoder.Open(file.reader, kTestDataOffset, 1, 0, 8, 1, kSide, kSide, false));
    }

    // Entropy-coded data overwritten: whatever libjpeg makes of it, no crash and no hang.
    Bytes corrupt = EncodeJpegBlock(pattern, {});
    for (size_t at = corrupt.size() - 40; at < corrupt.size() - 2; ++at)
        corrupt[at] = uint8_t(at * 97);
    OpenedJpeg damaged(BuildNitfJpegData({corrupt}, {}), 1);
    Bytes row(kSide);
    if (damaged.opened) {
        EXPECT_TRUE(damaged.decoder.GetRow(0, 0, 0, kSide - 1, kSide, row.data()));
    }

    // More blocks than the data can hold: refused before anything is allocated.
    Bytes one = BuildNitfJpegData({EncodeJpegBlock(pattern, {})}, {});
    DecoderTestFile file(one);
    CLeadToolLibWrapper decoder;
    ASSERT_TRUE(decoder.PrepareJpeg(file.reader, kTestDataOffset, 0, 8));
    EXPECT_FALSE(decoder.Open(file.reader, kTestDataOffset, 0xFFFFFFFF, 0, 8, 1, kSide, kSide, false));
    EXPECT_EQ(decoder.bitmaps, nullptr);
}

// Block 0 holds a whole frame; block 1 the case's frame, whose rows are its
// pixels repeated (across, down) times, or fail (0) when it does not fill the block.
TEST(JpegDecode, BlocksGiveRowsOnlyFromFramesThatFillThem)
{
    struct Case { const char* what; uint32_t width, height; int components; bool downsampled; uint32_t across, down; };
    const Case cases[] = {
        {"whole frame", kSide, kSide, 1, false, 1, 1},
        {"8 rows of a 16-row block", kSide, 8, 1, false, 0, 0},
        {"8 columns of a 16-column block", 8, kSide, 1, false, 0, 0},
        {"three components in a one-band image", kSide, kSide, 3, false, 0, 0},
        {"I1 whole frame", kSide, kSide, 1, true, 1, 1},
        {"I1 halved across, quartered down", 8, 4, 1, true, 2, 4},
        {"I1 5 columns: each 4 times", 5, kSide, 1, true, 4, 1},
        {"I1 2 x 2: each 8 times", 2, 2, 1, true, 8, 8},
        {"I1 1 column: 16 times is more than 8", 1, kSide, 1, true, 0, 0},
        {"I1 three components in a one-band image", 8, 8, 3, true, 0, 0},
    };
    const Bytes whole = EncodeJpegBlock(TestPattern(kSide, kSide, 1, 20), {});
    for (const Case& c : cases) {
        JpegBlockPlan plan {c.width, c.height, c.components};
        const Bytes frame = EncodeJpegBlock(TestPattern(c.width, c.height, c.components, 21), plan);
        const Bytes decoded = DecodeJpegBlock(frame, c.components);
        OpenedJpeg image(BuildNitfJpegData({whole, frame}, NitfApp6Plan {2, 1, 0, 0}), 2, 1, kSide, c.downsampled);
        ASSERT_TRUE(image.opened) << c.what;
        EXPECT_EQ(image.Block(0), DecodeJpegBlock(whole, 1)) << c.what;
        for (uint32_t row = 0; row < kSide; ++row) {
            if (c.across == 0) {
                EXPECT_TRUE(image.Row(1, row).empty()) << c.what << " row " << row;
                continue;
            }
            Bytes expected;
            for (uint32_t column = 0; column < kSide; ++column)
                expected.push_back(decoded[(row / c.down) * c.width + column / c.across]);
            EXPECT_EQ(image.Row(1, row), expected) << c.what << " row " << row;
            EXPECT_EQ(image.Row(1, row, 3, 12), Bytes(expected.begin() + 3, expected.begin() + 13)) << c.what;
        }
    }
}

// A stream cut anywhere in its scan: the rows decoded before the cut come
// out as libjpeg decodes the whole stream, the rest fail.
TEST(JpegDecode, StreamCutShortGivesOnlyTheRowsBeforeTheCut)
{
    const Bytes stream = EncodeJpegBlock(TestPattern(kSide, kSide, 1, 22), {});
    const Bytes decoded = DecodeJpegBlock(stream, 1);
    size_t scan = 2;
    while (!(stream[scan] == 0xFF && stream[scan + 1] == 0xDA))
        scan += 2 + ((stream[scan + 2] << 8) | stream[scan + 3]);
    std::set<uint32_t> rowsGiven;
    for (size_t cut = scan + 14; cut + 2 < stream.size(); cut += 3) {
        Bytes shortStream(stream.begin(), stream.begin() + cut);
        shortStream.insert(shortStream.end(), {0xFF, 0xD9});
        OpenedJpeg image(BuildNitfJpegData({shortStream}, {}), 1);
        uint32_t rows = 0;
        while (rows < kSide && !image.Row(0, rows).empty())
            ++rows;
        rowsGiven.insert(rows);
        for (uint32_t row = 0; row < kSide; ++row)
            EXPECT_EQ(image.Row(0, row), row < rows ? Bytes(decoded.begin() + row * kSide,
                                                            decoded.begin() + (row + 1) * kSide)
                                                    : Bytes {})
                << "cut at " << cut << ", row " << row;
    }
    EXPECT_EQ(rowsGiven, (std::set<uint32_t> {0, 8}));
}

// A few bytes of coded data under a frame header declaring 32000 x 32000:
// decoding stops where the data ends instead of writing a gibibyte of rows.
// The pages the process first touches meanwhile tell (a sanitizer's shadow
// memory takes a few of its own).
TEST(JpegDecode, FrameFarLargerThanItsDataStopsWhereTheDataEnds)
{
    constexpr uint16_t kDeclared = 32000;
    const long mostPagesTouched = (768L << 20) / sysconf(_SC_PAGESIZE);
    Bytes pattern = TestPattern(kSide, kSide, 1, 23);
    Bytes baseline = EncodeJpegBlock(pattern, {});
    SetFrameSize(baseline, 0xC0, kDeclared, kDeclared);
    Bytes lossless = EncodeLosslessJpeg(pattern, LosslessJpegPlan {});
    SetFrameSize(lossless, 0xC3, kDeclared, kDeclared);
    for (const Bytes* stream : {&baseline, &lossless}) {
        rusage before {}, after {};
        getrusage(RUSAGE_SELF, &before);
        OpenedJpeg image(BuildNitfJpegData({*stream}, {}), 1, 1, kDeclared);
        getrusage(RUSAGE_SELF, &after);
        EXPECT_TRUE(image.prepared);
        EXPECT_FALSE(image.opened);
        EXPECT_LT(after.ru_minflt - before.ru_minflt, mostPagesTouched) << (stream == &baseline ? "C3" : "C5");
    }
}

TEST(JpegDecode, PreparationNeedsNitfApp6AndEightBitSamples)
{
    Bytes data = BuildNitfJpegData({EncodeJpegBlock(TestPattern(kSide, kSide, 1, 5), {})}, {});
    DecoderTestFile file(data);
    CLeadToolLibWrapper decoder;
    EXPECT_FALSE(decoder.PrepareJpeg(file.reader, kTestDataOffset, 0, 12));
    EXPECT_FALSE(decoder.PrepareJpeg(file.reader, kTestDataOffset, 0, 16));
    EXPECT_FALSE(decoder.PrepareJpeg(file.reader, kTestDataOffset + 1, 0, 8));
    EXPECT_FALSE(decoder.Open(file.reader, kTestDataOffset, 1, 0, 8, 1, kSide, kSide, false));
    EXPECT_TRUE(decoder.PrepareJpeg(file.reader, kTestDataOffset, 0, 8));
    EXPECT_FALSE(decoder.Open(file.reader, kTestDataOffset, 1, 0, 12, 1, kSide, kSide, false));

    Bytes other = data;
    other[2 + 4] = 'X';   // identifier "XITF"
    DecoderTestFile otherFile(other);
    CLeadToolLibWrapper otherDecoder;
    EXPECT_FALSE(otherDecoder.PrepareJpeg(otherFile.reader, kTestDataOffset, 0, 8));
    EXPECT_EQ(otherDecoder.kind, kNotPrepared);
}

TEST(LosslessJpeg, EveryPredictorRestoresTheSamples)
{
    Bytes grey = TestPattern(kSide, kSide, 1, 8);
    Bytes colour = TestPattern(kSide, kSide, 3, 9);
    for (int predictor = 1; predictor <= 7; ++predictor) {
        for (int components : {1, 3}) {
            LosslessJpegPlan plan;
            plan.components = components;
            plan.predictor = predictor;
            plan.restartRows = predictor == 4 ? 4 : 0;
            const Bytes& pixels = components == 1 ? grey : colour;
            OpenedJpeg image(BuildNitfJpegData({EncodeLosslessJpeg(pixels, plan)}, {}), 1, components);
            ASSERT_TRUE(image.opened) << predictor << " " << components;
            EXPECT_EQ(image.Block(0, components), pixels) << predictor << " " << components;
        }
    }
}

TEST(LosslessJpeg, PointTransformDropsTheLowBits)
{
    Bytes pixels = TestPattern(kSide, kSide, 1, 10);
    LosslessJpegPlan plan;
    plan.predictor = 6;
    plan.pointTransform = 2;
    OpenedJpeg image(BuildNitfJpegData({EncodeLosslessJpeg(pixels, plan)}, {}), 1);
    ASSERT_TRUE(image.opened);
    for (uint8_t& value : pixels)
        value &= 0xFC;
    EXPECT_EQ(image.Block(0), pixels);
}

TEST(LosslessJpeg, TruncatedAndCorruptStreamsFail)
{
    Bytes stream = EncodeLosslessJpeg(TestPattern(kSide, kSide, 1, 11), LosslessJpegPlan {});
    Bytes truncated(stream.begin(), stream.begin() + stream.size() / 2);
    truncated.insert(truncated.end(), {0xFF, 0xD9});
    EXPECT_FALSE(OpenedJpeg(BuildNitfJpegData({truncated}, {}), 1).opened);
    Bytes twelveBit = stream;
    for (size_t at = 2; at + 4 < twelveBit.size(); ++at)
        if (twelveBit[at] == 0xFF && twelveBit[at + 1] == 0xC3) {
            twelveBit[at + 4] = 12;
            break;
        }
    EXPECT_FALSE(OpenedJpeg(BuildNitfJpegData({twelveBit}, {}), 1).opened);
}

}  // namespace
