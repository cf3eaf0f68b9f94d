// The affine map from image grid positions to world coordinates that the
// georeference record's three control points define.
//
// Convention: the control points name the corner pixels (0, 0), (w-1, 0) and
// (0, h-1), and their world positions are the image's outer corners: the
// upper-left corner of pixel (0, 0), the upper-right corner of pixel (w-1, 0)
// and the lower-left corner of pixel (0, h-1). On the pixel-corner grid, where
// pixel (c, r) covers [c, c+1) x [r, r+1), the three points therefore sit at
// (0, 0), (w, 0) and (0, h), and one pixel spans a w-th of the top edge. This
// is the GeoTIFF "PixelIsArea" raster space, so the world position of grid
// point (0, 0) is the first control point and adjacent RPF frames, whose
// coverage corners coincide, tile without overlap.
#pragma once

#include "HandlerLibrary.h"

namespace host {

struct GeoTransform {
    double originX = 0, originY = 0; // world position of grid point (0, 0)
    double columnX = 0, columnY = 0; // world step of one column
    double rowX = 0, rowY = 0;       // world step of one row

    double X(double column, double row) const { return originX + column * columnX + row * rowX; }
    double Y(double column, double row) const { return originY + column * columnY + row * rowY; }
    // True when the image is not rotated: columns run along x, rows along y.
    bool NorthUp() const { return columnY == 0 && rowX == 0; }
};

// False with a message when the record is missing, its points are not at
// the corner pixels of the image or its corners span no area.
bool TransformFromGeoRef(const OpenedImage& image, GeoTransform& transform, std::string& message);

// The same map for a window whose first pixel is (column, row) of the image.
GeoTransform ShiftedTo(const GeoTransform& transform, double column, double row);

} // namespace host
