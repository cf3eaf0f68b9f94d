// Eight host threads on eight handles at once, through the loaded handler: each opens, draws and closes its own files
// of every kind, many times. The first opens are of compressed images, so they race to bind the imaging library.
// Every draw must give what one thread alone gets. Run under ThreadSanitizer by the test command (build-tsan).
#include "tests/SampleFiles.h"
#include "tests/fixtures/NitfFileWriter.h"
#include "tests/fixtures/TempFiles.h"

#include <gtest/gtest.h>

#include <atomic>
#include <thread>

namespace {

TEST(Concurrency, EightThreadsDrawTheirOwnFilesOfEveryKindAsOneThreadDoes)
{
    constexpr unsigned kThreads = 8, kRounds = 5;
    constexpr uint32_t kRowsPerDraw = 96;
    const HandlerExports& rh = LoadHandler(VX_HANDLER_PATH);
    TempDirectory directory;
    std::vector<std::vector<std::string>> paths(kThreads), drawn(kThreads); // drawn: rounds x files per thread
    for (unsigned t = 0; t < kThreads; ++t)
        for (const SampleFile& file : FilesOfEveryKind(t)) {
            paths[t].push_back(directory / (file.name + std::to_string(t) + ".ntf"));
            WriteFile(paths[t].back(), file.bytes);
        }
    std::atomic<unsigned> arrived{0};
    std::vector<std::thread> threads;
    for (unsigned t = 0; t < kThreads; ++t)
        threads.emplace_back([&, t] {
            for (++arrived; arrived < kThreads;) // all start together, so the first opens overlap
                std::this_thread::yield();
            for (unsigned round = 0; round < kRounds; ++round)
                for (const std::string& path : paths[t])
                    drawn[t].push_back(OpenDrawClose(rh, path, kRowsPerDraw));
        });
    for (std::thread& thread : threads)
        thread.join();
    for (unsigned t = 0; t < kThreads; ++t)
        for (size_t f = 0; f < paths[t].size(); ++f) {
            const std::string alone = OpenDrawClose(rh, paths[t][f], kRowsPerDraw);
            EXPECT_EQ(alone.rfind(kDrawnClean, 0), 0u) << paths[t][f];
            for (unsigned round = 0; round < kRounds; ++round)
                EXPECT_TRUE(drawn[t][round * paths[t].size() + f] == alone) << paths[t][f] << " round " << round;
        }
}

} // namespace
