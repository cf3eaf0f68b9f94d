// Every real file of the shared corpus through the exports, as a host would
// meet it: probe, open, draw every row. Each either opens and draws what GDAL
// decodes (its band-1 checksum from the catalogue) or is refused cleanly.
#include "tests/fixtures/HandlerLoader.h"

#include <gtest/gtest.h>

#include <cstdio>
#include <filesystem>
#include <fstream>
#include <map>
#include <regex>
#include <sstream>

namespace {

namespace fs = std::filesystem;

struct CatalogueEntry {
    std::string bitsPerPixel; // "NBPP/ABPP"
    bool hasChecksum = false;
    uint32_t checksum = 0;    // GDAL's band-1 checksum
};

std::map<std::string, CatalogueEntry> ReadCatalogue(const fs::path& corpus)
{
    std::map<std::string, CatalogueEntry> entries;
    std::ifstream in(corpus / "catalogue.tsv");
    std::string line;
    std::getline(in, line); // column names
    const std::regex checksum("ck=([0-9]+)");
    while (std::getline(in, line)) {
        std::vector<std::string> columns;
        std::stringstream fields(line);
        for (std::string field; std::getline(fields, field, '\t');)
            columns.push_back(field);
        if (columns.size() < 17)
            continue;
        CatalogueEntry entry;
        entry.bitsPerPixel = columns[11];
        std::smatch match;
        if (std::regex_search(columns[16], match, checksum)) {
            entry.hasChecksum = true;
            entry.checksum = static_cast<uint32_t>(std::stoul(match[1]));
        }
        entries[columns[0]] = entry;
    }
    return entries;
}

// GDAL's image checksum over one band: pixel values modulo a cycle of primes,
// summed and kept to 16 bits at the end of every row.
uint32_t GdalChecksum(const std::vector<uint8_t>& pixels, uint32_t width, uint32_t height, size_t stride)
{
    static const uint32_t primes[] = {7, 11, 13, 17, 19, 23, 29, 31, 37, 41, 43};
    uint32_t sum = 0;
    size_t prime = 0;
    for (uint32_t row = 0; row < height; ++row) {
        for (uint32_t column = 0; column < width; ++column) {
            sum += pixels[(size_t(row) * width + column) * stride] % primes[prime++];
            if (prime > 10)
                prime = 0;
        }
        sum &= 0xFFFF;
    }
    return sum;
}

// Differences from GDAL by design, by file.
const std::map<std::string, std::string> kIntendedDifferences = {
    // The JPEG stream carries no DQT: the default quantisation tables are
    // inserted in the coefficient order NITF lists them, which GDAL reads in
    // another order.
    {"jitc-nitf20/U_1125C.NTF", "default quantisation table order"},
};

// Files whose band 1 is the byte we deliver. Wider samples are scaled into a
// grey palette, so GDAL's 16-bit values cannot be compared.
bool ComparableWithGdal(const std::string& name, const CatalogueEntry& entry)
{
    return entry.hasChecksum && entry.bitsPerPixel.rfind("8/8", 0) == 0 && kIntendedDifferences.count(name) == 0;
}

TEST(CorpusWalk, EveryFileOpensAndDrawsOrIsRefusedCleanly)
{
    const fs::path corpus = VX_CORPUS_DIR;
    if (!fs::exists(corpus / "catalogue.tsv"))
        GTEST_SKIP() << "no corpus at " << corpus;
    const auto catalogue = ReadCatalogue(corpus);
    const HandlerExports& rh = LoadHandler(VX_HANDLER_PATH);

    size_t served = 0;
    size_t compared = 0;
    for (const auto& [name, entry] : catalogue) {
        const std::string path = (corpus / name).string();
        SCOPED_TRACE(name);
        const bool probed = rh.isFormat(path.c_str()) == 1;
        OpenedImage image(rh, path);
        if (!image.Ready())
            continue;
        std::vector<uint8_t> pixels;
        uint32_t failedRows = 0;
        ASSERT_TRUE(image.DrawAll(pixels, failedRows));
        ++served;
        if (!probed)
            ADD_FAILURE() << "opens but the probe says no";
        if (ComparableWithGdal(name, entry) && failedRows == 0) {
            uint32_t ours = GdalChecksum(pixels, image.handle.width, image.handle.height, image.BytesPerPixel());
            EXPECT_EQ(ours, entry.checksum) << "pixel kind " << image.handle.pixelKind;
            ++compared;
        }
    }
    std::printf("%zu files served, %zu compared with GDAL\n", served, compared);
    EXPECT_GE(served, 30u);
    EXPECT_GE(compared, 20u);
}

} // namespace
