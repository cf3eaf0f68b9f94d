// mosaic --toc: one boundary rectangle of an A.TOC on the grid it spans.
#include "Drawing.h"
#include "ExitCodes.h"
#include "FileWalk.h"
#include "Mosaic.h"
#include "MosaicCanvas.h"
#include "TableOfContents.h"

#include <algorithm>
#include <cmath>
#include <cstdio>
#include <filesystem>
#include <optional>

namespace host {
namespace {

namespace fs = std::filesystem;

bool Refuse(std::string& message, const std::string& reason)
{
    message = reason;
    return false;
}

// The grid of the rectangle's frames between its north-west and south-east
// corners, 1536 pixels a frame.
bool GridOfRectangle(const TocRectangle& r, MosaicGrid& grid, std::string& message)
{
    if (r.Polar())
        return Refuse(message, std::string("zone ") + r.zone + " is polar: its frames are not in EPSG:4326");
    const double west = r.northWestLongitude, north = r.northWestLatitude, south = r.southEastLatitude;
    double east = r.southEastLongitude;
    if (!std::isfinite(west) || !std::isfinite(east) || !std::isfinite(north) || !std::isfinite(south))
        return Refuse(message, "its corners are not numbers");
    if (east <= west) // across the 180 degree meridian
        east += kTurnDegrees;
    if (!(north > south) || !(east > west) || east - west > kTurnDegrees)
        return Refuse(message, "its corners span no area");
    const double width = double(r.frameColumns) * kRpfFramePixels;
    const double height = double(r.frameRows) * kRpfFramePixels;
    if (width * height == 0 || width * height > kMaxMosaicPixels)
        return Refuse(message, "its " + std::to_string(r.frameRows) + " x " + std::to_string(r.frameColumns) +
                                   " frames are more than a mosaic may hold, or none");
    grid.width = uint32_t(width);
    grid.height = uint32_t(height);
    grid.transform = GeoTransform{};
    grid.transform.originX = west;
    grid.transform.originY = north;
    grid.transform.columnX = (east - west) / width;
    grid.transform.rowY = (south - north) / height;
    return true;
}

// The frame's file below the A.TOC's folder: each part of the path as
// written, or else the entry of its folder that differs from it only in case
// (tables of contents are written on systems that ignore case).
std::optional<fs::path> FindFrameFile(const fs::path& folder, std::string relative)
{
    std::replace(relative.begin(), relative.end(), '\\', '/');
    fs::path found = folder.empty() ? fs::path(".") : folder;
    for (const fs::path& part : fs::path(relative).lexically_normal()) {
        std::error_code error;
        if (part.empty() || fs::exists(found / part, error)) {
            found /= part;
            continue;
        }
        const std::string wanted = Folded(part.string());
        fs::directory_iterator it(found, error);
        while (!error && it != fs::directory_iterator() && Folded(it->path().filename().string()) != wanted)
            it.increment(error);
        if (error || it == fs::directory_iterator())
            return std::nullopt;
        found = it->path();
    }
    return found;
}

// Opens the frame for its palette and places it where the index record says:
// frame rows count from the south.
bool AddTocFrame(const Exports& rh, const std::string& path, const TocFrame& entry, const TocRectangle& rectangle,
                 const MosaicGrid& grid, std::vector<MosaicFrame>& frames)
{
    OpenFile opened(rh, path);
    const OpenedImage& image = opened.image;
    std::string refusal;
    if (!opened.Ready())
        refusal = opened.RefusalReason();
    else if (image.width != kRpfFramePixels || image.height != kRpfFramePixels)
        refusal = "not a 1536 x 1536 frame";
    if (!refusal.empty()) {
        Fail(kExitRefused, path + ": " + refusal + "; left as nodata");
        return false;
    }
    MosaicFrame frame{path, image.width, image.height, image.pixelKind, image.palette, grid.transform};
    frame.transform.originX = grid.transform.X(double(entry.column) * kRpfFramePixels, 0);
    frame.transform.originY = grid.transform.Y(0, double(rectangle.frameRows - 1 - entry.row) * kRpfFramePixels);
    frames.push_back(std::move(frame));
    return true;
}

} // namespace

int RunTocMosaic(const Exports& rh, const std::string& tocPath, size_t product, const std::string& output,
                 bool overviews)
{
    TableOfContents toc;
    std::string message;
    if (!ReadTableOfContents(tocPath, toc, message))
        return Fail(kExitRefused, tocPath + ": " + message);
    if (product < 1 || product > toc.rectangles.size())
        return Fail(kExitRefused, tocPath + ": no product " + std::to_string(product) + " (it lists " +
                                      std::to_string(toc.rectangles.size()) + ")");
    const TocRectangle& rectangle = toc.rectangles[product - 1];
    MosaicGrid grid;
    if (!GridOfRectangle(rectangle, grid, message))
        return Fail(kExitRefused, tocPath + ": product " + std::to_string(product) + ": " + message);
    MosaicFrames placed;
    std::vector<MosaicFrame>& frames = placed.frames;
    size_t missing = 0;
    for (const TocFrame& entry : toc.frames) {
        if (entry.rectangle != product - 1)
            continue;
        const std::optional<fs::path> file = FindFrameFile(fs::path(tocPath).parent_path(), entry.path);
        if (!file)
            Fail(kExitRefused, tocPath + ": " + entry.path + " is missing; left as nodata");
        if (!file || !AddTocFrame(rh, file->string(), entry, rectangle, grid, frames))
            ++missing;
    }
    uint32_t failedRows = 0;
    if (!WriteMosaic(rh, placed, grid, output, overviews, failedRows, message))
        return Fail(kExitRefused, message);
    std::fprintf(stderr, "rhlhost: %s: %zu frames on %u x %u pixels, %zu missing or refused\n", output.c_str(),
                 frames.size(), grid.width, grid.height, missing);
    if (missing > 0)
        return kExitRefused;
    return failedRows > 0 ? kExitRowsFailed : kExitOk;
}

} // namespace host
