// The stand-in host's view of a handler library: the seven exports looked up
// at run time, and the host records read by byte offset. The records are
// defined here on their own, not taken from the library's headers, so that
// the host checks the binary contract independently.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

namespace host {

constexpr size_t kIdentitySize = 2028;
constexpr size_t kHandleSize = 584;

struct Exports {
    int32_t (*isFormat)(const char*);
    int32_t (*identify)(void*);
    int32_t (*open)(void*, const char*);
    int32_t (*startDraw)(void*, void*, const int32_t*, double, uint32_t*);
    int32_t (*getLine)(void*, uint32_t, uint8_t**, uint16_t*);
    int32_t (*endDraw)(void*);
    int32_t (*close)(void*);
};

// Loads the handler file; false with a message when it or an export is missing.
bool LoadHandler(const std::string& path, Exports& exports, std::string& message);

// The georeference record's EPSG code when its corners name no coordinate system.
constexpr uint32_t kNoEpsgCode = 0;

struct ControlPoint {
    double column, row, x, y;
};

// What the host reads from a handle record after RH_Open.
struct OpenedImage {
    int32_t result = 0;
    uint32_t status = 0;
    uint32_t width = 0;
    uint32_t height = 0;
    uint32_t pixelKind = 0;
    bool hasPalette = false;
    std::vector<uint8_t> palette; // entries x (r, g, b)
    bool hasGeoRef = false;
    uint32_t epsg = 0; // kNoEpsgCode: corners in no named coordinate system
    std::vector<ControlPoint> points;
};

// A host-owned handle record, zero-filled.
struct HandleRecord {
    alignas(8) uint8_t bytes[kHandleSize] = {};
};

OpenedImage ReadOpenedImage(const HandleRecord& handle, int32_t result);
uint32_t HandleStatus(const HandleRecord& handle);

// Bytes per delivered pixel for a pixel kind: three for kind 3, else one.
inline size_t BytesPerPixel(uint32_t pixelKind)
{
    return pixelKind == 3 ? 3 : 1;
}

} // namespace host
