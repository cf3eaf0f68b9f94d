// rhlhost render --jobs N -o OUTDIR: directories walked, every recognised file
// rendered on worker threads, everything else reported and passed over; no
// partial output ever carries a final name.
#include "HostProcess.h"
#include "HostSamples.h"
#include "tests/fixtures/NitfFileWriter.h"
#include "tests/fixtures/TempFiles.h"

#include <gtest/gtest.h>

#include <atomic>
#include <cstdlib>
#include <filesystem>
#include <thread>

namespace {

namespace fs = std::filesystem;

constexpr int kJunkFiles = 300;
constexpr int kBulkFrames = 1000;
constexpr int kFewFrames = 100;
// Growth of the host's peak memory from 100 to 1,000 frames that still
// counts as flat: far less than one frame's decoding tables per file.
constexpr long kFlatMemoryKilobytes = 8 * 1024;

std::vector<std::string> FilesBelow(const std::string& directory)
{
    // The host may be renaming files meanwhile: errors skip, never throw.
    std::vector<std::string> files;
    std::error_code error;
    for (fs::recursive_directory_iterator it(directory, error), end; !error && it != end; it.increment(error)) {
        std::error_code typeError;
        if (it->is_regular_file(typeError))
            files.push_back(fs::relative(it->path(), directory).string());
    }
    std::sort(files.begin(), files.end());
    return files;
}

bool NoTemporaryFiles(const std::string& directory)
{
    for (const std::string& file : FilesBelow(directory))
        if (file.find(".part-") != std::string::npos)
            return false;
    return true;
}

void WriteFrames(const std::string& directory, int count, const std::string& bytes)
{
    fs::create_directories(directory);
    for (int i = 0; i < count; ++i)
        WriteFile(directory + "/frame" + std::to_string(i) + ".ntf", bytes);
}

TEST(HostBatch, DirectoryOfMostlyOtherFilesRendersTheRecognisedOnes)
{
    TempDirectory in, out;
    for (int i = 0; i < kJunkFiles; ++i)
        WriteFile(in / ("junk" + std::to_string(i) + ".txt"), std::string(size_t(i), char('a' + i % 26)));
    fs::create_directories(in / "deeper/still");
    WriteFile(in / "deeper/still/frame.ntf", SmallFrameFile());
    WriteFile(in / "utm.ntf", UtmRgbImage());
    WriteFile(in / "broken.ntf", BrokenFrame());

    ProcessResult result = RunHost({"render", "--jobs", "2", "-o", out.path(), in.path()});
    EXPECT_EQ(result.exitCode, 1) << "one recognised file could not be opened";
    EXPECT_NE(result.err.find("broken.ntf: the handler could not open it"), std::string::npos) << result.err;
    EXPECT_NE(result.err.find("303 files: 2 rendered (0 with 0 undecodable rows), 301 refused (300 not "
                              "recognised, 1 not opened, 0 vanished), 0 failed to write"),
              std::string::npos)
        << result.err;
    EXPECT_EQ(FilesBelow(out.path()), (std::vector<std::string>{"deeper/still/frame.ntf.tif", "utm.ntf.tif"}));
}

// A file cut in half is not taken for this format; a frame whose sections are
// missing fails at open. Both are reported in the summary, the next file is rendered.
TEST(HostBatch, DamagedFilesAreReportedAndTheBatchGoesOn)
{
    TempDirectory in, out;
    const std::string whole = UtmRgbImage();
    WriteFile(in / "a_cut.ntf", whole.substr(0, whole.size() / 2));
    WriteFile(in / "b_broken.ntf", BrokenFrame());
    WriteFile(in / "c_whole.ntf", whole);
    ProcessResult result = RunHost({"render", "--jobs", "1", "-o", out.path(), in.path()});
    EXPECT_EQ(result.exitCode, 1) << result.err;
    EXPECT_NE(result.err.find("b_broken.ntf: the handler could not open it (result 0, status 5)"),
              std::string::npos)
        << result.err;
    EXPECT_NE(result.err.find("3 files: 1 rendered (0 with 0 undecodable rows), 2 refused (1 not recognised, "
                              "1 not opened, 0 vanished)"),
              std::string::npos)
        << result.err;
    EXPECT_EQ(FilesBelow(out.path()), std::vector<std::string>{"c_whole.ntf.tif"});
}

TEST(HostBatch, NamedFilesThatAreGoneAreReportedAndTheRestRendered)
{
    TempDirectory in, out;
    WriteFile(in / "a.ntf", UtmRgbImage());
    ProcessResult result =
        RunHost({"render", "--format", "png", "-o", out.path(), in / "gone.ntf", in / "a.ntf"});
    EXPECT_EQ(result.exitCode, 1);
    EXPECT_NE(result.err.find("gone.ntf: the file no longer exists"), std::string::npos) << result.err;
    EXPECT_EQ(FilesBelow(out.path()), std::vector<std::string>{"a.ntf.png"});
}

TEST(HostBatch, FilesVanishingDuringTheBatchNeverStopIt)
{
    TempDirectory in, out;
    WriteFrames(in.path(), kFewFrames * 2, SmallFrameFile());
    ProcessResult result;
    std::atomic<bool> batchDone{false};
    std::thread batch([&] {
        result = RunHost({"render", "--jobs", "2", "--window", "0,0,64,64", "-o", out.path(), in.path()});
        batchDone = true;
    });
    // The walk is over once the first output appears; then every other file goes.
    while (FilesBelow(out.path()).empty() && !batchDone)
        std::this_thread::yield();
    for (int i = kFewFrames * 2 - 1; i >= 0; i -= 2)
        fs::remove(in / ("frame" + std::to_string(i) + ".ntf"));
    batch.join();
    EXPECT_TRUE(result.exitCode == 0 || result.exitCode == 1) << result.err;
    EXPECT_NE(result.err.find("200 files: "), std::string::npos) << result.err;
    const size_t rendered = FilesBelow(out.path()).size();
    EXPECT_GE(rendered, size_t(kFewFrames));
    const std::string vanished = std::to_string(kFewFrames * 2 - rendered) + " vanished";
    EXPECT_NE(result.err.find(std::to_string(rendered) + " rendered"), std::string::npos) << result.err;
    EXPECT_NE(result.err.find(vanished), std::string::npos) << result.err;
    EXPECT_TRUE(NoTemporaryFiles(out.path()));
}

TEST(HostBatch, ProgressBarOnlyOnATerminal)
{
    TempDirectory in, out;
    WriteFrames(in.path(), 5, SmallFrameFile());
    const std::string command = std::string(VX_HOST_PATH) + " --handler " + VX_HANDLER_PATH +
                                " render --jobs 2 --window 0,0,64,64 -o " + (out / "tty") + " " + in.path();
    // script(1) gives the host a terminal and copies what it shows to stdout.
    ProcessResult terminal = RunProgram({"script", "-qec", command, "/dev/null"});
    EXPECT_NE(terminal.out.find("] 5/5 files "), std::string::npos) << terminal.out;
    EXPECT_NE(terminal.out.find(" files/s "), std::string::npos) << terminal.out;
    EXPECT_NE(terminal.out.find(" left"), std::string::npos) << terminal.out;
    ProcessResult piped = RunHost({"render", "-o", out / "piped", in.path()});
    EXPECT_EQ(piped.err.find('\r'), std::string::npos) << piped.err;
    EXPECT_NE(piped.err.find("5 files: 5 rendered"), std::string::npos) << piped.err;
}

TEST(HostBatch, UnwritableOutputDirectoryIsReportedOnce)
{
    TempDirectory in;
    WriteFile(in / "a.ntf", UtmRgbImage());
    ProcessResult result = RunHost({"render", "-o", in / "a.ntf/out", in.path()});
    EXPECT_EQ(result.exitCode, 1);
    EXPECT_NE(result.err.find("cannot create " + (in / "a.ntf/out")), std::string::npos) << result.err;
    EXPECT_EQ(FilesBelow(in.path()), std::vector<std::string>{"a.ntf"});
}

// A batch of the frames in `in` with the peak memory of the host; under
// AddressSanitizer freed memory is reused at once instead of quarantined.
ProcessResult MeasuredBatch(const std::string& in, const std::string& out)
{
    const char* options = std::getenv("ASAN_OPTIONS");
    const std::string asan = std::string("ASAN_OPTIONS=") + (options ? options : "") + ":quarantine_size_mb=0";
    return RunProgram({"env", asan, VX_HOST_PATH, "--handler", VX_HANDLER_PATH, "render", "--jobs", "2",
                       "--window", "0,0,64,64", "-o", out, in});
}

// Each frame opens its own handle and releases it: the host's peak memory
// over 1,000 frames stays where it is over 100.
TEST(HostBatch, ThousandFramesOnTwoWorkersKeepMemoryFlat)
{
    TempDirectory in, out;
    const std::string frame = SmallFrameFile();
    WriteFrames(in / "few", kFewFrames, frame);
    WriteFrames(in / "many", kBulkFrames, frame);
    ProcessResult small = MeasuredBatch(in / "few", out / "few");
    ProcessResult large = MeasuredBatch(in / "many", out / "many");
    ASSERT_EQ(small.exitCode, 0) << small.err;
    ASSERT_EQ(large.exitCode, 0) << large.err;
    EXPECT_EQ(FilesBelow(out / "many").size(), size_t(kBulkFrames));
    RecordProperty("peak_kilobytes_100", std::to_string(small.peakKilobytes));
    RecordProperty("peak_kilobytes_1000", std::to_string(large.peakKilobytes));
    EXPECT_LT(large.peakKilobytes - small.peakKilobytes, kFlatMemoryKilobytes)
        << "100 frames: " << small.peakKilobytes << " kB, 1000 frames: " << large.peakKilobytes << " kB";
}

} // namespace
