// Writes the seed corpora of the fuzz targets into one folder per target:
// synthetic files of every kind from the test fixture writers, and the
// per-parser inputs cut out of those and of the shared sample files.
//   fuzz_seeds OUTPUT_DIR [SAMPLE_DIR...]
#include "nitf/NitfFileHeader.h"
#include "nitf/NitfImage.h"
#include "tests/fixtures/BiLevelWriter.h"
#include "tests/fixtures/JpegBlockWriter.h"
#include "tests/fixtures/LosslessJpegWriter.h"
#include "tests/fixtures/NitfFileWriter.h"
#include "tests/fixtures/NitfImageWriter.h"
#include "tests/fixtures/RpfFrameWriter.h"

#include <algorithm>
#include <cstdio>
#include <filesystem>
#include <string>
#include <vector>

namespace fs = std::filesystem;

namespace {

constexpr size_t kMaxSeedSize = 300000;

struct Seeds {
    fs::path root;
    int written = 0;

    void Write(const std::string& target, const std::string& name, const std::string& bytes)
    {
        fs::create_directories(root / target);
        WriteFile((root / target / name).string(), bytes.substr(0, kMaxSeedSize));
        ++written;
    }
};

std::string Prefix(std::initializer_list<uint32_t> values, std::initializer_list<unsigned> widths)
{
    std::string prefix;
    auto width = widths.begin();
    for (uint32_t value : values) {
        for (unsigned i = 0; i < *width; ++i)
            prefix += static_cast<char>((value >> (8 * i)) & 0xFF);
        ++width;
    }
    return prefix;
}

std::string AsString(const std::vector<uint8_t>& bytes)
{
    return std::string(bytes.begin(), bytes.end());
}

PixelValue Pattern()
{
    return [](int32_t band, int32_t row, int32_t column) { return uint64_t(band * 77 + row * 13 + column * 7); };
}

NitfImagePlan Image(const std::string& IREP, int32_t bands, char IMODE)
{
    NitfImagePlan plan;
    plan.rows = 20;
    plan.columns = 24;
    plan.NBPR = 2;
    plan.NBPC = 2;
    plan.NPPBH = 16;
    plan.NPPBV = 16;
    plan.IREP = IREP;
    plan.IMODE = IMODE;
    plan.bands.assign(size_t(bands), NitfBandPlan{});
    if (bands == 3)
        for (int32_t band = 0; band < 3; ++band)
            plan.bands[size_t(band)].IREPBAND = std::string(1, "RGB"[band]);
    return plan;
}

void UncompressedFiles(Seeds& seeds)
{
    for (char mode : {'B', 'P', 'R', 'S'}) {
        NitfImagePlan plan = Image("RGB", 3, mode);
        seeds.Write("exports", std::string("rgb_") + mode + ".ntf",
                    BuildImageFile(plan, JoinBlocks(BuildImageBlocks(plan, Pattern()))));
    }
    NitfImagePlan lut = Image("RGB/LUT", 1, 'B');
    lut.bands[0] = NitfBandPlan{"LU", 3, 200, RgbLookupTables(200)};
    lut.ICORDS = 'G';
    lut.IGEOLO = "400000N1000000W400000N0993000W393000N0993000W393000N1000000W";
    seeds.Write("exports", "rgb_lut_geographic.ntf", BuildImageFile(lut, JoinBlocks(BuildImageBlocks(lut, Pattern()))));

    NitfImagePlan mono = Image("MONO", 1, 'B');
    mono.NBPP = 16;
    mono.ABPP = 11;
    mono.ICORDS = 'U';
    mono.IGEOLO = "18SUJ2337106519" "18SUJ2347106519" "18SUJ2347106419" "18SUJ2337106419";
    seeds.Write("exports", "mono16_mgrs.ntf", BuildImageFile(mono, JoinBlocks(BuildImageBlocks(mono, Pattern()))));

    NitfImagePlan masked = Image("MONO", 1, 'B');
    masked.IC = "NM";
    masked.ICORDS = 'N';
    masked.IGEOLO = "185000004500000" "185001004500000" "185001004499900" "185000004499900";
    const std::vector<std::string> blocks = BuildImageBlocks(masked, Pattern());
    seeds.Write("exports", "masked_utm.ntf",
                BuildImageFile(masked, BuildMaskedData(blocks, {true, false, false, true}, 8)));

    NitfImagePlan old = Image("MONO", 1, 'B');
    old.version21 = false;
    old.downgradeEvent = true;
    old.comments = {"first comment", "second comment"};
    old.UDID = Tre("TESTXX", "user defined");
    seeds.Write("exports", "nitf20_downgrade.ntf",
                BuildImageFile(old, JoinBlocks(BuildImageBlocks(old, Pattern())), true));
}

void CompressedFiles(Seeds& seeds)
{
    const Bytes grey = TestPattern(16, 16, 1, 1);
    JpegBlockPlan bare;
    bare.defaultQuality = 3;
    bare.keepDqt = bare.keepDht = false;
    const Bytes jpeg = BuildNitfJpegData({EncodeJpegBlock(grey, {}), EncodeJpegBlock(grey, bare),
                                          EncodeJpegBlock(grey, {}), EncodeJpegBlock(grey, {})},
                                         NitfApp6Plan{2, 2, 3, 0});
    NitfImagePlan plan = Image("MONO", 1, 'B');
    plan.rows = plan.columns = 32;
    plan.IC = "C3";
    plan.COMRAT = "00.0";
    seeds.Write("exports", "jpeg_grey_2x2.ntf", BuildImageFile(plan, AsString(jpeg)));

    JpegBlockPlan colour;
    colour.components = 3;
    const Bytes rgb = BuildNitfJpegData({EncodeJpegBlock(TestPattern(24, 16, 3, 2), colour)}, NitfApp6Plan{1, 1, 0, 2});
    NitfImagePlan colourPlan = Image("RGB", 3, 'P');
    colourPlan.rows = 16;
    colourPlan.columns = 24;
    colourPlan.NBPR = colourPlan.NBPC = 1;
    colourPlan.NPPBH = colourPlan.NPPBV = 0;
    colourPlan.IC = "C3";
    colourPlan.COMRAT = "00.0";
    seeds.Write("exports", "jpeg_rgb.ntf", BuildImageFile(colourPlan, AsString(rgb)));

    std::vector<uint8_t> packed(size_t(64 / 8) * 40);
    for (size_t i = 0; i < packed.size(); ++i)
        packed[i] = static_cast<uint8_t>((i * 37) ^ (i / 8));
    for (bool twoDimensional : {false, true}) {
        NitfImagePlan bilevel = Image("MONO", 1, 'B');
        bilevel.rows = 40;
        bilevel.columns = 64;
        bilevel.NBPR = bilevel.NBPC = 1;
        bilevel.NPPBH = bilevel.NPPBV = 0;
        bilevel.NBPP = 1;
        bilevel.IC = "C1";
        bilevel.COMRAT = twoDimensional ? "2DS " : "1D  ";
        seeds.Write("exports", twoDimensional ? "bilevel_2d.ntf" : "bilevel_1d.ntf",
                    BuildImageFile(bilevel, AsString(EncodeT4Strip(packed, 64, 40, twoDimensional))));
    }
}

// Lossless (SOF3) streams of every predictor, with restarts and a point
// transform, as the JPEG target's input: one 16 x 16 block.
void LosslessStreams(Seeds& seeds)
{
    for (int components : {1, 3})
        for (int predictor = 1; predictor <= 7; ++predictor) {
            LosslessJpegPlan plan;
            plan.components = components;
            plan.predictor = predictor;
            plan.pointTransform = predictor % 3;
            plan.restartRows = predictor % 2 ? 4 : 0;
            const Bytes stream = EncodeLosslessJpeg(TestPattern(16, 16, components, unsigned(predictor)), plan);
            seeds.Write("jpeg", "lossless" + std::to_string(components) + "_" + std::to_string(predictor),
                        Prefix({uint32_t(components == 3), 0, 15, 15, 1, 0}, {1, 1, 2, 2, 1, 1}) +
                            AsString(BuildNitfJpegData({stream}, NitfApp6Plan{})));
        }
}

void RpfFiles(Seeds& seeds)
{
    RpfFramePlan cadrg;
    cadrg.indexImage = PatternIndexImage();
    cadrg.maskedSubframes = {0, 7};
    seeds.Write("exports", "cadrg_masked.on1", BuildRpfFrame(cadrg).bytes);
    RpfFramePlan cib;
    cib.product = RpfProduct::Cib;
    cib.bigEndian = false;
    cib.indexImage = PatternIndexImage();
    seeds.Write("exports", "cib_little_endian.i41", BuildRpfFrame(cib).bytes);
}

// The per-parser inputs of one whole file.
void CutFile(Seeds& seeds, const fs::path& file)
{
    CNitfFileHeader header;
    header.SetPath(file.c_str());
    if (!header.Parse() || header.NUMI < 1)
        return;
    const std::string name = file.filename().string();
    const std::string bytes = ReadWholeFile(file.string());
    if (header.HasRpfHeader()) {
        seeds.Write("rpf_frame", name, bytes);
        return;
    }
    const NitfSegmentLength& segment = header.imageSegments[0];
    const uint64_t segmentEnd = uint64_t(header.HL) + segment.subheaderLength + segment.dataLength;
    if (header.HL >= bytes.size() || segmentEnd > bytes.size())
        return;
    const std::string subheaderAndData = bytes.substr(header.HL, segmentEnd - header.HL);
    seeds.Write("image_subheader", name,
                Prefix({uint32_t(header.version21 | header.fixedLayout << 1), segment.subheaderLength}, {1, 3}) +
                    subheaderAndData);

    CFileReader reader;
    reader.OpenFile(file.c_str(), kShareDenyWrite);
    CNitfImage image;
    if (!image.ReadSubheader(reader, header) || image.isMasked || image.dataOffset >= bytes.size())
        return;
    const std::string data = bytes.substr(image.dataOffset, segment.dataLength);
    const auto side = [](int32_t value) { return uint32_t(std::max(value, 1) - 1); };
    if (image.compressionKind == kJpeg || image.compressionKind == kLosslessJpeg ||
        image.compressionKind == kDownsampledJpeg) {
        const uint32_t layout = uint32_t(image.NBPR > 1) | uint32_t(image.NBPC > 1) << 1;
        seeds.Write("jpeg", name,
                    Prefix({uint32_t(image.NBANDS == 3), layout, side(image.NPPBH), side(image.NPPBV), 1, 0},
                           {1, 1, 2, 2, 1, 1}) +
                        data);
    } else if (image.compressionKind == kBiLevel) {
        seeds.Write("bilevel", name,
                    Prefix({side(image.NCOLS), side(image.NROWS), uint32_t(image.COMRAT[0] == '1')}, {2, 2, 1}) +
                        data);
    }
}

void MgrsReferences(Seeds& seeds)
{
    const char* references[] = {"18SUJ2337106519", "4QFJ12345678", "33UXP04", "31NAA66021", "18SUJ",
                                "60XVQ1234567890", "01CAN0000000000", "32XMH", "17TNE8012345678"};
    int index = 0;
    for (const char* reference : references)
        seeds.Write("mgrs", "reference" + std::to_string(index++), reference);
    // ICORDS and IGEOLO of every corner form.
    const char* corners[] = {
        "G400000N1000000W400000N0993000W393000N0993000W393000N1000000W",
        "D+40.000-100.000+40.000-099.500+39.500-099.500+39.500-100.000",
        "U18SUJ233710651918SUJ234710651918SUJ234710641918SUJ2337106419",
        "N185000004500000185001004500000185001004499900185000004499900",
        "S185000004500000185001004500000185001004499900185000004499900"};
    for (const char* corner : corners)
        seeds.Write("mgrs", "corners" + std::to_string(index++), corner);
}

} // namespace

int main(int argc, char** argv)
{
    if (argc < 2) {
        std::fprintf(stderr, "usage: %s OUTPUT_DIR [SAMPLE_DIR...]\n", argv[0]);
        return 2;
    }
    Seeds seeds{argv[1]};
    UncompressedFiles(seeds);
    CompressedFiles(seeds);
    LosslessStreams(seeds);
    RpfFiles(seeds);
    MgrsReferences(seeds);

    std::vector<fs::path> wholeFiles;
    for (const fs::directory_entry& entry : fs::directory_iterator(seeds.root / "exports"))
        wholeFiles.push_back(entry.path());
    for (int i = 2; i < argc; ++i)
        for (const fs::directory_entry& entry : fs::recursive_directory_iterator(argv[i]))
            if (entry.is_regular_file())
                wholeFiles.push_back(entry.path());
    for (const fs::path& file : wholeFiles)
        CutFile(seeds, file);
    std::printf("%d seeds in %s\n", seeds.written, argv[1]);
    return 0;
}
