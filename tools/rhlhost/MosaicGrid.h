// The frames a mosaic can place and the one grid they share.
#pragma once

#include "FileWalk.h"
#include "GeoTransform.h"
#include "HandlerLibrary.h"

#include <string>
#include <vector>

namespace host {

// Every frame of a mosaic is in WGS 84 longitude and latitude.
constexpr uint32_t kMosaicEpsg = 4326;
// The largest mosaic, in pixels.
constexpr double kMaxMosaicPixels = double(1u << 28);
constexpr double kTurnDegrees = 360.0;

struct MosaicFrame {
    std::string path;
    uint32_t width = 0, height = 0;
    uint32_t pixelKind = 0;
    std::vector<uint8_t> palette;
    GeoTransform transform;
};

struct MosaicGrid {
    GeoTransform transform; // north up: originX west, originY north
    uint32_t width = 0, height = 0;

    // The grid position of a frame's first pixel.
    long Column(const MosaicFrame& frame) const;
    long Row(const MosaicFrame& frame) const;
};

struct MosaicFrames {
    std::vector<MosaicFrame> frames;
    std::vector<std::string> refusals; // one message per refused file
    size_t notRecognised = 0;
};

// Opens every file the handler recognises and keeps the north-up EPSG 4326 frames.
MosaicFrames CollectFrames(const Exports& rh, const std::vector<InputFile>& files);

// Drops frames whose scale differs from the first frame's (with a refusal),
// moves the rest into one longitude range (a product across the 180 degree
// meridian stays in one piece) and sizes the grid that holds them; false with
// a message when it is too large.
bool PlanGrid(MosaicFrames& collected, MosaicGrid& grid, std::string& message);

} // namespace host
