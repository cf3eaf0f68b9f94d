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

Raster RasterFromPixels(const OpenedImage& image, const Pixels& pixels)
{
    Raster raster;
    raster.width = pixels.width;
    raster.height = pixels.height;
    raster.pixels = pixels.bytes;
    if (pixels.bytesPerPixel == 3) {
        raster.colour = Colour::Rgb;
        return raster;
    }
    if (image.palette.empty())
        return raster;
    const size_t entries = image.palette.size() / 3;
    // An RPF frame stays paletted even when grey: its entry 216 is the masked value, not a grey level.
    const int masked = MaskedIndex(image.palette);
    if (masked == kNoNodata && AllGrey(image.palette)) {
        for (uint8_t& value : raster.pixels)
            value = image.palette[EntryOf(value, entries) * 3];
        return raster;
    }
    raster.colour = Colour::Palette;
    raster.palette.assign(image.palette.begin(),
                          image.palette.begin() + std::min(entries, kMaxPaletteEntries) * 3);
    raster.nodata = masked;
    return raster;
}

Raster Expanded(const Raster& raster)
{
    if (raster.colour != Colour::Palette)
        return raster;
    Raster rgb = raster;
    rgb.colour = raster.nodata == kNoNodata ? Colour::Rgb : Colour::Rgba;
    rgb.palette.clear();
    rgb.nodata = kNoNodata;
    const size_t entries = raster.palette.size() / 3, samples = rgb.Samples();
    rgb.pixels.assign(raster.pixels.size() * samples, 0);
    for (size_t i = 0; i < raster.pixels.size(); ++i) {
        if (raster.pixels[i] == raster.nodata)
            continue; // transparent black, as a mosaic leaves masked pixels
        std::memcpy(&rgb.pixels[i * samples], &raster.palette[EntryOf(raster.pixels[i], entries) * 3], 3);
        if (samples == 4)
            rgb.pixels[i * 4 + 3] = kOpaque;
    }
    return rgb;
}

} // namespace host
