// The NITF JPEG decoder on one image's data. Input: an 8-byte control prefix (byte 0: bit 0 three bands; byte 1: bit
// 0 two blocks per row, bit 1 two per column; bytes 2-3 and 4-5: NPPBH and NPPBV less one; byte 6: bit 0 pass the
// block size, bit 1 the IC "C5" lossless kind, no other difference here), then the image data: one JPEG stream per
// block.
#include "FuzzFile.h"
#include "imaging/LeadToolLibWrapper.h"

#include <algorithm>
#include <stdexcept>
#include <vector>

constexpr size_t kPrefixSize = 8;
constexpr uint32_t kBlockSideMask = 0x7FF; // blocks of up to 2048 x 2048
constexpr uint64_t kPixelBudget = 1u << 18;

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size)
{
    if (size < kPrefixSize || !WriteFuzzFile(data + kPrefixSize, size - kPrefixSize))
        return 0;
    const uint32_t bands = (data[0] & 1) ? 3 : 1;
    const uint32_t blocksPerRow = (data[1] & 1) + 1, blocksPerColumn = ((data[1] >> 1) & 1) + 1;
    const uint32_t blockWidth = (PrefixNumber(data + 2, 2) & kBlockSideMask) + 1;
    const uint32_t blockHeight = (PrefixNumber(data + 4, 2) & kBlockSideMask) + 1;
    const bool passBlockSize = data[6] & 1;
    const auto length = uint32_t(size - kPrefixSize);

    CFileReader reader;
    reader.OpenFile(FuzzFilePath().c_str(), kShareDenyWrite);
    CLeadToolLibWrapper decoder;
    if (!decoder.PrepareJpeg(reader, 0, length, 8))
        return 0;
    const uint32_t blocks = blocksPerRow * blocksPerColumn;
    try {
        decoder.Open(reader, 0, blocks, length, 8, bands, blocksPerRow * blockWidth, blocksPerColumn * blockHeight,
                     false, passBlockSize ? blockWidth : 0, passBlockSize ? blockHeight : 0);
    } catch (const std::exception&) {
        return 0;
    }
    std::vector<uint8_t> row(size_t(blockWidth) * bands);
    const uint32_t rows = uint32_t(std::min<uint64_t>(blockHeight, kPixelBudget / blockWidth + 1));
    for (uint32_t block = 0; block < blocks; ++block)
        for (uint32_t r = 0; r < rows; ++r)
            decoder.GetRow(reader, block, r, 0, blockWidth - 1, blockWidth * bands, row.data());
    decoder.GetRow(reader, 0, 0, blockWidth / 2, blockWidth - 1, (blockWidth - blockWidth / 2) * bands, row.data());
    return 0;
}
