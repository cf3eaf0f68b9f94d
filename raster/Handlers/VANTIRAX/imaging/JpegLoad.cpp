// JPEG streams of the DCT processes, decoded with libjpeg, whole from memory
// or a band of rows at a time from the file. libjpeg reports a fatal error
// through error_exit, which must not return: it jumps back to the setjmp in
// DecodeWithLibjpeg or in a row decoder's Start or Load, whose frames (and
// those of the functions they call) hold no C++ object that a jump would
// skip. Warnings on damaged data that libjpeg resynchronises past
// (a corrupt restart marker) are tolerated: it fills what it cannot read, as
// viewers do. Data that runs out is not: libjpeg would go on decoding zeros
// for the rest of the frame, so decoding stops there and only the rows
// decoded before are given.
#include "imaging/BitmapKernel.h"
#include "imaging/FileLoader.h"
#include "imaging/JpegMarkers.h"

#include <algorithm>
#include <csetjmp>
#include <cstdio>
#include <memory>
#include <new>

#include <jpeglib.h>
#include <jerror.h>

namespace {

constexpr int kGreyComponents = 1;
constexpr int kColourComponents = 3;
constexpr int kWarningLevel = -1;
const JOCTET kSuppliedEndOfImage[2] = {kMarkerPrefix, kEndOfImage};

struct JpegErrorExit {
    jpeg_error_mgr manager;
    jmp_buf jump;
    bool dataRanOut;
};

void JumpToErrorPath(j_common_ptr decoder)
{
    std::longjmp(reinterpret_cast<JpegErrorExit*>(decoder->err)->jump, 1);
}

// A warning met while the entropy decoder's next marker is EOI: the scan
// wanted more data than the stream holds. The EOI is the stream's own, or the
// one libjpeg's memory source supplies when it has no more bytes (after
// "premature end of JPEG file"); that warning alone is no proof, as reading
// ahead past the last coded byte of a stream without EOI raises it too.
void NoteWarning(j_common_ptr common, int level)
{
    auto* decoder = reinterpret_cast<j_decompress_ptr>(common);
    if (level == kWarningLevel && decoder->unread_marker == kEndOfImage)
        reinterpret_cast<JpegErrorExit*>(common->err)->dataRanOut = true;
}

void DropOutput(j_common_ptr) {}

void RouteErrors(jpeg_decompress_struct& decoder, JpegErrorExit& errors)
{
    decoder.err = jpeg_std_error(&errors.manager);
    errors.manager.error_exit = JumpToErrorPath;
    errors.manager.emit_message = NoteWarning;
    errors.manager.output_message = DropOutput;
}

// Refuses component counts other than one and three; chooses the colour
// space of the output. Progressive frames are decoded too: their coefficient
// buffers grow with the frame, which the load options bound as they bound
// the bitmap, and are held to max_memory_to_use (there is no backing store:
// a frame that needs more fails).
bool AcceptFrame(jpeg_decompress_struct& decoder, uint32_t flags)
{
    if (decoder.num_components == kGreyComponents) {
        decoder.out_color_space = JCS_GRAYSCALE;
        return true;
    }
    if (decoder.num_components != kColourComponents)
        return false;
    if (flags & kLoadFlagRgbStream)
        decoder.jpeg_color_space = JCS_RGB;
    decoder.out_color_space = JCS_RGB;
    return true;
}

// Rows into the bitmap until the frame is done or its data runs out; the
// count of rows wholly decoded from the stream. Rows of the call that met the
// end may hold zeros, and so may the rest of their MCU row.
uint32_t DecodeRows(jpeg_decompress_struct& decoder, const JpegErrorExit& errors, BITMAPHANDLE* bitmap)
{
    uint32_t decoded = 0;
    while (!errors.dataRanOut && decoder.output_scanline < decoder.output_height) {
        JSAMPROW row = bitmap->pixels + size_t(decoder.output_scanline) * bitmap->bytesPerLine;
        if (jpeg_read_scanlines(&decoder, &row, 1) != 1)
            break;
        if (!errors.dataRanOut)
            decoded = decoder.output_scanline;
    }
    return decoded;
}

bool DecodeWithLibjpeg(const LoadRequest& request, jpeg_decompress_struct& decoder, JpegErrorExit& errors)
{
    RouteErrors(decoder, errors);
    if (setjmp(errors.jump)) {
        jpeg_destroy_decompress(&decoder);
        return false;
    }
    jpeg_create_decompress(&decoder);
    decoder.mem->max_memory_to_use = static_cast<long>(request.options->maxBytes);
    jpeg_mem_src(&decoder, request.data, static_cast<unsigned long>(request.size));
    if (jpeg_read_header(&decoder, TRUE) != JPEG_HEADER_OK || !AcceptFrame(decoder, request.flags) ||
        !ShapeBitmap(request.bitmap, decoder.image_width, decoder.image_height,
                     decoder.num_components == kColourComponents ? 24 : 8, *request.options)) {
        jpeg_destroy_decompress(&decoder);
        return false;
    }
    // Streams of several scans are read whole here, and may run out here.
    jpeg_start_decompress(&decoder);
    BITMAPHANDLE* bitmap = request.bitmap;
    const uint32_t decoded = DecodeRows(decoder, errors, bitmap);
    if (decoded == bitmap->height)
        jpeg_finish_decompress(&decoder);
    jpeg_destroy_decompress(&decoder);
    request.info->colorConverted = bitmap->bitsPerPixel == 24 ? 1 : 0;
    request.info->decodedRows = decoded;
    return decoded > 0;
}

// libjpeg's source for a row decoder: the stream a chunk at a time; past its
// end, or where the file cannot be read, the EOI that jpeg_mem_src supplies
// too, with the same warning.
struct ChunkSource {
    jpeg_source_mgr manager;
    SplicedSource* bytes;
    uint64_t position;
    JOCTET chunk[kRowLoaderChunkBytes];
};

void StartSource(j_decompress_ptr decoder)
{
    auto* source = reinterpret_cast<ChunkSource*>(decoder->src);
    source->position = 0;
    source->manager.bytes_in_buffer = 0;
}

boolean FillChunk(j_decompress_ptr decoder)
{
    auto* source = reinterpret_cast<ChunkSource*>(decoder->src);
    const size_t count = source->bytes->Read(source->position, source->chunk, sizeof source->chunk);
    if (count == 0) {
        WARNMS(decoder, JWRN_JPEG_EOF);
        source->manager.next_input_byte = kSuppliedEndOfImage;
        source->manager.bytes_in_buffer = sizeof kSuppliedEndOfImage;
        return TRUE;
    }
    source->position += count;
    source->manager.next_input_byte = source->chunk;
    source->manager.bytes_in_buffer = count;
    return TRUE;
}

// Bytes past the chunk are skipped by reading on from beyond them.
void SkipBytes(j_decompress_ptr decoder, long count)
{
    auto* source = reinterpret_cast<ChunkSource*>(decoder->src);
    if (count <= 0)
        return;
    const size_t held = source->manager.bytes_in_buffer;
    if (size_t(count) <= held) {
        source->manager.next_input_byte += count;
        source->manager.bytes_in_buffer -= size_t(count);
        return;
    }
    source->position += uint64_t(count) - held;
    source->manager.bytes_in_buffer = 0;
}

void EndSource(j_decompress_ptr) {}

// One stream decoded a band of rows at a time: the decoder stays at the next
// row, and a band above it decodes again from the top. Rows from the one the
// data ran out in on are never given.
class JpegRows : public ROWLOADER {
public:
    JpegRows(const LOADSOURCE& stream, uint32_t loadFlags, const LOADFILEOPTION& loadOptions)
        : ROWLOADER(stream), flags(loadFlags), options(loadOptions)
    {
        input.bytes = &source;
    }
    ~JpegRows() override { Close(); }

