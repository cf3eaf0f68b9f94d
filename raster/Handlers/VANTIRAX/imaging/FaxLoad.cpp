// A TIFF file in memory holding one CCITT T.4 coded image, decoded with
// libtiff into a 1-bit bitmap whose set bits are black. libtiff's messages
// go to handlers of this open alone, which drop them.
#include "base/Limits.h"
#include "imaging/BitmapKernel.h"
#include "imaging/FileLoader.h"

#include <cstring>

#include <tiffio.h>

namespace {

struct MemoryTiff {
    const uint8_t* data;
    uint64_t size;
    uint64_t position;
};

tmsize_t ReadMemory(thandle_t handle, void* buffer, tmsize_t count)
{
    auto* file = static_cast<MemoryTiff*>(handle);
    if (count <= 0 || file->position >= file->size)
        return 0;
    uint64_t available = file->size - file->position;
    uint64_t taken = uint64_t(count) < available ? uint64_t(count) : available;
    std::memcpy(buffer, file->data + file->position, taken);
    file->position += taken;
    return static_cast<tmsize_t>(taken);
}

tmsize_t RefuseWrite(thandle_t, void*, tmsize_t)
{
    return 0;
}

toff_t SeekMemory(thandle_t handle, toff_t offset, int whence)
{
    auto* file = static_cast<MemoryTiff*>(handle);
    uint64_t base = whence == SEEK_CUR ? file->position : whence == SEEK_END ? file->size : 0;
    if (offset > UINT64_MAX - base)
        return static_cast<toff_t>(-1);
    file->position = base + offset;
    return file->position;
}

int CloseMemory(thandle_t)
{
    return 0;
}

toff_t MemorySize(thandle_t handle)
{
    return static_cast<MemoryTiff*>(handle)->size;
}

int RefuseMap(thandle_t, void**, toff_t*)
{
    return 0;
}

void NoUnmap(thandle_t, void*, toff_t) {}

int DropMessage(TIFF*, void*, const char*, const char*, va_list)
{
    return 1;   // handled: nothing reaches libtiff's global handlers
}

bool IsFaxImage(TIFF* tiff)
{
    uint16_t compression = 0, bitsPerSample = 0, samplesPerPixel = 0;
    return TIFFGetFieldDefaulted(tiff, TIFFTAG_COMPRESSION, &compression) &&
           TIFFGetFieldDefaulted(tiff, TIFFTAG_BITSPERSAMPLE, &bitsPerSample) &&
           TIFFGetFieldDefaulted(tiff, TIFFTAG_SAMPLESPERPIXEL, &samplesPerPixel) &&
           compression == COMPRESSION_CCITTFAX3 && bitsPerSample == 1 && samplesPerPixel == 1;
}

// With PhotometricInterpretation 1 (black is zero) the bits are turned over.
void MakeSetBitsBlack(TIFF* tiff, BITMAPHANDLE* bitmap)
{
    uint16_t photometric = PHOTOMETRIC_MINISWHITE;
    TIFFGetFieldDefaulted(tiff, TIFFTAG_PHOTOMETRIC, &photometric);
    if (photometric != PHOTOMETRIC_MINISBLACK)
        return;
    size_t total = size_t(bitmap->bytesPerLine) * bitmap->height;
    for (size_t i = 0; i < total; ++i)
        bitmap->pixels[i] = static_cast<uint8_t>(~bitmap->pixels[i]);
}

bool DecodeRows(TIFF* tiff, const LoadRequest& request)
{
    uint32_t width = 0, height = 0;
    if (!IsFaxImage(tiff) || !TIFFGetField(tiff, TIFFTAG_IMAGEWIDTH, &width) ||
        !TIFFGetField(tiff, TIFFTAG_IMAGELENGTH, &height) ||
        !ShapeBitmap(request.bitmap, width, height, 1, *request.options) ||
        TIFFScanlineSize64(tiff) != request.bitmap->bytesPerLine)
        return false;
    BITMAPHANDLE* bitmap = request.bitmap;
    for (uint32_t row = 0; row < height; ++row)
        if (TIFFReadScanline(tiff, bitmap->pixels + size_t(row) * bitmap->bytesPerLine, row, 0) < 0)
            return false;
    MakeSetBitsBlack(tiff, bitmap);
    request.info->decodedRows = height;
    return true;
}

}  // namespace

bool LoadFaxTiff(const LoadRequest& request)
{
    TIFFOpenOptions* options = TIFFOpenOptionsAlloc();
    if (options == nullptr)
        return false;
    TIFFOpenOptionsSetErrorHandlerExtR(options, DropMessage, nullptr);
    TIFFOpenOptionsSetWarningHandlerExtR(options, DropMessage, nullptr);
    TIFFOpenOptionsSetMaxSingleMemAlloc(options, tmsize_t(kMaxBiLevelLibraryAllocation));
    MemoryTiff file {request.data, request.size, 0};
    TIFF* tiff = TIFFClientOpenExt("nitf-bilevel", "rm", &file, ReadMemory, RefuseWrite, SeekMemory, CloseMemory,
                                   MemorySize, RefuseMap, NoUnmap, options);
    TIFFOpenOptionsFree(options);
    if (tiff == nullptr)
        return false;
    bool decoded = DecodeRows(tiff, request);
    TIFFClose(tiff);
    return decoded;
}
