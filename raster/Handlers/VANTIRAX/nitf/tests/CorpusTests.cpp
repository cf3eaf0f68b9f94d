// Every NITF file of the shared corpus at the CNitfImage level: the files this
// library serves draw what GDAL decodes; the rest are refused cleanly.
#include "nitf/tests/NitfTestFile.h"
#include "tests/fixtures/JpegBlockWriter.h"

#include <gtest/gtest.h>

#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <map>
#include <unistd.h>

namespace {

namespace fs = std::filesystem;

constexpr int32_t kNoOracle = -1;   // GDAL could not decode the file
constexpr int32_t kRowFailed = 256;

const char* const kFolders[] = {"jitc-nitf20", "jitc-nitf21", "other", "damaged", "jitc-jpeg2000"};

// Largest sample difference allowed against GDAL: none, as both decode JPEG
// with libjpeg. Streams that leave out their DQT get the default
// quantisation table, which GDAL loads in another coefficient order: those
// files differ by design.
int32_t Tolerance(const std::string& name)
{
    return name == "jitc-nitf20/U_1125C.NTF" ? 255 : 0; // no DQT in its stream
}

bool HaveGdal()
{
    return std::system("gdal_translate --version >/dev/null 2>&1") == 0;
}

// GDAL's samples of the first image, band sequential, in GDAL's data type.
std::string GdalDecode(const std::string& path, const std::string& raw)
{
    // GDAL may fail on the georeference (i_3004g straddles 180 degrees) after writing the samples.
    std::remove(raw.c_str());
    const std::string command = "gdal_translate -q -of ENVI \"" + path + "\" " + raw + " >/dev/null 2>&1";
    if (std::system(command.c_str()) == -1)
        return "";
    std::ifstream in(raw, std::ios::binary);
    return std::string((std::istreambuf_iterator<char>(in)), std::istreambuf_iterator<char>());
}

uint32_t GdalSample(const std::string& samples, size_t index, int32_t bytes)
{
    uint32_t value = 0;
    for (int32_t i = bytes - 1; i >= 0; --i)
        value = (value << 8) | uint8_t(samples[index * size_t(bytes) + size_t(i)]);
    return value;
}

// The largest difference between our rows and GDAL's, reduced to 8 bits as we reduce wide pixels.
int32_t WorstDifference(LoadedImage& loaded, const std::string& gdal)
{
    const CNitfImage& image = loaded.image;
    const int32_t bands = image.compressionKind == kBiLevel ? 1 : image.NBANDS;
    const int32_t bytes = image.bytesPerPixel < 2 ? 1 : image.bytesPerPixel;
    const size_t plane = size_t(image.NCOLS) * size_t(image.NROWS);
    if (gdal.size() < plane * size_t(bands) * size_t(bytes))
        return kNoOracle;
    const int32_t significant = image.ABPP >= 1 && image.ABPP <= image.NBPP ? image.ABPP : image.NBPP;
    int32_t worst = 0;
    for (int32_t row = 0; row < image.NROWS; ++row) {
        const std::vector<uint8_t> ours = loaded.Row(uint32_t(row));
        if (ours.empty())
            return kRowFailed;
        for (int32_t column = 0; column < image.NCOLS; ++column)
            for (int32_t band = 0; band < bands; ++band) {
                uint32_t expected = GdalSample(gdal, size_t(band) * plane + size_t(row) * image.NCOLS + column, bytes);
                if (bytes > 1)
                    expected = (expected >> (significant - 8)) & 0xFF;
                // GDAL shows a bi-level image as a negative: its 1 is a clear bit, white here.
                if (image.compressionKind == kBiLevel)
                    expected = expected != 0 ? 0 : 255;
                worst = std::max(worst, std::abs(int32_t(ours[size_t(column * bands + band)]) - int32_t(expected)));
            }
    }
    return worst;
}

TEST(Corpus, ServedFilesDrawAsGdalDecodesThemAndTheRestAreRefused)
{
    const fs::path corpus = VX_CORPUS_DIR;
    if (!fs::exists(corpus))
        GTEST_SKIP() << "no corpus at " << corpus;
    const bool gdal = HaveGdal();
    const std::string raw = (fs::temp_directory_path() / ("vx_corpus_" + std::to_string(::getpid()) + ".raw")).string();
    std::map<std::string, std::string> outcomes;
    for (const char* folder : kFolders) {
        for (const fs::directory_entry& entry : fs::directory_iterator(corpus / folder)) {
            const std::string path = entry.path().string();
            const std::string name = std::string(folder) + "/" + entry.path().filename().string();
            LoadedImage loaded(path.c_str());
            if (!loaded.Open()) {
                // A refused image serves no row.
                EXPECT_TRUE(loaded.Row(0).empty()) << name;
                outcomes[name] = "refused";
                continue;
            }
            outcomes[name] = "served";
            // Vector-quantised images are served but never decoded here: their rows fail.
            if (!gdal || loaded.image.compressionKind == kVectorQuantized)
                continue;
            int32_t worst = WorstDifference(loaded, GdalDecode(path, raw));
            if (worst == kNoOracle) {
                for (int32_t row = 0; row < loaded.image.NROWS; ++row)
                    loaded.Row(uint32_t(row));
                outcomes[name] += ", GDAL cannot decode it";
                continue;
            }
            EXPECT_LE(worst, Tolerance(name)) << name;
            outcomes[name] += " worst " + std::to_string(worst);
        }
    }
    // Files that exercise what this library must serve: padded subheaders
    // (rgb.ntf), band-sequential blocks (i_3301a), every IMODE, wide MONO,
    // downgrade events (U_1125C), bi-level and JPEG blocks, fill bytes before SOI (i_3025b).
    for (const char* name : {"other/rgb.ntf", "jitc-nitf21/i_3301a.ntf", "jitc-nitf21/i_3301h.ntf",
                             "jitc-nitf20/U_3010A.NTF", "jitc-nitf21/i_3201c.ntf", "jitc-nitf21/i_3405a.ntf",
                             "jitc-nitf20/U_1125C.NTF", "jitc-nitf21/i_3041a.ntf", "jitc-nitf21/i_3309a.ntf",
                             "jitc-nitf20/U_2001A.NTF", "jitc-nitf21/i_3025b.ntf"})
        EXPECT_EQ(outcomes[name].rfind("served", 0), 0u) << name;
    std::remove(raw.c_str());
    std::remove((raw.substr(0, raw.size() - 4) + ".hdr").c_str());
    for (const auto& [name, outcome] : outcomes)
        std::printf("%-45s %s\n", name.c_str(), outcome.c_str());
}

std::string ReadCorpusFile(const fs::path& path)
{
    std::ifstream in(path, std::ios::binary);
    return std::string((std::istreambuf_iterator<char>(in)), std::istreambuf_iterator<char>());
}

// i_3113g ("I1"): a 512 x 512 stream for a 1023 x 1023 image. GDAL cannot
// decode it; every row must be libjpeg's decoding of the stream with each
// pixel repeated twice across and down.
TEST(Corpus, DownsampledJpegDrawsEveryRowFromItsFrame)
{
    const fs::path path = fs::path(VX_CORPUS_DIR) / "jitc-nitf21/i_3113g.ntf";
    if (!fs::exists(path))
        GTEST_SKIP() << "no corpus file " << path;
    LoadedImage loaded(path.string().c_str());
    ASSERT_TRUE(loaded.Open());
    const std::string file = ReadCorpusFile(path);
    const size_t end = file.find("\xFF\xD9", loaded.image.dataOffset);
    ASSERT_NE(end, std::string::npos);
    const Bytes frame = DecodeJpegBlock(Bytes(file.begin() + loaded.image.dataOffset, file.begin() + end + 2), 1);
    ASSERT_EQ(frame.size(), 512u * 512u);
    for (uint32_t row = 0; row < 1023; ++row) {
        Bytes expected;
        for (uint32_t column = 0; column < 1023; ++column)
            expected.push_back(frame[row / 2 * 512 + column / 2]);
        ASSERT_EQ(Head(loaded.Row(row), 1023), expected) << "row " << row;
    }
}

// i_3041a with its IREP edited to "2IMO": the decoder writes one byte per
// pixel, which no direct (R,G,B) kind can serve.
TEST(Corpus, BiLevelImageOfAnotherIrepIsRefused)
{
    const fs::path path = fs::path(VX_CORPUS_DIR) / "jitc-nitf21/i_3041a.ntf";
    if (!fs::exists(path))
        GTEST_SKIP() << "no corpus file " << path;
    std::string file = ReadCorpusFile(path);
    const size_t irep = file.find("MONO    VI");
    ASSERT_NE(irep, std::string::npos);
    LoadedImage original(file);
    EXPECT_TRUE(original.Open());
    file.replace(irep, 4, "2IMO");
    LoadedImage edited(file);
    EXPECT_FALSE(edited.Open());
}

} // namespace
