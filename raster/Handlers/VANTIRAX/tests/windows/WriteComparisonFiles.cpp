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

NitfImagePlan Blocked(const std::string& IREP, int bands)
{
    NitfImagePlan plan;
    plan.rows = kRows;
    plan.columns = kColumns;
    plan.IREP = IREP;
    plan.bands.assign(bands, NitfBandPlan{});
    plan.NBPR = (kColumns + kBlockSide - 1) / kBlockSide;
    plan.NBPC = (kRows + kBlockSide - 1) / kBlockSide;
    plan.NPPBH = plan.NPPBV = kBlockSide;
    return plan;
}

std::string Uncompressed(const NitfImagePlan& plan)
{
    return BuildImageFile(plan, JoinBlocks(BuildImageBlocks(plan, Ramp)));
}

std::string Frame(RpfProduct product, bool bigEndian, std::set<uint32_t> masked)
{
    RpfFramePlan plan;
    plan.product = product;
    plan.bigEndian = bigEndian;
    plan.indexImage = PatternIndexImage();
    plan.maskedSubframes = std::move(masked);
    return BuildRpfFrame(plan).bytes;
}

std::string MonoGeographic()
{
    NitfImagePlan plan = Blocked("MONO", 1);
    plan.ICORDS = 'G';
    plan.IGEOLO = kGeographic;
    return Uncompressed(plan);
}

std::string RgbPixelInterleaved()
{
    NitfImagePlan plan = Blocked("RGB", 3);
    plan.bands[0].IREPBAND = "R";
    plan.bands[1].IREPBAND = "G";
    plan.bands[2].IREPBAND = "B";
    plan.IMODE = 'P';
    plan.ICORDS = 'D';
    plan.IGEOLO = kDecimal;
    return Uncompressed(plan);
}

std::string RgbBandSequential20()
{
    NitfImagePlan plan = Blocked("RGB", 3);
    plan.version21 = false;
    plan.IMODE = 'S';
    plan.ICORDS = 'U';
    plan.IGEOLO = kMgrs;
    return Uncompressed(plan);
}

std::string RgbRowInterleavedUtm()
{
    NitfImagePlan plan = Blocked("RGB", 3);
    plan.IMODE = 'R';
    plan.ICORDS = 'N';
    plan.IGEOLO = kUtm;
    return Uncompressed(plan);
}

std::string LookupTable()
{
    NitfImagePlan plan = Blocked("RGB/LUT", 1);
    plan.bands[0].IREPBAND = "LU";
    plan.bands[0].NLUTS = 3;
    plan.bands[0].NELUT = 200;
    plan.bands[0].LUT = RgbLookupTables(200);
    return Uncompressed(plan);
}

std::string Mono16()
{
    NitfImagePlan plan = Blocked("MONO", 1);
    plan.NBPP = 16;
    plan.ABPP = 12;
    return BuildImageFile(plan, JoinBlocks(BuildImageBlocks(plan, Wide)));
}

std::string MaskedBlocks()
{
    NitfImagePlan plan = Blocked("MONO", 1);
    plan.IC = "NM";
    std::vector<std::string> blocks = BuildImageBlocks(plan, Ramp);
    std::vector<bool> stored(blocks.size(), true);
    stored[1] = false;
    return BuildImageFile(plan, BuildMaskedData(blocks, stored, 8));
}

std::string Jpeg(int components)
{
    NitfImagePlan plan;
    plan.rows = plan.columns = kJpegSide;
    plan.IC = "C3";
    plan.COMRAT = "00.0";
    plan.IREP = components == 1 ? "MONO" : "YCbCr601";
    plan.bands.assign(components, NitfBandPlan{});
    plan.IMODE = components == 1 ? 'B' : 'P';
    JpegBlockPlan block;
    block.width = block.height = kJpegSide;
    block.components = components;
    NitfApp6Plan app6;
    app6.streamColor = components == 1 ? 0 : 2;
    Bytes data = BuildNitfJpegData({EncodeJpegBlock(TestPattern(kJpegSide, kJpegSide, components, 7), block)}, app6);
    return BuildImageFile(plan, std::string(data.begin(), data.end()));
}

std::string BiLevel()
{
    NitfImagePlan plan;
    plan.rows = kFaxHeight;
    plan.columns = kFaxWidth;
    plan.IC = "C1";
    plan.COMRAT = "2D  ";
    plan.IREP = "MONO";
    plan.NBPP = 1;
    std::vector<uint8_t> packed((kFaxWidth + 7) / 8 * kFaxHeight);
    for (size_t i = 0; i < packed.size(); ++i)
        packed[i] = uint8_t((i * 29) ^ (i / 15));
    std::vector<uint8_t> strip = EncodeT4Strip(packed, kFaxWidth, kFaxHeight, true);
    return BuildImageFile(plan, std::string(strip.begin(), strip.end()));
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
