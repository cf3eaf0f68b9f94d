// Real NITF files of the sample corpus, decoded straight from their image
// data and compared with the band-1 checksums GDAL gives for them.
#include "imaging/LeadToolLibWrapper.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <fstream>
#include <iterator>
#include <string>
#include <vector>

namespace {

using Bytes = std::vector<uint8_t>;

struct CorpusImage {
    const char* path;
    uint32_t blocksPerRow, blocksPerColumn, blockWidth, blockHeight, width, height, bands;
    uint16_t checksum;
};

// GDAL's image checksum of one band.
uint16_t GdalChecksum(const Bytes& band)
{
    static const int kPrimes[11] = {7, 11, 13, 17, 19, 23, 29, 31, 37, 41, 43};
    uint32_t sum = 0;
    for (size_t i = 0; i < band.size(); ++i)
        sum = (sum + band[i] % kPrimes[i % 11]) & 0xFFFF;
    return uint16_t(sum);
}

Bytes FileBytes(const std::string& path)
{
    std::ifstream in(path, std::ios::binary);
    return Bytes(std::istreambuf_iterator<char>(in), {});
}

// Band 1 of every row, assembled from the blocks through GetRow.
Bytes FirstBand(CLeadToolLibWrapper& decoder, const CorpusImage& image)
{
    Bytes band;
    Bytes row(size_t(image.blockWidth) * image.bands);
    for (uint32_t y = 0; y < image.height; ++y)
        for (uint32_t x = 0; x < image.width; x += image.blockWidth) {
            uint32_t block = (y / image.blockHeight) * image.blocksPerRow + x / image.blockWidth;
            uint32_t columns = std::min(image.blockWidth, image.width - x);
            EXPECT_TRUE(decoder.GetRow(block, y % image.blockHeight, 0, columns - 1, columns * image.bands,
                                       row.data()));
            for (uint32_t c = 0; c < columns; ++c)
                band.push_back(row[c * image.bands]);
        }
    return band;
}

class CorpusJpeg : public ::testing::TestWithParam<CorpusImage> {};

TEST_P(CorpusJpeg, DecodesAsGdalDoes)
{
    const CorpusImage& image = GetParam();
    std::string path = std::string(VX_CORPUS_DIR) + "/" + image.path;
    Bytes file = FileBytes(path);
    const uint8_t start[] = {0xFF, 0xD8, 0xFF, 0xE6};
    auto found = std::search(file.begin(), file.end(), std::begin(start), std::end(start));
    ASSERT_NE(found, file.end()) << path;
    uint32_t dataOffset = uint32_t(found - file.begin());
    CFileReader reader;
    reader.OpenFile(path.c_str(), kShareDenyWrite);
    CLeadToolLibWrapper decoder;
    ASSERT_TRUE(decoder.PrepareJpeg(reader, dataOffset, 0, 8));
    ASSERT_TRUE(decoder.Open(reader, dataOffset, image.blocksPerRow * image.blocksPerColumn, 0, 8, image.bands,
                             image.width, image.height, false, image.blockWidth, image.blockHeight));
    EXPECT_EQ(GdalChecksum(FirstBand(decoder, image)), image.checksum);
}

INSTANTIATE_TEST_SUITE_P(
    Files, CorpusJpeg,
    ::testing::Values(CorpusImage {"jitc-nitf21/i_3008a.ntf", 1, 1, 256, 256, 256, 256, 1, 64097},
                      CorpusImage {"jitc-nitf21/i_3015a.ntf", 1, 1, 256, 256, 256, 256, 1, 15321},
                      CorpusImage {"jitc-nitf21/i_3018a.ntf", 1, 1, 231, 191, 231, 191, 1, 60906},
                      CorpusImage {"jitc-nitf21/i_3025b.ntf", 1, 1, 64, 64, 64, 64, 1, 47963},
                      CorpusImage {"jitc-nitf21/i_3309a.ntf", 8, 8, 256, 256, 2048, 2048, 1, 32419},
                      CorpusImage {"other/WithBE.ntf", 1, 1, 683, 512, 683, 512, 3, 11654}));

struct CorpusBiLevel {
    const char* path;
    uint32_t dataOffset, LI, width, height;
    bool oneDimensional;
    uint16_t checksum;
};

class CorpusFax : public ::testing::TestWithParam<CorpusBiLevel> {};

// GDAL gives bi-level pixels as 1 (black) and 0 (white).
TEST_P(CorpusFax, DecodesAsGdalDoes)
{
    const CorpusBiLevel& image = GetParam();
    std::string path = std::string(VX_CORPUS_DIR) + "/" + image.path;
    CFileReader reader;
    reader.OpenFile(path.c_str(), kShareDenyWrite);
    CLeadToolLibWrapper decoder;
    ASSERT_TRUE(decoder.PrepareBiLevel());
    ASSERT_TRUE(decoder.Open(reader, image.dataOffset, 1, image.LI, 1, 1, image.width, image.height,
                             image.oneDimensional));
    Bytes band, row(image.width);
    for (uint32_t y = 0; y < image.height; ++y) {
        ASSERT_TRUE(decoder.GetRow(0, y, 0, image.width - 1, (image.width + 7) / 8, row.data()));
        for (uint8_t pixel : row)
            band.push_back(pixel ? 0 : 1);
    }
    EXPECT_EQ(GdalChecksum(band), image.checksum);
}

INSTANTIATE_TEST_SUITE_P(Files, CorpusFax,
                         ::testing::Values(CorpusBiLevel {"jitc-nitf20/U_1036A.NTF", 1567, 21918, 864, 260, true, 63913},
                                           CorpusBiLevel {"jitc-nitf21/i_3041a.ntf", 847, 63835, 512, 512, false,
                                                          47224}));

}  // namespace
