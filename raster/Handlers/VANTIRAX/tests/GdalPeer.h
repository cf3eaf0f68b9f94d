// GDAL as the judge: what it reads of a file (gdalinfo -json -checksum), the
// samples it decodes (gdal_translate), and its checksum over one band.
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

struct GdalReport {
    bool read = false;
    uint32_t width = 0, height = 0;
    int epsg = 0; // of the coordinate system's outermost ID
    std::array<double, 6> geoTransform{};
    std::vector<uint32_t> checksums; // one per band
    std::array<uint32_t, 2> block{};  // the first band's block size
    size_t overviews = 0;             // of the first band
    std::vector<std::string> colourInterpretations;
    bool hasNodata = false;
    double nodata = 0;
    std::vector<std::array<int, 3>> colourTable;

    // World position of the pixel-corner grid point (column, row).
    double X(double c, double r) const { return geoTransform[0] + c * geoTransform[1] + r * geoTransform[2]; }
    double Y(double c, double r) const { return geoTransform[3] + c * geoTransform[4] + r * geoTransform[5]; }
};

GdalReport ReadWithGdal(const std::string& path);
// The samples GDAL decodes, pixel interleaved, after gdal_translate OPTIONS.
std::string GdalSamples(const std::string& path, const std::string& options = "");
// GDAL's checksum of one band of 8-bit pixels `stride` bytes apart: values
// modulo a cycle of primes, summed, kept to 16 bits at the end of each row.
uint32_t GdalChecksum(const uint8_t* pixels, uint32_t width, uint32_t height, size_t stride = 1);
// Every match of the pattern in the text (a tool's JSON), its groups read as numbers.
std::vector<std::vector<double>> NumbersIn(const std::string& text, const std::string& pattern);
