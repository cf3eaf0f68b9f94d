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

bool WriteRaw(const std::string& path, const Pixels& pixels, std::string& message)
{
    FILE* out = std::fopen(path.c_str(), "wb");
    if (out == nullptr) {
        message = std::strerror(errno);
        return false;
    }
    bool written = std::fwrite(pixels.bytes.data(), 1, pixels.bytes.size(), out) == pixels.bytes.size();
    written = std::fclose(out) == 0 && written;
    if (!written)
        message = std::strerror(errno);
    return written;
}

// The window's georeference; null when the image has none, with a warning
// when the record it has cannot be used or names no coordinate system.
const GeoReference* WindowGeoReference(const OpenedImage& image, const Pixels& pixels, GeoReference& geo,
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
    geo.transform = ShiftedTo(whole, pixels.x0, pixels.y0);
    if (image.epsg == kNoEpsgCode)
        warning = "written without a coordinate system: the georeference names none (EPSG code 0)";
    return &geo;
}

bool WriteOutput(const std::string& path, OutputFormat format, const OpenedImage& image, const Pixels& pixels,
                 RenderOutcome& outcome)
{
    if (format == OutputFormat::Raw)
        return WriteRaw(path, pixels, outcome.message);
    Raster raster = RasterFromPixels(image, pixels);
    if (format == OutputFormat::Png) {
        Raster display = Expanded(raster);
        return WritePng(path, display.width, display.height, display.Samples(), display.pixels, outcome.message);
    }
    GeoReference geo;
    const GeoReference* reference = WindowGeoReference(image, pixels, geo, outcome.warning);
    return WriteGeoTiff(path, raster, reference, outcome.message);
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

RenderOutcome RenderFile(const Exports& rh, const std::string& input, const std::string& output,
                         OutputFormat format, const Window& window)
{
    OpenFile file(rh, input);
    if (!file.Ready())
        return Refused(file.RefusalReason());
    Pixels pixels;
    std::string message;
    if (!DrawWindow(rh, file, window, pixels, message))
        return Refused(message);

    RenderOutcome outcome;
    outcome.failedRows = pixels.failedRows;
    OutputFile out(output);
    if (!WriteOutput(out.TemporaryPath(), format, file.image, pixels, outcome)) {
        outcome.status = RenderStatus::Failed;
        outcome.message = "cannot write " + output + ": " + outcome.message;
        return outcome;
    }
    if (!out.Commit(outcome.message))
        outcome.status = RenderStatus::Failed;
    return outcome;
}

} // namespace host
