#include "PngWriter.h"

#include <cerrno>
#include <csetjmp>
#include <cstdio>
#include <cstring>
#include <png.h>

namespace host {
namespace {

int ColourType(unsigned channels)
{
    switch (channels) {
    case 3:
        return PNG_COLOR_TYPE_RGB;
    case 4:
        return PNG_COLOR_TYPE_RGB_ALPHA;
    default:
        return PNG_COLOR_TYPE_GRAY;
    }
}

// libpng reports errors by longjmp; no C++ object with a destructor lives
// across the setjmp in this function.
bool WriteRows(FILE* file, uint32_t width, uint32_t height, unsigned channels, const uint8_t* pixels)
{
    png_structp png = png_create_write_struct(PNG_LIBPNG_VER_STRING, nullptr, nullptr, nullptr);
    if (png == nullptr)
        return false;
    png_infop info = png_create_info_struct(png);
    if (info == nullptr || setjmp(png_jmpbuf(png))) {
        png_destroy_write_struct(&png, &info);
        return false;
    }
    png_init_io(png, file);
    png_set_IHDR(png, info, width, height, 8, ColourType(channels),
                 PNG_INTERLACE_NONE, PNG_COMPRESSION_TYPE_DEFAULT, PNG_FILTER_TYPE_DEFAULT);
    png_write_info(png, info);
    const size_t rowBytes = size_t(width) * channels;
    for (uint32_t row = 0; row < height; ++row)
        png_write_row(png, pixels + row * rowBytes);
    png_write_end(png, nullptr);
    png_destroy_write_struct(&png, &info);
    return true;
}

} // namespace

bool WritePng(const std::string& path, uint32_t width, uint32_t height, unsigned channels,
              const std::vector<uint8_t>& pixels, std::string& message)
{
    if (width == 0 || height == 0) {
        message = "the window is empty";
        return false;
    }
    FILE* file = std::fopen(path.c_str(), "wb");
    if (file == nullptr) {
        message = std::strerror(errno);
        return false;
    }
    bool written = WriteRows(file, width, height, channels, pixels.data());
    written = std::fclose(file) == 0 && written;
    if (!written)
        message = "PNG encoding failed";
    return written;
}

} // namespace host
