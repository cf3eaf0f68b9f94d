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

// Without overviews, the full resolution alone.
int RunMosaic(const Exports& rh, const std::vector<std::string>& inputs, const std::string& output, bool overviews);

// The frames of one boundary rectangle of an A.TOC, each where its frame file
// index record puts it on the grid the rectangle spans; frames missing on
// disk or refused are reported and left as nodata.
int RunTocMosaic(const Exports& rh, const std::string& tocPath, size_t product, const std::string& output,
                 bool overviews);

} // namespace host
