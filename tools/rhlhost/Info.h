// What a host sees of an opened file, as JSON for programs or as text for people.
#pragma once

#include "HandlerLibrary.h"

#include <string>

namespace host {

void PrintInfoJson(const OpenedImage& image);
void PrintInfoText(const std::string& path, const OpenedImage& image);

// "EPSG:4326 (WGS 84 longitude, latitude in degrees)" and the like; "no
// coordinate system (EPSG code 0)" for kNoEpsgCode.
std::string DescribeCoordinateSystem(uint32_t epsg);

} // namespace host
