// NITF files written by GDAL (gdal_translate) from a known source image, read
// by CNitfImage and compared with GDAL's own decoding of the same file, band
// by band, with its ICORDS, IGEOLO, palette and corner EPSG code. Pixels wider
// than 8 bits come out as the 8 most significant of their ABPP bits (GDAL gives
// the full value); GDAL adds a transparent entry to lookup tables shorter than
// 256 entries, the palette here has exactly NELUT entries.
#include "geo/ImageCorners.h"
#include "nitf/tests/NitfTestFile.h"

#include <gtest/gtest.h>

#include <fstream>
#include <sstream>

namespace {

struct SourceImage {
    int32_t bands = 1;
    bool wide = false;        // UInt16 instead of Byte
    int32_t colours = 0;      // colour table entries of band 1; 0: none
    std::string srs = "EPSG:4326";
    std::string geoTransform = "85.0, 0.001, 0, 33.0, 0, -0.001";
};
constexpr int32_t kWidth = 37, kHeight = 23;
const char* const kColourInterpretations[] = {"Red", "Green", "Blue"};

// A VRT over a raw file of the source's samples (band sequential); three bands are red, green, blue.
std::string WriteSource(const TempDirectory& dir, const SourceImage& source)
{
    std::string raw;
    for (int32_t band = 0; band < source.bands; ++band)
        for (int32_t row = 0; row < kHeight; ++row)
            for (int32_t column = 0; column < kWidth; ++column) {
                const uint32_t value = source.colours != 0 ? uint32_t(row * 5 + column) % uint32_t(source.colours)
                                       : source.wide   ? uint32_t(band * 100 + row * 7 + column * 3) * 13 % 2048
                                                       : uint32_t(band * 100 + row * 7 + column * 3) & 0xFF;
                raw += source.wide ? std::string{char(value & 0xFF), char(value >> 8)} : std::string(1, char(value));
            }
    WriteFile(dir / "source.raw", raw);
    const int32_t bytes = source.wide ? 2 : 1;
    std::ostringstream vrt;
    vrt << "<VRTDataset rasterXSize=\"" << kWidth << "\" rasterYSize=\"" << kHeight << "\">";
    if (!source.srs.empty())
        vrt << "<SRS>" << source.srs << "</SRS><GeoTransform>" << source.geoTransform << "</GeoTransform>";
    for (int32_t band = 0; band < source.bands; ++band) {
        vrt << "<VRTRasterBand dataType=\"" << (source.wide ? "UInt16" : "Byte") << "\" band=\"" << band + 1
            << "\" subClass=\"VRTRawRasterBand\">";
        if (source.bands == 3)
            vrt << "<ColorInterp>" << kColourInterpretations[band] << "</ColorInterp>";
        if (source.colours != 0) {
            vrt << "<ColorInterp>Palette</ColorInterp><ColorTable>";
            for (int32_t i = 0; i < source.colours; ++i)
                vrt << "<Entry c1=\"" << i << "\" c2=\"" << 255 - i << "\" c3=\"" << (i * 3) % 256 << "\" c4=\"255\"/>";
            vrt << "</ColorTable>";
        }
        vrt << "<SourceFilename relativetoVRT=\"1\">source.raw</SourceFilename><ImageOffset>"
            << band * kWidth * kHeight * bytes << "</ImageOffset><PixelOffset>" << bytes << "</PixelOffset><LineOffset>"
            << kWidth * bytes << "</LineOffset><ByteOrder>LSB</ByteOrder></VRTRasterBand>";
    }
    WriteFile(dir / "source.vrt", vrt.str() + "</VRTDataset>");
    return dir / "source.vrt";
}

std::string GdalMetadata(const std::string& nitf, const std::string& key)
{
    const std::string info = RunCommand("gdalinfo " + nitf);
    const size_t at = info.find("  " + key + "=");
    const size_t start = at + key.size() + 3;
    return at == std::string::npos ? "" : info.substr(start, info.find('\n', start) - start);
}

// options: gdal_translate creation options. Every sample must be GDAL's, JPEG ones too.
void CheckAgainstGdal(const std::string& name, const SourceImage& source, const std::string& options,
                      int32_t epsg = 4326)
{
    SCOPED_TRACE(name + " " + options);
    TempDirectory dir;
    const std::string nitf = dir / "image.ntf";
    RunCommand("gdal_translate -q -of NITF " + options + " " + WriteSource(dir, source) + " " + nitf);
    LoadedImage loaded(nitf.c_str());
    ASSERT_TRUE(loaded.Open());
    const CNitfImage& image = loaded.image;
    EXPECT_EQ(image.isMasked, options.find("IC=M3") != std::string::npos); // blocks found through the mask table
    const std::vector<uint32_t> gdal = GdalSamples(nitf, source.wide ? 2 : 1);
    ASSERT_EQ(gdal.size(), size_t(kWidth * kHeight * source.bands));
    EXPECT_EQ(WorstDifference(loaded, gdal), 0);
    const std::string icords = GdalMetadata(nitf, "NITF_ICORDS");
    EXPECT_EQ(std::string(1, image.ICORDS()), icords.empty() ? " " : icords);
    EXPECT_EQ(image.IGEOLO != nullptr ? std::string(image.IGEOLO.get()) : "", GdalMetadata(nitf, "NITF_IGEOLO"));
    EXPECT_EQ(ImageCornerEpsgCode(ImageCornerFields{image.ICORDS(), image.IGEOLO.get(), true}, 4326),
              source.srs.empty() ? 0 : epsg);
    if (source.colours == 0)
        return;
    ASSERT_EQ(image.GetPaletteSize(), source.colours);
    for (int32_t i = 0; i < source.colours; ++i) {
        uint8_t red = 0, green = 0, blue = 0;
        ASSERT_TRUE(image.GetPaletteEntry(i, red, green, blue));
        EXPECT_EQ(std::vector<int32_t>({red, green, blue}), std::vector<int32_t>({i, 255 - i, (i * 3) % 256}));
    }
}

TEST(GdalMatrix, RowsEqualGdalsDecodingInNitf21And20)
{
    VX_SKIP_WITHOUT_GDAL();
    SourceImage mono, plain, wide, rgb, lut256, lut200;
    plain.srs.clear();
    wide.wide = true;
    rgb.bands = 3;
    lut256.colours = 256;
    lut200.colours = 200;
    struct Case {
        const char* name;
        const SourceImage& source;
        std::string options;
    };
    const Case cases[] = {
        {"mono single block", plain, ""},
        {"mono partial blocks, ICORDS G", mono, "-co BLOCKSIZE=16"},
        {"mono ICORDS D", mono, "-co ICORDS=D -co BLOCKXSIZE=32 -co BLOCKYSIZE=8"},
        {"mono 16-bit ABPP 11", wide, "-co ABPP=11 -co BLOCKSIZE=16"},
        {"rgb partial blocks", rgb, "-co BLOCKSIZE=16"},
        {"rgb/lut 256", lut256, ""},
        {"rgb/lut 200", lut200, "-co BLOCKSIZE=16"},
        {"jpeg mono", mono, "-co IC=C3 -co BLOCKSIZE=16"},
        {"masked jpeg mono", plain, "-co IC=M3 -co BLOCKSIZE=16"},
        {"jpeg rgb", rgb, "-co IC=C3 -co BLOCKSIZE=16"},
        {"masked jpeg rgb", rgb, "-co IC=M3"},
    };
    for (const Case& c : cases)
        for (const char* version : {"NITF02.10", "NITF02.00"})
            CheckAgainstGdal(c.name, c.source, c.options + " -co FHDR=" + version);
    // UTM corners, north and south (NITF 2.1 only).
    SourceImage north = rgb, south = rgb;
    north.srs = "EPSG:32633";
    north.geoTransform = "500000, 30, 0, 4000000, 0, -30";
    south.srs = "EPSG:32733";
    south.geoTransform = "500000, 30, 0, 6000000, 0, -30";
    CheckAgainstGdal("utm north", north, "", 32633);
    CheckAgainstGdal("utm south", south, "", 32733);
}

} // namespace
