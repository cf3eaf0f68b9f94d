// Builds the host-visible georeference record: three control points that tie
// the image's upper-left, upper-right and lower-left pixels to world x/y.
#pragma once

#include "plugin/HostRecords.h"

constexpr uint32_t kEpsgGeographic = 4326;

// Zero-filled, malloc'ed record with magic, size, flag, EPSG code and the
// points (0,0), (width-1,0), (0,height-1) tied to cornersXY[0..2]. Null when
// the allocation fails.
RHGeoRef* CreateGeoRef(uint32_t epsgCode, uint32_t width, uint32_t height, const double cornersXY[3][2]);
