// GDAL as a peer: frames from the fixture writer and the real frames of the
// corpus, decoded by gdal_translate and by the frame reader, compared pixel
// by pixel through each one's own palette, and GDAL's corners with the
// coverage section.
//
// Known difference, checked rather than skipped: a masked subframe decodes to
// index 216 in both, but GDAL marks 216 as its no-data value with colour
// (0, 0, 0) while this reader's palette shows it white (255, 255, 255).
#include "rpf/tests/RpfTestSupport.h"

#include "tests/fixtures/Command.h"
#include "tests/fixtures/NitfFileWriter.h"

#include <gtest/gtest.h>

#include <array>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <string>

namespace {

constexpr uint8_t kMaskedIndex = 216;
constexpr double kCornerTolerance = 1e-7; // gdalinfo prints corners with 7 decimals

struct GdalDecode {
    std::vector<uint8_t> indices;
    std::vector<std::array<int, 3>> colorTable;
    int noData = -1;
    double corners[3][2] = {}; // upper left, upper right, lower left: (x, y)
    bool geographic = false;   // GDAL's corners are degrees (polar zones come projected)
};

bool GdalAvailable()
{
    int status = -1;
    RunCommand("gdal_translate --version", &status);
    return status == 0;
}

// The numbers that follow key in gdalinfo's JSON, up to the closing bracket at depth 0.
std::vector<double> NumbersAfter(const std::string& json, const std::string& key)
{
    std::vector<double> numbers;
    size_t at = json.find("\"" + key + "\"");
    if (at == std::string::npos)
        return numbers;
    at = json.find('[', at);
    int depth = 0;
    for (size_t index = at; index < json.size(); ++index) {
        char c = json[index];
        if (c == '[')
            ++depth;
        else if (c == ']' && --depth == 0)
            break;
        else if (c == '-' || (c >= '0' && c <= '9')) {
            char* end = nullptr;
            numbers.push_back(std::strtod(json.c_str() + index, &end));
            index = static_cast<size_t>(end - json.c_str()) - 1;
        }
    }
    return numbers;
}

// GDAL's band 1 as indices, its colour table and corners; indices empty when GDAL cannot decode.
GdalDecode DecodeWithGdal(const std::string& path)
{
    GdalDecode decode;
    std::string json = RunCommand("gdalinfo -json '" + path + "'");
    std::vector<double> entries = NumbersAfter(json, "entries");
    for (size_t index = 0; index + 3 < entries.size(); index += 4)
        decode.colorTable.push_back({int(entries[index]), int(entries[index + 1]), int(entries[index + 2])});
    size_t noDataAt = json.find("\"noDataValue\":");
    if (noDataAt != std::string::npos)
        decode.noData = std::atoi(json.c_str() + noDataAt + 14);
    decode.geographic = json.find("\"wkt\":\"GEOGCRS") != std::string::npos;
    const char* cornerKeys[3] = {"upperLeft", "upperRight", "lowerLeft"};
    for (int corner = 0; corner < 3; ++corner) {
        std::vector<double> xy = NumbersAfter(json, cornerKeys[corner]);
        if (xy.size() == 2) {
            decode.corners[corner][0] = xy[0];
            decode.corners[corner][1] = xy[1];
        }
    }
    TempFile raw("", ".raw");
    int status = -1;
    RunCommand("gdal_translate -q -of ENVI -b 1 '" + path + "' '" + raw.Path() + "'", &status);
    std::string bytes = ReadWholeFile(raw.Path());
    std::remove((raw.Path().substr(0, raw.Path().size() - 4) + ".hdr").c_str());
    std::remove((raw.Path() + ".aux.xml").c_str());
    if (status == 0 && bytes.size() == size_t(kRpfFrameSide) * kRpfFrameSide)
        decode.indices.assign(bytes.begin(), bytes.end());
    return decode;
}

// The host palette the handler builds: the colour or grey table, 216 white.
std::vector<std::array<int, 3>> OurPalette(RpfColorGraySection& colors)
{
    std::vector<std::array<int, 3>> palette;
    bool fromColors = colors.IsColorTable();
    for (uint32_t index = 0; index < kMaskedIndex; ++index) {
        uint8_t red = 0, green = 0, blue = 0;
        bool read = fromColors ? colors.GetPaletteColor(index, red, green, blue) : colors.GetPaletteGray(index, red);
        if (!read)
            return {};
        palette.push_back(fromColors ? std::array<int, 3>{red, green, blue} : std::array<int, 3>{red, red, red});
    }
    palette.push_back({255, 255, 255});
    return palette;
}

struct Comparison {
    size_t compared = 0, masked = 0, differing = 0, failedRows = 0;
};

// Compares every row the reader decodes with GDAL's pixels through both palettes.
Comparison Compare(OpenedFrame& ours, const GdalDecode& gdal)
{
    Comparison result;
    std::vector<std::array<int, 3>> palette = OurPalette(ours.reader.colorGraySection);
    std::vector<uint8_t> line(kRpfFrameSide);
    ours.reader.PrepareDraw(kRpfFrameSide);
    for (uint32_t row = 0; row < kRpfFrameSide; ++row) {
        if (!ours.reader.ReadLine(ours.drawReader, row, 0, kRpfFrameSide - 1, line.data())) {
            ++result.failedRows;
            continue;
        }
        for (uint32_t column = 0; column < kRpfFrameSide; ++column) {
            uint8_t theirs = gdal.indices[size_t(row) * kRpfFrameSide + column];
            if (line[column] == kMaskedIndex && theirs == gdal.noData) {
                ++result.masked;
                continue;
            }
            ++result.compared;
            bool same = !palette.empty() && theirs < gdal.colorTable.size() &&
                        palette[line[column]] == gdal.colorTable[theirs];
            result.differing += same ? 0 : 1;
        }
    }
    return result;
}

void ExpectCornersMatch(const CRpfFrameReader& reader, const GdalDecode& gdal)
{
    if (!gdal.geographic)
        return; // GDAL 3.6 reports zone 9 and 18 frames projected (and its polar TOC georeference is wrong)
    const RpfCoverage& coverage = reader.coverage;
    const double ours[3][2] = {{coverage.northWestLongitude, coverage.northWestLatitude},
                               {coverage.northEastLongitude, coverage.northEastLatitude},
                               {coverage.southWestLongitude, coverage.southWestLatitude}};
    for (int corner = 0; corner < 3; ++corner)
        for (int axis = 0; axis < 2; ++axis)
            EXPECT_NEAR(gdal.corners[corner][axis], ours[corner][axis], kCornerTolerance) << "corner " << corner;
}

} // namespace

