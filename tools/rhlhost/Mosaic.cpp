#include "Mosaic.h"

#include "Drawing.h"
#include "ExitCodes.h"
#include "GeoTiffWriter.h"
#include "MosaicGrid.h"
#include "OutputFile.h"
#include "Raster.h"

#include <cstdio>
#include <cstring>

namespace host {
namespace {

// The palette every frame shares, or empty when they differ or have none.
std::vector<uint8_t> SharedPalette(const std::vector<MosaicFrame>& frames)
{
    if (frames.empty())
        return {};
    for (const MosaicFrame& frame : frames)
        if (frame.palette.empty() || frame.palette != frames.front().palette)
            return {};
    return frames.front().palette;
}

// A paletted canvas when the frames share a palette with room for a nodata
// index (the RPF masked value, or one past the last entry); else RGB with alpha.
Raster EmptyCanvas(const std::vector<MosaicFrame>& frames, const MosaicGrid& grid)
{
    Raster canvas;
    canvas.width = grid.width;
    canvas.height = grid.height;
    canvas.palette = SharedPalette(frames);
    const size_t entries = canvas.palette.size() / 3;
    canvas.nodata = MaskedIndex(canvas.palette);
    if (!canvas.palette.empty() && canvas.nodata == kNoNodata && entries < kMaxPaletteEntries) {
        canvas.nodata = int(entries);
        canvas.palette.insert(canvas.palette.end(), 3, 0);
    }
    canvas.colour = canvas.nodata == kNoNodata ? Colour::Rgba : Colour::Palette;
    if (canvas.colour == Colour::Rgba)
        canvas.palette.clear();
    const uint8_t fill = canvas.colour == Colour::Palette ? uint8_t(canvas.nodata) : 0;
    canvas.pixels.assign(size_t(canvas.width) * canvas.height * canvas.Samples(), fill);
    return canvas;
}

// Writes one delivered pixel onto the canvas; masked pixels leave it as it is.
void PutPixel(const MosaicFrame& frame, const Pixels& pixels, size_t source, Raster& canvas, size_t target)
{
    const uint8_t* value = &pixels.bytes[source * pixels.bytesPerPixel];
    if (!frame.palette.empty() && *value == MaskedIndex(frame.palette))
        return;
    if (canvas.colour == Colour::Palette) {
        canvas.pixels[target] = *value;
        return;
    }
    uint8_t* rgba = &canvas.pixels[target * 4];
    const size_t entries = frame.palette.size() / 3;
    if (pixels.bytesPerPixel == 3)
        std::memcpy(rgba, value, 3);
    else if (*value < entries)
        std::memcpy(rgba, &frame.palette[*value * 3], 3);
    else
        std::memset(rgba, *value, 3);
    rgba[3] = kOpaque;
}

void Place(const MosaicFrame& frame, const Pixels& pixels, const MosaicGrid& grid, Raster& canvas)
{
    const long column0 = grid.Column(frame);
    const long row0 = grid.Row(frame);
    for (uint32_t row = 0; row < pixels.height; ++row) {
        const long y = row0 + long(row);
        if (y < 0 || y >= long(grid.height))
            continue;
        for (uint32_t column = 0; column < pixels.width; ++column) {
            const long x = column0 + long(column);
            if (x >= 0 && x < long(grid.width))
                PutPixel(frame, pixels, size_t(row) * pixels.width + column, canvas, size_t(y) * grid.width + size_t(x));
        }
    }
}

// Draws every frame onto the canvas; the number of rows that failed to decode.
uint32_t Paint(const Exports& rh, const std::vector<MosaicFrame>& frames, const MosaicGrid& grid, Raster& canvas)
{
    uint32_t failedRows = 0;
    for (const MosaicFrame& frame : frames) {
        OpenFile file(rh, frame.path);
        Pixels pixels;
        std::string message;
        if (!file.Ready() || !DrawWindow(rh, file, Window{}, pixels, message)) {
            Fail(kExitRefused, frame.path + ": could not be drawn again; left out");
            continue;
        }
        if (pixels.failedRows > 0)
            Fail(kExitRowsFailed, frame.path + ": " + std::to_string(pixels.failedRows) +
                                      " rows could not be decoded (left as nodata)");
        failedRows += pixels.failedRows;
        Place(frame, pixels, grid, canvas);
    }
    return failedRows;
}

bool WriteMosaic(const std::string& output, const Raster& canvas, const MosaicGrid& grid, std::string& message)
{
    GeoReference geo{kMosaicEpsg, grid.transform};
    OutputFile out(output);
    if (!WriteGeoTiff(out.TemporaryPath(), canvas, &geo, message)) {
        message = "cannot write " + output + ": " + message;
        return false;
    }
    return out.Commit(message);
}

} // namespace

bool PaintAndWrite(const Exports& rh, const std::vector<MosaicFrame>& frames, const MosaicGrid& grid,
                   const std::string& output, uint32_t& failedRows, std::string& message)
{
    Raster canvas = EmptyCanvas(frames, grid);
    failedRows = Paint(rh, frames, grid, canvas);
    return WriteMosaic(output, canvas, grid, message);
}

int RunMosaic(const Exports& rh, const std::vector<std::string>& inputs, const std::string& output)
{
    std::vector<std::string> problems;
    MosaicFrames collected = CollectFrames(rh, CollectInputs(inputs, problems));
    MosaicGrid grid;
    std::string message;
    const bool planned = !collected.frames.empty() && PlanGrid(collected, grid, message);
    for (const std::string& problem : problems)
        Fail(kExitRefused, problem);
    for (const std::string& refusal : collected.refusals)
        Fail(kExitRefused, refusal);
    if (collected.frames.empty())
        return Fail(kExitRefused, "no frame to place in the mosaic");
    if (!planned)
        return Fail(kExitRefused, message);
    uint32_t failedRows = 0;
    if (!PaintAndWrite(rh, collected.frames, grid, output, failedRows, message))
        return Fail(kExitRefused, message);
    std::fprintf(stderr, "rhlhost: %s: %zu frames on %u x %u pixels, %zu refused, %zu not recognised\n",
                 output.c_str(), collected.frames.size(), grid.width, grid.height, collected.refusals.size(),
                 collected.notRecognised);
    if (!collected.refusals.empty() || !problems.empty())
        return kExitRefused;
    return failedRows > 0 ? kExitRowsFailed : kExitOk;
}

} // namespace host
