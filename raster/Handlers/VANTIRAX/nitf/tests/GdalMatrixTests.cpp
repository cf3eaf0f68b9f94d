// NITF files written by GDAL (gdal_translate), read by CNitfImage and
// compared with GDAL's own decoding of the same file, band by band.
// Intended differences:
//  - pixels wider than 8 bits come out as the 8 most significant of their
//    ABPP bits (GDAL gives the full value);
//  - JPEG blocks are decoded by this library's decoder: samples may differ
//    from GDAL's libjpeg by a small rounding tolerance;
//  - for lookup tables shorter than 256 entries GDAL adds a transparent
//    entry; the palette here has exactly NELUT entries.
#include "geo/ImageCorners.h"
#include "nitf/tests/NitfTestFile.h"
#include "tests/fixtures/Command.h"
#include "tests/fixtures/TempFiles.h"

#include <gtest/gtest.h>

#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <iterator>
#include <sstream>

namespace {

struct SourceImage {
    int32_t width = 37, height = 23, bands = 1;
    bool wide = false;                 // UInt16 instead of Byte
    int32_t colours = 0;               // colour table entries of band 1; 0: none
    std::string colourInterp;          // "Red" makes bands 1-3 red, green, blue
    std::string srs;                   // empty: no georeference
    std::string geoTransform;
};

uint32_t SampleValue(const SourceImage& source, int32_t band, int32_t row, int32_t column)
{
    if (source.colours != 0)
        return uint32_t(row * 5 + column) % uint32_t(source.colours);
    const uint32_t value = uint32_t(band * 100 + row * 7 + column * 3);
    return source.wide ? (value * 13) % 2048 : value & 0xFF;
}

bool HaveGdal()
{
    return std::system("gdal_translate --version >/dev/null 2>&1") == 0;
}

// A VRT over a raw file of the source's samples (band sequential).
std::string WriteSource(const TempDirectory& dir, const SourceImage& source)
{
    std::string raw;
    const int32_t bytes = source.wide ? 2 : 1;
    for (int32_t band = 0; band < source.bands; ++band)
        for (int32_t row = 0; row < source.height; ++row)
            for (int32_t column = 0; column < source.width; ++column) {
                const uint32_t value = SampleValue(source, band, row, column);
                raw += char(value & 0xFF);
                if (bytes == 2)
                    raw += char(value >> 8);
            }
    std::ofstream(dir / "source.raw", std::ios::binary) << raw;
    std::ostringstream vrt;
    vrt << "<VRTDataset rasterXSize=\"" << source.width << "\" rasterYSize=\"" << source.height << "\">";
    if (!source.srs.empty())
        vrt << "<SRS>" << source.srs << "</SRS><GeoTransform>" << source.geoTransform << "</GeoTransform>";
    const char* interps[] = {"Red", "Green", "Blue"};
    for (int32_t band = 0; band < source.bands; ++band) {
        vrt << "<VRTRasterBand dataType=\"" << (source.wide ? "UInt16" : "Byte") << "\" band=\"" << band + 1
            << "\" subClass=\"VRTRawRasterBand\">";
        if (!source.colourInterp.empty())
            vrt << "<ColorInterp>" << interps[band] << "</ColorInterp>";
        if (source.colours != 0) {
            vrt << "<ColorInterp>Palette</ColorInterp><ColorTable>";
            for (int32_t i = 0; i < source.colours; ++i)
                vrt << "<Entry c1=\"" << i << "\" c2=\"" << 255 - i << "\" c3=\"" << (i * 3) % 256
                    << "\" c4=\"255\"/>";
            vrt << "</ColorTable>";
        }
        vrt << "<SourceFilename relativetoVRT=\"1\">source.raw</SourceFilename><ImageOffset>"
            << band * source.width * source.height * bytes << "</ImageOffset><PixelOffset>" << bytes
            << "</PixelOffset><LineOffset>" << source.width * bytes
            << "</LineOffset><ByteOrder>LSB</ByteOrder></VRTRasterBand>";
    }
    vrt << "</VRTDataset>";
    std::ofstream(dir / "source.vrt") << vrt.str();
    return dir / "source.vrt";
}

struct MatrixCase {
    std::string name;
    SourceImage source;
    std::string options;      // gdal_translate creation options
    int32_t tolerance = 0;    // per sample
};

// GDAL's decoding of the NITF file: band-sequential samples.
std::vector<uint32_t> GdalSamples(const TempDirectory& dir, const std::string& nitf, bool wide)
{
    const std::string raw = dir / "decoded.raw";
    RunCommand("gdal_translate -q -of ENVI " + nitf + " " + raw);
    std::ifstream in(raw, std::ios::binary);
    const std::string bytes((std::istreambuf_iterator<char>(in)), std::istreambuf_iterator<char>());
    std::vector<uint32_t> samples;
    for (size_t i = 0; i + (wide ? 1 : 0) < bytes.size(); i += wide ? 2 : 1)
        samples.push_back(wide ? uint8_t(bytes[i]) | (uint32_t(uint8_t(bytes[i + 1])) << 8) : uint8_t(bytes[i]));
    return samples;
}

std::string GdalMetadata(const std::string& nitf, const std::string& key)
{
    const std::string info = RunCommand("gdalinfo " + nitf);
    const size_t at = info.find("  " + key + "=");
    if (at == std::string::npos)
        return "";
    const size_t start = at + key.size() + 3;
    return info.substr(start, info.find('\n', start) - start);
}

void CheckAgainstGdal(const MatrixCase& test, const std::string& version)
{
    TempDirectory dir;
    const std::string nitf = dir / "image.ntf";
    RunCommand("gdal_translate -q -of NITF -co FHDR=" + version + " " + test.options + " " + WriteSource(dir, test.source) +
        " " + nitf);
    LoadedImage loaded(nitf.c_str());
    ASSERT_TRUE(loaded.Open()) << test.name << " " << version;
    const CNitfImage& image = loaded.image;
    if (test.options.find("IC=M3") != std::string::npos) {
        EXPECT_TRUE(image.isMasked) << test.name; // blocks found through the mask's block table
    }
    const std::vector<uint32_t> gdal = GdalSamples(dir, nitf, test.source.wide);
    const int32_t width = test.source.width, height = test.source.height, bands = test.source.bands;
    ASSERT_EQ(gdal.size(), size_t(width * height * bands)) << test.name;
    const int32_t ABPP = image.ABPP;
    int32_t worst = 0;
    for (int32_t row = 0; row < height; ++row) {
        const std::vector<uint8_t> ours = loaded.Row(uint32_t(row));
        ASSERT_FALSE(ours.empty()) << test.name << " row " << row;
        for (int32_t column = 0; column < width; ++column)
            for (int32_t band = 0; band < bands; ++band) {
                uint32_t expected = gdal[size_t((band * height + row) * width + column)];
                if (test.source.wide)
                    expected = (expected >> (ABPP - 8)) & 0xFF;
                const int32_t got = ours[size_t(column * bands + band)];
                worst = std::max(worst, std::abs(got - int32_t(expected)));
            }
    }
    EXPECT_LE(worst, test.tolerance) << test.name << " " << version;

    const std::string icords = GdalMetadata(nitf, "NITF_ICORDS");
    EXPECT_EQ(std::string(1, image.ICORDS()), icords.empty() ? " " : icords) << test.name;
    if (image.IGEOLO != nullptr) {
        EXPECT_EQ(std::string(image.IGEOLO.get()), GdalMetadata(nitf, "NITF_IGEOLO")) << test.name;
    }
    if (test.source.colours != 0) {
        ASSERT_EQ(image.GetPaletteSize(), test.source.colours) << test.name;
        for (int32_t i = 0; i < std::min(test.source.colours, 256); ++i) {
            uint8_t red = 0, green = 0, blue = 0;
            ASSERT_TRUE(image.GetPaletteEntry(i, red, green, blue));
            EXPECT_EQ(std::vector<int32_t>({red, green, blue}), std::vector<int32_t>({i, 255 - i, (i * 3) % 256}));
        }
    }
}

const char* const kGeographic = "EPSG:4326";
const char* const kGeographicTransform = "85.0, 0.001, 0, 33.0, 0, -0.001";

std::vector<MatrixCase> Matrix()
{
    std::vector<MatrixCase> cases;
    SourceImage mono;
    cases.push_back({"mono single block", mono, "", 0});
    SourceImage geographic = mono;
    geographic.srs = kGeographic;
    geographic.geoTransform = kGeographicTransform;
    cases.push_back({"mono partial blocks, ICORDS G", geographic, "-co BLOCKSIZE=16", 0});
    cases.push_back({"mono ICORDS D", geographic, "-co ICORDS=D -co BLOCKXSIZE=32 -co BLOCKYSIZE=8", 0});
    SourceImage wide = mono;
    wide.wide = true;
    cases.push_back({"mono 16-bit ABPP 11", wide, "-co ABPP=11 -co BLOCKSIZE=16", 0});
    SourceImage rgb = geographic;
    rgb.bands = 3;
    rgb.colourInterp = "Red";
    cases.push_back({"rgb partial blocks", rgb, "-co BLOCKSIZE=16", 0});
    SourceImage lut = mono;
    lut.colours = 256;
    cases.push_back({"rgb/lut 256", lut, "", 0});
    lut.colours = 200;
    cases.push_back({"rgb/lut 200", lut, "-co BLOCKSIZE=16", 0});
    cases.push_back({"jpeg mono", geographic, "-co IC=C3 -co BLOCKSIZE=16", 3});
    cases.push_back({"masked jpeg mono", mono, "-co IC=M3 -co BLOCKSIZE=16", 3});
    cases.push_back({"jpeg rgb", rgb, "-co IC=C3 -co BLOCKSIZE=16", 4});
    cases.push_back({"masked jpeg rgb", rgb, "-co IC=M3", 4});
    return cases;
}

TEST(GdalMatrix, RowsEqualGdalsDecodingInNitf21And20)
{
    if (!HaveGdal())
        GTEST_SKIP() << "gdal_translate is not installed";
    for (const MatrixCase& test : Matrix())
        for (const char* version : {"NITF02.10", "NITF02.00"})
            CheckAgainstGdal(test, version);
}

TEST(GdalMatrix, UtmCornersInNitf21)
{
    if (!HaveGdal())
        GTEST_SKIP() << "gdal_translate is not installed";
    SourceImage north;
    north.bands = 3;
    north.colourInterp = "Red";
    north.srs = "EPSG:32633";
    north.geoTransform = "500000, 30, 0, 4000000, 0, -30";
    SourceImage south = north;
    south.srs = "EPSG:32733";
    south.geoTransform = "500000, 30, 0, 6000000, 0, -30";
    for (const auto& [source, epsg] : {std::pair{north, 32633}, std::pair{south, 32733}}) {
        CheckAgainstGdal({"utm " + std::to_string(epsg), source, "", 0}, "NITF02.10");
        TempDirectory dir;
        const std::string nitf = dir / "utm.ntf";
        RunCommand("gdal_translate -q -of NITF " + WriteSource(dir, source) + " " + nitf);
        LoadedImage loaded(nitf.c_str());
        ASSERT_TRUE(loaded.Open());
        const ImageCornerFields fields{loaded.image.ICORDS(), loaded.image.IGEOLO.get(), true};
        EXPECT_EQ(ImageCornerEpsgCode(fields, 4326), epsg);
    }
}

} // namespace
