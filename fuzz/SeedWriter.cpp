// Writes the seed corpora of the fuzz targets into one folder per target: the sample files of every kind (whole files
// for the export and header targets), the per-parser inputs cut out of those and of the shared sample files
// (JPEG 2000 image data among them), JPEG streams of every lossless predictor and default table, and MGRS references
// and image corners.
//   fuzz_seeds OUTPUT_DIR [SAMPLE_DIR...]
#include "base/MemoryFiles.h"
#include "nitf/NitfFileHeader.h"
#include "nitf/NitfImage.h"
#include "tests/SampleFiles.h"
#include "tests/fixtures/JpegBlockWriter.h"
#include "tests/fixtures/NitfFileWriter.h"

#include <algorithm>
#include <cstdio>
#include <filesystem>

namespace fs = std::filesystem;

namespace {

constexpr size_t kMaxSeedSize = 300000;
fs::path root;
int written = 0;

void Write(const std::string& target, const std::string& name, const std::string& bytes)
{
    fs::create_directories(root / target);
    WriteFile((root / target / name).string(), bytes.substr(0, kMaxSeedSize));
    ++written;
}

// Little-endian numbers of the given widths: a target's control prefix.
std::string Prefix(std::initializer_list<std::pair<uint32_t, unsigned>> numbers)
{
    std::string prefix;
    for (const auto& [value, width] : numbers)
        for (unsigned i = 0; i < width; ++i)
            prefix += char((value >> (8 * i)) & 0xFF);
    return prefix;
}

// One 16 x 16 block as the JPEG target reads it: lossless streams of every predictor with restarts and a point
// transform, and baseline streams without DQT and DHT that take the default tables of each quality.
void JpegStreams()
{
    for (int components : {1, 3})
        for (int n = 1; n <= 7; ++n) { // lossless: predictor n, point transform n % 3; baseline: quality n
            const JpegBlockPlan lossless{16, 16, components, false, n, n % 3, n % 2 ? 4u : 0u};
            const JpegBlockPlan baseline{16, 16, components, false, 0, 0, 0, n <= 5 ? n : 0, n > 5, n > 5};
            const Bytes pattern = TestPattern(16, 16, components, unsigned(n));
            for (const Bytes& stream : {EncodeJpegBlock(pattern, lossless), EncodeJpegBlock(pattern, baseline)}) {
                const Bytes data = BuildNitfJpegData({stream}, NitfApp6Plan{});
                Write("jpeg", "stream" + std::to_string(written),
                      Prefix({{components == 3, 1}, {0, 1}, {15, 2}, {15, 2}, {1, 1}, {0, 1}}) +
                          std::string(data.begin(), data.end()));
            }
        }
}

// The per-parser inputs of one whole file.
void CutFile(const fs::path& file)
{
    CNitfFileHeader header;
    header.SetPath(file.c_str());
    const std::string name = file.filename().string(), bytes = ReadWholeFile(file.string());
#ifdef VX_MEMORY_FILES
    memoryfiles::Publish(file.c_str(), reinterpret_cast<const uint8_t*>(bytes.data()), bytes.size());
#endif
    if (!header.Parse() || header.NUMI < 1 || header.HL >= bytes.size())
        return;
    if (header.HasRpfHeader())
        return Write("rpf_frame", name, bytes);
    const NitfSegmentLength& segment = header.imageSegments[0];
    Write("image_subheader", name,
          Prefix({{header.version21 | header.fixedLayout << 1, 1}, {segment.subheaderLength, 3}}) +
              bytes.substr(header.HL, segment.subheaderLength + segment.dataLength));
    CFileReader reader;
    reader.OpenFile(file.c_str(), kShareDenyWrite);
    CNitfImage image;
    if (!image.ReadSubheader(reader, header) || image.isMasked || image.dataOffset >= bytes.size())
        return;
    const std::string data = bytes.substr(image.dataOffset, segment.dataLength);
    const auto side = [](int32_t value) { return uint32_t(std::max(value, 1) - 1); };
    const uint32_t blocks = uint32_t(image.NBPR > 1) | uint32_t(image.NBPC > 1) << 1;
    if (image.compressionKind == kJpeg || image.compressionKind == kLosslessJpeg ||
        image.compressionKind == kDownsampledJpeg)
        Write("jpeg", name,
              Prefix({{image.NBANDS == 3, 1}, {blocks, 1}, {side(image.NPPBH), 2}, {side(image.NPPBV), 2}, {1, 1},
                      {0, 1}}) + data);
    else if (image.compressionKind == kJpeg2000)
        Write("jpeg2000", name,
              Prefix({{side(image.NCOLS), 2}, {side(image.NROWS), 2}, {image.drawnBandCount == 3, 1},
                      {uint32_t(image.NBPP - 1), 1}}) + data);
    else if (image.compressionKind == kBiLevel)
        Write("bilevel", name,
              Prefix({{side(image.NCOLS), 2}, {side(image.NROWS), 2}, {image.COMRAT[0] == '1', 1}}) + data);
}

void MgrsReferences()
{
    for (const char* text : {"18SUJ2337106519", "4QFJ12345678", "33UXP04", "31NAA66021", "18SUJ", "60XVQ1234567890",
                             "01CAN0000000000", "32XMH", "17TNE8012345678",
                             // ICORDS and IGEOLO of every corner form
                             "G400000N1000000W400000N0993000W393000N0993000W393000N1000000W",
                             "D+40.000-100.000+40.000-099.500+39.500-099.500+39.500-100.000",
                             "U18SUJ233710651918SUJ234710651918SUJ234710641918SUJ2337106419",
                             "N185000004500000185001004500000185001004499900185000004499900",
                             "S185000004500000185001004500000185001004499900185000004499900"})
        Write("mgrs", "text" + std::to_string(written), text);
}

} // namespace

int main(int argc, char** argv)
{
    if (argc < 2)
        return std::fprintf(stderr, "usage: %s OUTPUT_DIR [SAMPLE_DIR...]\n", argv[0]), 2;
    root = argv[1];
    for (const auto& files : {FilesOfEveryKind(), HostileFiles()})
        for (const SampleFile& file : files)
            Write("exports", file.name + ".ntf", file.bytes);
    JpegStreams();
    MgrsReferences();
    for (const fs::directory_entry& entry : fs::directory_iterator(root / "exports"))
        CutFile(entry.path());
    for (int i = 2; i < argc; ++i)
        for (const fs::directory_entry& entry : fs::recursive_directory_iterator(argv[i]))
            if (entry.is_regular_file())
                CutFile(entry.path());
    std::printf("%d seeds in %s\n", written, argv[1]);
    return 0;
}
