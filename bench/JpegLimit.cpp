#include "bench/JpegLimit.h"

#include <csetjmp>
#include <cstdio>
#include <jpeglib.h>

namespace {

struct ErrorTrap {
    jpeg_error_mgr manager;
    jmp_buf exit;
};

void Escape(j_common_ptr info)
{
    longjmp(reinterpret_cast<ErrorTrap*>(info->err)->exit, 1);
}

void Silence(j_common_ptr, int) {}

// Decodes one stream starting at data; the bytes it used go to consumed.
bool DecodeOne(const uint8_t* data, size_t size, std::vector<uint8_t>& pixels, size_t& consumed)
{
    jpeg_decompress_struct info {};
    ErrorTrap trap {};
    info.err = jpeg_std_error(&trap.manager);
    trap.manager.error_exit = Escape;
    trap.manager.emit_message = Silence;
    if (setjmp(trap.exit)) {
        jpeg_destroy_decompress(&info);
        return false;
    }
    jpeg_create_decompress(&info);
    jpeg_mem_src(&info, data, static_cast<unsigned long>(size));
    jpeg_read_header(&info, TRUE);
    jpeg_start_decompress(&info);
    const size_t stride = size_t(info.output_width) * info.output_components;
    if (pixels.size() < stride * info.output_height)
        pixels.resize(stride * info.output_height);
    while (info.output_scanline < info.output_height) {
        JSAMPROW row = pixels.data() + stride * info.output_scanline;
        jpeg_read_scanlines(&info, &row, 1);
    }
    jpeg_finish_decompress(&info);
    consumed = size - info.src->bytes_in_buffer;
    jpeg_destroy_decompress(&info);
    return true;
}

bool StartsStream(const std::vector<uint8_t>& file, size_t at)
{
    return at + 3 <= file.size() && file[at] == 0xFF && file[at + 1] == 0xD8 && file[at + 2] == 0xFF;
}

} // namespace

std::vector<JpegStream> FindJpegStreams(const std::vector<uint8_t>& file, size_t maxStreams)
{
    std::vector<JpegStream> streams;
    std::vector<uint8_t> pixels;
    size_t at = 0;
    while (at < file.size() && streams.size() < maxStreams) {
        if (!StartsStream(file, at)) {
            ++at;
            continue;
        }
        size_t consumed = 0;
        if (!DecodeOne(file.data() + at, file.size() - at, pixels, consumed) || consumed == 0)
            break;
        streams.push_back({at, consumed});
        at += consumed;
    }
    return streams;
}

bool DecodeJpegStreams(const std::vector<uint8_t>& file, const std::vector<JpegStream>& streams,
                       std::vector<uint8_t>& pixels)
{
    for (const JpegStream& stream : streams) {
        size_t consumed = 0;
        if (!DecodeOne(file.data() + stream.offset, stream.length, pixels, consumed))
            return false;
    }
    return true;
}
