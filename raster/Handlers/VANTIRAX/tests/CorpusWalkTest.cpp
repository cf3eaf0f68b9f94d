// Every real file of the shared corpus through the exports, as a host would
// meet it: probe, open, draw every row. Each either opens and draws what GDAL
// decodes (its band-1 checksum in the catalogue) or is refused cleanly.
#include "tests/GdalPeer.h"
#include "tests/fixtures/HandlerLoader.h"

#include <gtest/gtest.h>

#include <filesystem>
#include <fstream>
#include <regex>

#define VX_SKIP_WITHOUT_CORPUS()                                                                                       \
    if (!std::filesystem::is_directory(VX_CORPUS_DIR))                                                                 \
    GTEST_SKIP() << "no corpus at " VX_CORPUS_DIR

namespace {

TEST(CorpusWalk, EveryFileDrawsAsGdalDecodesItOrIsRefusedCleanly)
{
    VX_SKIP_WITHOUT_CORPUS();
    const HandlerExports& rh = LoadHandler(VX_HANDLER_PATH);
    std::ifstream catalogue(VX_CORPUS_DIR "/catalogue.tsv");
    // Columns: the file (1), its bits per pixel (12) and what GDAL reads (17).
    const std::regex row("([^\t]*)(?:\t[^\t]*){10}\t([^\t]*)(?:\t[^\t]*){4}\t(?:[^\t]*ck=(\\d+))?.*");
    size_t served = 0, compared = 0;
    std::smatch column;
    for (std::string line; std::getline(catalogue, line);) {
        if (!std::regex_match(line, column, row) || column[1] == "file")
            continue;
        SCOPED_TRACE(column[1].str());
        const std::string path = VX_CORPUS_DIR "/" + column[1].str();
        const bool probed = rh.isFormat(path.c_str()) == 1;
        OpenedImage image(rh, path);
        std::vector<uint8_t> pixels;
        uint32_t failedRows = 0;
        if (!image.Ready())
            continue;
        ASSERT_TRUE(image.DrawAll(pixels, failedRows));
        ++served;
        EXPECT_TRUE(probed) << "opens but the probe says no";
        // Band 1 is the byte delivered only for 8-bit samples. U_1125C's JPEG
        // stream has no DQT: the default tables go in the coefficient order
        // NITF lists them, which GDAL reads in another order.
        if (failedRows == 0 && column[2].str().rfind("8/8", 0) == 0 && column[3].matched &&
            column[1] != "jitc-nitf20/U_1125C.NTF") {
            const uint32_t ours =
                GdalChecksum(pixels.data(), image.handle.width, image.handle.height, image.BytesPerPixel());
            EXPECT_EQ(ours, std::stoul(column[3])) << "pixel kind " << image.handle.pixelKind;
            ++compared;
        }
    }
    std::printf("%zu files served, %zu compared with GDAL\n", served, compared);
    EXPECT_GE(served, 30u);
    EXPECT_GE(compared, 20u);
}

} // namespace
