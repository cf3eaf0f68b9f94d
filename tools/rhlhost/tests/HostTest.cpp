// rhlhost driven as a user drives it, in a child process: what each command exits with, says and leaves; batches
// whose files vanish, the progress bar on a terminal and the memory of a thousand-frame batch; its GeoTIFF, PNG and
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

// An exit code, what was said and the child's peak resident set (VmHWM).
struct ProcessResult { int exitCode = -1; std::string out, err; long peakKilobytes = 0; };

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
    // The child's own peak is the VmHWM of its image, read while it runs: the kernel's account of a spawned child
    // counts the spawning process's peak too.
    int status = 0;
    while (spawned == 0 && waitpid(child, &status, WNOHANG) == 0) {
        std::ifstream proc("/proc/" + std::to_string(child) + "/status");
        for (std::string line; std::getline(proc, line);)
            if (line.rfind("VmHWM:", 0) == 0)
                result.peakKilobytes = std::max(result.peakKilobytes, std::stol(line.substr(6)));
        usleep(1000);
    }
    result.exitCode = spawned == 0 && WIFEXITED(status) ? WEXITSTATUS(status) : -1;
    result.out = ReadWholeFile(out.path()), result.err = ReadWholeFile(err.path());
    return result;
}

// The host's command line; an empty argument stands for none.
std::vector<std::string> HostArgv(std::vector<std::string> args)
{
    args.insert(args.begin(), {VX_HOST_PATH, "--handler", VX_HANDLER_PATH});
    args.erase(std::remove(args.begin(), args.end(), ""), args.end());
    return args;
}

ProcessResult RunHost(const std::vector<std::string>& args) { return RunProgram(HostArgv(args)); }

// GDAL's judge of a cloud-optimised GeoTIFF (Debian's python3-gdal), run by the system's Python that has GDAL.
bool ValidCloudOptimised(const std::string& tiff)
{
    const std::string validator = "/usr/lib/python3/dist-packages/osgeo_utils/samples/validate_cloud_optimized_geotiff.py";
    return RunProgram({"/usr/bin/python3", validator, "-q", tiff}).exitCode == 0;
}

// A batch render of every file below `in`, 64 x 64 pixels of each, on two workers.
std::vector<std::string> BatchArgv(const std::string& in, const std::string& out)
{ return HostArgv({"render", "--jobs", "2", "--window", "0,0,64,64", "-o", out, in}); }

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

// West, north, east and south edges of an image as GDAL places it; its corner pixels' centres at inset 0.5.
std::array<double, 4> Bounds(const GdalReport& g, double inset = 0)
{ return {g.X(inset, inset), g.Y(inset, inset), g.X(g.width - inset, inset), g.Y(inset, g.height - inset)}; }

// GDAL's checksum of each band of pixel-interleaved 8-bit pixels.
std::vector<uint32_t> Checksums(const std::string& pixels, uint32_t width, uint32_t height, size_t bands = 1)
{
    std::vector<uint32_t> sums;
    for (size_t band = 0; band < bands; ++band)
        sums.push_back(GdalChecksum(reinterpret_cast<const uint8_t*>(pixels.data()) + band, width, height, bands));
    return sums;
}

// Regular files below the directory, relative and sorted; files the host renames meanwhile are passed over.
std::vector<std::string> FilesBelow(const std::string& directory)
{
    std::vector<std::string> files;
    std::error_code error, typeError;
    for (fs::recursive_directory_iterator it(directory, error), end; !error && it != end; it.increment(error))
        if (it->is_regular_file(typeError))
            files.push_back(it->path().lexically_relative(directory).string());
    std::sort(files.begin(), files.end());
    return files;
}

// A frame of the pattern image `size` degrees a side from its north-west corner, longitudes past 180 degrees stated
// west of Greenwich: 'S'mall stores only its first subframe, 'M'asked lacks subframes 0 and 35, 'C'IB has them all.
std::string FrameFile(char kind = 'S', double west = -100, double north = 40, double size = 0.5)
{
    const auto stated = [](double longitude) { return longitude > 180.0 ? longitude - 360.0 : longitude; };
    RpfFramePlan plan;
    plan.product = kind == 'C' ? RpfProduct::Cib : RpfProduct::Cadrg;
    for (uint32_t subframe = 1; kind == 'S' && subframe < kRpfSubframeCount; ++subframe)
        plan.maskedSubframes.insert(subframe);
    if (kind == 'M')
        plan.maskedSubframes = {0, 35};
    RpfCorners& c = plan.corners;
    c.northWestLongitude = c.southWestLongitude = stated(west), c.northEastLongitude = c.southEastLongitude = stated(west + size);
    c.northWestLatitude = c.northEastLatitude = north, c.southWestLatitude = c.southEastLatitude = north - size;
    return BuildRpfFrame(plan).bytes;
}