    bool Start(FILEINFO& info)
    {
        if (setjmp(errors.jump)) {
            Close();
            return false;
        }
        if (!Open())
            return false;
        info.width = decoder.output_width;
        info.height = decoder.output_height;
        info.bitsPerPixel = PixelBits();
        info.colorConverted = info.bitsPerPixel == 24 ? 1 : 0;
        return true;
    }

    uint32_t Load(uint32_t firstRow, BITMAPHANDLE* band) override
    {
        filled = 0;
        if (setjmp(errors.jump)) {
            lastRow = std::min<uint32_t>(uint32_t(lastRow), open ? decoder.output_scanline : 0);
            Close();
            return filled;
        }
        if (firstRow >= lastRow)
            return 0;
        if (open && firstRow < decoder.output_scanline)
            Close();
        if (band->width != width || band->bitsPerPixel != bits || (!open && !Open()))
            return 0;
        while (decoder.output_scanline < firstRow && ReadRow(band->pixels)) {
        }
        while (filled < band->height && decoder.output_scanline == firstRow + filled &&
               ReadRow(band->pixels + size_t(filled) * band->bytesPerLine))
            ++filled;
        return filled;
    }

private:
    uint32_t PixelBits() const { return decoder.out_color_components == kColourComponents ? 24 : 8; }

