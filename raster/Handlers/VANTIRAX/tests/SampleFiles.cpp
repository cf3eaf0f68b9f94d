#include "tests/SampleFiles.h"

#include "tests/fixtures/BiLevelWriter.h"
#include "tests/fixtures/Jpeg2000Writer.h"
#include "tests/fixtures/JpegBlockWriter.h"
#include "tests/fixtures/NitfImageWriter.h"
#include "tests/fixtures/RpfFrameWriter.h"

#include <fcntl.h>
#include <map>
#include <unistd.h>

namespace {

constexpr uint32_t kFaxWidth = 96, kFaxHeight = 48;
const char kUtmCorners[] = "335000004000000335060004000000335060003992000335000003992000"; // zone 33 north

// 70 x 90 pixels in 3 x 3 blocks of 32, the edge blocks padded; three bands are R, G, B.
NitfImagePlan Image(const std::string& IREP, size_t bands, char IMODE, char ICORDS = ' ', const char* IGEOLO = "")
{
    NitfImagePlan plan{true, false, 70, 90, "INT", IREP, 0, 'R', ICORDS, IGEOLO, {}, "NC", "",
                       std::vector<NitfBandPlan>(bands), false, IMODE, 3, 3, 32, 32, 8, "", "", ""};
    for (size_t band = 0; bands == 3 && band < 3; ++band)
        plan.bands[band].IREPBAND = std::string(1, "RGB"[band]);
    return plan;
}

// IC "NM" stores every block but each fourth from the second.
std::string Uncompressed(const NitfImagePlan& plan, unsigned seed)
{
    const uint64_t values = plan.bands[0].NELUT ? plan.bands[0].NELUT : 1u << (plan.ABPP ? plan.ABPP : plan.NBPP);
    const std::vector<std::string> blocks = BuildImageBlocks(plan, [&](int32_t band, int32_t row, int32_t column) {
        return (uint64_t(band * 70 + row * 3 + column * 5) + seed * 11) * (values > 256 ? 29 : 1) % values;
    });
    std::vector<bool> stored;
    for (size_t i = 0; i < blocks.size(); ++i)
        stored.push_back(i % 4 != 1);
    return BuildImageFile(plan, plan.IC == "NM" ? BuildMaskedData(blocks, stored, 8) : JoinBlocks(blocks),
                          plan.downgradeEvent);
}

// A 32 x 32 grey or colour image of 2 x 2 blocks; streamScale > 1 makes each stream that many times larger than its
// block, the lower two progressive (their coefficient buffers are as large as the frame).
std::string Jpeg(int components, unsigned seed, uint32_t streamScale = 1)
{
    const bool grey = components == 1;
    NitfImagePlan plan = Image(grey ? "MONO" : "YCbCr601", size_t(components), grey ? 'B' : 'P');
    plan.IC = "C3";
    plan.COMRAT = "00.0";
    plan.rows = plan.columns = 32;
    plan.NBPR = plan.NBPC = 2;
    plan.NPPBH = plan.NPPBV = 16;
    JpegBlockPlan block{16 * streamScale, 16 * streamScale, components};
    std::vector<Bytes> streams;
    for (unsigned i = 0; i < 4; ++i) {
        block.progressive = streamScale > 1 && i >= 2;
        streams.push_back(EncodeJpegBlock(streamScale > 1 ? Bytes(size_t(block.width) * block.height, 0x80)
                                                          : TestPattern(16, 16, components, seed * 4 + i),
                                          block));
    }
    const Bytes data = BuildNitfJpegData(streams, NitfApp6Plan{2, 2, 0, uint8_t(grey ? 0 : 2)});
    return BuildImageFile(plan, std::string(data.begin(), data.end()));
}

// JPEG 2000 in 32 x 32 tiles, the subheader's blocks: 12-bit grey samples
// in NBPP 16 (ABPP 12), or R, G, B bands of 8 bits in a JP2 file.
std::string Jpeg2000(bool colour, unsigned seed)
{
    NitfImagePlan plan = Image(colour ? "RGB" : "MONO", colour ? 3 : 1, 'B');
    plan.IC = "C8";
    plan.COMRAT = "N001";
    plan.NBPP = colour ? 8 : 16;
    plan.ABPP = colour ? 8 : 12;
    std::vector<uint16_t> samples(70 * 90 * plan.bands.size());
    for (uint32_t i = 0; i < samples.size(); ++i)
        samples[i] = uint16_t((i / 90 * 3 + i % 90 * 5 + seed * 11) * (colour ? 1 : 29) % (colour ? 256 : 4096));
    const std::string codestream = EncodeJpeg2000(90, 70, uint32_t(plan.bands.size()), colour ? 8 : 12, 32, samples);
    return BuildImageFile(plan, colour ? Jp2File(codestream) : codestream);
}

std::string BiLevel(bool twoDimensional, unsigned seed)
{
    std::vector<uint8_t> packed(size_t(kFaxWidth / 8) * kFaxHeight);
    for (size_t i = 0; i < packed.size(); ++i)
        packed[i] = uint8_t((i * 37 + seed * 11) ^ (i / 12));
    const std::vector<uint8_t> strip = EncodeT4Strip(packed, kFaxWidth, kFaxHeight, twoDimensional);
    return BuildImageFile(BiLevelPlan(int32_t(kFaxWidth), int32_t(kFaxHeight), twoDimensional),
                          std::string(strip.begin(), strip.end()));
}

} // namespace

