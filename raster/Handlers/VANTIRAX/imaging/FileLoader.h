// The file loader module: decodes a JPEG stream (from an open file or from
// memory) or a TIFF-wrapped CCITT T.4 strip (from memory) into a bitmap, or
// either, read from the file, a band of rows at a time.
#pragma once

#include "imaging/ImagingRecords.h"

#include <cstddef>
#include <vector>

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

ROWLOADER* L_StartLoadRows(const LOADSOURCE* source, uint32_t flags, const LOADFILEOPTION* options, FILEINFO* info);
uint32_t L_LoadRows(ROWLOADER* loader, int fileHandle, uint32_t firstRow, BITMAPHANDLE* band);
int L_EndLoadRows(ROWLOADER* loader);

// The bytes a row loader decodes: the file's stream with the insert in place.
class SplicedSource {
public:
    explicit SplicedSource(const LOADSOURCE& source);
    uint64_t Size() const { return byteCount + insert.size(); }
    // Up to count bytes from position on, all from the file or all from the
    // insert; the count read, 0 past the end or when the file read fails.
    size_t Read(uint64_t position, uint8_t* destination, size_t count);

    uint32_t handle;   // the file, as the load in progress names it

private:
    const uint64_t offset;
    const uint64_t byteCount;
    const uint64_t insertAt;
    const std::vector<uint8_t> insert;
};

// A row decoder of one format; Load is L_LoadRows with the handle set.
struct ROWLOADER {
    explicit ROWLOADER(const LOADSOURCE& stream) : source(stream) {}
    virtual ~ROWLOADER() = default;
    ROWLOADER(const ROWLOADER&) = delete;
    ROWLOADER& operator=(const ROWLOADER&) = delete;
    virtual uint32_t Load(uint32_t firstRow, BITMAPHANDLE* band) = 0;

    SplicedSource source;
};

// The row decoders behind the row loads; null when the header is refused.
ROWLOADER* StartJpegRows(const LOADSOURCE& source, uint32_t flags, const LOADFILEOPTION& options, FILEINFO& info);
ROWLOADER* StartFaxRows(const LOADSOURCE& source, const LOADFILEOPTION& options, FILEINFO& info);
