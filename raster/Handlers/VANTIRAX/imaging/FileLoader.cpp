#include "imaging/FileLoader.h"

#include "imaging/BitmapKernel.h"
#include "imaging/JpegMarkers.h"

#include "base/CheckedMath.h"
#include "base/FileCalls.h"
#include "base/Limits.h"

#include <algorithm>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <new>

namespace {

// The largest side a JPEG frame header can declare: what one load may
// declare unless the caller's options say otherwise.
constexpr uint32_t kDefaultMaxSide = 65535;

// The code of the stream's frame marker, or 0 when a scan, the end or a
// break in the marker segments comes first.
uint8_t FrameMarker(const uint8_t* data, size_t size)
{
    JpegMemoryBytes bytes(data, size);
    JpegMarkerWalk walk(bytes);
    JpegSegment segment;
    while (walk.Next(segment) && segment.code != kStartOfScan)
        if (IsFrameMarker(segment.code))
            return segment.code;
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

bool StartsWithSoi(SplicedSource& source)
{
    uint8_t head[2] = {};
    return source.Read(0, head, 1) == 1 && source.Read(1, head + 1, 1) == 1 && IsJpegStream(head, sizeof head);
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
    *options = LOADFILEOPTION{structSize, kDefaultMaxSide, kDefaultMaxSide, kMaxDecodedCacheBytes};
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
    if (!SpanWithin(offset, byteCount, fileSize))
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

SplicedSource::SplicedSource(const LOADSOURCE& source)
    : handle(static_cast<uint32_t>(source.fileHandle)), offset(source.offset), byteCount(source.byteCount),
      insertAt(source.insertAt), insert(source.insert, source.insert + source.insertSize)
{
}

size_t SplicedSource::Read(uint64_t position, uint8_t* destination, size_t count)
{
    const uint64_t insertEnd = insertAt + insert.size();
    if (position >= Size() || count == 0)
        return 0;
    if (position >= insertAt && position < insertEnd) {
        const size_t taken = size_t(std::min<uint64_t>(count, insertEnd - position));
        std::memcpy(destination, insert.data() + (position - insertAt), taken);
        return taken;
    }
    const uint64_t fileStart = position < insertAt ? position : position - insert.size();
    const uint64_t pieceEnd = position < insertAt ? insertAt : byteCount;
    const auto taken = uint32_t(std::min<uint64_t>({count, pieceEnd - fileStart, UINT32_MAX}));
    return filecalls::ReadAt(handle, offset + fileStart, destination, taken) ? taken : 0;
}

// The source must lie within the file and the insert within the stream; a
// stream starting with SOI goes to the JPEG decoder, any other to the fax one.
ROWLOADER* L_StartLoadRows(const LOADSOURCE* source, uint32_t flags, const LOADFILEOPTION* options, FILEINFO* info)
{
    if (source == nullptr || source->structSize != sizeof(LOADSOURCE) || source->fileHandle <= 0 ||
        options == nullptr || options->structSize != sizeof(LOADFILEOPTION) || info == nullptr ||
        info->structSize != sizeof(FILEINFO) || (source->insert == nullptr && source->insertSize != 0) ||
        source->insertAt > source->byteCount ||
        !SpanWithin(source->offset, source->byteCount, filecalls::Size(uint32_t(source->fileHandle))))
        return nullptr;
    *info = FILEINFO{sizeof(FILEINFO), 0, 0, 0, 0, 0};
    SplicedSource head(*source);
    return StartsWithSoi(head) ? StartJpegRows(*source, flags, *options, *info)
                               : StartFaxRows(*source, *options, *info);
}

uint32_t L_LoadRows(ROWLOADER* loader, int fileHandle, uint32_t firstRow, BITMAPHANDLE* band)
{
    if (loader == nullptr || fileHandle <= 0 || band == nullptr || band->pixels == nullptr)
        return 0;
    loader->source.handle = static_cast<uint32_t>(fileHandle);
    return loader->Load(firstRow, band);
}

int L_EndLoadRows(ROWLOADER* loader)
{
    delete loader;
    return kLoadSucceeded;
}
