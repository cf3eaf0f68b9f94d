#include "Render.h"

#include "GeoTiffWriter.h"
#include "OutputFile.h"
#include "PngWriter.h"
#include "Raster.h"

#include <algorithm>
#include <cctype>
#include <cerrno>
#include <cstdio>
#include <cstring>

namespace host {
namespace {

bool EndsWith(std::string text, const std::string& suffix)
{
    std::transform(text.begin(), text.end(), text.begin(), [](unsigned char c) { return std::tolower(c); });
    return text.size() >= suffix.size() && text.compare(text.size() - suffix.size(), suffix.size(), suffix) == 0;
}

bool WriteRaw(const std::string& path, WindowDraw& draw, std::string& message)
{
    FILE* out = std::fopen(path.c_str(), "wb");
    if (out == nullptr) {
        message = std::strerror(errno);
        return false;
    }
    bool written = true;
    for (const uint8_t* row = draw.NextRow(); row != nullptr && written; row = draw.NextRow())
        written = std::fwrite(row, 1, draw.RowBytes(), out) == draw.RowBytes();
    written = std::fclose(out) == 0 && written;
    if (!written)
        message = std::strerror(errno);
    return written;
}

// The window's georeference; null when the image has none, with a warning
// when the record it has cannot be used or names no coordinate system.
const GeoReference* WindowGeoReference(const OpenedImage& image, const WindowDraw& draw, GeoReference& geo,
                                       std::string& warning)
{
    GeoTransform whole;
    if (!image.hasGeoRef)
        return nullptr;
    if (!TransformFromGeoRef(image, whole, warning)) {
        warning = "written without georeference: " + warning;
        return nullptr;
    }
    geo.epsg = image.epsg;
    geo.transform = ShiftedTo(whole, draw.x0, draw.y0);
    if (image.epsg == kNoEpsgCode)
        warning = "written without a coordinate system: the georeference names none (EPSG code 0)";
    return &geo;
}

bool WritePngRows(const std::string& path, const Raster& raster, WindowDraw& draw, std::string& message)
{
    const Raster shown = Expanded(raster);
    PngWriter png;
    if (!png.Open(path, shown.width, shown.height, shown.Samples(), message))
        return false;
    std::vector<uint8_t> values, expanded(shown.RowBytes());
    for (const uint8_t* row = draw.NextRow(); row != nullptr; row = draw.NextRow()) {
        values.assign(row, row + raster.RowBytes());
        ToRasterRow(raster, values.data());
        ExpandRow(raster, values.data(), expanded.data());
        if (!png.AddRow(expanded.data()))
            break;
    }
    return png.Finish(message);
}

bool WriteTiffRows(const std::string& path, const Raster& raster, const GeoReference* geo, bool overviews,
                   WindowDraw& draw, std::string& message)
{
    GeoTiffWriter tiff(path, raster, geo, overviews);
    if (!tiff.Open(message))
        return false;
    std::vector<uint8_t> values;
    for (const uint8_t* row = draw.NextRow(); row != nullptr; row = draw.NextRow()) {
        values.assign(row, row + raster.RowBytes());
        ToRasterRow(raster, values.data());
        if (!tiff.AddRow(values.data(), message))
            return false;
    }
    return tiff.Finish(message);
}

// Six lines: the pixel's x step, its y step, the row's x step, its y step
// (negative when north up), then the centre of the upper-left pixel.
bool WriteWorldFile(const std::string& path, const GeoTransform& t, std::string& message)
{
    OutputFile out(path);
    FILE* file = std::fopen(out.TemporaryPath().c_str(), "w");
    if (file == nullptr) {
        message = CannotWrite(path);
        return false;
    }
    const bool printed = std::fprintf(file, "%.17g\n%.17g\n%.17g\n%.17g\n%.17g\n%.17g\n", t.columnX, t.columnY,
                                      t.rowX, t.rowY, t.X(0.5, 0.5), t.Y(0.5, 0.5)) > 0;
    if (std::fclose(file) != 0 || !printed) {
        message = CannotWrite(path);
        return false;
    }
    return out.Commit(message);
}

// NAME.png's world file: NAME.pgw.
std::string WorldFilePath(const std::string& png)
{
    return png.substr(0, png.size() - 4) + ".pgw";
}

bool WriteOutput(const std::string& path, OutputFormat format, const OpenedImage& image, WindowDraw& draw,
                 const GeoReference* reference, bool overviews, std::string& message)
{
    if (format == OutputFormat::Raw)
        return WriteRaw(path, draw, message);
    const Raster raster = RasterOf(image, draw.width, draw.height);
    if (format == OutputFormat::Png)
        return WritePngRows(path, raster, draw, message);
    return WriteTiffRows(path, raster, reference, overviews, draw, message);
}

RenderOutcome Refused(std::string message)
{
    RenderOutcome outcome;
    outcome.status = RenderStatus::Refused;
    outcome.message = std::move(message);
    return outcome;
}

} // namespace

bool FormatFromName(const std::string& output, OutputFormat& format)
{
    if (EndsWith(output, ".tif") || EndsWith(output, ".tiff"))
        format = OutputFormat::GeoTiff;
    else if (EndsWith(output, ".png"))
        format = OutputFormat::Png;
    else if (EndsWith(output, ".raw"))
        format = OutputFormat::Raw;
    else
        return false;
    return true;
}

bool OptionsFitFormat(OutputFormat format, const RenderOptions& options, std::string& message)
{
    if (options.worldFile && format != OutputFormat::Png)
        message = "--world-file goes with PNG output";
    else if (!options.overviews && format != OutputFormat::GeoTiff)
        message = "--no-overviews goes with GeoTIFF output";
    else
        return true;
    return false;
}

RenderOutcome RenderFile(const Exports& rh, const std::string& input, const std::string& output,
                         OutputFormat format, const RenderOptions& options)
{
    OpenFile file(rh, input);
    if (!file.Ready())
        return Refused(file.RefusalReason());
    WindowDraw draw(rh, file);
    std::string message;
    if (!draw.Start(options.window, message))
        return Refused(message);

    RenderOutcome outcome;
    GeoReference geo;
    const bool placed = format == OutputFormat::GeoTiff || options.worldFile;
    const GeoReference* reference = placed ? WindowGeoReference(file.image, draw, geo, outcome.warning) : nullptr;
    OutputFile out(output);
    const bool written =
        WriteOutput(out.TemporaryPath(), format, file.image, draw, reference, options.overviews, outcome.message);
    outcome.failedRows = draw.failedRows;
    if (!written) {
        outcome.status = RenderStatus::Failed;
        outcome.message = "cannot write " + output + ": " + outcome.message;
    } else if (!out.Commit(outcome.message)) {
        outcome.status = RenderStatus::Failed;
    } else if (options.worldFile && reference == nullptr) {
        outcome.warning += (outcome.warning.empty() ? "" : "; ") + std::string("no world file: no georeference");
    } else if (options.worldFile && !WriteWorldFile(WorldFilePath(output), reference->transform, outcome.message)) {
        outcome.status = RenderStatus::Failed;
    }
    return outcome;
}

} // namespace host
