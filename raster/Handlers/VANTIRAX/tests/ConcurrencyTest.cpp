// Eight host threads on eight handles at once, through the loaded handler:
// each opens, draws and closes its own files of every kind, many times. The
// first opens are of compressed images, so they race to bind the imaging
// library. Every draw must give what one thread alone gets. Run under
// ThreadSanitizer by the test command (build-tsan).
#include "tests/StressFiles.h"
#include "tests/fixtures/NitfFileWriter.h"
#include "tests/fixtures/TempFiles.h"

#include <gtest/gtest.h>

#include <condition_variable>
#include <mutex>
#include <thread>

namespace {

constexpr unsigned kThreads = 8;
constexpr unsigned kRounds = 5;
constexpr uint32_t kRowsPerDraw = 96;

// Holds every thread until all have arrived, so their first opens overlap.
class StartLine {
public:
    explicit StartLine(unsigned count) : waiting_(count) {}
    void ArriveAndWait()
    {
        std::unique_lock<std::mutex> lock(mutex_);
        if (--waiting_ == 0)
            released_.notify_all();
        else
            released_.wait(lock, [this] { return waiting_ == 0; });
    }

private:
    std::mutex mutex_;
    std::condition_variable released_;
    unsigned waiting_;
};

TEST(Concurrency, EightThreadsDrawTheirOwnFilesOfEveryKindAsOneThreadDoes)
{
    const HandlerExports& rh = LoadHandler(VX_HANDLER_PATH);
    TempDirectory directory;
    std::vector<std::vector<std::string>> paths(kThreads);
    for (unsigned t = 0; t < kThreads; ++t)
        for (const StressFile& file : FilesOfEveryKind(t)) {
            paths[t].push_back(directory / (file.kind + std::to_string(t) + ".ntf"));
            WriteFile(paths[t].back(), file.bytes);
        }

    // results[t][round][file]
    std::vector<std::vector<std::vector<DrawResult>>> results(kThreads);
    StartLine start(kThreads);
    std::vector<std::thread> threads;
    for (unsigned t = 0; t < kThreads; ++t)
        threads.emplace_back([&, t] {
            start.ArriveAndWait();
            for (unsigned round = 0; round < kRounds; ++round) {
                results[t].emplace_back();
                for (const std::string& path : paths[t])
                    results[t][round].push_back(OpenDrawClose(rh, path, kRowsPerDraw));
            }
        });
    for (std::thread& thread : threads)
        thread.join();

    for (unsigned t = 0; t < kThreads; ++t)
        for (size_t f = 0; f < paths[t].size(); ++f) {
            const DrawResult alone = OpenDrawClose(rh, paths[t][f], kRowsPerDraw);
            EXPECT_EQ(alone.openResult, 1) << paths[t][f];
            EXPECT_EQ(alone.status, kStatusOk) << paths[t][f];
            EXPECT_EQ(alone.failedRows, 0u) << paths[t][f];
            for (unsigned round = 0; round < kRounds; ++round)
                EXPECT_TRUE(results[t][round][f] == alone) << paths[t][f] << " round " << round;
        }
}

} // namespace
