#include "imaging/BitmapKernel.h"

#include <cstdlib>
#include <cstring>

namespace {

bool IsKnownDepth(uint32_t bitsPerPixel)
{
    return bitsPerPixel == 0 || bitsPerPixel == 1 || bitsPerPixel == 8 || bitsPerPixel == 24;
}

uint64_t RowBytes(uint32_t width, uint32_t bitsPerPixel)
{
    return (uint64_t(width) * bitsPerPixel + 7) / 8;
}

// A 1-bit row from a column that is not on a byte boundary: the bits are
// shifted so that the column's bit leads the first byte.
int64_t CopyShiftedBits(const uint8_t* row, uint32_t rowBytes, uint32_t column, uint8_t* destination,
                        uint32_t count)
{
    uint32_t first = column / 8;
    unsigned shift = column % 8;
    for (uint32_t i = 0; i < count; ++i) {
        uint32_t at = first + i;
        unsigned next = at + 1 < rowBytes ? row[at + 1] : 0;
        destination[i] = static_cast<uint8_t>((row[at] << shift) | (next >> (8 - shift)));
    }
    return count;
}

}  // namespace

int L_InitBitmap(BITMAPHANDLE* bitmap, uint32_t structSize, uint32_t width, uint32_t height, uint32_t bitsPerPixel)
{
    if (bitmap == nullptr || structSize != sizeof(BITMAPHANDLE) || !IsKnownDepth(bitsPerPixel))
        return kLoadFailed;
    uint64_t rowBytes = RowBytes(width, bitsPerPixel);
    if (rowBytes > UINT32_MAX)
        return kLoadFailed;
    *bitmap = BITMAPHANDLE{structSize, width, height, bitsPerPixel, static_cast<uint32_t>(rowBytes), 0, nullptr};
    return kLoadSucceeded;
}

int L_AllocateBitmap(BITMAPHANDLE* bitmap, int /*memoryKind: always main memory*/)
{
    if (bitmap == nullptr || bitmap->pixels != nullptr)
        return kLoadFailed;
    if (bitmap->bytesPerLine == 0 || bitmap->height == 0)
        return kLoadSucceeded;
    // calloc checks the product of the two counts for overflow.
    bitmap->pixels = static_cast<uint8_t*>(std::calloc(bitmap->height, bitmap->bytesPerLine));
    return bitmap->pixels ? kLoadSucceeded : kLoadFailed;
}

int L_FreeBitmap(BITMAPHANDLE* bitmap)
{
    if (bitmap == nullptr)
        return kLoadFailed;
    std::free(bitmap->pixels);
    bitmap->pixels = nullptr;
    bitmap->width = bitmap->height = bitmap->bytesPerLine = 0;
    return kLoadSucceeded;
}

int L_AccessBitmap(BITMAPHANDLE* bitmap)
{
    if (bitmap == nullptr)
        return kLoadFailed;
    ++bitmap->accessCount;
    return kLoadSucceeded;
}

int L_ReleaseBitmap(BITMAPHANDLE* bitmap)
{
    if (bitmap == nullptr || bitmap->accessCount == 0)
        return kLoadFailed;
    --bitmap->accessCount;
    return kLoadSucceeded;
}

int64_t L_GetBitmapRowCol(BITMAPHANDLE* bitmap, uint8_t* destination, uint32_t row, uint32_t column,
                          uint32_t byteCount)
{
    if (bitmap == nullptr || destination == nullptr || bitmap->pixels == nullptr || row >= bitmap->height ||
        column >= bitmap->width)
        return 0;
    const uint8_t* rowStart = bitmap->pixels + size_t(row) * bitmap->bytesPerLine;
    uint32_t available = static_cast<uint32_t>(RowBytes(bitmap->width - column, bitmap->bitsPerPixel));
    uint32_t count = byteCount < available ? byteCount : available;
    if (bitmap->bitsPerPixel == 1 && column % 8 != 0)
        return CopyShiftedBits(rowStart, bitmap->bytesPerLine, column, destination, count);
    std::memcpy(destination, rowStart + RowBytes(column, bitmap->bitsPerPixel), count);
    return count;
}

bool ShapeBitmap(BITMAPHANDLE* bitmap, uint32_t width, uint32_t height, uint32_t bitsPerPixel,
                 const LOADFILEOPTION& options)
{
    if (width == 0 || height == 0 || width > options.maxWidth || height > options.maxHeight)
        return false;
    if (RowBytes(width, bitsPerPixel) > options.maxBytes / height)
        return false;
    L_FreeBitmap(bitmap);
    return L_InitBitmap(bitmap, sizeof(BITMAPHANDLE), width, height, bitsPerPixel) == kLoadSucceeded &&
           L_AllocateBitmap(bitmap, 0) == kLoadSucceeded;
}