std::vector<SampleFile> FilesOfEveryKind(unsigned seed)
{
    NitfImagePlan lut = Image("RGB/LUT", 1, 'B');
    lut.bands[0] = NitfBandPlan{"LU", 3, 200, RgbLookupTables(200)};
    NitfImagePlan mono16 = Image("MONO", 1, 'B');
    mono16.NBPP = 16;
    mono16.ABPP = 12;
    NitfImagePlan nitf20 = Image("RGB", 3, 'S', 'U', "18SUJ234830647918SUJ244830647918SUJ244830547918SUJ2348305479");
    nitf20.version21 = false;
    nitf20.downgradeEvent = true;
    nitf20.comments = {"first comment", "second comment"};
    nitf20.UDID = Tre("TESTXX", "user defined");
    NitfImagePlan masked = Image("MONO", 1, 'B', 'N', kUtmCorners);
    masked.IC = "NM";
    const std::set<uint32_t> cadrgMasked = {seed % kRpfSubframeCount, 35};
    return {
        {"compressed_jpeg_grey", Jpeg(1, seed)},
        {"compressed_jpeg_colour", Jpeg(3, seed)},
        {"compressed_jpeg2000_grey12", Jpeg2000(false, seed)},
        {"compressed_jpeg2000_rgb_jp2", Jpeg2000(true, seed)},
        {"compressed_bilevel_1d", BiLevel(false, seed)},
        {"compressed_bilevel_2d", BiLevel(true, seed)},
        {"cadrg_big_endian", BuildRpfFrame({RpfProduct::Cadrg, true, {}, cadrgMasked, {}, {}}).bytes},
        {"cadrg_little_endian", BuildRpfFrame({RpfProduct::Cadrg, false, {}, cadrgMasked, {}, {}}).bytes},
        {"cib", BuildRpfFrame({RpfProduct::Cib, true, {}, {7}, {}, {}}).bytes},
        {"mono_geographic",
         Uncompressed(Image("MONO", 1, 'B', 'G', "324530N0784510W324530N0784400W324415N0784400W324415N0784510W"),
                      seed)},
        {"rgb_pixel_decimal", // rotated: not north up
         Uncompressed(Image("RGB", 3, 'P', 'D', "+45.000+010.000+45.100+010.200+45.050+010.250+44.950+010.050"), seed)},
        {"rgb_row_utm", Uncompressed(Image("RGB", 3, 'R', 'N', kUtmCorners), seed)},
        {"rgb_band_sequential_mgrs_20", Uncompressed(nitf20, seed)},
        {"lookup_table", Uncompressed(lut, seed)},
        {"mono16", Uncompressed(mono16, seed)},
        {"masked_blocks_utm", Uncompressed(masked, seed)},
    };
}

