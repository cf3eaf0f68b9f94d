// A mosaic's grid painted a strip of rows at a time: each strip is drawn
// from the frames that cross it (each frame opened again for its rows there)
// and handed to the GeoTIFF writer, so that memory holds one strip, never
// the whole grid. Paletted with the frames' shared palette and a nodata
// index when they share one, else RGB with alpha.
#pragma once

#include "HandlerLibrary.h"
#include "MosaicGrid.h"

#include <string>

namespace host {

// Writes the mosaic to output through a temporary name; frames that cannot be
// drawn again and rows that fail are reported on stderr (the rows as nodata).
// False with a message when the file cannot be written.
bool WriteMosaic(const Exports& rh, const MosaicFrames& collected, const MosaicGrid& grid, const std::string& output,
                 bool overviews, uint32_t& failedRows, std::string& message);

} // namespace host