// The first kRpfFrameSide rows of pixels `rhlhost dump` gives of a frame.
std::string DumpedFrame(const std::string& frame)
{
    TempFile raw(".raw");
    EXPECT_EQ(RunHost({"dump", frame, raw.path()}).exitCode, 0) << frame;
    std::string pixels = ReadWholeFile(raw.path());
    pixels.resize(size_t(kRpfFrameSide) * kRpfFrameSide);
    return pixels;
}

bool Says(const ProcessResult& r, const std::string& words) { return (r.out + r.err).find(words) != std::string::npos; }

struct Command {
    std::vector<std::string> args; // IN and OUT stand for the two folders
    int exitCode;
    std::vector<std::string> says, leaves = {}; // on standard output or error; files below OUT
    std::string tiff = "";  // what GDAL reads of OUT/o.tif: "EPSG code, west edge"
    // 't': run on a terminal: a progress bar; without one, none. 'l': started through a link in OUT that holds
    // another file of the handler's name, the host still loads the handler beside its own file.
    char run = 'p';
};

const Command kCommands[] = {
    {{"identify"}, 0, {R"("name": "VANTIRAX.rhl", "description": "CADRG, CIB and NITF Format Handler", )"
                       R"("extensions": ["ntf"])"}},
    {{"identify"}, 0, {R"("name": "VANTIRAX.rhl", "description")"}, {"VANTIRAX.rhl", "rhlhost"}, "", 'l'},
    {{"probe", "IN/frame.ntf", "IN/notes.txt", "IN/broken.ntf"}, 0, {"1 IN/frame.ntf\n0 IN/notes.txt\n1 IN/broken.ntf\n"}},
    {{"probe", "IN/frame.ntf", "IN/missing.ntf"}, 1, {"1 IN/frame.ntf\n0 IN/missing.ntf\n", "IN/missing.ntf: no such file"}},
    {{"--help"}, 0, {"usage: rhlhost [--handler PATH] COMMAND"}}, {{"frobnicate"}, 2, {"unknown command frobnicate"}},
    {{"info", "IN/frame.ntf", "--text"}, 0, {"1536 x 1536 pixels", "217 entries, the last 255, 255, 255", "EPSG:4326",
      "longitude -100.000000000  latitude 40.000000000", "longitude -99.500000000  latitude 39.500000000"}},
    {{"info", "IN/utm.ntf", "--text"}, 0, {"EPSG:32633 (WGS 84 / UTM zone 33N, metres)", "three bytes per pixel"}},
    {{"info", "IN/broken.ntf"}, 1, {R"({"result": 0, "status": 5)"}}, {{"render"}, 2, {"usage: rhlhost [--handler PATH] COMMAND"}},
    {{"render", "IN/frame.ntf", "OUT/frame.jpg"}, 2, {"render writes .tif, .tiff or .png files"}},
    {{"render", "IN/frame.ntf", "IN/frame.ntf/out.tif"}, 1, {"cannot write IN/frame.ntf/out.tif"}},
    {{"render", "IN/missing.ntf", "OUT/out.tif"}, 1, {"IN/missing.ntf: "}},
    {{"render", "IN/rows_fail.ntf", "OUT/out.png"}, 3, {"32 rows could not be decoded (written as zeros)"}, {"out.png"}},
    // Corners in zone 00: written without a coordinate system (ICORDS N) or without georeference (E).
    {{"render", "IN/nocrs.ntf", "OUT/o.tif"}, 0, {"written without a coordinate system"}, {"o.tif"}, "0, 500000.000000"},
    {{"render", "IN/flat.ntf", "OUT/o.tif"}, 0,
     {"written without georeference: the georeference's corners span no area"}, {"o.tif"}, "0, 0.000000"},
    {{"info", "IN/nocrs.ntf", "--text"}, 0, {"georef      no coordinate system (EPSG code 0)", "x 500000.000  y 4000000.000"}},
    {{"info", "IN/flat.ntf", "--text"}, 0, {"georef      no coordinate system (EPSG code 0)", "span no area"}},
    {{"render", "-o", "IN/frame.ntf/out", "IN"}, 1, {"cannot create IN/frame.ntf/out"}},
    {{"render", "--format", "png", "-o", "OUT", "IN/gone.ntf", "IN/utm.ntf"}, 1,
     {"IN/gone.ntf: the file no longer exists", "2 files: 1 rendered"}, {"utm.ntf.png"}},
    {{"render", "--jobs", "2", "-v", "-o", "OUT", "IN"}, 1,
     {"IN/broken.ntf: the handler could not open it (result 0, status 5): not a file this handler reads; nitfinfo",
      "IN/notes.txt: not a file this handler reads (left out)",
      "IN/rows_fail.ntf: 32 rows could not be decoded (written as zeros)",
      "310 files: 7 rendered (1 with 32 undecodable rows), 303 refused (302 not recognised, 1 not opened, 0 vanished), "
      "0 failed to write"},
     {"flat.ntf.tif", "frame.ntf.tif", "nocrs.ntf.tif", "rotated.ntf.tif", "rows_fail.ntf.tif", "utm.ntf.tif",
      "z_coarse.ntf.tif"}},
    {{"render", "--jobs", "2", "-o", "OUT", "IN/frame.ntf", "IN/./frame.ntf", "IN/frame.ntf-2"}, 1,
     {"IN/./frame.ntf: written as frame.ntf-3.tif, frame.ntf.tif being another input's", "3 files: 2 rendered",
      "IN/frame.ntf-2: the handler does not recognise it", "] 3/3 files ", " files/s ", " left"},
     {"frame.ntf-3.tif", "frame.ntf.tif"}, "", 't'},
    {{"dump", "IN/frame.ntf", "OUT/frame.raw", "--window=0,0,10,20"}, 0, {}, {"frame.raw"}},
    {{"info", "IN/frame.ntf", "--text", "--text"}, 2, {"--text is given twice"}},
    {{"info", "IN/frame.ntf", "--jobs", "2"}, 2, {"--jobs does not apply to info"}},
    {{"render", "IN/frame.ntf", "OUT/frame.tif", "--format", "png"}, 2, {"--format does not apply to render without -o"}},
    {{"render", "IN/frame.ntf", "OUT/frame.tif", "--world-file"}, 2, {"--world-file goes with PNG output"}},
    {{"mosaic", "-o", "OUT/m.png", "IN"}, 2, {"mosaic writes .tif or .tiff files"}},
    {{"render", "-o", "OUT", "IN/notes.txt"}, 1,
     {"IN/notes.txt: the handler does not recognise it (nitfinfo says why)", "1 files: 0 rendered"}},
    {{"mosaic", "-o", "OUT/m.tif", "IN/utm.ntf"}, 1, {"no frame to place in the mosaic"}},
    {{"--version"}, 0, {"\nhandler VANTIRAX.rhl version 3, CADRG, CIB and NITF Format Handler"}},
    {{"dump", "IN/frame.ntf", "OUT/frame.tif"}, 2, {"dump writes .raw files"}},
    {{"info", "IN/missing.ntf"}, 1, {"IN/missing.ntf: no such file"}},
    {{"toc", "IN/frame.ntf"}, 1, {"IN/frame.ntf: no component 148 in the location section"}},
    {{"mosaic", "-o", "OUT/m.tif", "--product", "1", "IN"}, 2, {"--product does not apply to mosaic without --toc"}},
    {{"mosaic", "-o", "OUT/m.tif", "--toc", "IN/A.TOC", "--product", "1"}, 1, {"IN/A.TOC: no such file"}},
    {{"mosaic", "-o", "OUT/m.tif", "IN"}, 1,
     {"IN/utm.ntf: EPSG:32633 (WGS 84 / UTM zone 33N, metres): a mosaic takes EPSG:4326 frames only",
      "IN/rotated.ntf: the frame is not north up", "IN/rows_fail.ntf: the frame has no georeference",
      "IN/z_coarse.ntf: its pixel size differs from the first frame's", "IN/broken.ntf: the handler could not open",
      "OUT/m.tif: 1 frames on 1536 x 1536 pixels, 7 refused, 302 not recognised"}, {"m.tif"}},
};

