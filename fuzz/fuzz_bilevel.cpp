// The bi-level (CCITT T.4) decoder on one image's data. Input: a 5-byte control prefix (bytes 0-1 and 2-3: NCOLS and
// NROWS less one; byte 4: bit 0 one-dimensional coding), then the strip.
#include "FuzzFile.h"
#include "imaging/LeadToolLibWrapper.h"

#include <algorithm>
#include <stdexcept>
#include <vector>

constexpr size_t kPrefixSize = 5;
constexpr uint32_t kSideMask = 0x1FFF; // images of up to 8192 x 8192
constexpr uint64_t kPixelBudget = 1u << 20;
constexpr uint32_t kByteBits = 8;

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size)
{
    if (size < kPrefixSize || !WriteFuzzFile(data + kPrefixSize, size - kPrefixSize))
        return 0;
    const uint32_t columns = (PrefixNumber(data, 2) & kSideMask) + 1;
    const uint32_t rows = (PrefixNumber(data + 2, 2) & kSideMask) + 1;
    const bool oneDimensional = data[4] & 1;
    const auto length = uint32_t(size - kPrefixSize);

    CFileReader reader;
    reader.OpenFile(FuzzFilePath().c_str(), kShareDenyWrite);
    CLeadToolLibWrapper decoder;
    if (!decoder.PrepareBiLevel())
        return 0;
    try {
        decoder.Open(reader, 0, 1, length, 1, 1, columns, rows, oneDimensional);
    } catch (const std::exception&) {
        return 0;
    }
    std::vector<uint8_t> row(columns);
    const uint32_t drawn = uint32_t(std::min<uint64_t>(rows, kPixelBudget / columns + 1));
    for (uint32_t r = 0; r < drawn; ++r)
        decoder.GetRow(reader, 0, r, 0, columns - 1, (columns + kByteBits - 1) / kByteBits, row.data());
    // A span that starts inside a byte.
    if (columns > 3)
        decoder.GetRow(reader, 0, rows - 1, 3, columns - 1, (columns - 3 + kByteBits - 1) / kByteBits, row.data());
    return 0;
}
