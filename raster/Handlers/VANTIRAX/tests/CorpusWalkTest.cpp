// Every real file of the shared corpus through the exports, as a host would
// meet it: probe, open, draw every row. Each either opens and draws what GDAL
// decodes (its band-1 checksum in the catalogue) or is refused cleanly.
#include "tests/GdalPeer.h"
#include "tests/fixtures/HandlerLoader.h"

#include <gtest/gtest.h>

#include <filesystem>
#include <fstream>
#include <regex>
#include <sstream>

#define VX_SKIP_WITHOUT_CORPUS()                                          \
    if (!std::filesystem::is_directory(VX_CORPUS_DIR))                    \
    GTEST_SKIP() << "no corpus at " VX_CORPUS_DIR

namespace {

TEST(CorpusWalk, EveryFileDrawsAsGdalDecodesItOrIsRefusedCleanly)
{
    VX_SKIP_WITHOUT_CORPUS();
    const HandlerExports& rh = LoadHandler(VX_HANDLER_PATH);
    std::ifstream catalogue(VX_CORPUS_DIR "/catalogue.tsv");
    size_t served = 0, compared = 0;
    for (std::string line; std::getline(catalogue, line);) {
        std::vector<std::string> column; // file ... bpp (11) ... gdal (16)
        std::stringstream fields(line);
        for (std::string field; std::getline(fields, field, '\t');)
            column.push_back(field);
        if (column.size() < 17 || column[0] == "file")
            continue;
        SCOPED_TRACE(column[0]);
        const std::string path = VX_CORPUS_DIR "/" + column[0];
        const bool probed = rh.isFormat(path.c_str()) == 1;
        OpenedImage image(rh, path);
        if (!image.Ready())
            continue;
        std::vector<uint8_t> pixels;
        uint32_t failedRows = 0;
        ASSERT_TRUE(image.DrawAll(pixels, failedRows));
        ++served;
        EXPECT_TRUE(probed) << "opens but the probe says no";
        // Band 1 is the byte delivered only for 8-bit samples. U_1125C's JPEG
        // stream has no DQT: the default tables go in the coefficient order
        // NITF lists them, which GDAL reads in another order.
        std::smatch checksum;
        if (failedRows == 0 && column[11].rfind("8/8", 0) == 0 && column[0] != "jitc-nitf20/U_1125C.NTF" &&
            std::regex_search(column[16], checksum, std::regex("ck=([0-9]+)"))) {
            const uint32_t ours = GdalChecksum(pixels.data(), image.handle.width, image.handle.height,
                                               image.BytesPerPixel());
            EXPECT_EQ(ours, std::stoul(checksum[1])) << "pixel kind " << image.handle.pixelKind;
            ++compared;
        }
    }
    std::printf("%zu files served, %zu compared with GDAL\n", served, compared);
    EXPECT_GE(served, 30u);
    EXPECT_GE(compared, 20u);
}

} // namespace
