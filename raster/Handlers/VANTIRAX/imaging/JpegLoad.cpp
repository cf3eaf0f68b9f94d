// JPEG streams of the DCT processes, decoded with libjpeg. libjpeg reports a
// fatal error through error_exit, which must not return: it jumps back to
// the setjmp in DecodeWithLibjpeg, whose frame holds no C++ object that a
// jump would skip. Warnings (a corrupt restart marker, data that ends early)
// are tolerated: the decoder fills what it cannot read, as viewers do.
#include "imaging/BitmapKernel.h"
#include "imaging/FileLoader.h"

#include <csetjmp>
#include <cstdio>

#include <jpeglib.h>

namespace {

constexpr int kGreyComponents = 1;
constexpr int kColourComponents = 3;

struct JpegErrorExit {
    jpeg_error_mgr manager;
    jmp_buf jump;
};

void JumpToErrorPath(j_common_ptr decoder)
{
    std::longjmp(reinterpret_cast<JpegErrorExit*>(decoder->err)->jump, 1);
}

void DropMessage(j_common_ptr, int) {}
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

bool DecodeWithLibjpeg(const LoadRequest& request, jpeg_decompress_struct& decoder, JpegErrorExit& errors)
{
    decoder.err = jpeg_std_error(&errors.manager);
    errors.manager.error_exit = JumpToErrorPath;
    errors.manager.emit_message = DropMessage;
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
    jpeg_start_decompress(&decoder);
    BITMAPHANDLE* bitmap = request.bitmap;
    while (decoder.output_scanline < decoder.output_height) {
        JSAMPROW row = bitmap->pixels + size_t(decoder.output_scanline) * bitmap->bytesPerLine;
        if (jpeg_read_scanlines(&decoder, &row, 1) != 1) {
            jpeg_destroy_decompress(&decoder);
            return false;
        }
    }
    jpeg_finish_decompress(&decoder);
    jpeg_destroy_decompress(&decoder);
    request.info->colorConverted = bitmap->bitsPerPixel == 24 ? 1 : 0;
    return true;
}

}  // namespace

bool LoadJpegStream(const LoadRequest& request)
{
    jpeg_decompress_struct decoder {};
    JpegErrorExit errors {};
    return DecodeWithLibjpeg(request, decoder, errors);
}
