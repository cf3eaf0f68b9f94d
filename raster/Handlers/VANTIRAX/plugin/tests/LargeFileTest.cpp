// A NITF file larger than 4 GiB read through the exports: a sparse file, so
// that only the rows the test writes take disk space.
#include "tests/fixtures/HandlerLoader.h"
#include "tests/fixtures/NitfImageWriter.h"
#include "tests/fixtures/TempFiles.h"

#include <gtest/gtest.h>

#include <fcntl.h>
#include <unistd.h>

namespace {

const HandlerExports& rh = LoadHandler(VX_HANDLER_PATH);

constexpr int32_t kSide = 8192;     // NPPBH, NPPBV and NCOLS
constexpr int32_t kBlockRows = 70;  // NBPC: 70 blocks of 64 MiB, 4.7 GB of pixels
constexpr int32_t kRows = kSide * kBlockRows;
constexpr size_t kFlOffset = 342;   // FL, 12 digits, in a NITF 2.1 file header
constexpr size_t kLiOffset = 369;   // LI of the first image segment, 10 digits

uint8_t Pixel(int32_t row, int32_t column)
{
    return uint8_t(row * 7 + column);
}

// A MONO image whose last two rows hold Pixel and whose other rows are holes.
void WriteSparseImage(const std::string& path)
{
    NitfImagePlan plan;
    plan.rows = kRows;
    plan.columns = kSide;
    plan.NBPC = kBlockRows;
    plan.NPPBH = plan.NPPBV = kSide;
    std::string header = BuildImageFile(plan, "");
    const uint64_t dataBytes = uint64_t(kSide) * uint64_t(kRows);
    header.replace(kFlOffset, 12, Digits(header.size() + dataBytes, 12));
    header.replace(kLiOffset, 10, Digits(dataBytes, 10));
    std::string lastRows;
    for (int32_t row = kRows - 2; row < kRows; ++row)
        for (int32_t column = 0; column < kSide; ++column)
            lastRows.push_back(char(Pixel(row, column)));
    const int file = ::open(path.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0600);
    ASSERT_GE(file, 0);
    const off_t end = off_t(header.size() + dataBytes);
    ASSERT_EQ(::pwrite(file, header.data(), header.size(), 0), ssize_t(header.size()));
    ASSERT_EQ(::pwrite(file, lastRows.data(), lastRows.size(), end - off_t(lastRows.size())), ssize_t(lastRows.size()));
    ::close(file);
}

TEST(LargeFile, RowsPastFourGigabytesComeFromTheirOwnOffsets)
{
    TempFile file;
    WriteSparseImage(file.path());
    OpenedImage image(rh, file.path());
    ASSERT_TRUE(image.Ready()) << image.handle.status;
    EXPECT_EQ(image.handle.width, uint32_t(kSide));
    EXPECT_EQ(image.handle.height, uint32_t(kRows));

    struct Window {
        int32_t x0, y0, x1, y1;
    };
    for (const Window& window : {Window{0, kRows - 2, kSide, kRows}, Window{kSide - 300, kRows - 1, kSide, kRows},
                                 Window{0, kRows - 3, 16, kRows - 2}}) {
        std::vector<uint8_t> pixels;
        uint32_t failedRows = 0;
        ASSERT_TRUE(image.Draw(window.x0, window.y0, window.x1, window.y1, pixels, failedRows));
        EXPECT_EQ(failedRows, 0u);
        const int32_t width = window.x1 - window.x0;
        for (int32_t row = window.y0; row < window.y1; ++row)
            for (int32_t column = window.x0; column < window.x1; ++column) {
                const uint8_t expected = row >= kRows - 2 ? Pixel(row, column) : 0;
                ASSERT_EQ(pixels[size_t(row - window.y0) * size_t(width) + size_t(column - window.x0)], expected)
                    << "row " << row << " column " << column;
            }
    }
}

} // namespace
