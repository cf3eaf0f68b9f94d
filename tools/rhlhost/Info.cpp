#include "Info.h"

#include "Drawing.h"
#include "GeoTransform.h"

#include <cstdio>

namespace host {
namespace {

constexpr uint32_t kWgs84Geographic = 4326;
constexpr uint32_t kUtmNorthBase = 32600;
constexpr uint32_t kUtmSouthBase = 32700;
constexpr uint32_t kUtmZones = 60;

const char* DescribePixelKind(uint32_t kind)
{
    switch (kind) {
    case 0:
        return "one byte per pixel, no palette";
    case 1:
        return "one byte per pixel, an index into the colour palette";
    case 2:
        return "one byte per pixel, an index into the grey palette";
    case 3:
        return "three bytes per pixel: red, green, blue";
    default:
        return "unknown";
    }
}

bool IsUtm(uint32_t epsg, uint32_t base)
{
    return epsg > base && epsg <= base + kUtmZones;
}

void PrintCorner(const char* name, uint32_t epsg, double x, double y)
{
    if (epsg == kWgs84Geographic)
        std::printf("  %-12s longitude %.9f  latitude %.9f\n", name, x, y);
    else
        std::printf("  %-12s x %.3f  y %.3f\n", name, x, y);
}

void PrintPalette(const OpenedImage& image)
{
    if (!image.hasPalette) {
        std::printf("palette     none\n");
        return;
    }
    const size_t entries = image.palette.size() / 3;
    std::printf("palette     %zu entries", entries);
    if (entries > 0) {
        const uint8_t* last = &image.palette[(entries - 1) * 3];
        std::printf(", the last %u, %u, %u", last[0], last[1], last[2]);
    }
    std::printf("\n");
}

void PrintGeoReference(const OpenedImage& image)
{
    if (!image.hasGeoRef) {
        std::printf("georef      none\n");
        return;
    }
    std::printf("georef      %s\n", DescribeCoordinateSystem(image.epsg).c_str());
    GeoTransform t;
    std::string message;
    if (!TransformFromGeoRef(image, t, message)) {
        std::printf("  %s\n", message.c_str());
        return;
    }
    const double w = image.width;
    const double h = image.height;
    PrintCorner("upper left", image.epsg, t.X(0, 0), t.Y(0, 0));
    PrintCorner("upper right", image.epsg, t.X(w, 0), t.Y(w, 0));
    PrintCorner("lower left", image.epsg, t.X(0, h), t.Y(0, h));
    PrintCorner("lower right", image.epsg, t.X(w, h), t.Y(w, h));
    std::printf("  %-12s %.12g x %.12g per pixel\n", "pixel size", t.columnX, -t.rowY);
}

} // namespace

std::string DescribeCoordinateSystem(uint32_t epsg)
{
    if (epsg == kNoEpsgCode)
        return "no coordinate system (EPSG code 0)";
    std::string code = "EPSG:" + std::to_string(epsg);
    if (epsg == kWgs84Geographic)
        return code + " (WGS 84 longitude, latitude in degrees)";
    if (IsUtm(epsg, kUtmNorthBase))
        return code + " (WGS 84 / UTM zone " + std::to_string(epsg - kUtmNorthBase) + "N, metres)";
    if (IsUtm(epsg, kUtmSouthBase))
        return code + " (WGS 84 / UTM zone " + std::to_string(epsg - kUtmSouthBase) + "S, metres)";
    return code;
}

void PrintInfoJson(const OpenedImage& image)
{
    std::printf("{\"result\": %d, \"status\": %u, \"width\": %u, \"height\": %u, \"pixelKind\": %u, \"palette\": ",
                image.result, image.status, image.width, image.height, image.pixelKind);
    if (!image.hasPalette) {
        std::printf("null");
    } else {
        std::printf("[");
        for (size_t i = 0; i + 2 < image.palette.size(); i += 3)
            std::printf("%s[%u, %u, %u]", i ? ", " : "", image.palette[i], image.palette[i + 1], image.palette[i + 2]);
        std::printf("]");
    }
    std::printf(", \"georef\": ");
    if (!image.hasGeoRef) {
        std::printf("null");
    } else {
        std::printf("{\"epsg\": %u, \"points\": [", image.epsg);
        for (size_t i = 0; i < image.points.size(); ++i) {
            const ControlPoint& p = image.points[i];
            std::printf("%s[%.17g, %.17g, %.17g, %.17g]", i ? ", " : "", p.column, p.row, p.x, p.y);
        }
        std::printf("]}");
    }
    std::printf("}\n");
}

void PrintInfoText(const std::string& path, const OpenedImage& image)
{
    std::printf("file        %s\n", path.c_str());
    if (image.result != 1 || image.status != 0) {
        std::printf("opened      no %s\n", OpenRefusalWords(image).c_str());
        return;
    }
    std::printf("size        %u x %u pixels\n", image.width, image.height);
    std::printf("pixel kind  %u: %s\n", image.pixelKind, DescribePixelKind(image.pixelKind));
    PrintPalette(image);
    PrintGeoReference(image);
}

} // namespace host
