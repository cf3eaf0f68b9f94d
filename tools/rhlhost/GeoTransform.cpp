#include "GeoTransform.h"

#include <cmath>

namespace host {
namespace {

constexpr size_t kControlPointCount = 3;

bool At(const ControlPoint& point, double column, double row)
{
    return point.column == column && point.row == row;
}

} // namespace

bool TransformFromGeoRef(const OpenedImage& image, GeoTransform& transform, std::string& message)
{
    if (!image.hasGeoRef) {
        message = "the image has no georeference";
        return false;
    }
    const std::vector<ControlPoint>& p = image.points;
    const double w = image.width;
    const double h = image.height;
    if (p.size() != kControlPointCount || image.width == 0 || image.height == 0 || !At(p[0], 0, 0) ||
        !At(p[1], w - 1, 0) || !At(p[2], 0, h - 1)) {
        message = "the georeference's control points are not at the image's corner pixels";
        return false;
    }
    transform.originX = p[0].x;
    transform.originY = p[0].y;
    transform.columnX = (p[1].x - p[0].x) / w;
    transform.columnY = (p[1].y - p[0].y) / w;
    transform.rowX = (p[2].x - p[0].x) / h;
    transform.rowY = (p[2].y - p[0].y) / h;
    // Corners on one point or one line (all zero when ICORDS has no form) place nothing.
    const double pixelArea = transform.columnX * transform.rowY - transform.columnY * transform.rowX;
    if (!std::isfinite(pixelArea) || pixelArea == 0) {
        message = "the georeference's corners span no area";
        return false;
    }
    return true;
}

GeoTransform ShiftedTo(const GeoTransform& transform, double column, double row)
{
    GeoTransform shifted = transform;
    shifted.originX = transform.X(column, row);
    shifted.originY = transform.Y(column, row);
    return shifted;
}

} // namespace host
