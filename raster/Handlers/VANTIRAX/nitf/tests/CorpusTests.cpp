// Every NITF file of the shared corpus at the CNitfImage level: the files this
// library serves draw what GDAL decodes; the rest are refused cleanly.
#include "nitf/tests/NitfTestFile.h"
#include "tests/fixtures/Corpus.h"
#include "tests/fixtures/JpegBlockWriter.h"

#include <gtest/gtest.h>

#include <cstdio>
#include <filesystem>
#include <map>

namespace {

namespace fs = std::filesystem;

TEST(Corpus, ServedFilesDrawAsGdalDecodesThemAndTheRestAreRefused)
{
    VX_SKIP_WITHOUT_CORPUS();
    const bool gdal = CommandSucceeds("gdal_translate --version");
    std::map<std::string, std::string> outcomes;
    for (const char* folder : {"jitc-nitf20", "jitc-nitf21", "other", "damaged", "jitc-jpeg2000"}) {
        for (const fs::directory_entry& entry : fs::directory_iterator(CorpusPath(folder))) {
            const std::string name = std::string(folder) + "/" + entry.path().filename().string();
            LoadedImage loaded(entry.path().c_str());
            std::string& outcome = outcomes[name];
            if (!loaded.Open()) {
                EXPECT_TRUE(loaded.Row(0).empty()) << name; // a refused image serves no row
                outcome = "refused";
                continue;
            }
            outcome = "served";
            // Vector-quantised images are served but never decoded here: their rows fail.
            if (!gdal || loaded.image.compressionKind == kVectorQuantized)
                continue;
            const int32_t worst =
                WorstDifference(loaded, GdalSamples(entry.path().string(), std::max(1, loaded.image.bytesPerPixel)));
            if (worst == kNoOracle) {
                for (int32_t row = 0; row < loaded.image.NROWS; ++row)
                    loaded.Row(uint32_t(row));
                outcome += ", GDAL cannot decode it";
                continue;
            }
            // Streams without a DQT get the default quantisation table, which GDAL
            // loads in another coefficient order: that file differs by design.
            EXPECT_LE(worst, name == "jitc-nitf20/U_1125C.NTF" ? 255 : 0) << name;
            outcome += " worst " + std::to_string(worst);
        }
    }
    // Files that exercise what this library must serve: padded subheaders
    // (rgb.ntf), band-sequential blocks (i_3301a), every IMODE, wide MONO,
    // downgrade events (U_1125C), bi-level (1-D and 2-D) and JPEG blocks, fill bytes before SOI (i_3025b).
    for (const char* name : {"other/rgb.ntf", "jitc-nitf21/i_3301a.ntf", "jitc-nitf21/i_3301h.ntf",
                             "jitc-nitf20/U_3010A.NTF", "jitc-nitf21/i_3201c.ntf", "jitc-nitf21/i_3405a.ntf",
                             "jitc-nitf20/U_1125C.NTF", "jitc-nitf21/i_3041a.ntf", "jitc-nitf20/U_1036A.NTF",
                             "jitc-nitf21/i_3309a.ntf", "jitc-nitf21/i_3008a.ntf", "jitc-nitf21/i_3015a.ntf",
                             "jitc-nitf21/i_3018a.ntf", "other/WithBE.ntf", "jitc-nitf20/U_2001A.NTF",
                             "jitc-nitf21/i_3025b.ntf"})
        EXPECT_EQ(outcomes[name].rfind("served", 0), 0u) << name;
    for (const auto& [name, outcome] : outcomes)
        std::printf("%-45s %s\n", name.c_str(), outcome.c_str());
}

// i_3113g ("I1"): a 512 x 512 stream for a 1023 x 1023 image, which GDAL cannot decode: every row
// is libjpeg's decoding of the stream, each pixel twice across and down. i_3041a with its IREP
// edited to "2IMO": its bi-level decoder's one byte per pixel serves no R,G,B kind.
TEST(Corpus, DownsampledJpegDrawsFromItsFrameAndBiLevelOfAnotherIrepIsRefused)
{
    VX_SKIP_WITHOUT_CORPUS();
    LoadedImage loaded(CorpusPath("jitc-nitf21/i_3113g.ntf").c_str());
    ASSERT_TRUE(loaded.Open());
    const std::string file = ReadWholeFile(CorpusPath("jitc-nitf21/i_3113g.ntf"));
    const size_t end = file.find("\xFF\xD9", loaded.image.dataOffset);
    ASSERT_NE(end, std::string::npos);
    const Bytes frame = DecodeJpegBlock(Bytes(file.begin() + loaded.image.dataOffset, file.begin() + long(end) + 2), 1);
    ASSERT_EQ(frame.size(), 512u * 512u);
    for (uint32_t row = 0; row < 1023; ++row) {
        Bytes expected;
        for (uint32_t column = 0; column < 1023; ++column)
            expected.push_back(frame[row / 2 * 512 + column / 2]);
        ASSERT_EQ(Head(loaded.Row(row), 1023), expected) << "row " << row;
    }
    std::string biLevel = ReadWholeFile(CorpusPath("jitc-nitf21/i_3041a.ntf"));
    const size_t irep = biLevel.find("MONO    VI");
    ASSERT_NE(irep, std::string::npos);
    EXPECT_TRUE(LoadedImage(biLevel).Open());
    EXPECT_FALSE(LoadedImage(biLevel.replace(irep, 4, "2IMO")).Open());
}

} // namespace
