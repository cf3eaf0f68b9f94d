// A NITF file larger than 4 GiB read through the exports: a sparse file, so
// that only the rows it holds take disk space.
#include "tests/SampleFiles.h"
#include "tests/fixtures/TempFiles.h"

#include <gtest/gtest.h>

#include <array>

namespace {

TEST(LargeFile, RowsPastFourGigabytesComeFromTheirOwnOffsets)
{
    constexpr int32_t kSide = kLargeImageSide, kRows = kLargeImageRows;
    TempFile file;
    ASSERT_TRUE(WriteSparseLargeImage(file.path()));
    OpenedImage image(LoadHandler(VX_HANDLER_PATH), file.path());
    ASSERT_TRUE(image.Ready()) << image.handle.status;
    EXPECT_TRUE(image.handle.width == uint32_t(kSide) && image.handle.height == uint32_t(kRows));
    for (const auto& [x0, y0, x1, y1] : {std::array<int32_t, 4>{0, kRows - 2, kSide, kRows},
                                         {kSide - 300, kRows - 1, kSide, kRows}, {0, kRows - 3, 16, kRows - 2}}) {
        ASSERT_TRUE(image.Draw(x0, y0, x1, y1));
        EXPECT_EQ(image.failedRows, 0u);
        for (int32_t row = y0; row < y1; ++row)
            for (int32_t column = x0; column < x1; ++column)
                ASSERT_EQ(image.pixels[size_t(row - y0) * size_t(x1 - x0) + size_t(column - x0)],
                          LargeImagePixel(row, column)) << "row " << row << " column " << column;
    }
}

} // namespace
