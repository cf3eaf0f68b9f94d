#include "MosaicCanvas.h"

#include "Drawing.h"
#include "ExitCodes.h"
#include "GeoTiffWriter.h"
#include "OutputFile.h"
#include "Raster.h"

#include <algorithm>
#include <cstring>

namespace host {
namespace {

// Rows painted at once: one tile row of the GeoTIFF, one subframe row of a CADRG or CIB frame.
constexpr uint32_t kStripRows = 256;

// The palette every frame shares, or empty when they differ or have none.
std::vector<uint8_t> SharedPalette(const std::vector<MosaicFrame>& frames)
{
    if (frames.empty()) // a table of contents' product none of whose frames is on disk
        return {};
    for (const MosaicFrame& frame : frames)
        if (frame.palette.empty() || frame.palette != frames.front().palette)
            return {};
    return frames.front().palette;
}

// A paletted canvas when the frames share a palette with room for a nodata
// index (the RPF masked value, or one past the last entry); else RGB with alpha.
Raster CanvasRaster(const std::vector<MosaicFrame>& frames, const MosaicGrid& grid)
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
    return canvas;
}

// Writes one delivered pixel onto the canvas; masked pixels leave it as it is.
void PutPixel(const MosaicFrame& frame, const uint8_t* value, size_t bytesPerPixel, const Raster& canvas,
              uint8_t* target)
{
    if (!frame.palette.empty() && *value == MaskedIndex(frame.palette))
        return;
    if (canvas.colour == Colour::Palette) {
        *target = *value;
        return;
    }
    const size_t entries = frame.palette.size() / 3;
    if (bytesPerPixel == 3)
        std::memcpy(target, value, 3);
    else if (*value < entries)
        std::memcpy(target, &frame.palette[*value * 3], 3);
    else
        std::memset(target, *value, 3);
    target[3] = kOpaque;
}

class Painter {
public:
    Painter(const Exports& rh, const MosaicFrames& collected, const MosaicGrid& grid, const Raster& canvas)
        : rh_(rh), frames_(collected.frames), grid_(grid), canvas_(canvas), left_(frames_.size()),
          failedRows_(frames_.size())
    {
    }

    // Grid rows [top, top + rows): nodata, then every frame's rows there.
    void PaintStrip(uint32_t top, uint32_t rows, std::vector<uint8_t>& strip)
    {
        const uint8_t fill = canvas_.colour == Colour::Palette ? uint8_t(canvas_.nodata) : 0;
        std::fill(strip.begin(), strip.end(), fill);
        for (size_t i = 0; i < frames_.size(); ++i) {
            const long row0 = grid_.Row(frames_[i]);
            const long first = std::max<long>(top, row0), last = std::min<long>(long(top) + rows, row0 + frames_[i].height);
            if (first < last && !left_[i])
                PaintFrame(i, Window{0, int32_t(first - row0), -1, int32_t(last - row0)}, size_t(first - top), strip);
        }
    }

    // Reports the frames left out and the rows that failed; their number.
    uint32_t Report() const
    {
        uint32_t total = 0;
        for (size_t i = 0; i < frames_.size(); ++i) {
            if (left_[i])
                Fail(kExitRefused, frames_[i].path + ": could not be drawn again; left out");
            if (failedRows_[i] > 0)
                Fail(kExitRowsFailed, frames_[i].path + ": " + std::to_string(failedRows_[i]) +
                                          " rows could not be decoded (left as nodata)");
            total += failedRows_[i];
        }
        return total;
    }

private:
    void PaintFrame(size_t i, const Window& window, size_t stripRow, std::vector<uint8_t>& strip)
    {
        const MosaicFrame& frame = frames_[i];
        OpenFile file(rh_, frame.path);
        WindowDraw draw(rh_, file);
        std::string message;
        if (!file.Ready() || !draw.Start(window, message)) {
            left_[i] = true;
            return;
        }
        const long column0 = grid_.Column(frame);
        const size_t samples = canvas_.Samples();
        for (const uint8_t* row = draw.NextRow(); row != nullptr; row = draw.NextRow(), ++stripRow) {
            uint8_t* target = &strip[stripRow * canvas_.RowBytes()];
            for (uint32_t column = 0; column < draw.width; ++column) {
                const long x = column0 + long(column);
                if (x >= 0 && x < long(grid_.width))
                    PutPixel(frame, row + column * draw.bytesPerPixel, draw.bytesPerPixel, canvas_,
                             target + size_t(x) * samples);
            }
        }
        failedRows_[i] += draw.failedRows;
    }

    const Exports& rh_;
    const std::vector<MosaicFrame>& frames_;
    const MosaicGrid& grid_;
    const Raster& canvas_;
    std::vector<bool> left_;            // frames that could not be drawn again
    std::vector<uint32_t> failedRows_; // per frame
};

} // namespace

bool WriteMosaic(const Exports& rh, const MosaicFrames& collected, const MosaicGrid& grid, const std::string& output,
                 bool overviews, uint32_t& failedRows, std::string& message)
{
    const Raster canvas = CanvasRaster(collected.frames, grid);
    const GeoReference geo{kMosaicEpsg, grid.transform};
    OutputFile out(output);
    GeoTiffWriter tiff(out.TemporaryPath(), canvas, &geo, overviews);
    Painter painter(rh, collected, grid, canvas);
    std::vector<uint8_t> strip(canvas.RowBytes() * kStripRows);
    bool written = tiff.Open(message);
    for (uint32_t top = 0; written && top < grid.height; top += kStripRows) {
        const uint32_t rows = std::min(kStripRows, grid.height - top);
        painter.PaintStrip(top, rows, strip);
        for (uint32_t row = 0; written && row < rows; ++row)
            written = tiff.AddRow(&strip[row * canvas.RowBytes()], message);
    }
    failedRows = painter.Report();
    if (!written || !tiff.Finish(message)) {
        message = "cannot write " + output + ": " + message;
        return false;
    }
    return out.Commit(message);
}

} // namespace host
