#include "GeoTiffWriter.h"

#include <algorithm>
#include <cerrno>
#include <cstdio>
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
constexpr unsigned kColourMapSize = 256;
constexpr uint16_t kEightBitTo16 = 257;
constexpr uint32_t kTileSide = 256;
// An image wider or taller than this gets overviews.
constexpr uint32_t kLargestWithoutOverviews = 1024;
// A full resolution of more bytes is written as BigTIFF: with its overviews
// and LZW's growth on noise it could pass a classic TIFF's 4 GiB of offsets.
constexpr uint64_t kLargestClassicTiffBytes = uint64_t(1) << 30;
// The most a tile's LZW codes can take: 12-bit codes for each byte, and some.
constexpr uint64_t kLzwGrowthLimit = 2;

struct TiffCloser {
    void operator()(TIFF* tiff) const { XTIFFClose(tiff); }
};
using TiffFile = std::unique_ptr<TIFF, TiffCloser>;

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

// The tags of one level, width x height pixels of the raster's kind.
void SetImageTags(TIFF* tiff, const Raster& raster, uint32_t width, uint32_t height)
{
    TIFFSetField(tiff, TIFFTAG_IMAGEWIDTH, width);
    TIFFSetField(tiff, TIFFTAG_IMAGELENGTH, height);
    TIFFSetField(tiff, TIFFTAG_SAMPLESPERPIXEL, raster.Samples());
    TIFFSetField(tiff, TIFFTAG_BITSPERSAMPLE, 8);
    TIFFSetField(tiff, TIFFTAG_PLANARCONFIG, PLANARCONFIG_CONTIG);
    TIFFSetField(tiff, TIFFTAG_PHOTOMETRIC, Photometric(raster.colour));
    TIFFSetField(tiff, TIFFTAG_COMPRESSION, COMPRESSION_LZW);
    TIFFSetField(tiff, TIFFTAG_TILEWIDTH, kTileSide);
    TIFFSetField(tiff, TIFFTAG_TILELENGTH, kTileSide);
    if (raster.colour == Colour::Rgba) {
        const uint16_t alpha = EXTRASAMPLE_UNASSALPHA;
        TIFFSetField(tiff, TIFFTAG_EXTRASAMPLES, 1, &alpha);
    }
    if (raster.colour == Colour::Palette)
        SetColourMap(tiff, raster);
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

// Nearest pixel: the block's first, so that a palette index or nodata keeps its meaning.
void PickBlock(const uint8_t* const* block, size_t, unsigned samples, bool, uint8_t* out)
{
    std::memcpy(out, block[0], samples);
}

// The mean of each sample over the block's pixels; with alpha, the colours'
// over the pixels that show, so that no colour darkens towards an edge.
void AverageBlock(const uint8_t* const* block, size_t count, unsigned samples, bool alpha, uint8_t* out)
{
    unsigned sums[4] = {}, shown = 0;
    for (size_t i = 0; i < count; ++i) {
        const bool shows = !alpha || block[i][3] != 0;
        shown += shows;
        for (unsigned s = 0; s < samples; ++s)
            sums[s] += (shows || s == 3) ? block[i][s] : 0;
    }
    for (unsigned s = 0; s < samples; ++s) {
        const unsigned n = alpha && s < 3 ? shown : unsigned(count);
        out[s] = uint8_t(n == 0 ? 0 : (sums[s] + n / 2) / n);
    }
}

// One resolution: its rows gathered into a strip one tile high, written as
// tiles to its own temporary TIFF.
struct Level {
    uint32_t width = 0, height = 0;
    std::string path;
    TiffFile tiff;
    std::vector<uint8_t> strip;
    uint32_t rowsInStrip = 0, rowsIn = 0;
};

} // namespace

struct GeoTiffWriter::Levels {
    std::string path;
    Raster raster;
    bool hasGeo = false;
    GeoReference geo;
    bool bigTiff = false;
    std::vector<Level> levels;   // full resolution first
    std::vector<uint8_t> tile;   // one tile being written
    std::vector<uint8_t> halved; // one row of the next level

