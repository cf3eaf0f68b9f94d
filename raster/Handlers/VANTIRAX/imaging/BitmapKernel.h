// The bitmap kernel module: bitmap records and their row spans.
#pragma once

#include "imaging/ImagingRecords.h"

int L_InitBitmap(BITMAPHANDLE* bitmap, uint32_t structSize, uint32_t width, uint32_t height, uint32_t bitsPerPixel);
int L_AllocateBitmap(BITMAPHANDLE* bitmap, int memoryKind);
int L_FreeBitmap(BITMAPHANDLE* bitmap);
int L_AccessBitmap(BITMAPHANDLE* bitmap);
// Copies at most byteCount bytes of the row from the pixel at column on, and
// never more than the row holds from there; the result is the byte count
// copied, 0 when the row or column lies outside the bitmap.
int64_t L_GetBitmapRowCol(BITMAPHANDLE* bitmap, uint8_t* destination, uint32_t row, uint32_t column,
                          uint32_t byteCount);
int L_ReleaseBitmap(BITMAPHANDLE* bitmap);

// For the loaders: frees the bitmap's pixels and gives it a zeroed pixel
// store of the new shape, when the shape is within the load options.
bool ShapeBitmap(BITMAPHANDLE* bitmap, uint32_t width, uint32_t height, uint32_t bitsPerPixel,
                 const LOADFILEOPTION& options);
