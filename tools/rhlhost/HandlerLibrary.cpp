#include "HandlerLibrary.h"

#include "PlatformLibrary.h"

#include <cstring>

namespace host {
namespace {

// Byte offsets of the handle record's fields.
constexpr size_t kWidthOffset = 520;
constexpr size_t kHeightOffset = 524;
constexpr size_t kPixelKindOffset = 532;
constexpr size_t kPaletteOffset = 536;
constexpr size_t kGeoRefOffset = 552;
constexpr size_t kStatusOffset = 560;
// Palette record: signature, entry count, entries pointer.
constexpr size_t kPaletteCountOffset = 4;
constexpr size_t kPaletteEntriesOffset = 8;
// Georeference record: EPSG code, point count, points of six doubles.
constexpr size_t kGeoEpsgOffset = 16;
constexpr size_t kGeoPointCountOffset = 184;
constexpr size_t kGeoPointsOffset = 192;
constexpr size_t kGeoPointSize = 48;
constexpr uint32_t kMaxControlPoints = 3;

template <typename T>
T Read(const void* base, size_t offset)
{
    T value;
    std::memcpy(&value, static_cast<const uint8_t*>(base) + offset, sizeof value);
    return value;
}

template <typename T>
bool Bind(void* library, const char* name, T& function, std::string& message)
{
    void* symbol = FindExport(library, name);
    if (symbol == nullptr) {
        message = std::string("export ") + name + " is missing";
        return false;
    }
    function = reinterpret_cast<T>(symbol);
    return true;
}

} // namespace

bool LoadHandler(const std::string& path, Exports& exports, std::string& message)
{
    std::string reason;
    void* library = OpenLibrary(path, reason);
    if (library == nullptr) {
        message = "cannot load handler " + path + ": " + reason;
        return false;
    }
    return Bind(library, "RH_IsFormat", exports.isFormat, message) &&
           Bind(library, "RH_Identify", exports.identify, message) &&
           Bind(library, "RH_Open", exports.open, message) &&
           Bind(library, "RH_StartDraw", exports.startDraw, message) &&
           Bind(library, "RH_GetLine", exports.getLine, message) &&
           Bind(library, "RH_EndDraw", exports.endDraw, message) &&
           Bind(library, "RH_Close", exports.close, message);
}

uint32_t HandleStatus(const HandleRecord& handle)
{
    return Read<uint32_t>(handle.bytes, kStatusOffset);
}

OpenedImage ReadOpenedImage(const HandleRecord& handle, int32_t result)
{
    OpenedImage image;
    image.result = result;
    image.status = HandleStatus(handle);
    image.width = Read<uint32_t>(handle.bytes, kWidthOffset);
    image.height = Read<uint32_t>(handle.bytes, kHeightOffset);
    image.pixelKind = Read<uint32_t>(handle.bytes, kPixelKindOffset);

    auto* palette = Read<const uint8_t*>(handle.bytes, kPaletteOffset);
    if (palette != nullptr) {
        image.hasPalette = true;
        int32_t count = Read<int32_t>(palette, kPaletteCountOffset);
        auto* entries = Read<const uint8_t*>(palette, kPaletteEntriesOffset);
        if (count > 0 && entries != nullptr)
            image.palette.assign(entries, entries + size_t(count) * 3);
    }

    auto* geoRef = Read<const uint8_t*>(handle.bytes, kGeoRefOffset);
    if (geoRef != nullptr) {
        image.hasGeoRef = true;
        image.epsg = Read<uint32_t>(geoRef, kGeoEpsgOffset);
        uint32_t count = Read<uint32_t>(geoRef, kGeoPointCountOffset);
        for (uint32_t i = 0; i < count && i < kMaxControlPoints; ++i) {
            size_t point = kGeoPointsOffset + i * kGeoPointSize;
            image.points.push_back({Read<double>(geoRef, point), Read<double>(geoRef, point + 8),
                                    Read<double>(geoRef, point + 24), Read<double>(geoRef, point + 32)});
        }
    }
    return image;
}

} // namespace host
