// A TIFF file holding one CCITT T.4 coded image, decoded with libtiff into a
// 1-bit bitmap whose set bits are black: from memory whole, or from the file
// a band of rows at a time. libtiff's messages go to handlers of this open
// alone, which drop them.
#include "base/Limits.h"
#include "imaging/BitmapKernel.h"
#include "imaging/FileLoader.h"

#include <algorithm>
#include <cstring>
#include <memory>
#include <new>

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

// The file a row decoder reads: its spliced stream, at a position.
struct SplicedTiff {
    SplicedSource* bytes;
    uint64_t size;
    uint64_t position;
};

tmsize_t ReadSpliced(thandle_t handle, void* buffer, tmsize_t count)
{
    auto* file = static_cast<SplicedTiff*>(handle);
    auto* out = static_cast<uint8_t*>(buffer);
    tmsize_t done = 0;
    while (done < count) {
        const size_t read = file->bytes->Read(file->position, out + done, size_t(count - done));
        if (read == 0)
            break;
        file->position += read;
        done += tmsize_t(read);
    }
    return done;
}

template <typename File>
toff_t SeekIn(thandle_t handle, toff_t offset, int whence)
{
    auto* file = static_cast<File*>(handle);
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

template <typename File>
toff_t SizeOf(thandle_t handle)
{
    return static_cast<File*>(handle)->size;
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
void MakeSetBitsBlack(TIFF* tiff, uint8_t* pixels, size_t byteCount)
{
    uint16_t photometric = PHOTOMETRIC_MINISWHITE;
    TIFFGetFieldDefaulted(tiff, TIFFTAG_PHOTOMETRIC, &photometric);
    if (photometric != PHOTOMETRIC_MINISBLACK)
        return;
    for (size_t i = 0; i < byteCount; ++i)
        pixels[i] = static_cast<uint8_t>(~pixels[i]);
}

bool ReadFaxSize(TIFF* tiff, uint32_t& width, uint32_t& height)
{
    return IsFaxImage(tiff) && TIFFGetField(tiff, TIFFTAG_IMAGEWIDTH, &width) &&
           TIFFGetField(tiff, TIFFTAG_IMAGELENGTH, &height) && width > 0 && height > 0;
}

TIFF* OpenTiff(thandle_t file, TIFFReadWriteProc read, TIFFSeekProc seek, TIFFSizeProc size)
{
    TIFFOpenOptions* options = TIFFOpenOptionsAlloc();
    if (options == nullptr)
        return nullptr;
    TIFFOpenOptionsSetErrorHandlerExtR(options, DropMessage, nullptr);
    TIFFOpenOptionsSetWarningHandlerExtR(options, DropMessage, nullptr);
    TIFFOpenOptionsSetMaxSingleMemAlloc(options, tmsize_t(kMaxBiLevelLibraryAllocation));
    TIFF* tiff = TIFFClientOpenExt("nitf-bilevel", "rm", file, read, RefuseWrite, seek, CloseMemory, size, RefuseMap,
                                   NoUnmap, options);
    TIFFOpenOptionsFree(options);
    return tiff;
}

bool DecodeRows(TIFF* tiff, const LoadRequest& request)
{
    uint32_t width = 0, height = 0;
    if (!ReadFaxSize(tiff, width, height) || !ShapeBitmap(request.bitmap, width, height, 1, *request.options) ||
        TIFFScanlineSize64(tiff) != request.bitmap->bytesPerLine)
        return false;
    BITMAPHANDLE* bitmap = request.bitmap;
    for (uint32_t row = 0; row < height; ++row)
        if (TIFFReadScanline(tiff, bitmap->pixels + size_t(row) * bitmap->bytesPerLine, row, 0) < 0)
            return false;
    MakeSetBitsBlack(tiff, bitmap->pixels, size_t(bitmap->bytesPerLine) * height);
    request.info->decodedRows = height;
    return true;
}

// The strip read a band of rows at a time through libtiff, which reads the
// strip in pieces when it is not in memory and starts it again when row 0 is
// asked for after others. Rows from one that fails on are never given.
class FaxRows : public ROWLOADER {
public:
    explicit FaxRows(const LOADSOURCE& stream) : ROWLOADER(stream), file{&source, source.Size(), 0} {}
    ~FaxRows() override
    {
        if (tiff != nullptr)
            TIFFClose(tiff);
    }

    bool Start(const LOADFILEOPTION& options, FILEINFO& info)
    {
        tiff = OpenTiff(&file, ReadSpliced, SeekIn<SplicedTiff>, SizeOf<SplicedTiff>);
        if (tiff == nullptr || !ReadFaxSize(tiff, width, height) || width > options.maxWidth ||
            height > options.maxHeight)
            return false;
        info.width = width;
        info.height = height;
        info.bitsPerPixel = 1;
        return true;
    }

    uint32_t Load(uint32_t firstRow, BITMAPHANDLE* band) override
    {
        if (band->width != width || band->bitsPerPixel != 1 || TIFFScanlineSize64(tiff) != band->bytesPerLine)
            return 0;
        // Rows before the band are decoded into its first row: the fax
        // decoder cannot skip them.
        if (firstRow < nextRow)
            nextRow = 0;
        while (nextRow < firstRow && ReadRow(band->pixels)) {
        }
        uint32_t filled = 0;
        while (filled < band->height && nextRow == firstRow + filled &&
               ReadRow(band->pixels + size_t(filled) * band->bytesPerLine))
            ++filled;
        return filled;
    }

private:
    bool ReadRow(uint8_t* row)
    {
        if (nextRow >= std::min(height, lastRow))
            return false;
        if (TIFFReadScanline(tiff, row, nextRow, 0) < 0) {
            lastRow = nextRow;
            return false;
        }
        MakeSetBitsBlack(tiff, row, TIFFScanlineSize64(tiff));
        ++nextRow;
        return true;
    }

    SplicedTiff file;
    TIFF* tiff = nullptr;
    uint32_t width = 0;
    uint32_t height = 0;
    uint32_t nextRow = 0;            // the row libtiff decodes next
    uint32_t lastRow = UINT32_MAX;   // rows from here on cannot be decoded
};

}  // namespace

ROWLOADER* StartFaxRows(const LOADSOURCE& source, const LOADFILEOPTION& options, FILEINFO& info)
{
    std::unique_ptr<FaxRows> rows(new (std::nothrow) FaxRows(source));
    return rows && rows->Start(options, info) ? rows.release() : nullptr;
}

bool LoadFaxTiff(const LoadRequest& request)
{
    MemoryTiff file {request.data, request.size, 0};
    TIFF* tiff = OpenTiff(&file, ReadMemory, SeekIn<MemoryTiff>, SizeOf<MemoryTiff>);
    if (tiff == nullptr)
        return false;
    bool decoded = DecodeRows(tiff, request);
    TIFFClose(tiff);
    return decoded;
}