std::vector<SampleFile> HostileFiles()
{
    const RpfFramePlan shortTable{RpfProduct::Cadrg, true, Bytes(kRpfFrameSide * kRpfFrameSide, 3), {}, {}, {32}};
    const NitfFilePlan noSections{true, false, {{std::string(100, 'x'), std::string(100, 'y')}}, {}, {}, {}, {}, {},
                                  Tre("RPFHDR", std::string(48, '\0')), "", -1, -1}; // the RPF sections missing
    NitfImagePlan plan;
    plan.rows = plan.columns = 8;
    plan.COMRAT = "00.0";
    const auto withIC = [&plan](const char* IC, size_t dataBytes) {
        plan.IC = IC;
        return BuildImageFile(plan, std::string(dataBytes, '\0'));
    };
    const std::string dpcm = withIC("C2", 64), jpeg2000 = withIC("C8", 64), cut = withIC("NC", 64).substr(0, 300);
    plan.PVTYPE = "R";
    plan.NBPP = 32;
    // dpcm parses but is never served; jpeg2000 parses but holds no codestream.
    return {{"rpf_short_colour_table", BuildRpfFrame(shortTable).bytes},
            {"rpf_sections_missing", BuildNitfFile(noSections)}, {"dpcm", dpcm}, {"jpeg2000", jpeg2000},
            {"real_pixels", withIC("NC", 256)}, {"cut_header", cut},
            {"jpeg_streams_larger_than_blocks", Jpeg(1, 0, 16)}};
}

const std::string& SampleBytes(const std::string& name)
{
    static std::map<std::string, std::string> files;
    if (files.empty())
        for (const auto& list : {FilesOfEveryKind(), HostileFiles()})
            for (const SampleFile& file : list)
                files[file.name] = file.bytes;
    return files.at(name);
}

std::string OpenDrawClose(const HandlerExports& rh, const std::string& path, uint32_t maxRows)
{
    OpenedImage image(rh, path);
    const RHHandle& h = image.handle;
    if (image.Ready() && !image.Draw(0, 0, int32_t(h.width), int32_t(std::min(h.height, maxRows))))
        image.failedRows = UINT32_MAX;
    std::string drawn = "result " + std::to_string(image.result) + " status " + std::to_string(h.status) +
        " failed " + std::to_string(image.failedRows) + " size " + std::to_string(h.width) + " x " +
        std::to_string(h.height) + " kind " + std::to_string(h.pixelKind) + "\n";
    if (h.palette != nullptr)
        drawn.append(reinterpret_cast<const char*>(h.palette->entries), size_t(h.palette->entryCount) * 3);
    return drawn.append(image.pixels.begin(), image.pixels.end());
}

uint8_t LargeImagePixel(int32_t row, int32_t column)
{
    return row >= kLargeImageRows - 2 ? uint8_t(row * 7 + column) : 0;
}

bool WriteSparseLargeImage(const std::string& path)
{
    constexpr size_t kFlOffset = 342, kLiOffset = 369; // FL (12 digits) and LI (10) of a NITF 2.1 file
    constexpr int32_t kSide = kLargeImageSide, kRows = kLargeImageRows;
    NitfImagePlan plan;
    plan.rows = kRows;
    plan.columns = plan.NPPBH = plan.NPPBV = kSide;
    plan.NBPC = kRows / kSide;
    std::string header = BuildImageFile(plan, ""), lastRows;
    const uint64_t dataBytes = uint64_t(kSide) * uint64_t(kRows);
    header.replace(kFlOffset, 12, Digits(header.size() + dataBytes, 12));
    header.replace(kLiOffset, 10, Digits(dataBytes, 10));
    for (int32_t at = 0; at < 2 * kSide; ++at)
        lastRows.push_back(char(LargeImagePixel(kRows - 2 + at / kSide, at % kSide)));
    const int file = ::open(path.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0600);
    const off_t end = off_t(header.size() + dataBytes);
    const bool written = file >= 0 && ::pwrite(file, header.data(), header.size(), 0) == ssize_t(header.size()) &&
                         ::pwrite(file, lastRows.data(), lastRows.size(), end - off_t(lastRows.size())) ==
                             ssize_t(lastRows.size());
    return (file < 0 || ::close(file) == 0) && written;
}
