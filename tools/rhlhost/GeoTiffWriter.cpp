#include "GeoTiffWriter.h"

#include <cerrno>
#include <cstring>
#include <geotiff.h>
#include <geovalues.h>
#include <mutex>
#include <tiffio.h>
#include <xtiffio.h>

namespace host {
namespace {

// EPSG codes of geographic coordinate systems lie in this range; the others
// the handler reports (UTM 326zz and 327zz) are projected.
constexpr uint32_t kFirstGeographicCode = 4000;
constexpr uint32_t kLastGeographicCode = 4999;
constexpr uint32_t kRowsPerStrip = 64;
constexpr unsigned kColourMapSize = 256;
constexpr uint16_t kEightBitTo16 = 257;

// Process-wide libtiff state, set once before any worker thread opens a file:
// the GeoTIFF tags, and no messages of its own (the writer makes its own).
void PrepareLibtiff()
{
    static std::once_flag once;
    std::call_once(once, [] {
        XTIFFInitialize();
        TIFFSetErrorHandler(nullptr);
        TIFFSetWarningHandler(nullptr);
    });
}

uint16_t Photometric(Colour colour)
{
    switch (colour) {
    case Colour::Palette:
        return PHOTOMETRIC_PALETTE;
    case Colour::Grey:
        return PHOTOMETRIC_MINISBLACK;
    default:
        return PHOTOMETRIC_RGB;
    }
}

void SetColourMap(TIFF* tiff, const Raster& raster)
{
    std::vector<uint16_t> red(kColourMapSize, 0), green(kColourMapSize, 0), blue(kColourMapSize, 0);
    for (size_t i = 0; i < raster.palette.size() / 3 && i < kColourMapSize; ++i) {
        red[i] = uint16_t(raster.palette[i * 3] * kEightBitTo16);
        green[i] = uint16_t(raster.palette[i * 3 + 1] * kEightBitTo16);
        blue[i] = uint16_t(raster.palette[i * 3 + 2] * kEightBitTo16);
    }
    TIFFSetField(tiff, TIFFTAG_COLORMAP, red.data(), green.data(), blue.data());
}

// The nodata value as GDAL reads it: an ASCII tag that libtiff learns here.
void SetNodata(TIFF* tiff, int nodata)
{
    static const TIFFFieldInfo field = {TIFFTAG_GDAL_NODATA, -1, -1, TIFF_ASCII, FIELD_CUSTOM, 1, 0,
                                        const_cast<char*>("GDALNoDataValue")};
    TIFFMergeFieldInfo(tiff, &field, 1);
    TIFFSetField(tiff, TIFFTAG_GDAL_NODATA, std::to_string(nodata).c_str());
}

void SetImageTags(TIFF* tiff, const Raster& raster)
{
    TIFFSetField(tiff, TIFFTAG_IMAGEWIDTH, raster.width);
    TIFFSetField(tiff, TIFFTAG_IMAGELENGTH, raster.height);
    TIFFSetField(tiff, TIFFTAG_SAMPLESPERPIXEL, raster.Samples());
    TIFFSetField(tiff, TIFFTAG_BITSPERSAMPLE, 8);
    TIFFSetField(tiff, TIFFTAG_PLANARCONFIG, PLANARCONFIG_CONTIG);
    TIFFSetField(tiff, TIFFTAG_PHOTOMETRIC, Photometric(raster.colour));
    TIFFSetField(tiff, TIFFTAG_COMPRESSION, COMPRESSION_LZW);
    TIFFSetField(tiff, TIFFTAG_ROWSPERSTRIP, kRowsPerStrip);
    if (raster.colour == Colour::Rgba) {
        const uint16_t alpha = EXTRASAMPLE_UNASSALPHA;
        TIFFSetField(tiff, TIFFTAG_EXTRASAMPLES, 1, &alpha);
    }
    if (raster.colour == Colour::Palette)
        SetColourMap(tiff, raster);
    if (raster.nodata != kNoNodata)
        SetNodata(tiff, raster.nodata);
}

// North-up images get a tie point and pixel scale; any other a full matrix.
void SetModelTags(TIFF* tiff, const GeoTransform& t)
{
    if (t.NorthUp() && t.columnX > 0 && t.rowY < 0) {
        double scale[3] = {t.columnX, -t.rowY, 0};
        double tiePoint[6] = {0, 0, 0, t.originX, t.originY, 0};
        TIFFSetField(tiff, TIFFTAG_GEOPIXELSCALE, 3, scale);
        TIFFSetField(tiff, TIFFTAG_GEOTIEPOINTS, 6, tiePoint);
        return;
    }
    double matrix[16] = {t.columnX, t.rowX, 0, t.originX, t.columnY, t.rowY, 0, t.originY,
                         0,         0,      0, 0,         0,         0,      0, 1};
    TIFFSetField(tiff, TIFFTAG_GEOTRANSMATRIX, 16, matrix);
}

bool SetGeoKeys(TIFF* tiff, uint32_t epsg)
{
    GTIF* keys = GTIFNew(tiff);
    if (keys == nullptr)
        return false;
    const bool geographic = epsg >= kFirstGeographicCode && epsg <= kLastGeographicCode;
    GTIFKeySet(keys, GTModelTypeGeoKey, TYPE_SHORT, 1, geographic ? ModelTypeGeographic : ModelTypeProjected);
    GTIFKeySet(keys, GTRasterTypeGeoKey, TYPE_SHORT, 1, RasterPixelIsArea);
    GTIFKeySet(keys, geographic ? GeographicTypeGeoKey : ProjectedCSTypeGeoKey, TYPE_SHORT, 1, int(epsg));
    const bool written = GTIFWriteKeys(keys) != 0;
    GTIFFree(keys);
    return written;
}

bool WriteStrips(TIFF* tiff, const Raster& raster)
{
    const size_t rowBytes = size_t(raster.width) * raster.Samples();
    for (uint32_t row = 0; row < raster.height; ++row) {
        auto* data = const_cast<uint8_t*>(raster.pixels.data() + row * rowBytes);
        if (TIFFWriteScanline(tiff, data, row, 0) < 0)
            return false;
    }
    return true;
}

} // namespace

bool WriteGeoTiff(const std::string& path, const Raster& raster, const GeoReference* geo, std::string& message)
{
    if (raster.width == 0 || raster.height == 0) {
        message = "the window is empty";
        return false;
    }
    PrepareLibtiff();
    TIFF* tiff = XTIFFOpen(path.c_str(), "w");
    if (tiff == nullptr) {
        message = std::strerror(errno);
        return false;
    }
    SetImageTags(tiff, raster);
    bool written = true;
    if (geo != nullptr) {
        // Without an EPSG code the transform places the image in no
        // coordinate system: no keys at all, so that none is implied.
        SetModelTags(tiff, geo->transform);
        written = geo->epsg == kNoEpsgCode || SetGeoKeys(tiff, geo->epsg);
    }
    written = written && WriteStrips(tiff, raster) && TIFFFlush(tiff) != 0;
    XTIFFClose(tiff);
    if (!written)
        message = "TIFF encoding failed";
    return written;
}

} // namespace host
