#include "Raster.h"

#include <algorithm>
#include <cstring>

namespace host {
namespace {

constexpr size_t kMaxPaletteEntries = 256;

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
    if (AllGrey(image.palette)) {
        for (uint8_t& value : raster.pixels)
            value = image.palette[EntryOf(value, entries) * 3];
        return raster;
    }
    raster.colour = Colour::Palette;
    raster.palette.assign(image.palette.begin(),
                          image.palette.begin() + std::min(entries, kMaxPaletteEntries) * 3);
    raster.nodata = MaskedIndex(image.palette);
    return raster;
}

Raster Expanded(const Raster& raster)
{
    if (raster.colour != Colour::Palette)
        return raster;
    Raster rgb = raster;
    rgb.colour = Colour::Rgb;
    rgb.palette.clear();
    rgb.nodata = kNoNodata;
    const size_t entries = raster.palette.size() / 3;
    rgb.pixels.resize(raster.pixels.size() * 3);
    for (size_t i = 0; i < raster.pixels.size(); ++i)
        std::memcpy(&rgb.pixels[i * 3], &raster.palette[EntryOf(raster.pixels[i], entries) * 3], 3);
    return rgb;
}

} // namespace host
