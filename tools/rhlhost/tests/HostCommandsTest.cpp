// rhlhost's commands on one folder of files of every fate: what each exits
// with, says (no progress bar without a terminal) and leaves in its output
// folder; then batches whose files vanish, the progress bar on a terminal,
// and the memory of a thousand-frame batch.
#include "Host.h"
#include "tests/SampleFiles.h"
#include "tests/fixtures/NitfFileWriter.h"
#include "tests/fixtures/TempFiles.h"

#include <gtest/gtest.h>

#include <atomic>
#include <filesystem>
#include <regex>
#include <thread>

namespace {

namespace fs = std::filesystem;

struct Command {
    std::vector<std::string> args; // IN/ and OUT/ stand for the two folders
    int exitCode;
    std::vector<std::string> says; // on standard output or error
    std::vector<std::string> leaves; // files below OUT
};

const Command kCommands[] = {
    {{"identify"}, 0, {R"("name": "VANTIRAX.rhl", "description": "CADRG, CIB and NITF Format Handler", )"
                       R"("extensions": ["ntf"])"}, {}},
    {{"probe", "IN/frame.ntf", "IN/notes.txt", "IN/broken.ntf"}, 0,
     {"1 IN/frame.ntf\n0 IN/notes.txt\n1 IN/broken.ntf\n"}, {}},
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
     {"IN/broken.ntf: the handler could not open it (result 0, status 5)",
      "IN/rows_fail.ntf: 32 rows could not be decoded (written as zeros)",
      "308 files: 5 rendered (1 with 32 undecodable rows), 303 refused (302 not recognised, 1 not opened, 0 vanished), "
      "0 failed to write"},
     {"frame.ntf.tif", "rotated.ntf.tif", "rows_fail.ntf.tif", "utm.ntf.tif", "z_coarse.ntf.tif"}},
    {{"dump", "IN/frame.ntf", "OUT/frame.raw", "--window", "0,0,10,20"}, 0, {}, {"frame.raw"}},
    {{"mosaic", "-o", "OUT/m.tif", "IN/utm.ntf"}, 1, {"no frame to place in the mosaic"}, {}},
    {{"mosaic", "-o", "OUT/m.tif", "IN"}, 1,
     {"IN/utm.ntf: EPSG:32633 (WGS 84 / UTM zone 33N, metres): a mosaic takes EPSG:4326 frames only",
      "IN/rotated.ntf: the frame is not north up", "IN/rows_fail.ntf: the frame has no georeference",
      "IN/z_coarse.ntf: its pixel size differs from the first frame's", "IN/broken.ntf: the handler could not open",
      "OUT/m.tif: 1 frames on 1536 x 1536 pixels, 5 refused, 302 not recognised"}, {"m.tif"}},
};

// IN/ and OUT/ at the start of an argument, or anywhere in a message, made the folders' paths.
std::string Placed(const std::string& text, const std::string& in, const std::string& out)
{
    return std::regex_replace(std::regex_replace(text, std::regex("\\bIN\\b"), in), std::regex("\\bOUT\\b"), out);
}

TEST(HostCommands, ExitSayAndLeave)
{
    TempDirectory in;
    RpfCorners coarse; // a frame of twice the pixel size
    coarse.southWestLatitude = coarse.southEastLatitude = 39.0;
    coarse.northEastLongitude = coarse.southEastLongitude = -99.0;
    WriteFile(in / "frame.ntf", SmallFrameFile());
    WriteFile(in / "z_coarse.ntf", SmallFrameFile(coarse));
    WriteFile(in / "utm.ntf", SampleBytes("rgb_row_utm"));
    WriteFile(in / "rotated.ntf", SampleBytes("rgb_pixel_decimal"));
    WriteFile(in / "rows_fail.ntf", SampleBytes("jpeg_streams_larger_than_blocks"));
    WriteFile(in / "broken.ntf", SampleBytes("rpf_sections_missing"));
    WriteFile(in / "cut.ntf", SampleBytes("rgb_row_utm").substr(0, 5000));
    WriteFile(in / "notes.txt", "not an image");
    fs::create_directories(in / "junk");
    for (int i = 0; i < 300; ++i)
        WriteFile(in / "junk/" + std::to_string(i) + ".txt", std::string(size_t(i), char('a' + i % 26)));

    for (const Command& command : kCommands) {
        TempDirectory out;
        std::vector<std::string> args;
        for (const std::string& arg : command.args)
            args.push_back(Placed(arg, in.path(), out.path()));
        SCOPED_TRACE(command.args[0] + " " + (args.size() > 1 ? args[1] : ""));
        const ProcessResult result = RunHost(args);
        EXPECT_EQ(result.exitCode, command.exitCode) << result.err;
        for (const std::string& words : command.says)
            EXPECT_NE((result.out + result.err).find(Placed(words, in.path(), out.path())), std::string::npos)
                << "not said: " << words << "\n" << result.out << result.err;
        EXPECT_EQ(result.err.find('\r'), std::string::npos) << "a progress bar without a terminal";
        EXPECT_EQ(FilesBelow(out.path()), command.leaves);
    }
}

void WriteFrames(const std::string& directory, int count)
{
    const std::string frame = SmallFrameFile();
    fs::create_directories(directory);
    for (int i = 0; i < count; ++i)
        WriteFile(directory + "/frame" + std::to_string(i) + ".ntf", frame);
}

TEST(HostBatch, FilesVanishingDuringTheBatchNeverStopIt)
{
    constexpr int kFrames = 200;
    TempDirectory in, out;
    WriteFrames(in.path(), kFrames);
    ProcessResult result;
    std::atomic<bool> done{false};
    std::thread batch([&] {
        result = RunHost({"render", "--jobs", "2", "--window", "0,0,64,64", "-o", out.path(), in.path()});
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
    const std::string summary = std::to_string(kFrames) + " files: " + std::to_string(rendered.size()) + " rendered";
    EXPECT_NE(result.err.find(summary), std::string::npos) << result.err;
    EXPECT_NE(result.err.find(std::to_string(kFrames - rendered.size()) + " vanished"), std::string::npos);
    for (const std::string& file : rendered)
        EXPECT_EQ(file.find(".part-"), std::string::npos) << "a partial output under a final name: " << file;
}

TEST(HostBatch, ProgressBarOnATerminal)
{
    TempDirectory in, out;
    WriteFrames(in.path(), 5);
    const std::string command = std::string(VX_HOST_PATH) + " --handler " + VX_HANDLER_PATH +
        " render --jobs 2 --window 0,0,64,64 -o " + out.path() + " " + in.path();
    // script(1) gives the host a terminal and copies what it shows to stdout.
    const std::string shown = RunProgram({"script", "-qec", command, "/dev/null"}).out;
    for (const char* part : {"] 5/5 files ", " files/s ", " left", "5 files: 5 rendered"})
        EXPECT_NE(shown.find(part), std::string::npos) << shown;
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
        const ProcessResult batch = RunProgram({"env", asan, VX_HOST_PATH, "--handler", VX_HANDLER_PATH, "render",
                                                "--jobs", "2", "--window", "0,0,64,64", "-o", out / name, in / name});
        ASSERT_EQ(batch.exitCode, 0) << batch.err;
        EXPECT_EQ(FilesBelow(out / name).size(), size_t(count));
        peak[count == 1000] = batch.peakKilobytes;
    }
    EXPECT_LT(peak[1] - peak[0], kFlatKilobytes) << "100 frames: " << peak[0] << " kB, 1000 frames: " << peak[1];
}

} // namespace
