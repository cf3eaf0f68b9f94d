// Ten thousand handles through the loaded handler, probed, opened, drawn and
// closed in every way a host meets: good files of every kind, failed opens (no
// file, a damaged header, a kind that is not served) and failed draws (a
// reversed column span, a file gone before the draw). Open file descriptors
// and heap in use must stay where they were.
#include "tests/StressFiles.h"
#include "tests/fixtures/NitfFileWriter.h"
#include "tests/fixtures/NitfImageWriter.h"
#include "tests/fixtures/TempFiles.h"

#include <gtest/gtest.h>

#include <filesystem>
#include <functional>
#include <unistd.h>

namespace {

constexpr unsigned kHandles = 10000;
constexpr unsigned kWarmUp = 200;
constexpr size_t kHeapSlack = 64 * 1024; // allocator bookkeeping, not per-handle growth
constexpr uint32_t kRowsPerDraw = 4;

size_t OpenDescriptors()
{
    size_t count = 0;
    for (const auto& entry : std::filesystem::directory_iterator("/proc/self/fd")) {
        (void)entry;
        ++count;
    }
    return count;
}

struct Samples {
    TempDirectory directory;
    std::vector<std::string> good;
    std::string damagedHeader, notServed, missing, vanishing;
    std::string vanishingBytes;

    Samples()
    {
        for (const StressFile& file : FilesOfEveryKind(1)) {
            good.push_back(directory / (file.kind + ".ntf"));
            WriteFile(good.back(), file.bytes);
        }
        const StressFile uncompressed = FilesOfEveryKind(2).back();
        damagedHeader = directory / "damaged_header.ntf";
        WriteFile(damagedHeader, uncompressed.bytes.substr(0, 300));
        NitfImagePlan real;
        real.PVTYPE = "R";
        real.NBPP = 32;
        notServed = directory / "real_pixels.ntf";
        WriteFile(notServed, BuildImageFile(real, std::string(4, '\0')));
        missing = directory / "missing.ntf";
        vanishing = directory / "vanishing.ntf";
        vanishingBytes = uncompressed.bytes;
    }
};

// One handle's life; kind picks the path through the exports.
void OneHandle(const HandlerExports& rh, const Samples& samples, unsigned kind)
{
    switch (kind % 8) {
    case 0:
    case 1:
    case 2:
    case 3: {
        ASSERT_EQ(rh.isFormat(samples.good[kind % 8].c_str()), 1);
        const DrawResult result = OpenDrawClose(rh, samples.good[kind % 8], kRowsPerDraw);
        ASSERT_EQ(result.status, kStatusOk);
        ASSERT_EQ(result.failedRows, 0u);
        break;
    }
    case 4: {
        OpenedImage damaged(rh, samples.damagedHeader);
        OpenedImage missing(rh, samples.missing);
        ASSERT_EQ(rh.isFormat(samples.damagedHeader.c_str()), 0);
        ASSERT_EQ(rh.isFormat(samples.notServed.c_str()), 0);
        ASSERT_EQ(damaged.result, 0);
        ASSERT_EQ(missing.result, 0);
        break;
    }
    case 5: {
        OpenedImage image(rh, samples.notServed);
        ASSERT_EQ(image.handle.status, kStatusFailed);
        break;
    }
    case 6: {
        // A reversed span detaches the handler from the handle; the export releases it.
        OpenedImage image(rh, samples.good[kind % 4]);
        ASSERT_TRUE(image.Ready());
        const int32_t reversed[4] = {10, 0, 2, 4};
        uint32_t width = 0;
        ASSERT_EQ(rh.startDraw(&image.handle, nullptr, reversed, 1.0, &width), 0);
        ASSERT_EQ(image.handle.handler, nullptr);
        break;
    }
    case 7: {
        // The file is gone when the draw reopens it.
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
    const size_t descriptors = OpenDescriptors();
    const size_t heap = HeapInUse();
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