// Commands on one folder of files of every fate.
TEST(HostCommands, ExitSayAndLeave)
{
    TempDirectory in;
    WriteFile(in / "frame.ntf", FrameFile());
    WriteFile(in / "z_coarse.ntf", FrameFile('S', -100, 40, 1.0)); // twice the pixel size
    for (const auto& [file, sample] : {std::pair{"utm", "rgb_row_utm"}, {"rotated", "rgb_pixel_decimal"},
                                       {"rows_fail", "jpeg_streams_larger_than_blocks"},
                                       {"broken", "rpf_sections_missing"}})
        WriteFile(in / file + ".ntf", SampleBytes(sample));
    std::string utm = SampleBytes("rgb_row_utm");
    WriteFile(in / "frame.ntf-2", utm.substr(0, 5000)), WriteFile(in / "notes.txt", "not an image"); // the first cut short
    const size_t igeolo = utm.find("335000004000000"); // IGEOLO's four corners put in zone 00
    for (size_t corner = 0; corner < 60; corner += 15)
        utm.replace(igeolo + corner, 2, "00");
    WriteFile(in / "nocrs.ntf", utm.replace(igeolo - 1, 1, "N"));
    WriteFile(in / "flat.ntf", utm.replace(igeolo - 1, 1, "E"));
    fs::create_directories(in / "junk");
    for (int i = 0; i < 300; ++i)
        WriteFile(in / "junk/" + std::to_string(i) + ".txt", std::string(size_t(i), char('a' + i % 26)));
    for (const Command& command : kCommands) {
        TempDirectory out;
        // IN and OUT in an argument or a message made the folders' paths.
        const auto placed = [&](const std::string& text) {
            return std::regex_replace(std::regex_replace(text, std::regex("\\bIN\\b"), in.path()), std::regex("\\bOUT\\b"), out.path());
        };
        if (command.run == 'l')
            fs::create_symlink(VX_HOST_PATH, out / "rhlhost"), WriteFile(out / "VANTIRAX.rhl", "not a handler");
        std::vector<std::string> argv = command.run == 'l' ? std::vector<std::string>{out / "rhlhost"} : HostArgv({});
        std::transform(command.args.begin(), command.args.end(), std::back_inserter(argv), placed);
        std::string line; // for script(1), which gives the host a terminal and copies what it shows to stdout
        for (const std::string& arg : argv)
            line += arg + " ";
        SCOPED_TRACE(line);
        const ProcessResult result = RunProgram(command.run == 't' ? std::vector<std::string>{"script", "-qec", line, "/dev/null"} : argv);
        EXPECT_EQ(result.exitCode, command.exitCode) << result.err;
        for (const std::string& words : command.says)
            EXPECT_TRUE(Says(result, placed(words))) << "not said: " << words << "\n" << result.out << result.err;
        EXPECT_EQ(result.err.find('\r'), std::string::npos) << "a progress bar without a terminal";
        EXPECT_EQ(FilesBelow(out.path()), command.leaves);
        const GdalReport gdal = command.tiff.empty() ? GdalReport{} : ReadWithGdal(out / "o.tif");
        EXPECT_TRUE(command.tiff.empty() || std::to_string(gdal.epsg) + ", " + std::to_string(gdal.geoTransform[0]) ==
                    command.tiff) << gdal.epsg << ", " << gdal.geoTransform[0];
    }
}

