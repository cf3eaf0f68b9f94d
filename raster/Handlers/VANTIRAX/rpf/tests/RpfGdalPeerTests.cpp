// Whole frames: those of the fixture writer decode to the index image they
// were written from, and, with GDAL as a peer, they and the real frames of the
// corpus decode to GDAL's indices, with GDAL's colours and corners.
//
// Known difference, checked rather than skipped: a masked subframe decodes to
// index 216 in both, but GDAL marks 216 as its no-data value with colour
// (0, 0, 0) while this reader's palette shows it white (255, 255, 255).
#include "rpf/tests/RpfTestSupport.h"
#include "tests/fixtures/Command.h"
#include "tests/fixtures/Corpus.h"
#include "tests/fixtures/NitfFileWriter.h"

#include <gtest/gtest.h>

#include <cmath>
#include <cstdlib>
#include <filesystem>

namespace {

// The numbers that follow key in gdalinfo's JSON, up to the closing bracket at depth 0.
std::vector<double> NumbersAfter(const std::string& json, const std::string& key)
{
    std::vector<double> numbers;
    int depth = 0;
    for (size_t at = json.find('[', json.find("\"" + key + "\"")); at < json.size(); ++at) {
        const char c = json[at];
        if (c == '[') {
            ++depth;
        } else if (c == ']' && --depth == 0) {
            break;
        } else if (c == '-' || (c >= '0' && c <= '9')) {
            char* end = nullptr;
            numbers.push_back(std::strtod(json.c_str() + at, &end));
            at = size_t(end - json.c_str()) - 1;
        }
    }
    return numbers;
}

// GDAL's decoding of the file at path compared with ours, which opened a copy
// of it: indices pixel by pixel (216 against GDAL's no-data value), our
// palette entry by entry, the corners where GDAL gives degrees (GDAL 3.6
// reports zone 9 and 18 frames projected; gdalinfo prints 7 decimals).
// False when GDAL cannot decode the frame.
bool MatchesGdal(OpenedFrame& ours, const std::string& path, const std::vector<uint8_t>& pixels)
{
    TempFile raw(".raw");
    RunCommand("gdal_translate -q -of ENVI -b 1 '" + path + "' '" + raw.path() + "'");
    const std::string indices = ReadWholeFile(raw.path());
    std::remove((raw.path().substr(0, raw.path().size() - 4) + ".hdr").c_str());
    std::remove((raw.path() + ".aux.xml").c_str());
    if (indices.size() != pixels.size())
        return false;
    const std::string json = RunCommand("gdalinfo -json '" + path + "'");
    const size_t noData = json.find("\"noDataValue\":");
    const int gdalNoData = noData == std::string::npos ? -1 : std::atoi(json.c_str() + noData + 14);
    size_t differing = 0;
    for (size_t i = 0; i < pixels.size(); ++i)
        differing += pixels[i] == uint8_t(indices[i]) && (pixels[i] != kRpfMaskedPixel || gdalNoData == 216) ? 0 : 1;
    EXPECT_EQ(differing, 0u);
    const std::vector<double> entries = NumbersAfter(json, "entries");
    RpfColorGraySection& colors = ours.reader.colorGraySection;
    EXPECT_GE(entries.size(), 4u * kRpfMaskedPixel);
    for (uint32_t i = 0; i < kRpfMaskedPixel && 4 * i + 2 < entries.size(); ++i) {
        uint8_t red = 0, green = 0, blue = 0;
        EXPECT_TRUE(colors.IsColorTable() ? colors.GetPaletteColor(i, red, green, blue)
                                          : colors.GetPaletteGray(i, red));
        if (!colors.IsColorTable())
            green = blue = red;
        EXPECT_EQ((std::vector<double>{double(red), double(green), double(blue)}),
                  std::vector<double>(entries.begin() + 4 * i, entries.begin() + 4 * i + 3)) << "entry " << i;
    }
    if (json.find("\"wkt\":\"GEOGCRS") != std::string::npos) {
        const RpfCoverage& c = ours.reader.coverage;
        const double corners[3][2] = {{c.northWestLongitude, c.northWestLatitude},
                                      {c.northEastLongitude, c.northEastLatitude},
                                      {c.southWestLongitude, c.southWestLatitude}};
        const char* keys[3] = {"upperLeft", "upperRight", "lowerLeft"};
        for (int corner = 0; corner < 3; ++corner) {
            const std::vector<double> xy = NumbersAfter(json, keys[corner]);
            EXPECT_TRUE(xy.size() == 2 && std::fabs(xy[0] - corners[corner][0]) <= 1e-7 &&
                        std::fabs(xy[1] - corners[corner][1]) <= 1e-7)
                << keys[corner] << ": ours " << corners[corner][0] << ", " << corners[corner][1];
        }
    }
    return true;
}

TEST(RpfFrames, WrittenFramesDecodeToTheirIndicesAsGdalDecodesThem)
{
    const bool gdal = CommandSucceeds("gdal_translate --version");
    RpfCorners southern;
    southern.northWestLatitude = southern.northEastLatitude = -33.25;
    southern.southWestLatitude = southern.southEastLatitude = -33.75;
    southern.northWestLongitude = southern.southWestLongitude = 151.0;
    southern.northEastLongitude = southern.southEastLongitude = 151.75;
    struct Case {
        RpfProduct product;
        bool bigEndian;
        std::set<uint32_t> masked;
        RpfCorners corners;
    };
    for (const Case& c : {Case{RpfProduct::Cadrg, true, {}, {}}, {RpfProduct::Cadrg, true, {2, 15, 30}, southern},
                          {RpfProduct::Cib, true, {}, southern}, {RpfProduct::Cib, true, {0, 35}, {}},
                          {RpfProduct::Cadrg, false, {1, 14, 20, 35}, {}}, {RpfProduct::Cib, false, {0, 7, 35}, {}}}) {
        RpfFramePlan plan;
        plan.product = c.product;
        plan.bigEndian = c.bigEndian;
        plan.maskedSubframes = c.masked;
        plan.corners = c.corners;
        OpenedFrame frame(BuildRpfFrame(plan));
        ASSERT_TRUE(frame.opened);
        EXPECT_EQ(frame.reader.headerSection.bigEndian, c.bigEndian);
        EXPECT_EQ(frame.reader.coverage.southEastLatitude, c.corners.southEastLatitude);
        EXPECT_EQ(frame.reader.coverage.southEastLongitude, c.corners.southEastLongitude);
        const std::vector<uint8_t> pixels = frame.All();
        EXPECT_EQ(pixels, ExpectedRpfPixels(plan));
        // GDAL reads big-endian frames only; it takes the 216 records of the
        // frame's table and adds entry 216 as its no-data value.
        EXPECT_TRUE(!gdal || !c.bigEndian || MatchesGdal(frame, frame.file.path(), pixels));
    }
}

// Every RPF file of the corpus opens and matches GDAL wherever both decode,
// or is refused cleanly.
TEST(RpfFrames, CorpusFramesOpenAndMatchGdalOrAreRefused)
{
    VX_SKIP_WITHOUT_CORPUS();
    VX_SKIP_WITHOUT_GDAL();
    size_t framesMatched = 0;
    for (const auto& entry : std::filesystem::recursive_directory_iterator(CorpusPath("rpf"))) {
        const std::string bytes = entry.is_regular_file() ? ReadWholeFile(entry.path().string()) : "";
        const size_t tag = bytes.substr(0, 2000).find("RPFHDR");
        if (tag == std::string::npos)
            continue; // a table of contents or another file beside the frames
        SCOPED_TRACE(entry.path().string());
        OpenedFrame frame(bytes, uint32_t(tag + 11));
        // Refused by us, or not decodable by GDAL: lines must fail cleanly or decode.
        const std::vector<uint8_t> pixels = frame.opened ? frame.All() : std::vector<uint8_t>();
        if (!frame.opened || pixels.empty() || !MatchesGdal(frame, entry.path().string(), pixels)) {
            for (uint32_t row = 0; row < kRpfFrameSide; row += 97)
                frame.Line(row);
            continue;
        }
        ++framesMatched;
    }
    EXPECT_GE(framesMatched, 3u);
}

} // namespace
