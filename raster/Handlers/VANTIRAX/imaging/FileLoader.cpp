#include "imaging/FileLoader.h"

#include "imaging/BitmapKernel.h"
#include "plugin/FileCalls.h"

#include <cstdlib>
#include <memory>
#include <new>

namespace {

// The largest side a JPEG frame header can declare, and the pixel store one
// load may allocate unless the caller's options say otherwise.
constexpr uint32_t kDefaultMaxSide = 65535;
constexpr uint64_t kDefaultMaxBitmapBytes = uint64_t(1) << 30;

constexpr uint8_t kMarkerPrefix = 0xFF;
constexpr uint8_t kStartOfImage = 0xD8;
constexpr uint8_t kEndOfImage = 0xD9;
constexpr uint8_t kStartOfScan = 0xDA;
constexpr uint8_t kLosslessFrame = 0xC3;   // SOF3: lossless, Huffman coded

bool IsFrameMarker(uint8_t code)
{
    // SOF0 to SOF15 without DHT (C4), JPG (C8) and DAC (CC).
    return code >= 0xC0 && code <= 0xCF && code != 0xC4 && code != 0xC8 && code != 0xCC;
}

bool IsStandaloneMarker(uint8_t code)
{
    return code == 0x01 || (code >= 0xD0 && code <= 0xD7);
}

// Walks the marker segments after SOI up to the frame header; the result is
// the frame marker's code, or 0 when a scan or the end comes first.
uint8_t FrameMarker(const uint8_t* data, size_t size)
{
    size_t at = 2;
    while (at + 1 < size) {
        if (data[at] != kMarkerPrefix)
            return 0;
        uint8_t code = data[at + 1];
        if (code == kMarkerPrefix) {    // fill byte before a marker
            ++at;
            continue;
        }
        if (IsFrameMarker(code))
            return code;
        if (code == kStartOfScan || code == kEndOfImage || code == kStartOfImage)
            return 0;
        if (IsStandaloneMarker(code)) {
            at += 2;
            continue;
        }
        if (at + 3 >= size)
            return 0;
        at += 2 + ((size_t(data[at + 2]) << 8) | data[at + 3]);
    }
    return 0;
}

bool IsJpegStream(const uint8_t* data, size_t size)
{
    return size >= 2 && data[0] == kMarkerPrefix && data[1] == kStartOfImage;
}

bool IsTiffFile(const uint8_t* data, size_t size)
{
    return size >= 4 && ((data[0] == 'M' && data[1] == 'M' && data[2] == 0 && data[3] == 42) ||
                         (data[0] == 'I' && data[1] == 'I' && data[2] == 42 && data[3] == 0));
}

bool ValidRecords(const BITMAPHANDLE* bitmap, uint32_t structSize, const LOADFILEOPTION* options,
                  const FILEINFO* info)
{
    return bitmap && structSize == sizeof(BITMAPHANDLE) && options && options->structSize == sizeof(LOADFILEOPTION) &&
           info && info->structSize == sizeof(FILEINFO);
}

int Decode(const LoadRequest& request)
{
    FILEINFO& info = *request.info;
    info.width = info.height = info.bitsPerPixel = info.colorConverted = info.decodedRows = 0;
    bool loaded = false;
    if (IsJpegStream(request.data, request.size))
        loaded = FrameMarker(request.data, request.size) == kLosslessFrame ? LoadLosslessJpegStream(request)
                                                                            : LoadJpegStream(request);
    else if (IsTiffFile(request.data, request.size))
        loaded = LoadFaxTiff(request);
    if (!loaded) {
        L_FreeBitmap(request.bitmap);
        info.colorConverted = info.decodedRows = 0;
        return kLoadFailed;
    }
    info.width = request.bitmap->width;
    info.height = request.bitmap->height;
    info.bitsPerPixel = request.bitmap->bitsPerPixel;
    return kLoadSucceeded;
}

}  // namespace

int L_GetDefaultLoadFileOption(LOADFILEOPTION* options, uint32_t structSize)
{
    if (options == nullptr || structSize != sizeof(LOADFILEOPTION))
        return kLoadFailed;
    *options = LOADFILEOPTION{structSize, kDefaultMaxSide, kDefaultMaxSide, kDefaultMaxBitmapBytes};
    return kLoadSucceeded;
}

int L_LoadMemory(const uint8_t* buffer, BITMAPHANDLE* bitmap, uint32_t structSize, int bitsPerPixel, int order,
                 uint32_t flags, LoadProgress /*progress*/, void* /*userData*/, uint32_t bufferSize,
                 const LOADFILEOPTION* options, FILEINFO* info)
{
    if (buffer == nullptr || !ValidRecords(bitmap, structSize, options, info) || bitsPerPixel != kBitsAsStored ||
        (order != kOrderRgb && order != kOrderAsStored))
        return kLoadFailed;
    return Decode(LoadRequest{buffer, bufferSize, flags, options, bitmap, info});
}

// The stream is read whole into memory: the decoders work on one buffer.
int L_LoadFileOffset(int fileHandle, uint64_t offset, uint32_t byteCount, BITMAPHANDLE* bitmap, uint32_t structSize,
                     int bitsPerPixel, int order, uint32_t flags, LoadProgress progress, void* userData,
                     const LOADFILEOPTION* options, FILEINFO* info)
{
    if (fileHandle <= 0)
        return kLoadFailed;
    uint32_t handle = static_cast<uint32_t>(fileHandle);
    uint64_t fileSize = filecalls::Size(handle);
    if (offset > fileSize || byteCount > fileSize - offset)
        return kLoadFailed;
    std::unique_ptr<uint8_t[]> stream(new (std::nothrow) uint8_t[byteCount == 0 ? 1 : byteCount]);
    if (!stream || !filecalls::ReadAt(handle, offset, stream.get(), byteCount))
        return kLoadFailed;
    return L_LoadMemory(stream.get(), bitmap, structSize, bitsPerPixel, order, flags, progress, userData, byteCount,
                        options, info);
}

int L_LoadBitmapMemory(const uint8_t* buffer, BITMAPHANDLE* bitmap, uint32_t structSize, int bitsPerPixel, int order,
                       uint32_t bufferSize)
{
    LOADFILEOPTION options {};
    L_GetDefaultLoadFileOption(&options, sizeof options);
    FILEINFO info {};
    info.structSize = sizeof info;
    uint32_t flags = buffer && IsTiffFile(buffer, bufferSize) ? kLoadFlagsBiLevel : kLoadFlagsJpeg;
    return L_LoadMemory(buffer, bitmap, structSize, bitsPerPixel, order, flags, nullptr, nullptr, bufferSize,
                        &options, &info);
}
