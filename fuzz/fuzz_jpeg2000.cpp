// The JPEG 2000 reader on one image's data. Input: a 6-byte control prefix (bytes 0-1 and 2-3: NCOLS and NROWS less
// one; byte 4: bit 0 three bands drawn as R, G, B; byte 5: NBPP less one, of which the low 4 bits), then the image
// data: a codestream or a JP2 file.
#include "FuzzFile.h"
#include "imaging/Jpeg2000Image.h"

#include <algorithm>
#include <vector>

constexpr size_t kPrefixSize = 6;
constexpr uint64_t kPixelBudget = 1u << 20;

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size)
{
    if (size < kPrefixSize || !WriteFuzzFile(data + kPrefixSize, size - kPrefixSize))
        return 0;
    Jpeg2000Expectation expected;
    expected.columns = PrefixNumber(data, 2) + 1;
    expected.rows = PrefixNumber(data + 2, 2) + 1;
    expected.components = (data[4] & 1) ? 3 : 1;
    expected.largestPrecision = (data[5] & 15) + 1u;
    expected.significantBits = expected.largestPrecision > 8 ? int32_t(expected.largestPrecision) : 0;
    expected.drawn = (data[4] & 1) ? std::vector<uint32_t>{0, 1, 2} : std::vector<uint32_t>{0};

    CFileReader reader;
    reader.OpenFile(FuzzFilePath().c_str(), kShareDenyWrite);
    CJpeg2000Image image;
    if (!image.Open(reader, 0, size - kPrefixSize, expected))
        return 0;
    std::vector<uint8_t> row(size_t(expected.columns) * expected.components);
    const uint32_t rows = uint32_t(std::min<uint64_t>(expected.rows, kPixelBudget / expected.columns + 1));
    for (uint32_t r = 0; r < rows; ++r)
        image.GetRow(reader, r, 0, expected.columns - 1, row.data());
    image.GetRow(reader, expected.rows - 1, expected.columns / 2, expected.columns - 1, row.data());
    return 0;
}
