// Ten thousand handles through the loaded handler, probed, opened, drawn and
// closed in every way a host meets: good files of every kind, failed opens
// (refused files, no file) and failed draws (a reversed column span, a file
// gone before the draw). Open file descriptors and heap in use must stay
// where they were: every handle releases its handler, palette and records.
#include "tests/SampleFiles.h"
#include "tests/fixtures/NitfFileWriter.h"
#include "tests/fixtures/TempFiles.h"

#include <gtest/gtest.h>

#include <filesystem>
#include <unistd.h>

namespace {

constexpr unsigned kHandles = 10000, kWarmUp = 200;
constexpr size_t kHeapSlack = 64 * 1024; // allocator bookkeeping, not per-handle growth
constexpr uint32_t kRowsPerDraw = 4;

size_t OpenDescriptors()
{
    const std::filesystem::directory_iterator fds("/proc/self/fd");
    return size_t(std::distance(begin(fds), end(fds)));
}

struct Samples {
    TempDirectory directory;
    std::vector<std::string> good, hostile;
    std::string vanishing = directory / "vanishing.ntf", vanishingBytes;

    Samples()
    {
        for (const SampleFile& file : FilesOfEveryKind())
            WriteFile(good.emplace_back(directory / (file.name + ".ntf")), vanishingBytes = file.bytes);
        for (const SampleFile& file : HostileFiles())
            WriteFile(hostile.emplace_back(directory / (file.name + ".ntf")), file.bytes);
        hostile.push_back(directory / "missing.ntf");
    }
};

// One handle's life; i picks the path through the exports.
void OneHandle(const HandlerExports& rh, const Samples& samples, unsigned i)
{
    const std::string& good = samples.good[i / 4 % samples.good.size()];
    switch (i % 4) {
    case 0: {
        ASSERT_EQ(rh.isFormat(good.c_str()), 1);
        const DrawResult result = OpenDrawClose(rh, good, kRowsPerDraw);
        ASSERT_TRUE(result.status == kStatusOk && result.failedRows == 0) << good;
        break;
    }
    case 1: {
        const std::string& hostile = samples.hostile[i / 4 % samples.hostile.size()];
        rh.isFormat(hostile.c_str());
        const DrawResult result = OpenDrawClose(rh, hostile, kRowsPerDraw);
        ASSERT_TRUE(result.openResult != 1 || result.status != kStatusOk || result.failedRows == kRowsPerDraw)
            << hostile;
        break;
    }
    case 2: { // a reversed span detaches the handler from the handle; the export releases it
        OpenedImage image(rh, good);
        const int32_t reversed[4] = {10, 0, 2, 4};
        uint32_t width = 0;
        ASSERT_TRUE(image.Ready());
        ASSERT_EQ(rh.startDraw(&image.handle, nullptr, reversed, 1.0, &width), 0);
        ASSERT_EQ(image.handle.handler, nullptr);
        break;
    }
    case 3: { // the file is gone when the draw reopens it
        WriteFile(samples.vanishing, samples.vanishingBytes);
        OpenedImage image(rh, samples.vanishing);
        ASSERT_TRUE(image.Ready());
        unlink(samples.vanishing.c_str());
        std::vector<uint8_t> pixels;
        uint32_t failedRows = 0;
        ASSERT_FALSE(image.Draw(0, 0, int32_t(image.handle.width), 2, pixels, failedRows));
        ASSERT_EQ(image.handle.handler, nullptr);
        break;
    }
    }
}

TEST(HandleHygiene, TenThousandHandlesLeaveDescriptorsAndHeapFlat)
{
    const HandlerExports& rh = LoadHandler(VX_HANDLER_PATH);
    const Samples samples;
    for (unsigned i = 0; i < kWarmUp; ++i)
        ASSERT_NO_FATAL_FAILURE(OneHandle(rh, samples, i));
    const size_t descriptors = OpenDescriptors(), heap = HeapInUse();
    size_t heapHalfway = 0;
    for (unsigned i = 0; i < kHandles; ++i) {
        ASSERT_NO_FATAL_FAILURE(OneHandle(rh, samples, i));
        if (i == kHandles / 2)
            heapHalfway = HeapInUse();
    }
    EXPECT_EQ(OpenDescriptors(), descriptors);
    EXPECT_LE(HeapInUse(), heap + kHeapSlack);
    EXPECT_LE(HeapInUse(), heapHalfway + kHeapSlack);
}

} // namespace