    // Reads the header and starts the decoder at the first row.
    bool Open()
    {
        errors.dataRanOut = false;
        RouteErrors(decoder, errors);
        jpeg_create_decompress(&decoder);
        open = true;
        decoder.mem->max_memory_to_use = static_cast<long>(options.maxBytes);
        input.manager = jpeg_source_mgr{nullptr, 0, StartSource, FillChunk, SkipBytes, jpeg_resync_to_restart,
                                        EndSource};
        decoder.src = &input.manager;
        if (jpeg_read_header(&decoder, TRUE) != JPEG_HEADER_OK || !AcceptFrame(decoder, flags) ||
            decoder.image_width == 0 || decoder.image_height == 0 || decoder.image_width > options.maxWidth ||
            decoder.image_height > options.maxHeight) {
            Close();
            return false;
        }
        jpeg_start_decompress(&decoder);
        width = decoder.output_width;
        bits = PixelBits();
        return true;
    }

    // The next row; false from the row the data ran out in on.
    bool ReadRow(uint8_t* row)
    {
        const uint32_t next = decoder.output_scanline;
        JSAMPROW rows[1] = {row};
        if (next >= lastRow || next >= decoder.output_height || jpeg_read_scanlines(&decoder, rows, 1) != 1 ||
            errors.dataRanOut) {
            lastRow = std::min<uint32_t>(uint32_t(lastRow), next);
            return false;
        }
        return true;
    }

    void Close()
    {
        if (open)
            jpeg_destroy_decompress(&decoder);
        open = false;
    }

    const uint32_t flags;
    const LOADFILEOPTION options;
    jpeg_decompress_struct decoder {};
    JpegErrorExit errors {};
    ChunkSource input {};
    // Written between setjmp and a jump that may return to it.
    volatile bool open = false;
    volatile uint32_t filled = 0;
    volatile uint32_t lastRow = UINT32_MAX;   // rows from here on are not in the stream's data
    uint32_t width = 0;
    uint32_t bits = 0;
};

}  // namespace

ROWLOADER* StartJpegRows(const LOADSOURCE& source, uint32_t flags, const LOADFILEOPTION& options, FILEINFO& info)
{
    std::unique_ptr<JpegRows> rows(new (std::nothrow) JpegRows(source, flags, options));
    return rows && rows->Start(info) ? rows.release() : nullptr;
}

bool LoadJpegStream(const LoadRequest& request)
{
    jpeg_decompress_struct decoder {};
    JpegErrorExit errors {};
    return DecodeWithLibjpeg(request, decoder, errors);
}