// The peak memory of a host command that succeeds; under AddressSanitizer freed memory is reused at once instead of
// quarantined.
long PeakKilobytes(std::vector<std::string> argv)
{
    const char* options = std::getenv("ASAN_OPTIONS");
    argv.insert(argv.begin(), {"env", std::string("ASAN_OPTIONS=") + (options ? options : "") + ":quarantine_size_mb=0"});
    const ProcessResult result = RunProgram(argv);
    EXPECT_EQ(result.exitCode, 0) << result.err;
    return result.peakKilobytes;
}

// Peak memory stays flat: each frame of a batch opens its own handle and releases it (1,000 frames on two workers
// against 100), and rows pass through a render or a dump as they arrive (an image 16 times as tall, 64 MiB). Files
// vanishing during a batch of the thousand never stop it.
TEST(HostBatch, MemoryFlatOverAThousandFramesAndA64MebibyteImageAndFilesVanishing)
{
    TempDirectory directory;
    const std::string frame = FrameFile();
    long peak[3][2] = {}; // batch, render, dump; small, then large
    for (int large = 0; large < 2; ++large) {
        const int frames = large ? 1000 : 100;
        const std::string in = directory / std::to_string(frames), out = in + "out";
        fs::create_directories(in);
        for (int i = 0; i < frames; ++i)
            WriteFile(in + "/frame" + std::to_string(i) + ".ntf", frame);
        peak[0][large] = PeakKilobytes(BatchArgv(in, out));
        EXPECT_EQ(FilesBelow(out).size(), size_t(frames));
        NitfImagePlan plan;
        plan.rows = large ? 8192 : 512, plan.columns = 8192, plan.NPPBV = 64, plan.NBPC = plan.rows / 64;
        const auto value = [](int32_t, int32_t row, int32_t column) { return uint64_t(row * 7 ^ column) % 251; };
        WriteFile(directory / "in.ntf", BuildImageFile(plan, JoinBlocks(BuildImageBlocks(plan, value))));
        peak[1][large] = PeakKilobytes(HostArgv({"render", directory / "in.ntf", directory / "out.tif"}));
        peak[2][large] = PeakKilobytes(HostArgv({"dump", directory / "in.ntf", directory / "out.raw"}));
    }
    // 8 MiB is far less than one frame's decoding tables per file; 16 MiB a few strips of rows.
    const long flatKilobytes[] = {8 * 1024, 16 * 1024, 16 * 1024};
    for (int i = 0; i < 3; ++i)
        EXPECT_LT(peak[i][1] - peak[i][0], flatKilobytes[i])
            << "batch, render, dump: " << i << ": " << peak[i][0] << " kB, then " << peak[i][1];
    const std::string in = directory / "1000", out = directory / "vanish";
    ProcessResult result;
    std::atomic<bool> done{false};
    std::thread batch([&] { result = RunProgram(BatchArgv(in, out)); done = true; });
    // The walk is over once the first output appears; then every other file goes.
    while (FilesBelow(out).empty() && !done)
        std::this_thread::yield();
    for (int i = 999; i >= 0; i -= 2)
        fs::remove(in + "/frame" + std::to_string(i) + ".ntf");
    batch.join();
    const std::vector<std::string> rendered = FilesBelow(out);
    EXPECT_TRUE(rendered.size() >= 500 && result.exitCode <= 1) << result.err;
    EXPECT_TRUE(Says(result, "1000 files: " + std::to_string(rendered.size()) + " rendered") &&
                Says(result, std::to_string(1000 - rendered.size()) + " vanished")) << result.err;
    for (const std::string& file : rendered)
        EXPECT_EQ(file.find(".part-"), std::string::npos) << "a partial output under a final name: " << file;
}

