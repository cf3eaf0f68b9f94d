// The bi-level (IC "C1") decoder on T.4 strips coded by libtiff.
#include "imaging/BitmapKernel.h"
#include "imaging/LeadToolLibWrapper.h"
#include "imaging/NitfJpegDefaults.h"
#include "imaging/tests/DecoderTestFile.h"
#include "base/ByteOrder.h"
#include "tests/fixtures/BiLevelWriter.h"

#include <gtest/gtest.h>

namespace {

using Bytes = std::vector<uint8_t>;

constexpr uint32_t kWidth = 77, kHeight = 23, kStride = (kWidth + 7) / 8; // rows of no whole number of bytes

Bytes PackedPattern()
{
    Bytes packed(size_t(kStride) * kHeight);
    for (uint32_t y = 0; y < kHeight; ++y)
        for (uint32_t x = 0; x < kWidth; ++x)
            if ((x / 5 + y / 3) % 3 == 0 || x == y)
                packed[y * kStride + x / 8] |= uint8_t(0x80 >> (x % 8));
    return packed;
}

TEST(BiLevelDecode, OneAndTwoDimensionalStripsDecodeBitForBit)
{
    const Bytes packed = PackedPattern();
    for (bool twoDimensional : {false, true}) {
        const Bytes strip = EncodeT4Strip(packed, kWidth, kHeight, twoDimensional);
        DecoderTestFile file(strip);
        CLeadToolLibWrapper decoder;
        ASSERT_TRUE(decoder.PrepareBiLevel());
        ASSERT_TRUE(decoder.Open(file.reader, kTestDataOffset, 1, uint32_t(strip.size()), 1, 1, kWidth, kHeight,
                                 !twoDimensional));
        EXPECT_EQ(BigEndian32(decoder.tiffHeader + kTiffT4OptionsValue), twoDimensional ? 5u : 4u);
        EXPECT_EQ(BigEndian32(decoder.tiffHeader + kTiffStripByteCountsValue), strip.size());
        for (uint32_t y = 0; y < kHeight; ++y) {
            // Columns 3 to 76, a span that starts inside a byte; a set bit is black (0).
            Bytes row(kWidth - 3 + 1, 0x11);
            ASSERT_TRUE(decoder.GetRow(0, y, 3, kWidth - 1, (kWidth - 3 + 7) / 8, row.data()));
            for (uint32_t x = 3; x < kWidth; ++x)
                ASSERT_EQ(row[x - 3], (packed[y * kStride + x / 8] & (0x80 >> (x % 8))) ? 0 : 255)
                    << x << "," << y << " 2-D " << twoDimensional;
            ASSERT_EQ(row.back(), 0x11) << "wrote past the span";
        }
        Bytes row(kWidth);
        EXPECT_FALSE(decoder.GetRow(1, 0, 0, kWidth - 1, kStride, row.data()));
    }
}

TEST(BiLevelDecode, CorruptOrShortStripsFailCleanly)
{
    const Bytes strip = EncodeT4Strip(PackedPattern(), kWidth, kHeight, true);
    Bytes garbage(strip.size());
    for (size_t i = 0; i < garbage.size(); ++i)
        garbage[i] = uint8_t(i * 131 + 7);
    for (const Bytes& data : {garbage, Bytes(strip.begin(), strip.begin() + strip.size() / 3)}) {
        DecoderTestFile file(data);
        CLeadToolLibWrapper decoder;
        ASSERT_TRUE(decoder.PrepareBiLevel());
        decoder.Open(file.reader, kTestDataOffset, 1, uint32_t(data.size()), 1, 1, kWidth, kHeight, false);
        Bytes row(kWidth);
        decoder.GetRow(0, kHeight - 1, 0, kWidth - 1, kStride, row.data());
    }
    // LI beyond the file, and more rows than the strip has bits: refused before decoding.
    DecoderTestFile file(strip);
    CLeadToolLibWrapper decoder;
    ASSERT_TRUE(decoder.PrepareBiLevel());
    EXPECT_FALSE(
        decoder.Open(file.reader, kTestDataOffset, 1, uint32_t(strip.size()) + 1, 1, 1, kWidth, kHeight, false));
    decoder.FreeBitmaps();
    EXPECT_FALSE(decoder.Open(file.reader, kTestDataOffset, 1, uint32_t(strip.size()), 1, 1, kWidth,
                              uint32_t(strip.size()) * 8 + 8, false));
    EXPECT_EQ(decoder.bitmaps, nullptr);
}

} // namespace
