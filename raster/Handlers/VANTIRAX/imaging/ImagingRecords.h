// The records the imaging library exchanges with its callers, and the
// signatures of its thirteen entry points. The library is in two modules: the
// bitmap kernel (bitmap records and row spans) and the file loader (JPEG
// streams and TIFF-wrapped CCITT T.4 strips decoded into bitmaps, whole or a
// band of rows at a time).
#pragma once

#include <cstddef>
#include <cstdint>

constexpr int kLoadSucceeded = 1;
constexpr int kLoadFailed = 0;

// A bitmap: 1-bit (packed, most significant bit first, a set bit is black),
// 8-bit grey or 24-bit R,G,B pixels, rows stored top to bottom.
struct BITMAPHANDLE {
    uint32_t structSize;
    uint32_t width;
    uint32_t height;
    uint32_t bitsPerPixel;
    uint32_t bytesPerLine;
    uint32_t accessCount;   // L_AccessBitmap / L_ReleaseBitmap nesting
    uint8_t* pixels;        // bytesPerLine * height bytes, or null
};

// Load options: limits on the bitmap that a load may allocate.
struct LOADFILEOPTION {
    uint32_t structSize;
    uint32_t maxWidth;      // the widest bitmap a load accepts, in pixels
    uint32_t maxHeight;
    uint64_t maxBytes;      // the largest pixel store a load may allocate
};

// What a load found in the stream.
struct FILEINFO {
    uint32_t structSize;
    uint32_t width;             // the frame, as the bitmap holds it
    uint32_t height;
    uint32_t bitsPerPixel;
    uint32_t colorConverted;    // 1: the three components were delivered as R,G,B
    uint32_t decodedRows;       // rows of the bitmap decoded from the stream, from the top: fewer
                                // than height when the stream's data ran out (the rest is zeros)
};

// A stream in an open file, byteCount bytes from offset, with insertSize
// bytes from memory placed before its byte insertAt (a TIFF header before a
// strip, default tables before a frame header); the loader keeps a copy.
struct LOADSOURCE {
    uint32_t structSize;
    int fileHandle;
    uint64_t offset;
    uint64_t byteCount;
    const uint8_t* insert;      // null when insertSize is 0
    uint32_t insertSize;
    uint64_t insertAt;
};

// A decoder kept open on one stream between loads of its rows; it reads the
// file kRowLoaderChunkBytes at a time and holds only the rows it works on.
struct ROWLOADER;
constexpr uint32_t kRowLoaderChunkBytes = 16 * 1024;

// Load flags. The JPEG loads pass kLoadFlagsJpeg, with kLoadFlagRgbStream
// added when the NITF APP6 segment says the components are coded as R,G,B
// (no colour transform); the bi-level load passes kLoadFlagsBiLevel.
constexpr uint32_t kLoadFlagsJpeg = 11;
constexpr uint32_t kLoadFlagRgbStream = 4;
constexpr uint32_t kLoadFlagsBiLevel = 67;
constexpr int kOrderRgb = 3;        // three-byte pixels as R,G,B
constexpr int kOrderAsStored = 0;
constexpr int kBitsAsStored = 0;

using LoadProgress = int (*)(void* userData);   // never used: loads run to completion

using L_InitBitmapFunction = int (*)(BITMAPHANDLE* bitmap, uint32_t structSize, uint32_t width, uint32_t height,
                                     uint32_t bitsPerPixel);
using L_AllocateBitmapFunction = int (*)(BITMAPHANDLE* bitmap, int memoryKind);
using L_FreeBitmapFunction = int (*)(BITMAPHANDLE* bitmap);
using L_AccessBitmapFunction = int (*)(BITMAPHANDLE* bitmap);
using L_GetBitmapRowColFunction = int64_t (*)(BITMAPHANDLE* bitmap, uint8_t* destination, uint32_t row,
                                              uint32_t column, uint32_t byteCount);
using L_ReleaseBitmapFunction = int (*)(BITMAPHANDLE* bitmap);
using L_GetDefaultLoadFileOptionFunction = int (*)(LOADFILEOPTION* options, uint32_t structSize);
using L_LoadFileOffsetFunction = int (*)(int fileHandle, uint64_t offset, uint32_t byteCount, BITMAPHANDLE* bitmap,
                                         uint32_t structSize, int bitsPerPixel, int order, uint32_t flags,
                                         LoadProgress progress, void* userData, const LOADFILEOPTION* options,
                                         FILEINFO* info);
using L_LoadMemoryFunction = int (*)(const uint8_t* buffer, BITMAPHANDLE* bitmap, uint32_t structSize,
                                     int bitsPerPixel, int order, uint32_t flags, LoadProgress progress,
                                     void* userData, uint32_t bufferSize, const LOADFILEOPTION* options,
                                     FILEINFO* info);
using L_LoadBitmapMemoryFunction = int (*)(const uint8_t* buffer, BITMAPHANDLE* bitmap, uint32_t structSize,
                                           int bitsPerPixel, int order, uint32_t bufferSize);
// Row loads: start reads the stream's header into info (width, height and
// bitsPerPixel; decodedRows 0) and returns null on failure. Each load fills
// the band bitmap (the frame's width and depth, any height) with the rows from
// firstRow on, decoding on from where the last load stopped or again from the
// top, reading through fileHandle; it returns the rows filled from the band's
// top, fewer when the stream's data runs out or breaks.
using L_StartLoadRowsFunction = ROWLOADER* (*)(const LOADSOURCE* source, uint32_t flags,
                                               const LOADFILEOPTION* options, FILEINFO* info);
using L_LoadRowsFunction = uint32_t (*)(ROWLOADER* loader, int fileHandle, uint32_t firstRow, BITMAPHANDLE* band);
using L_EndLoadRowsFunction = int (*)(ROWLOADER* loader);