struct Rendering {
    std::string source; // a sample's name, a corpus path or "across180": a small frame from 179.75E to 179.75W
    const char* window; // X0,Y0,X1,Y1 or empty
    std::vector<std::string> colours;
    bool nodata; // the masked value 216 is the TIFF's nodata value
    size_t overviews = 0; const char* tiffOption = "";
    // GDAL reads the source's corners at the corner pixels' centres (IGEOLO: 0.5) or the outer edges (RPF coverage:
    // 0), its east corners this far west of ours; the edges `rhlhost info` gives when listed.
    double gdalInset = 0, gdalEastBehind = 0;
    std::vector<double> edges = {}; // west, north, east, south
};

void PrintTo(const Rendering& r, std::ostream* out) { *out << r.source << " " << r.window; }

class HostRender : public testing::TestWithParam<Rendering> { };

// A GeoTIFF has the coordinate system and corners that `rhlhost info` reports (the control points' world positions
// are the outer corners, so GDAL's corners equal them), the pixels `rhlhost dump` delivers and the palette, in 256 x
// 256 tiles laid out as GDAL's validator wants, overviews when large; a PNG shows the palette's colours and its world
// file places it as the GeoTIFF. GDAL places the source itself at those corners too, across the 180 degree meridian
// and of geocentric latitudes.
TEST_P(HostRender, GdalReadsWhatInfoAndDumpSay)
{
    const Rendering& r = GetParam();
    const bool real = r.source.find('/') != std::string::npos;
    if (real)
        VX_SKIP_WITHOUT_CORPUS();
    TempDirectory directory;
    const std::string input = real ? CorpusPath(r.source) : directory / "in.ntf", tiff = directory / "out.tif",
                      png = directory / "out.png";
    if (!real)
        WriteFile(input, r.source == "across180" ? FrameFile('S', 179.75, 40) : SampleBytes(r.source));
    const std::string window = *r.window ? std::string("--window=") + r.window : "";
    for (const std::vector<std::string>& args : {std::vector<std::string>{"render", input, tiff, window, r.tiffOption},
                                                 {"render", input, png, window, "--world-file"},
                                                 {"dump", input, directory / "dump.raw", window}})
        ASSERT_EQ(RunHost(args).exitCode, 0) << args[2];
    const HostInfo info = ReadHostInfo(input);
    const GdalReport gdal = ReadWithGdal(tiff), shown = ReadWithGdal(png);
    int32_t x0 = 0, y0 = 0, x1 = int32_t(info.width), y1 = int32_t(info.height);
    std::sscanf(r.window, "%d,%d,%d,%d", &x0, &y0, &x1, &y1);
    const uint32_t w = uint32_t(x1 - x0), h = uint32_t(y1 - y0);
    ASSERT_TRUE(gdal.width == w && gdal.height == h) << gdal.width << " x " << gdal.height;
    EXPECT_TRUE(gdal.block == (std::array<uint32_t, 2>{256, 256}) && gdal.overviews == r.overviews) << gdal.overviews;
    EXPECT_TRUE(ValidCloudOptimised(tiff));
    for (size_t i = 0; i < 6; ++i)
        EXPECT_NEAR(shown.geoTransform[i], gdal.geoTransform[i], 1e-9 * (1 + std::fabs(gdal.geoTransform[i])));
    EXPECT_EQ(gdal.colourInterpretations, r.colours);
    // The dump's bytes, grey palettes mapped to their greys, sum as GDAL sums the TIFF's bands; the PNG shows
    // palettes as their colours, masked pixels transparent black.
    const bool paletted = r.colours[0] == "Palette";
    std::string dump = ReadWholeFile(directory / "dump.raw"), expanded;
    for (char& value : dump) {
        if (r.colours[0] == "Gray" && !info.palette.empty())
            value = char(info.palette.at(uint8_t(value))[0]);
        const bool masked = r.nodata && uint8_t(value) == kRpfMaskedPixel;
        for (size_t c = 0; paletted && c < 3u + r.nodata; ++c)
            expanded += masked ? '\0' : c == 3 ? '\xff' : char(info.palette.at(uint8_t(value))[c]);
    }
    EXPECT_EQ(gdal.checksums, Checksums(dump, w, h, r.colours.size()));
    EXPECT_EQ(shown.checksums, paletted ? Checksums(expanded, w, h, 3u + r.nodata) : gdal.checksums);
    EXPECT_TRUE(gdal.hasNodata == r.nodata && (!r.nodata || gdal.nodata == kRpfMaskedPixel)) << gdal.nodata;
    for (size_t i = 0; paletted && i < info.palette.size(); ++i)
        EXPECT_EQ(gdal.colourTable.at(i), info.palette[i]) << "entry " << i;
    ASSERT_TRUE(gdal.epsg == info.epsg && info.points.size() == (info.epsg ? 3u : 0u)) << gdal.epsg << ", " << info.epsg;
    if (info.epsg == 0)
        return;
    const auto& p = info.points;
    for (const auto& [a, b] : {std::pair{0u, 0u}, {w, 0u}, {0u, h}, {w, h}})
        for (int axis = 2; axis < 4; ++axis) // the host's corner from its control points
            EXPECT_NEAR(axis == 2 ? gdal.X(a, b) : gdal.Y(a, b), p[0][axis] + (x0 + a) * (p[1][axis] - p[0][axis]) /
                        info.width + (y0 + b) * (p[2][axis] - p[0][axis]) / info.height,
                        1e-4 * std::fabs(gdal.geoTransform[1])) << "corner " << a << ", " << b;
    const std::array<double, 4> ours = {p[0][2], p[0][3], p[1][2], p[2][3]}, source = Bounds(ReadWithGdal(input), r.gdalInset);
    for (size_t i = 0; i < 4; ++i) {
        EXPECT_NEAR(source[i], ours[i] - (i == 2 ? r.gdalEastBehind : 0), 1e-6) << "edge " << i;
        EXPECT_TRUE(r.edges.empty() || std::fabs(ours[i] - r.edges[i]) < 1e-5) << "edge " << i << ": " << ours[i];
    }
}

