// What GDAL reads of a file (gdalinfo -json -checksum) and what the stand-in
// host reports of an opened file (rhlhost info), picked out of their JSON.
#pragma once

#include <array>
#include <cstdint>
#include <string>
#include <vector>

struct GdalReport {
    bool read = false;
    uint32_t width = 0, height = 0;
    int epsg = 0;                    // of the coordinate system's outermost ID
    std::array<double, 6> geoTransform{};
    std::vector<uint32_t> checksums; // one per band
    std::vector<std::string> colourInterpretations;
    bool hasNodata = false;
    double nodata = 0;
    std::vector<std::array<int, 3>> colourTable;

    // World position of the pixel-corner grid point (column, row).
    double X(double column, double row) const;
    double Y(double column, double row) const;
};

GdalReport ReadWithGdal(const std::string& path);

// GDAL's band checksums of a headerless file of 8-bit pixels (bands interleaved
// by pixel), read through an ENVI header written beside it.
std::vector<uint32_t> RawChecksums(const std::string& rawPath, uint32_t width, uint32_t height, unsigned bands);

struct HostInfo {
    int epsg = 0;
    std::vector<std::array<double, 4>> points; // column, row, x, y
    std::vector<std::array<int, 3>> palette;
};

HostInfo ReadHostInfo(const std::string& path);
