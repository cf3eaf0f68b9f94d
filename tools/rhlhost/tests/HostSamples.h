// Files the stand-in host's tests render: RPF frames and plain NITF images
// with known corners, and files the handler must refuse.
#pragma once

#include "tests/fixtures/RpfFrameWriter.h"

#include <set>
#include <string>

// A CADRG (or CIB) frame of the pattern image at these corners.
std::string FrameFile(const RpfCorners& corners = {}, RpfProduct product = RpfProduct::Cadrg,
                      const std::set<uint32_t>& maskedSubframes = {});
// A frame with only its first subframe stored: small, quick to write in bulk.
std::string SmallFrameFile(const RpfCorners& corners = {});
// A 40 x 30 RGB image with UTM zone 33 north corners (ICORDS "N").
std::string UtmRgbImage();
// A 20 x 10 grey image whose decimal-degree corners are rotated (not north up).
std::string RotatedGreyImage();
// An RPFHDR file whose RPF sections are missing: recognised, then refused at open.
std::string BrokenFrame();

// Corners of the UTM image: upper-left easting and northing, metres per pixel.
constexpr double kUtmWest = 500000.0, kUtmNorth = 4400000.0, kUtmPixel = 25.0;