    ~Levels()
    {
        for (Level& level : levels) {
            level.tiff.reset();
            std::remove(level.path.c_str());
        }
    }

    bool OpenLevel(Level& level)
    {
        level.tiff.reset(XTIFFOpen(level.path.c_str(), bigTiff ? "w8" : "w"));
        if (level.tiff == nullptr)
            return false;
        SetImageTags(level.tiff.get(), raster, level.width, level.height);
        level.strip.resize(size_t(level.width) * raster.Samples() * kTileSide);
        return true;
    }

    bool AddRow(size_t index, const uint8_t* row)
    {
        Level& level = levels[index];
        const size_t rowBytes = size_t(level.width) * raster.Samples();
        std::memcpy(&level.strip[level.rowsInStrip * rowBytes], row, rowBytes);
        ++level.rowsIn;
        if (++level.rowsInStrip < kTileSide && level.rowsIn < level.height)
            return true;
        const bool written = WriteStrip(level) && HalveStrip(index);
        level.rowsInStrip = 0;
        return written;
    }

    bool WriteStrip(const Level& level)
    {
        const size_t samples = raster.Samples(), rowBytes = level.width * samples, tileRowBytes = kTileSide * samples;
        const uint32_t top = level.rowsIn - level.rowsInStrip;
        for (uint32_t left = 0; left < level.width; left += kTileSide) {
            const size_t bytes = std::min<size_t>(tileRowBytes, rowBytes - left * samples);
            std::fill(tile.begin(), tile.end(), 0);
            for (uint32_t row = 0; row < level.rowsInStrip; ++row)
                std::memcpy(&tile[row * tileRowBytes], &level.strip[row * rowBytes + left * samples], bytes);
            TIFF* tiff = level.tiff.get();
            if (TIFFWriteEncodedTile(tiff, TIFFComputeTile(tiff, left, top, 0, 0), tile.data(), tmsize_t(tile.size())) < 0)
                return false;
        }
        return true;
    }

    // Each pair of the strip's rows (a last row alone) becomes a row of the next level.
    bool HalveStrip(size_t index)
    {
        if (index + 1 == levels.size())
            return true;
        const Level& level = levels[index];
        const unsigned samples = raster.Samples();
        const auto reduce = raster.colour == Colour::Palette ? PickBlock : AverageBlock;
        const size_t rowBytes = size_t(level.width) * samples;
        for (uint32_t row = 0; row < level.rowsInStrip; row += 2) {
            const uint8_t* upper = &level.strip[row * rowBytes];
            const uint8_t* lower = row + 1 < level.rowsInStrip ? upper + rowBytes : nullptr;
            for (uint32_t column = 0; column < level.width; column += 2) {
                const uint8_t* block[4];
                size_t count = 0;
                for (const uint8_t* line : {upper, lower})
                    for (uint32_t c = column; line != nullptr && c < column + 2 && c < level.width; ++c)
                        block[count++] = line + size_t(c) * samples;
                reduce(block, count, samples, raster.colour == Colour::Rgba, &halved[column / 2 * samples]);
            }
            if (!AddRow(index + 1, halved.data()))
                return false;
        }
        return true;
    }

    // The IFDs of every level, with empty tile arrays; the model's tags on the full resolution's.
    bool WriteDirectories(TIFF* out)
    {
        for (size_t i = 0; i < levels.size(); ++i) {
            SetImageTags(out, raster, levels[i].width, levels[i].height);
            if (i > 0)
                TIFFSetField(out, TIFFTAG_SUBFILETYPE, FILETYPE_REDUCEDIMAGE);
            if (i == 0 && raster.nodata != kNoNodata)
                SetNodata(out, raster.nodata);
            // Without an EPSG code the transform places the image in no
            // coordinate system: no keys at all, so that none is implied.
            if (i == 0 && hasGeo) {
                SetModelTags(out, geo.transform);
                if (geo.epsg != kNoEpsgCode && !SetGeoKeys(out, geo.epsg))
                    return false;
            }
            if (!TIFFDeferStrileArrayWriting(out) || !TIFFWriteCheck(out, 1, "rhlhost") || !TIFFWriteDirectory(out))
                return false;
        }
        // The tile arrays go right after the IFDs, filled in as the tiles follow.
        for (size_t i = 0; i < levels.size(); ++i)
            if (!TIFFSetDirectory(out, tdir_t(i)) || !TIFFForceStrileArrayWriting(out))
                return false;
        return true;
    }

