// Writes a raster as a tiled GeoTIFF through libtiff and libgeotiff, its rows
// taken one at a time: grey, paletted with its colour map, RGB or RGBA,
// LZW-compressed in 256 x 256 tiles, with the model's EPSG code and its
// pixel-corner ("PixelIsArea") transform.
//
// An image wider or taller than 1024 pixels gets internal overviews, each
// half the one before (nearest pixel for palette indices, the mean for grey
// and colour), down to one that fits a tile. The file is laid out
// cloud-optimised: every IFD first, the full resolution's at byte 8, then the
// tiles of the smallest overview up to those of the full resolution.
// Memory stays at one strip of tiles per level: each level's tiles go to a
// temporary file beside the output as its rows arrive, and the file is put
// together from them at the end.
#pragma once

#include "GeoTransform.h"
#include "Raster.h"

#include <memory>
#include <string>

namespace host {

struct GeoReference {
    uint32_t epsg = 0;
    GeoTransform transform;
};

class GeoTiffWriter {
public:
    // geo may be null: a plain TIFF. Without overviews, the full resolution alone.
    GeoTiffWriter(const std::string& path, const Raster& raster, const GeoReference* geo, bool overviews);
    ~GeoTiffWriter(); // removes the temporary files
    GeoTiffWriter(const GeoTiffWriter&) = delete;
    GeoTiffWriter& operator=(const GeoTiffWriter&) = delete;

    // Each false with the reason when the file cannot be written.
    bool Open(std::string& message);
    // One row of raster.RowBytes() bytes, from the top.
    bool AddRow(const uint8_t* row, std::string& message);
    // Once every row is in: writes the file itself.
    bool Finish(std::string& message);

private:
    struct Levels;
    std::unique_ptr<Levels> levels_;
};

} // namespace host
