// Writes a raster as a GeoTIFF through libtiff and libgeotiff: grey, paletted
// with its colour map, RGB or RGBA, LZW-compressed, with the model's EPSG code
// and its pixel-corner ("PixelIsArea") transform.
#pragma once

#include "GeoTransform.h"
#include "Raster.h"

#include <string>

namespace host {

struct GeoReference {
    uint32_t epsg = 0;
    GeoTransform transform;
};

// geo may be null: a plain TIFF. False with the reason when the file cannot be written.
bool WriteGeoTiff(const std::string& path, const Raster& raster, const GeoReference* geo, std::string& message);

} // namespace host