const std::vector<std::string> kPalette = {"Palette"}, kGray = {"Gray"}, kRgb = {"Red", "Green", "Blue"};

const Rendering kRenderings[] = {
    {"cadrg_big_endian", "", kPalette, true, 3}, {"cadrg_big_endian", "100,200,400,300", kPalette, true},
    {"cib", "", kPalette, true, 0, "--no-overviews"}, {"lookup_table", "", kPalette, false},
    {"rgb_row_utm", "", kRgb, false, 0, "", 0.5}, {"rgb_pixel_decimal", "33,5,80,69", kRgb, false, 0, "", 0.5},
    {"compressed_bilevel_2d", "", kGray, false},
    // GDAL leaves the fixture frame's east corners at -179.75, mirrored.
    {"across180", "", kPalette, true, 3, "", 0, 360, {179.75, 40, 180.25, 39.5}},
    // A CADRG frame from 173.1E to 170.7W.
    {"jitc-nitf20/U_3058B.NTF", "", kPalette, true, 3, "", 0, 0, {173.0769231, 62.3076923, 189.32643, 51.9230769}},
    // 160E to 160W: GDAL 3.6 leaves the east corners at -160, mirrored.
    {"jitc-nitf21/i_3004g.ntf", "", kGray, false, 0, "", 0.5, 360, {160, 20, 200, -20}},
    // ICORDS "C": 32d59'00" and 32d14'57" geocentric.
    {"jitc-nitf20/U_1001A.NTF", "", kGray, false, 0, "", 0.5, 0, {85, 33.15932, 85.9675, 32.4230942}}};
