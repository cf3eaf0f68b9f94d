// Places the frames of a CADRG or CIB product (EPSG 4326, north up, one
// scale) by their corners onto one grid and writes it as one GeoTIFF: with
// the frames' shared palette and the masked value as nodata, or as RGB with
// alpha when the frames' colours differ. Frames that cannot be placed are
// refused with a message; the others are still placed.
#pragma once

#include "HandlerLibrary.h"
#include "MosaicGrid.h"

#include <string>
#include <vector>

namespace host {

int RunMosaic(const Exports& rh, const std::vector<std::string>& inputs, const std::string& output);

// The frames of one boundary rectangle of an A.TOC, each where its frame file
// index record puts it on the grid the rectangle spans; frames missing on
// disk or refused are reported and left as nodata.
int RunTocMosaic(const Exports& rh, const std::string& tocPath, size_t product, const std::string& output);

// Draws the frames onto a canvas of the grid (see RunMosaic for its kind) and
// writes it; false with a message when it cannot be written.
bool PaintAndWrite(const Exports& rh, const std::vector<MosaicFrame>& frames, const MosaicGrid& grid,
                   const std::string& output, uint32_t& failedRows, std::string& message);

} // namespace host
