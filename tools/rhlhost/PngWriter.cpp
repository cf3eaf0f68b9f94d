#include "PngWriter.h"

#include <cerrno>
#include <csetjmp>
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

} // namespace

// libpng reports errors by longjmp: every function here that calls it sets
// its jump first, and no C++ object with a destructor lives across it.

PngWriter::~PngWriter()
{
    png_destroy_write_struct(&png_, &info_);
    if (file_ != nullptr)
        std::fclose(file_);
}

bool PngWriter::Open(const std::string& path, uint32_t width, uint32_t height, unsigned channels,
                     std::string& message)
{
    if (width == 0 || height == 0) {
        message = "the window is empty";
        return false;
    }
    file_ = std::fopen(path.c_str(), "wb");
    if (file_ == nullptr) {
        message = std::strerror(errno);
        return false;
    }
    png_ = png_create_write_struct(PNG_LIBPNG_VER_STRING, nullptr, nullptr, nullptr);
    info_ = png_ == nullptr ? nullptr : png_create_info_struct(png_);
    if (info_ == nullptr || setjmp(png_jmpbuf(png_))) {
        failed_ = true;
        message = "PNG encoding failed";
        return false;
    }
    png_init_io(png_, file_);
    png_set_IHDR(png_, info_, width, height, 8, ColourType(channels), PNG_INTERLACE_NONE,
                 PNG_COMPRESSION_TYPE_DEFAULT, PNG_FILTER_TYPE_DEFAULT);
    png_write_info(png_, info_);
    return true;
}

bool PngWriter::AddRow(const uint8_t* row)
{
    if (failed_ || setjmp(png_jmpbuf(png_))) {
        failed_ = true;
        return false;
    }
    png_write_row(png_, row);
    return true;
}

bool PngWriter::Finish(std::string& message)
{
    if (!failed_ && setjmp(png_jmpbuf(png_)) == 0)
        png_write_end(png_, nullptr);
    else
        failed_ = true;
    const bool closed = std::fclose(file_) == 0;
    file_ = nullptr;
    if (failed_ || !closed)
        message = "PNG encoding failed";
    return !failed_ && closed;
}

} // namespace host