INSTANTIATE_TEST_SUITE_P(Samples, HostRender, testing::ValuesIn(kRenderings));

// Frames placed by their corners on one grid, each where its dump says, nodata around them and in masked subframes;
// frames of different palettes give RGB with an alpha band; frames on both sides of the 180 degree meridian and
// across it, one longitude range.
TEST(HostMosaic, FramesMeetOnOneGridAsTheirDumpsSay)
{
    constexpr uint32_t side = kRpfFrameSide;
    const struct {
        std::vector<std::tuple<char, double, double>> frames; // FrameFile's kind, west, north
        std::array<double, 4> bounds;                          // west, north, east, south
        std::vector<std::string> colours; size_t overviews;    // halved down to 256 pixels a side
    } mosaics[] = {{{{'M', -100, 40}, {'M', -99.5, 40}, {'M', -100, 39.5}}, {-100, 40, -99, 39}, kPalette, 4},
                   {{{'S', -100, 40}, {'C', -99.5, 39.5}}, {-100, 40, -99, 39}, {"Red", "Green", "Blue", "Alpha"}, 4},
                   {{{'S', 179.25, 40}, {'S', 179.75, 40}, {'S', 180.25, 40}}, {179.25, 40, 180.75, 39.5}, kPalette, 5}};
    for (const auto& m : mosaics) {
        TempDirectory in, out;
        const auto pixels = [&](double degrees) { return uint32_t(std::lround(degrees * 2)) * side; };
        const uint32_t width = pixels(m.bounds[2] - m.bounds[0]), height = pixels(m.bounds[1] - m.bounds[3]);
        std::string expected(size_t(width) * height, char(kRpfMaskedPixel));
        for (const auto& [kind, west, north] : m.frames) {
            const std::string path = in / (std::to_string(west) + "_" + std::to_string(north) + ".ntf");
            WriteFile(path, FrameFile(kind, west, north));
            const std::string frame = DumpedFrame(path);
            const uint32_t column = pixels(west - m.bounds[0]), row = pixels(m.bounds[1] - north);
            for (uint32_t y = 0; y < side; ++y)
                std::memcpy(&expected[size_t(row + y) * width + column], &frame[size_t(y) * side], side);
        }
        const ProcessResult result = RunHost({"mosaic", "-o", out / "m.tif", in.path()});
        ASSERT_TRUE(result.exitCode == 0 && Says(result, std::to_string(m.frames.size()) + " frames on " +
                                                 std::to_string(width) + " x " + std::to_string(height) + " pixels")) << result.err;
        const GdalReport gdal = ReadWithGdal(out / "m.tif");
        ASSERT_TRUE(gdal.epsg == 4326 && gdal.width == width && gdal.height == height) << gdal.width;
        for (size_t i = 0; i < 4; ++i)
            EXPECT_NEAR(Bounds(gdal)[i], m.bounds[i], 1e-9) << "edge " << i;
        EXPECT_TRUE(gdal.colourInterpretations == m.colours && gdal.overviews == m.overviews) << gdal.overviews;
        EXPECT_TRUE(ValidCloudOptimised(out / "m.tif"));
        EXPECT_TRUE(m.colours != kPalette || (gdal.hasNodata && gdal.nodata == kRpfMaskedPixel &&
                                              gdal.checksums == Checksums(expected, width, height)));
    }
}

