// What an image file holds of a drawn window: grey, palette indices with
// their colour map, RGB, or RGB with alpha; its rows pass through one at a time.
#pragma once

#include "HandlerLibrary.h"

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
    std::vector<uint8_t> palette; // Colour::Palette: entries x (r, g, b), at most 256
    int nodata = kNoNodata;       // Colour::Palette: the index that marks no data
    std::vector<uint8_t> greys;   // rows delivered as indices of a grey palette: each index's grey

    unsigned Samples() const;
    size_t RowBytes() const { return size_t(width) * Samples(); }
};

// The palette index that means "masked" (the RPF frame's entry 216), or kNoNodata.
int MaskedIndex(const std::vector<uint8_t>& palette);

// The raster of a width x height window of the image: colour palettes and
// every RPF frame's palette keep their indices and colour map; other palettes
// whose entries are all grey become grey values; RGB rows stay RGB; rows
// without palette are grey.
Raster RasterOf(const OpenedImage& image, uint32_t width, uint32_t height);

// A delivered row in the raster's values, in place: grey palettes' indices become their greys.
void ToRasterRow(const Raster& raster, uint8_t* row);

// The raster with palette indices replaced by their colours, for formats
// written without a colour map; with a nodata index, RGBA with the masked
// pixels transparent black. ExpandRow fills a row of it from a row of the raster.
Raster Expanded(const Raster& raster);
void ExpandRow(const Raster& raster, const uint8_t* row, uint8_t* expanded);

} // namespace host
