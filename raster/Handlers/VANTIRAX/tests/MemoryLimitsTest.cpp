// Images whose declared size the decoded-bitmap limits refuse: they open,
// nothing of their declared size is allocated, and their rows fail.
#include "tests/StressFiles.h"
#include "tests/fixtures/BiLevelWriter.h"
#include "tests/fixtures/JpegBlockWriter.h"
#include "tests/fixtures/NitfImageWriter.h"
#include "tests/fixtures/TempFiles.h"

#include <gtest/gtest.h>

namespace {

constexpr size_t kSmallGrowth = 16u << 20; // far below any declared bitmap here

// Opens the file, checks what the open allocated, and draws a narrow span
// of its first row, which must fail while the handle stays good.
void ExpectOpensSmallAndRowsFail(const std::string& bytes, uint32_t width)
{
    const HandlerExports& rh = LoadHandler(VX_HANDLER_PATH);
    TempFile file(bytes, ".ntf");
    const size_t before = HeapInUse();
    OpenedImage image(rh, file.path());
    ASSERT_TRUE(image.Ready());
    EXPECT_EQ(image.handle.width, width);
    EXPECT_LT(HeapInUse(), before + kSmallGrowth);
    std::vector<uint8_t> pixels;
    uint32_t failedRows = 0;
    ASSERT_TRUE(image.Draw(0, 0, 64, 1, pixels, failedRows));
    EXPECT_EQ(failedRows, 1u);
    EXPECT_EQ(image.handle.status, kStatusOk);
}

TEST(MemoryLimits, BiLevelImageLargerThanTheBitmapCapIsNotDecoded)
{
    // 99,999,999 x 100 one-bit pixels: about 1.16 GiB, above the 1 GiB cap.
    constexpr uint32_t kColumns = 99999999, kRows = 100;
    NitfImagePlan plan;
    plan.columns = int32_t(kColumns);
    plan.rows = int32_t(kRows);
    plan.NBPP = 1;
    plan.IC = "C1";
    plan.COMRAT = "1D  ";
    const std::vector<uint8_t> strip = EncodeT4Strip(std::vector<uint8_t>(8 * kRows, 0), 64, kRows, false);
    ExpectOpensSmallAndRowsFail(BuildImageFile(plan, std::string(strip.begin(), strip.end())), kColumns);
}

// A white bi-level image of the given width, two rows, coded two-dimensionally.
std::string WideBiLevelFile(uint32_t columns)
{
    constexpr uint32_t kRows = 2;
    NitfImagePlan plan;
    plan.columns = int32_t(columns);
    plan.rows = int32_t(kRows);
    plan.NBPP = 1;
    plan.IC = "C1";
    plan.COMRAT = "2DS ";
    const std::vector<uint8_t> white(size_t((columns + 7) / 8) * kRows, 0);
    const std::vector<uint8_t> strip = EncodeT4Strip(white, columns, kRows, true);
    return BuildImageFile(plan, std::string(strip.begin(), strip.end()));
}

TEST(MemoryLimits, BiLevelImageWhoseDecoderWouldNeedOverAQuarterGibibyteIsNotDecoded)
{
    // The bitmap is small (2 MiB), but the fax decoder's run arrays for
    // 17 million columns would take 272 MB: such strips of a few kilobytes
    // made it allocate over a gibibyte.
    const HandlerExports& rh = LoadHandler(VX_HANDLER_PATH);
    TempFile fitting(WideBiLevelFile(1000000), ".ntf");
    OpenedImage image(rh, fitting.path());
    std::vector<uint8_t> pixels;
    uint32_t failedRows = 0;
    ASSERT_TRUE(image.Ready() && image.Draw(0, 0, 64, 2, pixels, failedRows));
    ASSERT_EQ(failedRows, 0u);
    EXPECT_EQ(pixels, std::vector<uint8_t>(128, 255));
    ExpectOpensSmallAndRowsFail(WideBiLevelFile(17000000), 17000000);
}

std::string JpegImageFile(uint32_t streamSide, bool progressive)
{
    JpegBlockPlan block;
    block.width = block.height = streamSide;
    block.progressive = progressive;
    const Bytes stream = EncodeJpegBlock(Bytes(size_t(streamSide) * streamSide, 0x80), block);
    NitfImagePlan plan;
    plan.columns = plan.rows = 16;
    plan.IC = "C3";
    plan.COMRAT = "00.0";
    const Bytes data = BuildNitfJpegData({stream}, NitfApp6Plan{});
    return BuildImageFile(plan, std::string(data.begin(), data.end()));
}

TEST(MemoryLimits, JpegStreamLargerThanItsBlockIsNotDecoded)
{
    const HandlerExports& rh = LoadHandler(VX_HANDLER_PATH);
    // Progressive streams need coefficient buffers as large as the frame.
    for (bool progressive : {false, true}) {
        TempFile fitting(JpegImageFile(16, progressive), ".ntf");
        OpenedImage image(rh, fitting.path());
        std::vector<uint8_t> pixels;
        uint32_t failedRows = 0;
        ASSERT_TRUE(image.Ready() && image.DrawAll(pixels, failedRows));
        ASSERT_EQ(failedRows, 0u) << progressive;
        // The same block whose stream declares 4096 x 4096 pixels.
        ExpectOpensSmallAndRowsFail(JpegImageFile(4096, progressive), 16);
    }
}

} // namespace
