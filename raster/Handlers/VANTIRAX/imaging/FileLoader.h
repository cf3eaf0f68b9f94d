// The file loader module: decodes a JPEG stream (from an open file or from
// memory) or a TIFF-wrapped CCITT T.4 strip (from memory) into a bitmap.
#pragma once

#include "imaging/ImagingRecords.h"

#include <cstddef>

int L_GetDefaultLoadFileOption(LOADFILEOPTION* options, uint32_t structSize);
int L_LoadFileOffset(int fileHandle, uint64_t offset, uint32_t byteCount, BITMAPHANDLE* bitmap, uint32_t structSize,
                     int bitsPerPixel, int order, uint32_t flags, LoadProgress progress, void* userData,
                     const LOADFILEOPTION* options, FILEINFO* info);
int L_LoadMemory(const uint8_t* buffer, BITMAPHANDLE* bitmap, uint32_t structSize, int bitsPerPixel, int order,
                 uint32_t flags, LoadProgress progress, void* userData, uint32_t bufferSize,
                 const LOADFILEOPTION* options, FILEINFO* info);
// L_LoadMemory with the default load options and flags.
int L_LoadBitmapMemory(const uint8_t* buffer, BITMAPHANDLE* bitmap, uint32_t structSize, int bitsPerPixel,
                       int order, uint32_t bufferSize);

// One load as the format decoders see it: the whole stream in memory.
struct LoadRequest {
    const uint8_t* data;
    size_t size;
    uint32_t flags;
    const LOADFILEOPTION* options;
    BITMAPHANDLE* bitmap;
    FILEINFO* info;
};

// The format decoders behind the loads; each answers true when the bitmap
// holds the decoded image.
bool LoadJpegStream(const LoadRequest& request);
bool LoadLosslessJpegStream(const LoadRequest& request);
bool LoadFaxTiff(const LoadRequest& request);
