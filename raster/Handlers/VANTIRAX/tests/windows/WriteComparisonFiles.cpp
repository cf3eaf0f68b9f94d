// Writes RPF frames and NITF images of every kind into a directory, one file
// each, so that two builds of the handler can be run on the same files and
// their answers compared.
//
//   vx_write_comparison_files DIRECTORY
#include "tests/fixtures/BiLevelWriter.h"
#include "tests/fixtures/JpegBlockWriter.h"
#include "tests/fixtures/NitfFileWriter.h"
#include "tests/fixtures/NitfImageWriter.h"
#include "tests/fixtures/RpfFrameWriter.h"

#include <cstdio>
#include <exception>
#include <string>

namespace {

constexpr int32_t kRows = 70, kColumns = 90;     // not a multiple of the block size
constexpr int32_t kBlockSide = 32;
constexpr int32_t kJpegSide = 64;
constexpr uint32_t kFaxWidth = 120, kFaxHeight = 40;

const char kGeographic[] = "324530N0784510W324530N0784400W324415N0784400W324415N0784510W";
const char kDecimal[] = "+32.758-078.753+32.758-078.733+32.737-078.733+32.737-078.753";
const char kUtm[] = "335000004000000335060004000000335060003992000335000003992000";
const char kMgrs[] = "18SUJ234830647918SUJ244830647918SUJ244830547918SUJ2348305479";

uint64_t Ramp(int32_t band, int32_t row, int32_t column)
{
    return uint64_t(band * 70 + row * 3 + column * 5) & 0xFF;
}

uint64_t Wide(int32_t band, int32_t row, int32_t column)
{
    return (uint64_t(row) * 911 + uint64_t(column) * 37 + uint64_t(band)) & 0xFFF;
}

NitfImageSpec Blocked(const std::string& IREP, int bands)
{
    NitfImageSpec spec;
    spec.rows = kRows;
    spec.columns = kColumns;
    spec.IREP = IREP;
    spec.bands.assign(bands, NitfBandSpec{});
    spec.NBPR = (kColumns + kBlockSide - 1) / kBlockSide;
    spec.NBPC = (kRows + kBlockSide - 1) / kBlockSide;
    spec.NPPBH = spec.NPPBV = kBlockSide;
    return spec;
}

std::string Uncompressed(const NitfImageSpec& spec)
{
    return BuildImageFile(spec, JoinBlocks(BuildImageBlocks(spec, Ramp)));
}

std::string Frame(RpfProduct product, bool bigEndian, std::set<uint32_t> masked)
{
    RpfFrameSpec spec;
    spec.product = product;
    spec.bigEndian = bigEndian;
    spec.indexImage = PatternIndexImage();
    spec.maskedSubframes = std::move(masked);
    return BuildRpfFrame(spec).bytes;
}

std::string MonoGeographic()
{
    NitfImageSpec spec = Blocked("MONO", 1);
    spec.ICORDS = 'G';
    spec.IGEOLO = kGeographic;
    return Uncompressed(spec);
}

std::string RgbPixelInterleaved()
{
    NitfImageSpec spec = Blocked("RGB", 3);
    spec.bands[0].IREPBAND = "R";
    spec.bands[1].IREPBAND = "G";
    spec.bands[2].IREPBAND = "B";
    spec.IMODE = 'P';
    spec.ICORDS = 'D';
    spec.IGEOLO = kDecimal;
    return Uncompressed(spec);
}

std::string RgbBandSequential20()
{
    NitfImageSpec spec = Blocked("RGB", 3);
    spec.version21 = false;
    spec.IMODE = 'S';
    spec.ICORDS = 'U';
    spec.IGEOLO = kMgrs;
    return Uncompressed(spec);
}

std::string RgbRowInterleavedUtm()
{
    NitfImageSpec spec = Blocked("RGB", 3);
    spec.IMODE = 'R';
    spec.ICORDS = 'N';
    spec.IGEOLO = kUtm;
    return Uncompressed(spec);
}

std::string LookupTable()
{
    NitfImageSpec spec = Blocked("RGB/LUT", 1);
    spec.bands[0].IREPBAND = "LU";
    spec.bands[0].NLUTS = 3;
    spec.bands[0].NELUT = 200;
    spec.bands[0].LUT = RgbLookupTables(200);
    return Uncompressed(spec);
}

std::string Mono16()
{
    NitfImageSpec spec = Blocked("MONO", 1);
    spec.NBPP = 16;
    spec.ABPP = 12;
    return BuildImageFile(spec, JoinBlocks(BuildImageBlocks(spec, Wide)));
}

std::string MaskedBlocks()
{
    NitfImageSpec spec = Blocked("MONO", 1);
    spec.IC = "NM";
    std::vector<std::string> blocks = BuildImageBlocks(spec, Ramp);
    std::vector<bool> stored(blocks.size(), true);
    stored[1] = false;
    return BuildImageFile(spec, BuildMaskedData(blocks, stored, 8));
}

std::string Jpeg(int components)
{
    NitfImageSpec spec;
    spec.rows = spec.columns = kJpegSide;
    spec.IC = "C3";
    spec.COMRAT = "00.0";
    spec.IREP = components == 1 ? "MONO" : "YCbCr601";
    spec.bands.assign(components, NitfBandSpec{});
    spec.IMODE = components == 1 ? 'B' : 'P';
    JpegBlockSpec block;
    block.width = block.height = kJpegSide;
    block.components = components;
    NitfApp6Spec app6;
    app6.streamColor = components == 1 ? 0 : 2;
    Bytes data = BuildNitfJpegData({EncodeJpegBlock(TestPattern(kJpegSide, kJpegSide, components, 7), block)}, app6);
    return BuildImageFile(spec, std::string(data.begin(), data.end()));
}

std::string BiLevel()
{
    NitfImageSpec spec;
    spec.rows = kFaxHeight;
    spec.columns = kFaxWidth;
    spec.IC = "C1";
    spec.COMRAT = "2D  ";
    spec.IREP = "MONO";
    spec.NBPP = 1;
    std::vector<uint8_t> packed((kFaxWidth + 7) / 8 * kFaxHeight);
    for (size_t i = 0; i < packed.size(); ++i)
        packed[i] = uint8_t((i * 29) ^ (i / 15));
    std::vector<uint8_t> strip = EncodeT4Strip(packed, kFaxWidth, kFaxHeight, true);
    return BuildImageFile(spec, std::string(strip.begin(), strip.end()));
}

} // namespace

