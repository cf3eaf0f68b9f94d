// The RPF frame reader on one input file: open at the RPFHDR data (found by its tag, else at offset 0), then a
// full-width draw over a sample of rows and a narrow draw inside the frame.
#include "FuzzFile.h"
#include "rpf/RpfFrameReader.h"

#include <algorithm>
#include <cstring>
#include <vector>

constexpr uint32_t kFrameSide = 1536;
constexpr uint32_t kTagAndLength = 11; // CETAG (6) and CEL (5)
constexpr size_t kTagSearch = 4096;

static uint32_t HeaderSectionOffset(const uint8_t* data, size_t size)
{
    const uint8_t* end = data + std::min(size, kTagSearch);
    static const char kTag[] = "RPFHDR";
    const uint8_t* found = std::search(data, end, kTag, kTag + 6);
    return found == end ? 0 : uint32_t(found - data) + kTagAndLength;
}

static void Draw(CRpfFrameReader& frame, CFileReader& reader, uint32_t first, uint32_t last, uint32_t rowStep)
{
    std::vector<uint8_t> row(kFrameSide * 2);
    frame.PrepareDraw(last - first + 1);
    for (uint32_t r = 0; r < kFrameSide; r += rowStep)
        frame.ReadLine(reader, r, first, last, row.data());
    frame.ReleaseCodeBuffer();
}

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size)
{
    if (!WriteFuzzFile(data, size))
        return 0;
    CFileReader reader;
    reader.OpenFile(FuzzFilePath().c_str(), kShareDenyWrite);
    CRpfFrameReader frame;
    if (!frame.Open(reader, HeaderSectionOffset(data, size)))
        return 0;
    uint8_t red = 0, green = 0, blue = 0, grey = 0;
    for (uint32_t index = 0; index < 217; ++index) {
        frame.colorGraySection.GetPaletteColor(index, red, green, blue);
        frame.colorGraySection.GetPaletteGray(index, grey);
    }
    Draw(frame, reader, 0, kFrameSide - 1, 7);
    Draw(frame, reader, 700, 901, 97);
    return 0;
}
