#include "plugin/GeoRefRecord.h"

#include <cstdlib>

RHGeoRef* CreateGeoRef(uint32_t epsgCode, uint32_t width, uint32_t height, const double cornersXY[3][2])
{
    auto* geoRef = static_cast<RHGeoRef*>(std::calloc(1, sizeof(RHGeoRef)));
    if (geoRef == nullptr)
        return nullptr;
    geoRef->magic = kGeoRefMagic;
    geoRef->recordSize = sizeof(RHGeoRef);
    geoRef->georeferenced = 1;
    geoRef->epsgCode = epsgCode;
    geoRef->controlPointCount = kGeoRefControlPoints;
    // The pixel positions are the signed width and height less one, as doubles.
    const double lastColumn = static_cast<double>(static_cast<int32_t>(width) - 1);
    const double lastRow = static_cast<double>(static_cast<int32_t>(height) - 1);
    const double pixels[kGeoRefControlPoints][2] = {{0, 0}, {lastColumn, 0}, {0, lastRow}};
    for (uint32_t i = 0; i < kGeoRefControlPoints; ++i) {
        geoRef->points[i].column = pixels[i][0];
        geoRef->points[i].row = pixels[i][1];
        geoRef->points[i].worldX = cornersXY[i][0];
        geoRef->points[i].worldY = cornersXY[i][1];
    }
    return geoRef;
}
