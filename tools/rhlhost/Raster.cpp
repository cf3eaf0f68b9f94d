#include "Raster.h"

#include <algorithm>
#include <cstring>

namespace host {
namespace {

bool AllGrey(const std::vector<uint8_t>& palette)
{
    for (size_t i = 0; i + 2 < palette.size(); i += 3)
        if (palette[i] != palette[i + 1] || palette[i] != palette[i + 2])
            return false;
    return true;
}

// Indices past the palette's end show its first entry.
size_t EntryOf(uint8_t index, size_t entries)
{
    return index < entries ? index : 0;
}

} // namespace

unsigned Raster::Samples() const
{
    switch (colour) {
    case Colour::Rgb:
        return 3;
    case Colour::Rgba:
        return 4;
    default:
        return 1;
    }
}

int MaskedIndex(const std::vector<uint8_t>& palette)
{
    return palette.size() == kRpfPaletteEntries * 3 ? kRpfMaskedIndex : kNoNodata;
}

Raster RasterOf(const OpenedImage& image, uint32_t width, uint32_t height)
{
    Raster raster;
    raster.width = width;
    raster.height = height;
    if (BytesPerPixel(image.pixelKind) == 3) {
        raster.colour = Colour::Rgb;
        return raster;
    }
    if (image.palette.empty())
        return raster;
    const size_t entries = image.palette.size() / 3;
    // An RPF frame stays paletted even when grey: its entry 216 is the masked value, not a grey level.
    const int masked = MaskedIndex(image.palette);
    if (masked == kNoNodata && AllGrey(image.palette)) {
        for (size_t index = 0; index < kMaxPaletteEntries; ++index)
            raster.greys.push_back(image.palette[EntryOf(uint8_t(index), entries) * 3]);
        return raster;
    }
    raster.colour = Colour::Palette;
    raster.palette.assign(image.palette.begin(),
                          image.palette.begin() + std::min(entries, kMaxPaletteEntries) * 3);
    raster.nodata = masked;
    return raster;
}

void ToRasterRow(const Raster& raster, uint8_t* row)
{
    for (size_t i = 0; !raster.greys.empty() && i < raster.width; ++i)
        row[i] = raster.greys[row[i]];
}

Raster Expanded(const Raster& raster)
{
    if (raster.colour != Colour::Palette)
        return raster;
    Raster rgb = raster;
    rgb.colour = raster.nodata == kNoNodata ? Colour::Rgb : Colour::Rgba;
    rgb.palette.clear();
    rgb.nodata = kNoNodata;
    return rgb;
}

void ExpandRow(const Raster& raster, const uint8_t* row, uint8_t* expanded)
{
    if (raster.colour != Colour::Palette) {
        std::memcpy(expanded, row, raster.RowBytes());
        return;
    }
    const size_t entries = raster.palette.size() / 3, samples = raster.nodata == kNoNodata ? 3 : 4;
    std::memset(expanded, 0, raster.width * samples); // transparent black, as a mosaic leaves masked pixels
    for (size_t i = 0; i < raster.width; ++i) {
        if (row[i] == raster.nodata)
            continue;
        std::memcpy(&expanded[i * samples], &raster.palette[EntryOf(row[i], entries) * 3], 3);
        if (samples == 4)
            expanded[i * 4 + 3] = kOpaque;
    }
}

} // namespace host
