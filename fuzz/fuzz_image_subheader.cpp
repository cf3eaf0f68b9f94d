// The first image segment of a plain NITF file: subheader parse, data preparation, decode of compressed kinds and
// rows up to a pixel budget. Input: a 4-byte control prefix (byte 0: bit 0 NITF 2.1 layout, bit 1 not used; bytes
// 1-3: LISH, 0 when not known), then the subheader and its image data as they stand in the file.
#include "FuzzFile.h"
#include "nitf/NitfImage.h"

#include <algorithm>
#include <vector>

constexpr size_t kPrefixSize = 4;
constexpr uint64_t kPixelBudget = 1u << 18;

static void ReadRows(CNitfImage& image, CFileReader& reader)
{
    if (image.NCOLS < 1 || image.NROWS < 1)
        return;
    // Spans of at most the budget: a row of millions of pixels costs its
    // decode, not the filling of a buffer that wide.
    const auto width = uint32_t(std::min<uint64_t>(uint64_t(image.NCOLS), kPixelBudget));
    const uint64_t rows = std::min<uint64_t>(uint64_t(image.NROWS), kPixelBudget / width + 1);
    std::vector<uint8_t> row(size_t(width) * 3);
    for (uint32_t r = 0; r < rows; ++r)
        image.ReadLine(reader, r, 0, int32_t(width - 1), row.data());
    // A span that starts and ends inside blocks, at the image's right edge.
    if (width > 2)
        image.ReadLine(reader, uint32_t(image.NROWS - 1), image.NCOLS - int32_t(width) + 1, image.NCOLS - 2,
                       row.data());
}

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size)
{
    if (size < kPrefixSize || !WriteFuzzFile(data + kPrefixSize, size - kPrefixSize))
        return 0;
    CFileReader reader;
    reader.OpenFile(FuzzFilePath().c_str(), kShareDenyWrite);
    CNitfImage image;
    image.version21 = data[0] & 1;
    image.subheaderLength = PrefixNumber(data + 1, 3);
    if (!image.ReadSubheader(reader, 0))
        return 0;
    const uint64_t available = reader.FileSize() - std::min<uint64_t>(reader.FileSize(), image.dataOffset);
    const auto dataLength = uint32_t(std::min<uint64_t>(available, UINT32_MAX));
    if (!image.PrepareData(reader, dataLength))
        return 0;
    image.GetPaletteSize();
    uint8_t red = 0, green = 0, blue = 0;
    for (int32_t index = 0; index < 256; ++index)
        image.GetPaletteEntry(index, red, green, blue);
    image.AllocLineBuffer();
    try {
        image.OpenCompressed(reader, dataLength);
    } catch (const std::exception&) {
        // The decoder's message texts: the open fails, as the handler reports it.
        return 0;
    }
    ReadRows(image, reader);
    image.Release();
    return 0;
}
