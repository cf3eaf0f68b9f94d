// NITF files written by GDAL (gdal_translate, NITF 2.1 and 2.0) from files of
// the fixture writer, read by CNitfImage and compared with GDAL's decoding of
// them: every sample (wide ones reduced to the top 8 of their ABPP bits; JPEG
// ones too), ICORDS, IGEOLO, the palette and the corners' EPSG code.
#include "geo/ImageCorners.h"
#include "nitf/tests/NitfTestFile.h"
#include "tests/fixtures/NitfImageWriter.h"

#include <gtest/gtest.h>

namespace {

std::string GdalMetadata(const std::string& nitf, const std::string& key)
{
    const std::string info = RunCommand("gdalinfo " + nitf);
    const size_t at = info.find("  " + key + "="), start = at + key.size() + 3;
    return at == std::string::npos ? "" : info.substr(start, info.find('\n', start) - start);
}

// source: the plan of the file GDAL converts, its values below limit; options: gdal_translate's.
void CheckAgainstGdal(const char* name, const NitfImagePlan& source, const std::string& options, int32_t epsg)
{
    SCOPED_TRACE(std::string(name) + " " + options);
    TempDirectory dir;
    const uint64_t limit = source.NBPP == 16 ? 2048 : source.bands[0].NELUT ? uint64_t(source.bands[0].NELUT) : 256;
    const PixelValue pixel = [&](int32_t band, int32_t row, int32_t column) {
        return uint64_t(band * 100 + row * 7 + column * 3) * 13 % limit;
    };
    WriteFile(dir / "source.ntf", BuildImageFile(source, JoinBlocks(BuildImageBlocks(source, pixel))));
    const std::string nitf = dir / "image.ntf";
    RunCommand("gdal_translate -q -of NITF " + options + " " + dir / "source.ntf" + " " + nitf);
    LoadedImage loaded(nitf.c_str());
    ASSERT_TRUE(loaded.Open());
    const CNitfImage& image = loaded.image;
    EXPECT_EQ(image.isMasked, options.find("IC=M3") != std::string::npos); // blocks found through the mask table
    const std::vector<uint32_t> gdal = GdalSamples(nitf, source.NBPP / 8);
    ASSERT_EQ(gdal.size(), size_t(source.rows * source.columns) * source.bands.size());
    EXPECT_EQ(WorstDifference(loaded, gdal), 0);
    const std::string icords = GdalMetadata(nitf, "NITF_ICORDS");
    EXPECT_EQ(std::string(1, image.ICORDS()), icords.empty() ? " " : icords);
    EXPECT_EQ(image.IGEOLO != nullptr ? std::string(image.IGEOLO.get()) : "", GdalMetadata(nitf, "NITF_IGEOLO"));
    EXPECT_EQ(ImageCornerEpsgCode(ImageCornerFields{image.ICORDS(), image.IGEOLO.get(), true}, 4326), epsg);
    const int32_t entries = source.bands[0].NELUT;
    const std::string& lut = source.bands[0].LUT;
    // Reading a table of fewer than 256 entries, GDAL adds a transparent one, which it writes.
    EXPECT_EQ(image.GetPaletteSize(), entries == 0 ? image.GetPaletteSize() : entries + (entries < 256 ? 1 : 0));
    for (int32_t i = 0; i < entries; ++i) {
        uint8_t red = 0, green = 0, blue = 0;
        ASSERT_TRUE(image.GetPaletteEntry(i, red, green, blue));
        EXPECT_EQ(std::string({char(red), char(green), char(blue)}),
                  std::string({lut[size_t(i)], lut[size_t(entries + i)], lut[size_t(2 * entries + i)]}));
    }
}

TEST(GdalMatrix, RowsEqualGdalsDecodingOfTheFilesItWrites)
{
    VX_SKIP_WITHOUT_GDAL();
    NitfImagePlan mono, plain, wide, rgb, lut256, lut200, north, south;
    mono.rows = 23;
    mono.columns = 37;
    mono.ICORDS = 'G';
    mono.IGEOLO = "330000N0850000E330000N0850213E325937N0850213E325937N0850000E";
    plain = wide = rgb = lut256 = lut200 = mono;
    plain.ICORDS = ' ';
    wide.NBPP = 16;
    wide.ABPP = 11;
    rgb.IREP = "RGB";
    rgb.bands = {NitfBandPlan{"R", 0, 0, ""}, NitfBandPlan{"G", 0, 0, ""}, NitfBandPlan{"B", 0, 0, ""}};
    lut256.IREP = lut200.IREP = "RGB/LUT";
    lut256.bands = {NitfBandPlan{"LU", 3, 256, RgbLookupTables(256)}};
    lut200.bands = {NitfBandPlan{"LU", 3, 200, RgbLookupTables(200)}};
    north = south = rgb;
    north.ICORDS = 'N';
    north.IGEOLO = "335000004400000335011104400000335011104399310335000004399310"; // zone 33, 30 m pixels
    south.ICORDS = 'S';
    south.IGEOLO = "335000006000000335011106000000335011105999310335000005999310";
    struct Case {
        const char* name;
        const NitfImagePlan& source;
        std::string options;
        int32_t epsg;
    };
    const Case cases[] = {
        {"mono single block", plain, "", 0},
        {"mono partial blocks, ICORDS G", mono, "-co BLOCKSIZE=16", 4326},
        {"mono ICORDS D", mono, "-co ICORDS=D -co BLOCKXSIZE=32 -co BLOCKYSIZE=8", 4326},
        {"mono 16-bit ABPP 11", wide, "-co ABPP=11 -co BLOCKSIZE=16", 4326},
        {"rgb partial blocks", rgb, "-co BLOCKSIZE=16", 4326},
        {"rgb/lut 256", lut256, "", 4326},
        {"rgb/lut 200", lut200, "-co BLOCKSIZE=16", 4326},
        {"jpeg mono", mono, "-co IC=C3 -co BLOCKSIZE=16", 4326},
        {"masked jpeg mono", plain, "-co IC=M3 -co BLOCKSIZE=16", 0},
        {"jpeg rgb", rgb, "-co IC=C3 -co BLOCKSIZE=16", 4326},
        {"masked jpeg rgb", rgb, "-co IC=M3", 4326},
        {"utm north", north, "", 32633},
        {"utm south", south, "", 32733},
    };
    for (const Case& c : cases) {
        CheckAgainstGdal(c.name, c.source, c.options + " -co FHDR=NITF02.10", c.epsg);
        if (c.source.ICORDS == 'G' || c.source.ICORDS == ' ') // NITF 2.0 has no ICORDS "N" or "S"
            CheckAgainstGdal(c.name, c.source, c.options + " -co FHDR=NITF02.00", c.epsg);
    }
}

} // namespace
