// A drawn image ready for an image file: grey, palette indices with their
// colour map, RGB, or RGB with alpha.
#pragma once

#include "Drawing.h"

#include <cstdint>
#include <vector>

namespace host {

enum class Colour { Grey, Palette, Rgb, Rgba };

// An RPF frame's palette: 216 colours or greys and the masked value, entry 216.
constexpr size_t kRpfPaletteEntries = 217;
constexpr int kRpfMaskedIndex = 216;
constexpr int kNoNodata = -1;
constexpr size_t kMaxPaletteEntries = 256;
constexpr uint8_t kOpaque = 255; // alpha

struct Raster {
    uint32_t width = 0, height = 0;
    Colour colour = Colour::Grey;
    std::vector<uint8_t> pixels;  // rows of width x Samples() bytes
    std::vector<uint8_t> palette; // Colour::Palette: entries x (r, g, b), at most 256
    int nodata = kNoNodata;       // Colour::Palette: the index that marks no data

    unsigned Samples() const;
};

// The palette index that means "masked" (the RPF frame's entry 216), or kNoNodata.
int MaskedIndex(const std::vector<uint8_t>& palette);

// Colour palettes and every RPF frame's palette keep their indices and colour
// map; other palettes whose entries are all grey become grey values; RGB rows
// stay RGB; rows without palette are grey.
Raster RasterFromPixels(const OpenedImage& image, const Pixels& pixels);

// Palette indices replaced by their colours, for formats written without a
// colour map; with a nodata index, RGBA with the masked pixels transparent.
Raster Expanded(const Raster& raster);

} // namespace host
