// A NITF file on disk, its file header and its first image subheader read
// the way the handler reads them.
#pragma once

#include "nitf/NitfFileHeader.h"
#include "nitf/NitfImage.h"
#include "base/FileReader.h"
#include "tests/fixtures/TempFiles.h"

#include <algorithm>
#include <string>
#include <vector>

struct LoadedImage {
    explicit LoadedImage(const std::string& bytes) : file(bytes, ".ntf") {}
    explicit LoadedImage(const char* path) : externalPath(path) {}

    // Parses the file header and the first image subheader.
    bool Parse()
    {
        header.SetPath(Path());
        if (!header.Parse() || header.NUMI < 1)
            return false;
        reader.OpenFile(Path(), kShareDenyWrite);
        return image.ReadSubheader(reader, header);
    }
    // Parse, PrepareData and AllocLineBuffer, as an open does.
    bool Open()
    {
        if (!Parse() || !image.PrepareData(reader, header.imageSegments[0].dataLength))
            return false;
        image.AllocLineBuffer();
        image.OpenCompressed(reader, header.imageSegments[0].dataLength);
        return true;
    }
    // A whole row; empty when ReadLine fails.
    std::vector<uint8_t> Row(uint32_t row, int32_t first = 0, int32_t last = -1)
    {
        if (last < 0)
            last = image.NCOLS - 1;
        std::vector<uint8_t> out(size_t(last - first + 1) * 3, 0xEE);
        if (!image.ReadLine(reader, row, first, last, out.data()))
            return {};
        return out;
    }
    const char* Path() const { return externalPath.empty() ? file.c_str() : externalPath.c_str(); }

    TempFile file{std::string(), ".ntf"};
    std::string externalPath;
    CNitfFileHeader header;
    CFileReader reader;
    CNitfImage image;
};

// The first count bytes of a row (all of a shorter one).
inline std::vector<uint8_t> Head(std::vector<uint8_t> row, size_t count)
{
    row.resize(std::min(row.size(), count));
    return row;
}
