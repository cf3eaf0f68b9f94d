#include "imaging/BitmapKernel.h"
#include "imaging/LeadToolLibWrapper.h"
#include "imaging/NitfJpegDefaults.h"
#include "imaging/tests/DecoderTestFile.h"
#include "base/ByteOrder.h"
#include "tests/fixtures/BiLevelWriter.h"

#include <gtest/gtest.h>

#include <string>

namespace {

using Bytes = std::vector<uint8_t>;

constexpr uint32_t kWidth = 77;     // not a whole number of bytes
constexpr uint32_t kHeight = 23;

Bytes PackedPattern()
{
    uint32_t stride = (kWidth + 7) / 8;
    Bytes packed(size_t(stride) * kHeight);
    for (uint32_t y = 0; y < kHeight; ++y)
        for (uint32_t x = 0; x < kWidth; ++x)
            if ((x / 5 + y / 3) % 3 == 0 || x == y)
                packed[y * stride + x / 8] |= uint8_t(0x80 >> (x % 8));
    return packed;
}

uint8_t ExpectedPixel(const Bytes& packed, uint32_t x, uint32_t y)
{
    uint32_t stride = (kWidth + 7) / 8;
    return (packed[y * stride + x / 8] & (0x80 >> (x % 8))) ? 0 : 255;
}

TEST(BiLevelDecode, OneAndTwoDimensionalStripsDecode)
{
    Bytes packed = PackedPattern();
    for (bool twoDimensional : {false, true}) {
        Bytes strip = EncodeT4Strip(packed, kWidth, kHeight, twoDimensional);
        DecoderTestFile file(strip);
        CLeadToolLibWrapper decoder;
        ASSERT_TRUE(decoder.PrepareBiLevel());
        ASSERT_TRUE(decoder.Open(file.reader, kTestDataOffset, 1, uint32_t(strip.size()), 1, 1, kWidth, kHeight,
                                 !twoDimensional));
        EXPECT_EQ(BigEndian32(decoder.tiffHeader + kTiffT4OptionsValue), twoDimensional ? 5u : 4u);
        EXPECT_EQ(BigEndian32(decoder.tiffHeader + kTiffStripByteCountsValue), strip.size());
        for (uint32_t y = 0; y < kHeight; ++y) {
            // Columns 3 to 76: a span that starts inside a byte.
            Bytes row(kWidth - 3, 0x11);
            ASSERT_TRUE(decoder.GetRow(0, y, 3, kWidth - 1, (kWidth - 3 + 7) / 8, row.data()));
            for (uint32_t x = 3; x < kWidth; ++x)
                ASSERT_EQ(row[x - 3], ExpectedPixel(packed, x, y)) << x << "," << y << " 2-D " << twoDimensional;
        }
        Bytes row(kWidth);
        EXPECT_FALSE(decoder.GetRow(1, 0, 0, kWidth - 1, (kWidth + 7) / 8, row.data()));
    }
}

TEST(BiLevelDecode, PackedBitsExpandMostSignificantFirst)
{
    CLeadToolLibWrapper decoder;
    ASSERT_TRUE(decoder.PrepareBiLevel());
    BITMAPHANDLE* bitmap = new BITMAPHANDLE();
    L_InitBitmap(bitmap, sizeof *bitmap, 10, 1, 1);
    L_AllocateBitmap(bitmap, 0);
    bitmap->pixels[0] = 0xB5;
    bitmap->pixels[1] = 0xC0;
    decoder.bitmaps = new BITMAPHANDLE*[1] {bitmap};
    decoder.bitmapCount = 1;
    Bytes row(12, 0x11);
    ASSERT_TRUE(decoder.GetRow(0, 0, 0, 9, 2, row.data()));
    EXPECT_EQ(row, (Bytes {0, 255, 0, 0, 255, 0, 255, 0, 0, 0, 0x11, 0x11}));
    L_FreeBitmap(bitmap);
    decoder.FreeBitmaps();
}

TEST(BiLevelDecode, TemplateHoldsTheFixedTiffDirectory)
{
    const auto& header = kBiLevelTiffTemplate;
    EXPECT_EQ(std::string(header.begin(), header.begin() + 4), std::string("MM\0*", 4));
    EXPECT_EQ(BigEndian32(&header[4]), 16u);
    EXPECT_EQ(BigEndian16(&header[16]), 24u);
    EXPECT_EQ(BigEndian32(&header[306]), 0u);
    EXPECT_EQ(BigEndian32(&header[kTiffStripByteCountsValue]), 3224u);
    EXPECT_EQ(BigEndian32(&header[18 + 12 * 10 + 8]), 424u);   // StripOffsets
    EXPECT_EQ(std::string(header.begin() + 380, header.begin() + 400), "0000:00:00 00:00:00 ");
    EXPECT_EQ(header[422], 0);
}

TEST(BiLevelDecode, CorruptOrShortStripsFailCleanly)
{
    Bytes strip = EncodeT4Strip(PackedPattern(), kWidth, kHeight, true);
    Bytes garbage(strip.size());
    for (size_t i = 0; i < garbage.size(); ++i)
        garbage[i] = uint8_t(i * 131 + 7);
    for (const Bytes& data : {garbage, Bytes(strip.begin(), strip.begin() + strip.size() / 3)}) {
        DecoderTestFile file(data);
        CLeadToolLibWrapper decoder;
        ASSERT_TRUE(decoder.PrepareBiLevel());
        decoder.Open(file.reader, kTestDataOffset, 1, uint32_t(data.size()), 1, 1, kWidth, kHeight, false);
        Bytes row(kWidth);
        decoder.GetRow(0, kHeight - 1, 0, kWidth - 1, (kWidth + 7) / 8, row.data());
    }
    // LI beyond the file, and more rows than the strip has bits: refused before decoding.
    DecoderTestFile file(strip);
    CLeadToolLibWrapper decoder;
    ASSERT_TRUE(decoder.PrepareBiLevel());
    EXPECT_FALSE(decoder.Open(file.reader, kTestDataOffset, 1, uint32_t(strip.size()) + 1, 1, 1, kWidth, kHeight,
                              false));
    decoder.FreeBitmaps();
    EXPECT_FALSE(decoder.Open(file.reader, kTestDataOffset, 1, uint32_t(strip.size()), 1, 1, kWidth,
                              uint32_t(strip.size()) * 8 + 8, false));
    EXPECT_EQ(decoder.bitmaps, nullptr);
}

}  // namespace
