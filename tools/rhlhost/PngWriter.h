// Writes 8-bit grey, RGB or RGBA PNG files through libpng, a row at a time.
#pragma once

#include <cstdint>
#include <cstdio>
#include <string>

struct png_struct_def;
struct png_info_def;

namespace host {

class PngWriter {
public:
    PngWriter() = default;
    ~PngWriter();
    PngWriter(const PngWriter&) = delete;
    PngWriter& operator=(const PngWriter&) = delete;

    // channels 1, 3 or 4. False with the reason.
    bool Open(const std::string& path, uint32_t width, uint32_t height, unsigned channels, std::string& message);
    // One row of width x channels bytes, from the top.
    bool AddRow(const uint8_t* row);
    // Once every row is in; false with the reason.
    bool Finish(std::string& message);

private:
    FILE* file_ = nullptr;
    png_struct_def* png_ = nullptr;
    png_info_def* info_ = nullptr;
    bool failed_ = false;
};

} // namespace host