    // The level's tiles as its temporary file holds them, LZW codes and all.
    bool CopyTiles(const Level& level, size_t index, TIFF* out)
    {
        // "m": read, not memory-mapped, so that the copy holds one tile at a time.
        TiffFile in(XTIFFOpen(level.path.c_str(), "rm"));
        if (in == nullptr || !TIFFSetDirectory(out, tdir_t(index)))
            return false;
        const uint64_t limit = tile.size() * kLzwGrowthLimit;
        std::vector<uint8_t> codes;
        for (uint32_t t = 0; t < TIFFNumberOfTiles(in.get()); ++t) {
            const uint64_t size = TIFFGetStrileByteCount(in.get(), t);
            if (size == 0 || size > limit)
                return false;
            codes.resize(size_t(size));
            if (TIFFReadRawTile(in.get(), t, codes.data(), tmsize_t(size)) != tmsize_t(size) ||
                TIFFWriteRawTile(out, t, codes.data(), tmsize_t(size)) != tmsize_t(size))
                return false;
        }
        return TIFFFlush(out) != 0;
    }

    bool Assemble()
    {
        for (Level& level : levels)
            if (level.rowsIn != level.height || TIFFFlush(level.tiff.get()) == 0)
                return false;
        for (Level& level : levels)
            level.tiff.reset();
        TiffFile out(XTIFFOpen(path.c_str(), bigTiff ? "w8" : "w"));
        if (out == nullptr || !WriteDirectories(out.get()))
            return false;
        for (size_t i = levels.size(); i-- > 0;)
            if (!CopyTiles(levels[i], i, out.get()))
                return false;
        return TIFFFlush(out.get()) != 0;
    }
};

GeoTiffWriter::GeoTiffWriter(const std::string& path, const Raster& raster, const GeoReference* geo, bool overviews)
    : levels_(std::make_unique<Levels>())
{
    Levels& l = *levels_;
    l.path = path;
    l.raster = raster;
    l.hasGeo = geo != nullptr;
    if (geo != nullptr)
        l.geo = *geo;
    l.bigTiff = uint64_t(raster.width) * raster.height * raster.Samples() > kLargestClassicTiffBytes;
    uint32_t width = raster.width, height = raster.height;
    const bool large = std::max(width, height) > kLargestWithoutOverviews;
    do {
        l.levels.emplace_back();
        l.levels.back().width = width;
        l.levels.back().height = height;
        l.levels.back().path = path + ".level" + std::to_string(l.levels.size() - 1);
        width = (width + 1) / 2;
        height = (height + 1) / 2;
    } while (overviews && large && std::max(l.levels.back().width, l.levels.back().height) > kTileSide);
    l.tile.resize(size_t(kTileSide) * kTileSide * raster.Samples());
    l.halved.resize((size_t(raster.width) / 2 + 1) * raster.Samples());
}

GeoTiffWriter::~GeoTiffWriter() = default;

bool GeoTiffWriter::Open(std::string& message)
{
    if (levels_->raster.width == 0 || levels_->raster.height == 0) {
        message = "the window is empty";
        return false;
    }
    PrepareLibtiff();
    for (Level& level : levels_->levels)
        if (!levels_->OpenLevel(level)) {
            message = std::strerror(errno);
            return false;
        }
    return true;
}

bool GeoTiffWriter::AddRow(const uint8_t* row, std::string& message)
{
    if (levels_->levels.front().rowsIn < levels_->raster.height && levels_->AddRow(0, row))
        return true;
    message = "TIFF encoding failed";
    return false;
}

bool GeoTiffWriter::Finish(std::string& message)
{
    if (levels_->Assemble())
        return true;
    message = "TIFF encoding failed";
    return false;
}

} // namespace host
