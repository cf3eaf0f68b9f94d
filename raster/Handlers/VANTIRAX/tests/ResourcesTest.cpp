// What handles cost the host, through the loaded handler. Ten thousand
// handles probed, opened, drawn and closed in every way a host meets (files of
// every kind, hostile files and a missing one, a reversed column span, a file
// gone before the draw) leave open file descriptors and heap in use where
// they were: every handle releases its handler, palette and records. Images
// beyond the decoded-bitmap caps open without allocating their declared size
// and their rows fail while the handle stays good; those within decode.
#include "tests/SampleFiles.h"
#include "tests/fixtures/BiLevelWriter.h"
#include "tests/fixtures/NitfImageWriter.h"
#include "tests/fixtures/TempFiles.h"

#include <gtest/gtest.h>

#include <filesystem>
#include <unistd.h>

namespace {

constexpr unsigned kHandles = 10000, kWarmUp = 200;
constexpr size_t kHeapSlack = 64 * 1024; // allocator bookkeeping, not per-handle growth
constexpr size_t kSmallGrowth = 16u << 20; // far below any declared bitmap here

size_t OpenDescriptors()
{
    const std::filesystem::directory_iterator descriptors("/proc/self/fd");
    return size_t(std::distance(begin(descriptors), end(descriptors)));
}

// One handle's life; i picks the file and the path through the exports.
void OneHandle(const HandlerExports& rh, const TempDirectory& files, unsigned i)
{
    static const std::vector<SampleFile> good = FilesOfEveryKind(), hostile = HostileFiles();
    const SampleFile& sample = good[i / 4 % good.size()];
    const std::string path = files / (sample.name + ".ntf"),
                      hostilePath = files / (hostile[i / 4 % hostile.size()].name + ".ntf");
    const int32_t reversed[4] = {10, 0, 2, 4};
    uint32_t width = 0, failedRows = 0;
    std::vector<uint8_t> pixels;
    switch (i % 4) {
    case 0:
        ASSERT_EQ(rh.isFormat(path.c_str()), 1);
        ASSERT_EQ(OpenDrawClose(rh, path, 4).rfind(kDrawnClean, 0), 0u) << path;
        break;
    case 1: // hostile files never draw clean rows; one more is missing
        rh.isFormat(hostilePath.c_str());
        ASSERT_NE(OpenDrawClose(rh, i % 7 ? hostilePath : files / "missing", 4).rfind(kDrawnClean, 0), 0u);
        break;
    case 2: { // a reversed span detaches the handler from the handle; the export releases it
        OpenedImage image(rh, path);
        ASSERT_TRUE(image.Ready());
        ASSERT_EQ(rh.startDraw(&image.handle, nullptr, reversed, 1.0, &width), 0);
        ASSERT_EQ(image.handle.handler, nullptr);
        break;
    }
    case 3: { // the file is gone when the draw reopens it
        const std::string vanishing = files / "vanishing";
        WriteFile(vanishing, sample.bytes);
        OpenedImage image(rh, vanishing);
        ASSERT_TRUE(image.Ready());
        unlink(vanishing.c_str());
        ASSERT_FALSE(image.Draw(0, 0, int32_t(image.handle.width), 2, pixels, failedRows));
        ASSERT_EQ(image.handle.handler, nullptr);
        break;
    }
    }
}

TEST(HandleHygiene, TenThousandHandlesLeaveDescriptorsAndHeapFlat)
{
    const HandlerExports& rh = LoadHandler(VX_HANDLER_PATH);
    TempDirectory files;
    for (const auto& list : {FilesOfEveryKind(), HostileFiles()})
        for (const SampleFile& file : list)
            WriteFile(files / (file.name + ".ntf"), file.bytes);
    for (unsigned i = 0; i < kWarmUp; ++i)
        ASSERT_NO_FATAL_FAILURE(OneHandle(rh, files, i));
    const size_t descriptors = OpenDescriptors(), heap = HeapInUse();
    size_t heapHalfway = 0;
    for (unsigned i = 0; i < kHandles; ++i) {
        ASSERT_NO_FATAL_FAILURE(OneHandle(rh, files, i));
        heapHalfway = i == kHandles / 2 ? HeapInUse() : heapHalfway;
    }
    EXPECT_EQ(OpenDescriptors(), descriptors);
    EXPECT_LE(HeapInUse(), heap + kHeapSlack);
    EXPECT_LE(HeapInUse(), heapHalfway + kHeapSlack);
}

// A white bi-level image, one- or two-dimensionally coded (a one-dimensional
// strip of 64 columns stands for any width).
std::string BiLevel(uint32_t columns, uint32_t rows, bool twoDimensional)
{
    NitfImagePlan plan;
    plan.columns = int32_t(columns);
    plan.rows = int32_t(rows);
    plan.NBPP = 1;
    plan.IC = "C1";
    plan.COMRAT = twoDimensional ? "2DS " : "1D  ";
    const uint32_t coded = twoDimensional ? columns : 64;
    const std::vector<uint8_t> strip =
        EncodeT4Strip(std::vector<uint8_t>((coded + 7) / 8 * rows), coded, rows, twoDimensional);
    return BuildImageFile(plan, std::string(strip.begin(), strip.end()));
}

TEST(MemoryLimits, BiLevelImagesBeyondTheCapsOpenSmallAndFailTheirRows)
{
    const struct {
        const char* name;
        uint32_t columns, rows;
        bool twoDimensional, decodes;
    } limits[] = {
        // 99,999,999 x 100 one-bit pixels: about 1.16 GiB, above the 1 GiB bitmap cap.
        {"bitmap over 1 GiB", 99999999, 100, false, false},
        // A 2 MiB bitmap whose fax decoder run arrays for 17 million columns
        // would take 272 MB: such strips of a few kilobytes made it allocate
        // over a gibibyte. A million columns still decode.
        {"run arrays over 256 MiB", 17000000, 2, true, false},
        {"run arrays within", 1000000, 2, true, true},
    };
    const HandlerExports& rh = LoadHandler(VX_HANDLER_PATH);
    for (const auto& limit : limits) {
        SCOPED_TRACE(limit.name);
        TempFile file(BiLevel(limit.columns, limit.rows, limit.twoDimensional), ".ntf");
        const size_t before = HeapInUse();
        OpenedImage image(rh, file.path());
        ASSERT_TRUE(image.Ready());
        EXPECT_EQ(image.handle.width, limit.columns);
        EXPECT_LT(HeapInUse(), before + kSmallGrowth);
        std::vector<uint8_t> pixels;
        uint32_t failedRows = 0;
        ASSERT_TRUE(image.Draw(0, 0, 16, 1, pixels, failedRows));
        EXPECT_EQ(failedRows, limit.decodes ? 0u : 1u);
        EXPECT_EQ(pixels, std::vector<uint8_t>(16, limit.decodes ? 255 : 0));
        EXPECT_EQ(image.handle.status, kStatusOk);
    }
}

} // namespace
