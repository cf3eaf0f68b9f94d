// A NITF file on disk, its file header and its first image subheader read
// the way the handler reads them; and GDAL's decoding of it to compare with.
#pragma once

#include "nitf/NitfFileHeader.h"
#include "nitf/NitfImage.h"
#include "base/FileReader.h"
#include "tests/fixtures/Command.h"
#include "tests/fixtures/NitfFileWriter.h"
#include "tests/fixtures/TempFiles.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <cstdlib>
#include <string>
#include <vector>

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

// The value the tests' images hold at (band, row, column).
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

constexpr int32_t kNoOracle = -1;  // GDAL gave fewer samples than the image has
constexpr int32_t kRowFailed = 256;

// The largest difference between our rows and GDAL's samples, wide samples
// reduced to the top 8 of their ABPP bits as ours are; GDAL's bi-level 1 is
// a clear bit, which is white here.
inline int32_t WorstDifference(LoadedImage& loaded, const std::vector<uint32_t>& gdal)
{
    const CNitfImage& image = loaded.image;
    const bool biLevel = image.compressionKind == kBiLevel;
    const int32_t bands = int32_t(image.HostPixelBytes()); // the first bands: R, G, B or the one shown
    const int32_t significant = image.ABPP >= 1 && image.ABPP <= image.NBPP ? image.ABPP : image.NBPP;
    const size_t plane = size_t(image.NCOLS) * size_t(image.NROWS);
    if (gdal.size() < plane * size_t(bands))
        return kNoOracle;
    int32_t worst = 0;
    for (int32_t row = 0; row < image.NROWS; ++row) {
        const std::vector<uint8_t> ours = loaded.Row(uint32_t(row));
        if (ours.empty())
            return kRowFailed;
        for (int32_t column = 0; column < image.NCOLS; ++column)
            for (int32_t band = 0; band < bands; ++band) {
                uint32_t expected = gdal[size_t(band) * plane + size_t(row) * size_t(image.NCOLS) + size_t(column)];
                expected = image.bytesPerPixel > 1 ? (expected >> (significant - 8)) & 0xFF : expected;
                expected = biLevel ? (expected != 0 ? 0 : 255) : expected;
                worst = std::max(worst, std::abs(int32_t(ours[size_t(column * bands + band)]) - int32_t(expected)));
            }
    }
    return worst;
}

// The first count bytes of a row (all of a shorter one).
inline std::vector<uint8_t> Head(std::vector<uint8_t> row, size_t count)
{
    row.resize(std::min(row.size(), count));
    return row;
}
