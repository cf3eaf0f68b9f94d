// Writes 8-bit grey, RGB or RGBA PNG files through libpng.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

namespace host {

// pixels: height rows of width x channels bytes (channels 1, 3 or 4). False with the reason.
bool WritePng(const std::string& path, uint32_t width, uint32_t height, unsigned channels,
              const std::vector<uint8_t>& pixels, std::string& message);

} // namespace host
