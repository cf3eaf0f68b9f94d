// Images at and beyond the decoded-bitmap limits through the loaded handler:
// those beyond open without allocating their declared size and their rows
// fail while the handle stays good; those within decode.
#include "tests/SampleFiles.h"
#include "tests/fixtures/BiLevelWriter.h"
#include "tests/fixtures/NitfImageWriter.h"
#include "tests/fixtures/TempFiles.h"

#include <gtest/gtest.h>

namespace {

constexpr size_t kSmallGrowth = 16u << 20; // far below any declared bitmap here

// A white bi-level image of `rows` rows, one- or two-dimensionally coded
// (a one-dimensional strip of 64 columns stands for any width).
std::string BiLevel(uint32_t columns, uint32_t rows, bool twoDimensional)
{
    NitfImagePlan plan;
    plan.columns = int32_t(columns);
    plan.rows = int32_t(rows);
    plan.NBPP = 1;
    plan.IC = "C1";
    plan.COMRAT = twoDimensional ? "2DS " : "1D  ";
    const uint32_t coded = twoDimensional ? columns : 64;
    const std::vector<uint8_t> white(size_t((coded + 7) / 8) * rows, 0);
    const std::vector<uint8_t> strip = EncodeT4Strip(white, coded, rows, twoDimensional);
    return BuildImageFile(plan, std::string(strip.begin(), strip.end()));
}

struct Limit {
    const char* name;
    std::string bytes;
    uint32_t width;
    bool decodes;
};

TEST(MemoryLimits, ImagesBeyondTheDecodeCapsOpenSmallAndFailTheirRows)
{
    const Limit limits[] = {
        // 99,999,999 x 100 one-bit pixels: about 1.16 GiB, above the 1 GiB bitmap cap.
        {"bitmap over 1 GiB", BiLevel(99999999, 100, false), 99999999, false},
        // A 2 MiB bitmap whose fax decoder run arrays for 17 million columns
        // would take 272 MB: such strips of a few kilobytes made it allocate
        // over a gibibyte. A million columns still decode.
        {"run arrays over 256 MiB", BiLevel(17000000, 2, true), 17000000, false},
        {"run arrays within", BiLevel(1000000, 2, true), 1000000, true},
        {"JPEG streams larger than their blocks", SampleBytes("jpeg_streams_larger_than_blocks"), 32, false},
        {"JPEG streams of their blocks", SampleBytes("compressed_jpeg_grey"), 32, true},
    };
    const HandlerExports& rh = LoadHandler(VX_HANDLER_PATH);
    for (const Limit& limit : limits) {
        SCOPED_TRACE(limit.name);
        TempFile file(limit.bytes, ".ntf");
        const size_t before = HeapInUse();
        OpenedImage image(rh, file.path());
        ASSERT_TRUE(image.Ready());
        EXPECT_EQ(image.handle.width, limit.width);
        EXPECT_LT(HeapInUse(), before + kSmallGrowth);
        std::vector<uint8_t> pixels;
        uint32_t failedRows = 0;
        ASSERT_TRUE(image.Draw(0, 0, 16, 1, pixels, failedRows));
        EXPECT_EQ(failedRows, limit.decodes ? 0u : 1u);
        EXPECT_EQ(image.handle.status, kStatusOk);
    }
}

} // namespace
