// JPEG streams of the DCT processes, decoded with libjpeg. libjpeg reports a
// fatal error through error_exit, which must not return: it jumps back to
// the setjmp in DecodeWithLibjpeg, whose frame (and DecodeRows') holds no
// C++ object that a jump would skip. Warnings on damaged data that libjpeg resynchronises past
// (a corrupt restart marker) are tolerated: it fills what it cannot read, as
// viewers do. Data that runs out is not: libjpeg would go on decoding zeros
// for the rest of the frame, so decoding stops there and the bitmap holds
// only the rows decoded before.
#include "imaging/BitmapKernel.h"
#include "imaging/FileLoader.h"
#include "imaging/JpegMarkers.h"

#include <csetjmp>
#include <cstdio>

#include <jpeglib.h>

namespace {

constexpr int kGreyComponents = 1;
constexpr int kColourComponents = 3;
constexpr int kWarningLevel = -1;

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
    decoder.err = jpeg_std_error(&errors.manager);
    errors.manager.error_exit = JumpToErrorPath;
    errors.manager.emit_message = NoteWarning;
    errors.manager.output_message = DropOutput;
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

}  // namespace

bool LoadJpegStream(const LoadRequest& request)
{
    jpeg_decompress_struct decoder {};
    JpegErrorExit errors {};
    return DecodeWithLibjpeg(request, decoder, errors);
}