// The corpus tables of contents listed and mosaicked as GDAL reads them: corners, frame counts and the mosaic's grid;
// the frame, named in another case, placed where its index record says (whatever its own corners) as its dump says,
// or reported missing and left as nodata.
TEST(HostToc, ListingAndMosaicGridAreGdals)
{
    VX_SKIP_WITHOUT_CORPUS();
    for (const std::string name : {"rpf/gdal-zone9/RPF/A.TOC", "rpf/gdal-handmade/A.TOC"}) {
        const std::string toc = CorpusPath(name);
        const bool polar = name.find("zone9") != std::string::npos; // GDAL's pixels there are metres
        const ProcessResult listed = RunHost({"toc", toc});
        const auto corners = NumbersIn(listed.out, "latitude (-?[\\d.]+)  longitude (-?[\\d.]+)");
        const auto frames = NumbersIn(listed.out, "(\\d+) x (\\d+) \\(rows x columns\\)");
        const GdalReport expected = ReadWithGdal(toc);
        ASSERT_TRUE(listed.exitCode == 0 && expected.read && corners.size() == 2 && frames.size() == 1) << listed.out;
        EXPECT_TRUE(expected.width == frames[0][1] * kRpfFrameSide && expected.height == frames[0][0] * kRpfFrameSide)
            << expected.width << " x " << expected.height << ": " << listed.out;
        const std::array<double, 4> ours = {corners[0][1], corners[0][0], corners[1][1], corners[1][0]};
        for (size_t i = 0; i < (polar ? 2 : 4); ++i)
            EXPECT_NEAR(Bounds(expected)[i], ours[i], 1e-8) << "edge " << i;
        for (int present = 0; !polar && present < 2; ++present) {
            TempDirectory in, out;
            fs::copy_file(toc, in / "A.TOC");
            if (present)
                WriteFile(in / "rpftoc01.on2", FrameFile()); // named RPFTOC01.ON2
            const ProcessResult result = RunHost({"mosaic", "-o", out / "m.tif", "--toc", in / "A.TOC", "--product=1"});
            EXPECT_TRUE(result.exitCode == !present &&
                        Says(result, present ? "1 frames on 1536 x 1536 pixels, 0 missing" : "RPFTOC01.ON2 is missing")) << result.err;
            const GdalReport gdal = ReadWithGdal(out / "m.tif");
            ASSERT_TRUE(gdal.width == expected.width && gdal.height == expected.height) << result.err;
            for (size_t i = 0; i < 6; ++i)
                EXPECT_NEAR(gdal.geoTransform[i], expected.geoTransform[i], 1e-12);
            EXPECT_TRUE(!present || gdal.checksums == Checksums(DumpedFrame(in / "rpftoc01.on2"), kRpfFrameSide, kRpfFrameSide));
        }
    }
}

} // namespace
