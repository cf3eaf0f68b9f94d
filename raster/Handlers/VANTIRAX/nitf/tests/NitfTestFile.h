// A NITF file on disk, its file header and its first image subheader read
// the way the handler reads them; and GDAL's decoding of a file to compare with.
#pragma once

#include "nitf/NitfFileHeader.h"
#include "nitf/NitfImage.h"
#include "base/FileReader.h"
#include "tests/fixtures/Command.h"
#include "tests/fixtures/NitfFileWriter.h"
#include "tests/fixtures/TempFiles.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

// A NITF file on disk, its file header and its first image subheader read the way the handler reads them.
struct LoadedImage {
    explicit LoadedImage(const std::string& bytes) : file(bytes, ".ntf"), path(file.path()) {}
    explicit LoadedImage(const char* externalPath) : path(externalPath) {}

    // Parses the file header and the first image subheader.
    bool Parse()
    {
        header.SetPath(path.c_str());
        if (!header.Parse() || header.NUMI < 1)
            return false;
        reader.OpenFile(path.c_str(), kShareDenyWrite);
        return image.ReadSubheader(reader, header);
    }
    // Parse, PrepareData, AllocLineBuffer and OpenCompressed, as an open does.
    bool Open()
    {
        if (!Parse() || !image.PrepareData(reader, header.imageSegments[0].dataLength))
            return false;
        image.AllocLineBuffer();
        image.OpenCompressed(reader, header.imageSegments[0].dataLength);
        return true;
    }
    // Columns first..last of a row (all when last is -1); empty when ReadLine fails.
    std::vector<uint8_t> Row(uint32_t row, int32_t first = 0, int32_t last = -1)
    {
        last = last < 0 ? image.NCOLS - 1 : last;
        std::vector<uint8_t> out(size_t(last - first + 1) * image.HostPixelBytes() + 1, 0xEE);
        const bool read = image.ReadLine(reader, row, first, last, out.data());
        EXPECT_EQ(out.back(), 0xEE) << "row " << row << ": wrote past column " << last;
        out.pop_back();
        return read ? out : std::vector<uint8_t>();
    }

    TempFile file{std::string(), ".ntf"};
    std::string path;
    CNitfImage image;
    CNitfFileHeader header;
    CFileReader reader;
};

inline uint64_t Ramp(int32_t band, int32_t row, int32_t column)
{
    return uint64_t(band * 100 + row * 7 + column) & 0xFF;
}

// GDAL's samples of the first image, band sequential; empty when GDAL cannot decode it.
inline std::vector<uint32_t> GdalSamples(const std::string& path, int32_t bytesPerSample)
{
    TempDirectory dir;
    RunCommand("gdal_translate -q -of ENVI '" + path + "' " + dir / "decoded.raw");
    const std::string bytes = ReadWholeFile(dir / "decoded.raw");
    std::vector<uint32_t> samples(bytes.size() / size_t(bytesPerSample));
    for (size_t i = 0; i < bytes.size(); ++i) // little-endian
        samples[i / size_t(bytesPerSample)] |= uint32_t(uint8_t(bytes[i])) << (8 * (i % size_t(bytesPerSample)));
    return samples;
}
