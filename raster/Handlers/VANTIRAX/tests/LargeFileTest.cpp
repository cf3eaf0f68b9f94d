// A NITF file larger than 4 GiB read through the exports: a sparse file, so
// that only the rows it holds take disk space.
#include "tests/SampleFiles.h"
#include "tests/fixtures/TempFiles.h"

#include <gtest/gtest.h>

namespace {

const HandlerExports& rh = LoadHandler(VX_HANDLER_PATH);

TEST(LargeFile, RowsPastFourGigabytesComeFromTheirOwnOffsets)
{
    TempFile file;
    ASSERT_TRUE(WriteSparseLargeImage(file.path()));
    OpenedImage image(rh, file.path());
    ASSERT_TRUE(image.Ready()) << image.handle.status;
    EXPECT_EQ(image.handle.width, uint32_t(kLargeImageSide));
    EXPECT_EQ(image.handle.height, uint32_t(kLargeImageRows));
    constexpr int32_t kSide = kLargeImageSide, kRows = kLargeImageRows;
    struct Window {
        int32_t x0, y0, x1, y1;
    };
    for (const Window& window : {Window{0, kRows - 2, kSide, kRows}, Window{kSide - 300, kRows - 1, kSide, kRows},
                                 Window{0, kRows - 3, 16, kRows - 2}}) {
        std::vector<uint8_t> pixels;
        uint32_t failedRows = 0;
        ASSERT_TRUE(image.Draw(window.x0, window.y0, window.x1, window.y1, pixels, failedRows));
        EXPECT_EQ(failedRows, 0u);
        const size_t width = size_t(window.x1 - window.x0);
        for (int32_t row = window.y0; row < window.y1; ++row)
            for (int32_t column = window.x0; column < window.x1; ++column)
                ASSERT_EQ(pixels[size_t(row - window.y0) * width + size_t(column - window.x0)],
                          row >= kRows - 2 ? LargeImagePixel(row, column) : 0)
                    << "row " << row << " column " << column;
    }
}

} // namespace