TEST(RpfGdalPeer, WrittenFramesDecodeAsGdalDecodesThem)
{
    if (!GdalAvailable())
        GTEST_SKIP() << "gdal_translate is not installed";
    struct Case {
        RpfProduct product;
        std::set<uint32_t> masked;
        RpfCorners corners;
    };
    RpfCorners southern;
    southern.northWestLatitude = southern.northEastLatitude = -33.25;
    southern.southWestLatitude = southern.southEastLatitude = -33.75;
    southern.northWestLongitude = southern.southWestLongitude = 151.0;
    southern.northEastLongitude = southern.southEastLongitude = 151.75;
    const Case cases[] = {{RpfProduct::Cadrg, {}, {}}, {RpfProduct::Cadrg, {2, 15, 30}, southern},
                          {RpfProduct::Cib, {}, southern}, {RpfProduct::Cib, {0, 35}, {}}};
    for (const Case& frameCase : cases) {
        RpfFramePlan plan;
        plan.product = frameCase.product;
        plan.maskedSubframes = frameCase.masked;
        plan.corners = frameCase.corners;
        auto opened = OpenFrame(BuildRpfFrame(plan));
        ASSERT_TRUE(opened->opened);
        GdalDecode gdal = DecodeWithGdal(opened->file->Path());
        ASSERT_EQ(gdal.indices.size(), size_t(kRpfFrameSide) * kRpfFrameSide);
        // GDAL takes the 216 records of the frame's table and adds entry 216 as its no-data value.
        EXPECT_EQ(gdal.noData, kMaskedIndex);
        Comparison result = Compare(*opened, gdal);
        EXPECT_EQ(result.failedRows, 0u);
        EXPECT_EQ(result.differing, 0u);
        EXPECT_EQ(result.masked, frameCase.masked.size() * 256 * 256);
        ExpectCornersMatch(opened->reader, gdal);
    }
}

// Every RPF file of the corpus opens and matches GDAL wherever both decode,
// or is refused cleanly.
TEST(RpfGdalPeer, CorpusFramesOpenAndMatchGdalOrAreRefused)
{
    if (!GdalAvailable())
        GTEST_SKIP() << "gdal_translate is not installed";
    const std::filesystem::path root = std::filesystem::path(VX_CORPUS_DIR) / "rpf";
    if (!std::filesystem::exists(root))
        GTEST_SKIP() << "no corpus at " << root;
    size_t framesMatched = 0;
    for (const auto& entry : std::filesystem::recursive_directory_iterator(root)) {
        if (!entry.is_regular_file())
            continue;
        const std::string path = entry.path().string();
        std::string bytes = ReadWholeFile(path);
        size_t tag = bytes.substr(0, 2000).find("RPFHDR");
        if (tag == std::string::npos)
            continue; // a table of contents or another file beside the frames
        auto opened = OpenFrame(bytes, static_cast<uint32_t>(tag + 11));
        GdalDecode gdal = DecodeWithGdal(path);
        SCOPED_TRACE(path);
        if (!opened->opened || gdal.indices.empty()) {
            // Refused by us, or not decodable by GDAL: lines must fail cleanly or decode.
            std::vector<uint8_t> line(kRpfFrameSide);
            opened->reader.PrepareDraw(kRpfFrameSide);
            for (uint32_t row = 0; row < kRpfFrameSide; row += 97)
                opened->reader.ReadLine(opened->drawReader, row, 0, kRpfFrameSide - 1, line.data());
            continue;
        }
        Comparison result = Compare(*opened, gdal);
        EXPECT_EQ(result.differing, 0u) << result.compared << " compared";
        ExpectCornersMatch(opened->reader, gdal);
        framesMatched += result.compared > 0 ? 1 : 0;
    }
    EXPECT_GE(framesMatched, 3u);
}