int main(int argc, char** argv)
{
    if (argc != 2) {
        std::fprintf(stderr, "usage: vx_write_comparison_files DIRECTORY\n");
        return 2;
    }
    const std::string directory = argv[1];
    try {
        WriteFile(directory + "/cadrg_big_endian.ntf", Frame(RpfProduct::Cadrg, true, {}));
        WriteFile(directory + "/cadrg_little_endian_masked.ntf", Frame(RpfProduct::Cadrg, false, {0, 7, 35}));
        WriteFile(directory + "/cib.ntf", Frame(RpfProduct::Cib, true, {12}));
        WriteFile(directory + "/mono_geographic.ntf", MonoGeographic());
        WriteFile(directory + "/rgb_pixel_decimal.ntf", RgbPixelInterleaved());
        WriteFile(directory + "/rgb_band_sequential_mgrs_20.ntf", RgbBandSequential20());
        WriteFile(directory + "/rgb_row_utm.ntf", RgbRowInterleavedUtm());
        WriteFile(directory + "/lookup_table.ntf", LookupTable());
        WriteFile(directory + "/mono16.ntf", Mono16());
        WriteFile(directory + "/masked_blocks.ntf", MaskedBlocks());
        WriteFile(directory + "/compressed_jpeg_grey.ntf", Jpeg(1));
        WriteFile(directory + "/compressed_jpeg_colour.ntf", Jpeg(3));
        WriteFile(directory + "/compressed_bilevel.ntf", BiLevel());
    } catch (const std::exception& failure) {
        std::fprintf(stderr, "vx_write_comparison_files: %s\n", failure.what());
        return 1;
    }
    return 0;
}
