// rhlhost driven as a user drives it, in a child process: what each command
// exits with, says and leaves; batches whose files vanish, the progress bar on
// a terminal and the memory of a thousand-frame batch; its GeoTIFF, PNG and
// mosaic outputs read back by GDAL.
#include "tests/GdalPeer.h"
#include "tests/SampleFiles.h"
#include "tests/fixtures/Corpus.h"
#include "tests/fixtures/NitfFileWriter.h"
#include "tests/fixtures/NitfImageWriter.h"
#include "tests/fixtures/RpfFrameWriter.h"
#include "tests/fixtures/TempFiles.h"

#include <gtest/gtest.h>

#include <atomic>
#include <cmath>
#include <cstring>
#include <fcntl.h>
#include <filesystem>
#include <fstream>
#include <regex>
#include <spawn.h>
#include <sys/wait.h>
#include <thread>
#include <unistd.h>

namespace {

namespace fs = std::filesystem;

struct ProcessResult {
    int exitCode = -1;
    std::string out, err;
    long peakKilobytes = 0; // the child's peak resident set (VmHWM)
};

ProcessResult RunProgram(const std::vector<std::string>& argv)
{
    TempFile out(".out"), err(".err");
    posix_spawn_file_actions_t actions;
    posix_spawn_file_actions_init(&actions);
    posix_spawn_file_actions_addopen(&actions, 1, out.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0644);
    posix_spawn_file_actions_addopen(&actions, 2, err.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0644);
    std::vector<char*> args;
    for (const std::string& arg : argv)
        args.push_back(const_cast<char*>(arg.c_str()));
    args.push_back(nullptr);
    ProcessResult result;
    pid_t child = 0;
    const int spawned = posix_spawnp(&child, args[0], &actions, nullptr, args.data(), environ);
    posix_spawn_file_actions_destroy(&actions);
    // The child's own peak is the VmHWM of its image, read while it runs: the
    // kernel's account of a spawned child counts the spawning process's peak too.
    int status = 0;
    while (spawned == 0 && waitpid(child, &status, WNOHANG) == 0) {
        std::ifstream proc("/proc/" + std::to_string(child) + "/status");
        for (std::string line; std::getline(proc, line);)
            if (line.rfind("VmHWM:", 0) == 0)
                result.peakKilobytes = std::max(result.peakKilobytes, std::stol(line.substr(6)));
        usleep(1000);
    }
    result.exitCode = spawned == 0 && WIFEXITED(status) ? WEXITSTATUS(status) : -1;
    result.out = ReadWholeFile(out.path());
    result.err = ReadWholeFile(err.path());
    return result;
}

std::vector<std::string> HostArgv(std::vector<std::string> args)
{
    args.insert(args.begin(), {VX_HOST_PATH, "--handler", VX_HANDLER_PATH});
    return args;
}

ProcessResult RunHost(const std::vector<std::string>& args)
{
    return RunProgram(HostArgv(args));
}

// GDAL's judge of a cloud-optimised GeoTIFF (Debian's python3-gdal), run by the system's Python that has GDAL.
bool ValidCloudOptimised(const std::string& tiff)
{
    return RunProgram({"/usr/bin/python3",
                       "/usr/lib/python3/dist-packages/osgeo_utils/samples/validate_cloud_optimized_geotiff.py", "-q",
                       tiff}).exitCode == 0;
}

// A batch render of every file below `in`, 64 x 64 pixels of each, on two workers.
std::vector<std::string> BatchArgv(const std::string& in, const std::string& out)
{
    return HostArgv({"render", "--jobs", "2", "--window", "0,0,64,64", "-o", out, in});
}

struct HostInfo {
    uint32_t width = 0, height = 0;
    int epsg = 0;
    std::vector<std::vector<double>> points; // column, row, x, y
    std::vector<std::array<int, 3>> palette;
};

HostInfo ReadHostInfo(const std::string& path)
{
    const std::string json = RunHost({"info", path}).out, n = "([-+0-9.eE]+)";
    HostInfo info;
    for (const auto& size : NumbersIn(json, "\"width\": (\\d+), \"height\": (\\d+)"))
        info.width = uint32_t(size[0]), info.height = uint32_t(size[1]);
    for (const auto& code : NumbersIn(json, "\"epsg\": (\\d+)"))
        info.epsg = int(code[0]);
    info.points = NumbersIn(json, "\\[" + n + ", " + n + ", " + n + ", " + n + "\\]");
    for (const auto& e : NumbersIn(json.substr(0, json.find("\"georef\"")), "\\[(\\d+), (\\d+), (\\d+)\\]"))
        info.palette.push_back({int(e[0]), int(e[1]), int(e[2])});
    return info;
}

// Regular files below the directory, relative and sorted; files the host
// renames meanwhile are passed over.
std::vector<std::string> FilesBelow(const std::string& directory)
{
    std::vector<std::string> files;
    std::error_code error, typeError;
    for (fs::recursive_directory_iterator it(directory, error), end; !error && it != end; it.increment(error))
        if (it->is_regular_file(typeError))
            files.push_back(fs::relative(it->path(), directory).string());
    std::sort(files.begin(), files.end());
    return files;
}

// A frame of the pattern image at these corners; a small one stores only its first subframe.
std::string FrameFile(const RpfCorners& corners = {}, RpfProduct product = RpfProduct::Cadrg,
                      const std::set<uint32_t>& masked = {})
{
    return BuildRpfFrame({product, true, {}, masked, corners, {}}).bytes;
}

std::string SmallFrameFile(const RpfCorners& corners = {})
{
    std::set<uint32_t> masked;
    for (uint32_t subframe = 1; subframe < kRpfSubframeCount; ++subframe)
        masked.insert(subframe);
    return FrameFile(corners, RpfProduct::Cadrg, masked);
}

void WriteFrames(const std::string& directory, int count)
{
    const std::string frame = SmallFrameFile();
    fs::create_directories(directory);
    for (int i = 0; i < count; ++i)
        WriteFile(directory + "/frame" + std::to_string(i) + ".ntf", frame);
}

bool Says(const ProcessResult& result, const std::string& words)
{
    return (result.out + result.err).find(words) != std::string::npos;
}

struct Command {
    std::vector<std::string> args; // IN and OUT stand for the two folders
    int exitCode;
    std::vector<std::string> says; // on standard output or error
    std::vector<std::string> leaves; // files below OUT
};

const Command kCommands[] = {
    {{"identify"}, 0, {R"("name": "VANTIRAX.rhl", "description": "CADRG, CIB and NITF Format Handler", )"
                       R"("extensions": ["ntf"])"}, {}},
    {{"probe", "IN/frame.ntf", "IN/notes.txt", "IN/broken.ntf"}, 0,
     {"1 IN/frame.ntf\n0 IN/notes.txt\n1 IN/broken.ntf\n"}, {}},
    {{"probe", "IN/frame.ntf", "IN/missing.ntf"}, 1, {"1 IN/frame.ntf\n0 IN/missing.ntf\n", "IN/missing.ntf: no such file"}, {}},
    {{"--help"}, 0, {"usage: rhlhost [--handler PATH] COMMAND"}, {}},
    {{"frobnicate"}, 2, {"unknown command frobnicate"}, {}},
    {{"info", "IN/frame.ntf", "--text"}, 0,
     {"1536 x 1536 pixels", "217 entries, the last 255, 255, 255", "EPSG:4326",
      "longitude -100.000000000  latitude 40.000000000", "longitude -99.500000000  latitude 39.500000000"}, {}},
    {{"info", "IN/utm.ntf", "--text"}, 0, {"EPSG:32633 (WGS 84 / UTM zone 33N, metres)", "three bytes per pixel"}, {}},
    {{"info", "IN/broken.ntf"}, 1, {R"({"result": 0, "status": 5)"}, {}},
    {{"render"}, 2, {"usage: rhlhost [--handler PATH] COMMAND"}, {}},
    {{"render", "IN/frame.ntf", "OUT/frame.jpg"}, 2, {"render writes .tif, .tiff or .png files"}, {}},
    {{"render", "IN/frame.ntf", "IN/frame.ntf/out.tif"}, 1, {"cannot write IN/frame.ntf/out.tif"}, {}},
    {{"render", "IN/missing.ntf", "OUT/out.tif"}, 1, {"IN/missing.ntf: "}, {}},
    {{"render", "IN/rows_fail.ntf", "OUT/out.png"}, 3, {"32 rows could not be decoded (written as zeros)"}, {"out.png"}},
    {{"render", "-o", "IN/frame.ntf/out", "IN"}, 1, {"cannot create IN/frame.ntf/out"}, {}},
    {{"render", "--format", "png", "-o", "OUT", "IN/gone.ntf", "IN/utm.ntf"}, 1,
     {"IN/gone.ntf: the file no longer exists", "2 files: 1 rendered"}, {"utm.ntf.png"}},
    {{"render", "--jobs", "2", "-o", "OUT", "IN"}, 1,
     {"IN/broken.ntf: the handler could not open it (result 0, status 5): not a file this handler reads; nitfinfo",
      "IN/rows_fail.ntf: 32 rows could not be decoded (written as zeros)",
      "308 files: 5 rendered (1 with 32 undecodable rows), 303 refused (302 not recognised, 1 not opened, 0 vanished), "
      "0 failed to write"},
     {"frame.ntf.tif", "rotated.ntf.tif", "rows_fail.ntf.tif", "utm.ntf.tif", "z_coarse.ntf.tif"}},
    {{"render", "--jobs", "2", "-o", "OUT", "IN/frame.ntf", "IN/./frame.ntf", "IN/frame.ntf-2"}, 1,
     {"IN/./frame.ntf: written as frame.ntf-3.tif, frame.ntf.tif being another input's", "3 files: 2 rendered",
      "IN/frame.ntf-2: the handler does not recognise it"},
     {"frame.ntf-3.tif", "frame.ntf.tif"}},
    {{"dump", "IN/frame.ntf", "OUT/frame.raw", "--window=0,0,10,20"}, 0, {}, {"frame.raw"}},
    {{"info", "IN/frame.ntf", "--text", "--text"}, 2, {"--text is given twice"}, {}},
    {{"info", "IN/frame.ntf", "--jobs", "2"}, 2, {"--jobs does not apply to info"}, {}},
    {{"render", "IN/frame.ntf", "OUT/frame.tif", "--format", "png"}, 2, {"--format does not apply to render without -o"}, {}},
    {{"render", "IN/frame.ntf", "OUT/frame.tif", "--world-file"}, 2, {"--world-file goes with PNG output"}, {}},
    {{"mosaic", "-o", "OUT/m.png", "IN"}, 2, {"mosaic writes .tif or .tiff files"}, {}},
    {{"render", "-o", "OUT", "IN/notes.txt"}, 1,
     {"IN/notes.txt: the handler does not recognise it (nitfinfo says why)", "1 files: 0 rendered"}, {}},
    {{"mosaic", "-o", "OUT/m.tif", "IN/utm.ntf"}, 1, {"no frame to place in the mosaic"}, {}},
    {{"--version"}, 0, {"\nhandler VANTIRAX.rhl version 3, CADRG, CIB and NITF Format Handler"}, {}},
    {{"dump", "IN/frame.ntf", "OUT/frame.tif"}, 2, {"dump writes .raw files"}, {}},
    {{"info", "IN/missing.ntf"}, 1, {"IN/missing.ntf: no such file"}, {}},
    {{"toc", "IN/frame.ntf"}, 1, {"IN/frame.ntf: no component 148 in the location section"}, {}},
    {{"mosaic", "-o", "OUT/m.tif", "--product", "1", "IN"}, 2, {"--product does not apply to mosaic without --toc"}, {}},
    {{"mosaic", "-o", "OUT/m.tif", "--toc", "IN/A.TOC", "--product", "1"}, 1, {"IN/A.TOC: no such file"}, {}},
    {{"mosaic", "-o", "OUT/m.tif", "IN"}, 1,
     {"IN/utm.ntf: EPSG:32633 (WGS 84 / UTM zone 33N, metres): a mosaic takes EPSG:4326 frames only",
      "IN/rotated.ntf: the frame is not north up", "IN/rows_fail.ntf: the frame has no georeference",
      "IN/z_coarse.ntf: its pixel size differs from the first frame's", "IN/broken.ntf: the handler could not open",
      "OUT/m.tif: 1 frames on 1536 x 1536 pixels, 5 refused, 302 not recognised"}, {"m.tif"}},
};

// Commands on one folder of files of every fate; no progress bar without a terminal.
TEST(HostCommands, ExitSayAndLeave)
{
    TempDirectory in;
    RpfCorners coarse; // a frame of twice the pixel size
    coarse.southWestLatitude = coarse.southEastLatitude = 39.0;
    coarse.northEastLongitude = coarse.southEastLongitude = -99.0;
    WriteFile(in / "frame.ntf", SmallFrameFile());
    WriteFile(in / "z_coarse.ntf", SmallFrameFile(coarse));
    for (const auto& [file, sample] : {std::pair{"utm", "rgb_row_utm"}, {"rotated", "rgb_pixel_decimal"},
                                       {"rows_fail", "jpeg_streams_larger_than_blocks"},
                                       {"broken", "rpf_sections_missing"}})
        WriteFile(in / file + ".ntf", SampleBytes(sample));
    WriteFile(in / "frame.ntf-2", SampleBytes("rgb_row_utm").substr(0, 5000)); // cut short
    WriteFile(in / "notes.txt", "not an image");
    fs::create_directories(in / "junk");
    for (int i = 0; i < 300; ++i)
        WriteFile(in / "junk/" + std::to_string(i) + ".txt", std::string(size_t(i), char('a' + i % 26)));
    for (const Command& command : kCommands) {
        TempDirectory out;
        // IN and OUT in an argument or a message made the folders' paths.
        const auto placed = [&](const std::string& text) {
            return std::regex_replace(std::regex_replace(text, std::regex("\\bIN\\b"), in.path()),
                                      std::regex("\\bOUT\\b"), out.path());
        };
        std::vector<std::string> args;
        for (const std::string& arg : command.args)
            args.push_back(placed(arg));
        SCOPED_TRACE(command.args[0] + " " + (args.size() > 1 ? args[1] : ""));
        const ProcessResult result = RunHost(args);
        EXPECT_EQ(result.exitCode, command.exitCode) << result.err;
        for (const std::string& words : command.says)
            EXPECT_TRUE(Says(result, placed(words))) << "not said: " << words << "\n" << result.out << result.err;
        EXPECT_EQ(result.err.find('\r'), std::string::npos) << "a progress bar without a terminal";
        EXPECT_EQ(FilesBelow(out.path()), command.leaves);
    }
}

// Started through a link from a folder that holds another file of the
// handler's name, the host still loads the handler beside its own file.
TEST(HostCommands, HandlerIsFoundBesideTheExecutableItself)
{
    TempDirectory elsewhere;
    fs::create_symlink(VX_HOST_PATH, elsewhere / "rhlhost");
    WriteFile(elsewhere / "VANTIRAX.rhl", "not a handler");
    const ProcessResult result = RunProgram({elsewhere / "rhlhost", "identify"});
    EXPECT_EQ(result.exitCode, 0) << result.err;
    EXPECT_TRUE(Says(result, R"("name": "VANTIRAX.rhl")"));
}

TEST(HostBatch, FilesVanishingDuringTheBatchNeverStopIt)
{
    constexpr int kFrames = 200;
    TempDirectory in, out;
    WriteFrames(in.path(), kFrames);
    ProcessResult result;
    std::atomic<bool> done{false};
    std::thread batch([&] {
        result = RunProgram(BatchArgv(in.path(), out.path()));
        done = true;
    });
    // The walk is over once the first output appears; then every other file goes.
    while (FilesBelow(out.path()).empty() && !done)
        std::this_thread::yield();
    for (int i = kFrames - 1; i >= 0; i -= 2)
        fs::remove(in / ("frame" + std::to_string(i) + ".ntf"));
    batch.join();
    const std::vector<std::string> rendered = FilesBelow(out.path());
    EXPECT_GE(rendered.size(), size_t(kFrames / 2));
    EXPECT_LE(result.exitCode, 1) << result.err;
    EXPECT_TRUE(Says(result, std::to_string(kFrames) + " files: " + std::to_string(rendered.size()) + " rendered"));
    EXPECT_TRUE(Says(result, std::to_string(kFrames - rendered.size()) + " vanished")) << result.err;
    for (const std::string& file : rendered)
        EXPECT_EQ(file.find(".part-"), std::string::npos) << "a partial output under a final name: " << file;
}

TEST(HostBatch, ProgressBarOnATerminal)
{
    TempDirectory in, out;
    WriteFrames(in.path(), 5);
    std::string command;
    for (const std::string& arg : BatchArgv(in.path(), out.path()))
        command += arg + " ";
    // script(1) gives the host a terminal and copies what it shows to stdout.
    const std::string shown = RunProgram({"script", "-qec", command, "/dev/null"}).out;
    for (const char* piece : {"] 5/5 files ", " files/s ", " left", "5 files: 5 rendered"})
        EXPECT_NE(shown.find(piece), std::string::npos) << shown;
}

// Each frame opens its own handle and releases it: the host's peak memory
// over 1,000 frames stays where it is over 100 (under AddressSanitizer freed
// memory is reused at once instead of quarantined).
TEST(HostBatch, ThousandFramesOnTwoWorkersKeepMemoryFlat)
{
    constexpr long kFlatKilobytes = 8 * 1024; // far less than one frame's decoding tables per file
    TempDirectory in, out;
    const char* options = std::getenv("ASAN_OPTIONS");
    const std::string asan = std::string("ASAN_OPTIONS=") + (options ? options : "") + ":quarantine_size_mb=0";
    long peak[2] = {};
    for (int count : {100, 1000}) {
        const std::string name = std::to_string(count);
        WriteFrames(in / name, count);
        std::vector<std::string> argv = BatchArgv(in / name, out / name);
        argv.insert(argv.begin(), {"env", asan});
        const ProcessResult batch = RunProgram(argv);
        ASSERT_EQ(batch.exitCode, 0) << batch.err;
        EXPECT_EQ(FilesBelow(out / name).size(), size_t(count));
        peak[count == 1000] = batch.peakKilobytes;
    }
    EXPECT_LT(peak[1] - peak[0], kFlatKilobytes) << "100 frames: " << peak[0] << " kB, 1000 frames: " << peak[1];
}

// Rows pass through as they arrive: rendering or dumping an image 16 times
// as tall (64 MiB) holds no more than a few strips more.
TEST(HostRender, RowsPassThroughInMemoryOfAFewStrips)
{
    constexpr long kFlatKilobytes = 16 * 1024;
    TempDirectory directory;
    long peak[2][2] = {};
    for (int32_t rows : {512, 8192}) {
        NitfImagePlan plan;
        plan.rows = rows;
        plan.columns = 8192;
        plan.NPPBV = 64;
        plan.NBPC = rows / 64;
        const auto value = [](int32_t, int32_t row, int32_t column) { return uint64_t(row * 7 ^ column) % 251; };
        WriteFile(directory / "in.ntf", BuildImageFile(plan, JoinBlocks(BuildImageBlocks(plan, value))));
        for (const char* output : {"out.tif", "out.raw"}) {
            const ProcessResult result = RunHost({output[4] == 't' ? "render" : "dump", directory / "in.ntf", directory / output});
            ASSERT_EQ(result.exitCode, 0) << result.err;
            peak[rows == 8192][output[4] == 'r'] = result.peakKilobytes;
        }
    }
    for (int output = 0; output < 2; ++output)
        EXPECT_LT(peak[1][output] - peak[0][output], kFlatKilobytes) << (output ? "dump: " : "render: ") << peak[0][output] << " kB, then " << peak[1][output];
}

uint32_t Checksum(const std::string& pixels, uint32_t width, uint32_t height, size_t bands = 1, size_t band = 0)
{
    return GdalChecksum(reinterpret_cast<const uint8_t*>(pixels.data()) + band, width, height, bands);
}

struct Rendering {
    const char* sample;
    const char* window; // X0,Y0,X1,Y1 or empty
    std::vector<std::string> colours;
    bool nodata; // the masked value 216 is the TIFF's nodata value
    size_t overviews = 0;
    const char* tiffOption = "";
};

void PrintTo(const Rendering& r, std::ostream* out)
{
    *out << r.sample << (*r.window ? " window " : "") << r.window;
}

class HostRender : public testing::TestWithParam<Rendering> { };

// A GeoTIFF has the coordinate system and corners that `rhlhost info` reports
// (the control points' world positions are the outer corners, so GDAL's
// corners equal them), the pixels `rhlhost dump` delivers and the palette,
// in 256 x 256 tiles laid out as GDAL's validator wants, overviews when large;
// a PNG shows the palette's colours and its world file places it as the GeoTIFF.
TEST_P(HostRender, GdalReadsWhatInfoAndDumpSay)
{
    const Rendering& r = GetParam();
    TempDirectory directory;
    const std::string input = directory / "in.ntf", tiff = directory / "out.tif", png = directory / "out.png";
    WriteFile(input, SampleBytes(r.sample));
    for (const std::string& output : {tiff, png, directory / "dump.raw"}) {
        std::vector<std::string> args = {output == png || output == tiff ? "render" : "dump", input, output};
        if (*r.window)
            args.insert(args.end(), {"--window", r.window});
        if (output == png || (output == tiff && *r.tiffOption))
            args.push_back(output == png ? "--world-file" : r.tiffOption);
        ASSERT_EQ(RunHost(args).exitCode, 0) << output;
    }
    const HostInfo info = ReadHostInfo(input);
    const GdalReport gdal = ReadWithGdal(tiff);
    int32_t x0 = 0, y0 = 0, x1 = int32_t(info.width), y1 = int32_t(info.height);
    std::sscanf(r.window, "%d,%d,%d,%d", &x0, &y0, &x1, &y1);
    const uint32_t w = uint32_t(x1 - x0), h = uint32_t(y1 - y0);
    ASSERT_EQ(gdal.width, w);
    ASSERT_EQ(gdal.height, h);
    EXPECT_EQ(gdal.block, (std::array<uint32_t, 2>{256, 256}));
    EXPECT_EQ(gdal.overviews, r.overviews);
    EXPECT_TRUE(ValidCloudOptimised(tiff));
    const GdalReport shown = ReadWithGdal(png);
    for (size_t i = 0; i < 6; ++i)
        EXPECT_NEAR(shown.geoTransform[i], gdal.geoTransform[i], 1e-9 * (1 + std::fabs(gdal.geoTransform[i])));
    EXPECT_EQ(gdal.colourInterpretations, r.colours);
    EXPECT_EQ(gdal.epsg, info.epsg);
    ASSERT_EQ(info.points.size(), info.epsg ? 3u : 0u);
    for (const auto& [a, b] : {std::pair{0u, 0u}, {w, 0u}, {0u, h}, {w, h}})
        for (int axis = 2; info.epsg && axis < 4; ++axis) {
            const auto& p = info.points;
            const double host = p[0][axis] + (x0 + a) * (p[1][axis] - p[0][axis]) / info.width +
                (y0 + b) * (p[2][axis] - p[0][axis]) / info.height;
            EXPECT_NEAR(axis == 2 ? gdal.X(a, b) : gdal.Y(a, b), host, 1e-4 * std::fabs(gdal.geoTransform[1]))
                << "corner " << a << ", " << b;
        }
    // The dump's bytes, grey palettes mapped to their greys, sum as GDAL sums
    // the TIFF's bands; the PNG shows palettes as their colours, masked pixels transparent black.
    const bool paletted = r.colours[0] == "Palette";
    std::string dump = ReadWholeFile(directory / "dump.raw"), expanded;
    for (char& value : dump) {
        if (r.colours[0] == "Gray" && !info.palette.empty())
            value = char(info.palette.at(uint8_t(value))[0]);
        const bool masked = r.nodata && uint8_t(value) == kRpfMaskedPixel;
        for (size_t c = 0; paletted && c < 3u + r.nodata; ++c)
            expanded += masked ? '\0' : c == 3 ? '\xff' : char(info.palette.at(uint8_t(value))[c]);
    }
    const auto sums = [&](const std::string& pixels, size_t bands) {
        std::vector<uint32_t> sums;
        for (size_t band = 0; band < bands; ++band)
            sums.push_back(Checksum(pixels, w, h, bands, band));
        return sums;
    };
    EXPECT_EQ(gdal.checksums, sums(dump, r.colours.size()));
    EXPECT_EQ(shown.checksums, paletted ? sums(expanded, 3u + r.nodata) : gdal.checksums);
    EXPECT_EQ(gdal.hasNodata, r.nodata);
    EXPECT_TRUE(!r.nodata || gdal.nodata == kRpfMaskedPixel);
    for (size_t i = 0; paletted && i < info.palette.size(); ++i)
        EXPECT_EQ(gdal.colourTable.at(i), info.palette[i]) << "entry " << i;
}

const std::vector<std::string> kPalette = {"Palette"}, kGray = {"Gray"}, kRgb = {"Red", "Green", "Blue"};

INSTANTIATE_TEST_SUITE_P(Samples, HostRender,
                         testing::Values(Rendering{"cadrg_big_endian", "", kPalette, true, 3},
                                         Rendering{"cadrg_big_endian", "100,200,400,300", kPalette, true},
                                         Rendering{"cib", "", kPalette, true, 0, "--no-overviews"},
                                         Rendering{"lookup_table", "", kPalette, false},
                                         Rendering{"rgb_row_utm", "", kRgb, false},
                                         Rendering{"rgb_pixel_decimal", "33,5,80,69", kRgb, false},
                                         Rendering{"compressed_bilevel_2d", "", kGray, false}),
                         [](const testing::TestParamInfo<Rendering>& info) {
                             return std::string(info.param.sample) + (*info.param.window ? "_window" : "");
                         });

// Corners corpus frames and GDAL cannot judge. Zone 00 keeps its transform without a coordinate system,
// ICORDS "E" (corners spanning no area) gives no georeference; the host says so.
TEST(HostRender, CornersWithoutACoordinateSystemAreWrittenWithoutOne)
{
    const std::string& utm = SampleBytes("rgb_row_utm");
    const size_t igeolo = utm.find("335000004000000");
    ASSERT_NE(igeolo, std::string::npos);
    for (const auto& [ICORDS, warning, info] :
         {std::tuple{'N', "written without a coordinate system", "x 500000.000  y 4000000.000"},
          {'E', "written without georeference: the georeference's corners span no area", "span no area"}}) {
        TempDirectory directory;
        std::string bytes = utm;
        bytes[igeolo - 1] = ICORDS;
        for (size_t slot = 0; slot < 60; slot += 15)
            bytes.replace(igeolo + slot, 2, "00");
        WriteFile(directory / "in.ntf", bytes);
        const ProcessResult rendered = RunHost({"render", directory / "in.ntf", directory / "out.tif"});
        EXPECT_EQ(rendered.exitCode, 0) << rendered.err;
        EXPECT_NE(rendered.err.find(warning), std::string::npos) << rendered.err;
        const GdalReport gdal = ReadWithGdal(directory / "out.tif");
        EXPECT_EQ(gdal.epsg, 0);
        EXPECT_EQ(gdal.geoTransform[0] == 500000.0, ICORDS == 'N');
        const std::string text = RunHost({"info", directory / "in.ntf", "--text"}).out;
        EXPECT_NE(text.find("georef      no coordinate system (EPSG code 0)"), std::string::npos) << text;
        EXPECT_NE(text.find(info), std::string::npos) << text;
    }
}

// Across the 180 degree meridian or of geocentric latitudes: the corners the host reads, a GeoTIFF
// of positive pixel width at them, and GDAL's corners of the file itself (RPF coverage corners at
// the outer corners as here, IGEOLO corners at the corner pixels' centres).
TEST(HostRender, ImagesAcross180DegreesAndOfGeocentricLatitudesArePlacedAsGdalPlacesThem)
{
    RpfCorners frame;
    frame.northWestLongitude = frame.southWestLongitude = 179.75;
    frame.northEastLongitude = frame.southEastLongitude = -179.75;
    TempDirectory directory;
    WriteFile(directory / "frame.ntf", SmallFrameFile(frame));
    const struct {
        std::string path;
        bool gdalAtPixelCentres;
        double gdalEastBehind, west, north, east, south; // GDAL's east corners lie that far west of ours
    } placements[] = {// GDAL leaves the fixture frame's east corners at -179.75, mirrored.
                      {directory / "frame.ntf", false, 360, 179.75, 40, 180.25, 39.5},
                      // A CADRG frame from 173.1E to 170.7W.
                      {CorpusPath("jitc-nitf20/U_3058B.NTF"), false, 0, 173.0769231, 62.3076923, 189.32643, 51.9230769},
                      // 160E to 160W: GDAL 3.6 leaves the east corners at -160, mirrored.
                      {CorpusPath("jitc-nitf21/i_3004g.ntf"), true, 360, 160, 20, 200, -20},
                      // ICORDS "C": 32d59'00" and 32d14'57" geocentric.
                      {CorpusPath("jitc-nitf20/U_1001A.NTF"), true, 0, 85, 33.15932, 85.9675, 32.4230942}};
    for (const auto& p : placements) {
        if (&p != placements)
            VX_SKIP_WITHOUT_CORPUS();
        SCOPED_TRACE(p.path);
        const std::vector<std::vector<double>> ours = ReadHostInfo(p.path).points;
        ASSERT_EQ(ours.size(), 3u);
        EXPECT_NEAR(ours[0][2], p.west, 1e-5);
        EXPECT_NEAR(ours[0][3], p.north, 1e-5);
        EXPECT_NEAR(ours[1][2], p.east, 1e-5);
        EXPECT_NEAR(ours[2][3], p.south, 1e-5);
        ASSERT_EQ(RunHost({"render", p.path, directory / "out.tif"}).exitCode, 0);
        const GdalReport tiff = ReadWithGdal(directory / "out.tif"), source = ReadWithGdal(p.path);
        EXPECT_GT(tiff.geoTransform[1], 0.0);
        EXPECT_NEAR(tiff.X(0, 0), ours[0][2], 1e-6);
        EXPECT_NEAR(tiff.X(tiff.width, 0), ours[1][2], 1e-6);
        EXPECT_NEAR(tiff.Y(0, tiff.height), ours[2][3], 1e-6);
        ASSERT_TRUE(source.read);
        const double in = p.gdalAtPixelCentres ? 0.5 : 0.0, w = source.width, h = source.height;
        EXPECT_NEAR(source.X(in, in), ours[0][2], 1e-6);
        EXPECT_NEAR(source.Y(in, in), ours[0][3], 1e-6);
        EXPECT_NEAR(source.X(w - in, in), ours[1][2] - p.gdalEastBehind, 1e-6);
        EXPECT_NEAR(source.Y(in, h - in), ours[2][3], 1e-6);
    }
}

// A frame's corners as its coverage section states them: longitudes past 180
// degrees written west of Greenwich.
RpfCorners CornersAt(double west, double north)
{
    const auto stated = [](double longitude) { return longitude > 180.0 ? longitude - 360.0 : longitude; };
    RpfCorners c;
    c.northWestLongitude = c.southWestLongitude = stated(west);
    c.northEastLongitude = c.southEastLongitude = stated(west + 0.5);
    c.northWestLatitude = c.northEastLatitude = north;
    c.southWestLatitude = c.southEastLatitude = north - 0.5;
    return c;
}

// Frames placed by their corners on one grid, each where its dump says, nodata
// around them and in masked subframes; frames of different palettes give RGB
// with an alpha band; frames on both sides of the 180 degree meridian and
// across it, one longitude range.
TEST(HostMosaic, FramesMeetOnOneGridAsTheirDumpsSay)
{
    constexpr uint32_t side = kRpfFrameSide;
    const std::set<uint32_t> masked = {0, 35};
    const struct {
        std::vector<std::tuple<std::string, uint32_t, uint32_t>> frames; // bytes, column, row
        uint32_t width, height;
        double west, north, east, south;
        std::vector<std::string> colours;
        size_t overviews; // halved down to 256 pixels a side
    } mosaics[] = {
        {{{FrameFile(CornersAt(-100.0, 40.0), RpfProduct::Cadrg, masked), 0, 0},
          {FrameFile(CornersAt(-99.5, 40.0), RpfProduct::Cadrg, masked), side, 0},
          {FrameFile(CornersAt(-100.0, 39.5), RpfProduct::Cadrg, masked), 0, side}},
         2 * side, 2 * side, -100.0, 40.0, -99.0, 39.0, kPalette, 4},
        {{{SmallFrameFile(CornersAt(-100.0, 40.0)), 0, 0}, {FrameFile(CornersAt(-99.5, 39.5), RpfProduct::Cib), side, side}},
         2 * side, 2 * side, -100.0, 40.0, -99.0, 39.0, {"Red", "Green", "Blue", "Alpha"}, 4},
        {{{SmallFrameFile(CornersAt(179.25, 40.0)), 0, 0}, {SmallFrameFile(CornersAt(179.75, 40.0)), side, 0},
          {SmallFrameFile(CornersAt(180.25, 40.0)), 2 * side, 0}},
         3 * side, side, 179.25, 40.0, 180.75, 39.5, kPalette, 5}};
    for (const auto& m : mosaics) {
        TempDirectory in, out;
        std::string expected(size_t(m.width) * m.height, char(kRpfMaskedPixel));
        for (const auto& [bytes, column, row] : m.frames) {
            const std::string path = in / (std::to_string(column) + "_" + std::to_string(row) + ".ntf");
            WriteFile(path, bytes);
            ASSERT_EQ(RunHost({"dump", path, out / "dump.raw"}).exitCode, 0);
            std::string pixels = ReadWholeFile(out / "dump.raw");
            pixels.resize(size_t(side) * side);
            for (uint32_t y = 0; y < side; ++y)
                std::memcpy(&expected[size_t(row + y) * m.width + column], &pixels[size_t(y) * side], side);
        }
        fs::remove(out / "dump.raw");
        const ProcessResult result = RunHost({"mosaic", "-o", out / "m.tif", in.path()});
        ASSERT_EQ(result.exitCode, 0) << result.err;
        const std::string summary = std::to_string(m.frames.size()) + " frames on " + std::to_string(m.width) + " x " +
            std::to_string(m.height) + " pixels";
        EXPECT_TRUE(Says(result, summary)) << result.err;
        const GdalReport gdal = ReadWithGdal(out / "m.tif");
        EXPECT_EQ(gdal.epsg, 4326);
        ASSERT_EQ(gdal.width, m.width);
        ASSERT_EQ(gdal.height, m.height);
        EXPECT_NEAR(gdal.X(0, 0), m.west, 1e-9);
        EXPECT_NEAR(gdal.Y(0, 0), m.north, 1e-9);
        EXPECT_NEAR(gdal.X(m.width, m.height), m.east, 1e-9);
        EXPECT_NEAR(gdal.Y(m.width, m.height), m.south, 1e-9);
        EXPECT_EQ(gdal.colourInterpretations, m.colours);
        EXPECT_EQ(gdal.overviews, m.overviews);
        EXPECT_TRUE(ValidCloudOptimised(out / "m.tif"));
        if (m.colours != kPalette)
            continue;
        EXPECT_TRUE(gdal.hasNodata && gdal.nodata == kRpfMaskedPixel);
        EXPECT_EQ(gdal.checksums, std::vector<uint32_t>{Checksum(expected, m.width, m.height)});
    }
}

// The corpus tables of contents listed and mosaicked as GDAL reads them:
// corners, frame counts and the mosaic's grid; the frame, named in another
// case, placed where its index record says (whatever its own corners) as its
// dump says, or reported missing and left as nodata.
TEST(HostToc, ListingAndMosaicGridAreGdals)
{
    VX_SKIP_WITHOUT_CORPUS();
    for (const std::string toc : {"rpf/gdal-handmade/A.TOC", "rpf/gdal-zone9/RPF/A.TOC"}) {
        const ProcessResult listed = RunHost({"toc", CorpusPath(toc)});
        const auto corners = NumbersIn(listed.out, "latitude (-?[\\d.]+)  longitude (-?[\\d.]+)");
        const auto frames = NumbersIn(listed.out, "(\\d+) x (\\d+) \\(rows x columns\\)");
        const GdalReport gdal = ReadWithGdal(CorpusPath(toc));
        ASSERT_TRUE(listed.exitCode == 0 && gdal.read && corners.size() == 2 && frames.size() == 1) << listed.out;
        EXPECT_EQ(gdal.width, frames[0][1] * kRpfFrameSide);
        EXPECT_EQ(gdal.height, frames[0][0] * kRpfFrameSide);
        EXPECT_NEAR(gdal.X(0, 0), corners[0][1], 1e-8);
        EXPECT_NEAR(gdal.Y(0, 0), corners[0][0], 1e-8);
        if (toc.find("zone9") != std::string::npos)
            continue; // polar: GDAL's pixels there are metres
        EXPECT_NEAR(gdal.X(gdal.width, gdal.height), corners[1][1], 1e-8);
        EXPECT_NEAR(gdal.Y(gdal.width, gdal.height), corners[1][0], 1e-8);
    }
    const std::string toc = CorpusPath("rpf/gdal-handmade/A.TOC");
    const GdalReport expected = ReadWithGdal(toc);
    for (const bool present : {true, false}) {
        TempDirectory in, out;
        fs::copy_file(toc, in / "A.TOC");
        std::string pixels;
        if (present) {
            WriteFile(in / "rpftoc01.on2", SmallFrameFile()); // named RPFTOC01.ON2
            ASSERT_EQ(RunHost({"dump", in / "rpftoc01.on2", out / "frame.raw"}).exitCode, 0);
            pixels = ReadWholeFile(out / "frame.raw");
        }
        const ProcessResult result = RunHost({"mosaic", "-o", out / "m.tif", "--toc", in / "A.TOC", "--product=1"});
        EXPECT_EQ(result.exitCode, present ? 0 : 1) << result.err;
        EXPECT_TRUE(Says(result, present ? "1 frames on 1536 x 1536 pixels, 0 missing" : "RPFTOC01.ON2 is missing"));
        const GdalReport gdal = ReadWithGdal(out / "m.tif");
        ASSERT_TRUE(gdal.width == expected.width && gdal.height == expected.height) << result.err;
        for (size_t i = 0; i < 6; ++i)
            EXPECT_NEAR(gdal.geoTransform[i], expected.geoTransform[i], 1e-12);
        if (present) {
            EXPECT_EQ(gdal.checksums, std::vector<uint32_t>{Checksum(pixels, kRpfFrameSide, kRpfFrameSide)});
        }
    }
}

} // namespace
