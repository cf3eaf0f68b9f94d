#include "MosaicGrid.h"

#include "Drawing.h"
#include "Info.h"

#include <algorithm>
#include <cmath>
#include <filesystem>

namespace host {
namespace {

// Frames of one product share their pixel size to far better than this.
constexpr double kScaleTolerance = 1e-6;

bool Refuse(MosaicFrames& collected, const std::string& path, const std::string& reason)
{
    collected.refusals.push_back(path + ": " + reason);
    return false;
}

bool AddFrame(const Exports& rh, const InputFile& file, MosaicFrames& collected)
{
    OpenFile opened(rh, file.path);
    const OpenedImage& image = opened.image;
    if (!opened.Ready())
        return Refuse(collected, file.path, opened.RefusalReason());
    if (!image.hasGeoRef)
        return Refuse(collected, file.path, "the frame has no georeference");
    if (image.epsg != kMosaicEpsg)
        return Refuse(collected, file.path,
                      DescribeCoordinateSystem(image.epsg) + ": a mosaic takes EPSG:4326 frames only");
    MosaicFrame frame{file.path, image.width, image.height, image.pixelKind, image.palette, {}};
    std::string message;
    if (!TransformFromGeoRef(image, frame.transform, message))
        return Refuse(collected, file.path, message);
    const GeoTransform& t = frame.transform;
    if (!t.NorthUp() || t.columnX <= 0 || t.rowY >= 0)
        return Refuse(collected, file.path, "the frame is not north up");
    collected.frames.push_back(std::move(frame));
    return true;
}

bool SameScale(double a, double b)
{
    return std::fabs(a - b) <= kScaleTolerance * std::fabs(b);
}

// The west edge where the frames' longitude range starts: the one after the
// widest gap between west edges around the globe, so that a product across
// the 180 degree meridian is not split at it.
double RangeStart(const std::vector<MosaicFrame>& frames)
{
    std::vector<double> wests;
    for (const MosaicFrame& f : frames)
        wests.push_back(f.transform.originX);
    std::sort(wests.begin(), wests.end());
    double start = wests.front();
    double widestGap = wests.front() + kTurnDegrees - wests.back();
    for (size_t i = 1; i < wests.size(); ++i) {
        if (wests[i] - wests[i - 1] > widestGap) {
            widestGap = wests[i] - wests[i - 1];
            start = wests[i];
        }
    }
    return start;
}

// Moves frames west of the range's start by a whole turn east, into one
// longitude range: a frame at -179.5 follows one at 179.5 as 180.5.
void PutInOneLongitudeRange(std::vector<MosaicFrame>& frames)
{
    const double start = RangeStart(frames);
    for (MosaicFrame& f : frames)
        if (f.transform.originX < start)
            f.transform.originX += kTurnDegrees;
}

} // namespace

long MosaicGrid::Column(const MosaicFrame& frame) const
{
    return std::lround((frame.transform.originX - transform.originX) / transform.columnX);
}

long MosaicGrid::Row(const MosaicFrame& frame) const
{
    return std::lround((frame.transform.originY - transform.originY) / transform.rowY);
}

MosaicFrames CollectFrames(const Exports& rh, const std::vector<InputFile>& files)
{
    MosaicFrames collected;
    for (const InputFile& file : files) {
        std::error_code error;
        if (file.named && !std::filesystem::exists(file.path, error))
            Refuse(collected, file.path, "no such file");
        else if (rh.isFormat(file.path.c_str()) != 1)
            ++collected.notRecognised;
        else
            AddFrame(rh, file, collected);
    }
    return collected;
}

bool PlanGrid(MosaicFrames& collected, MosaicGrid& grid, std::string& message)
{
    std::vector<MosaicFrame>& frames = collected.frames;
    const GeoTransform scale = frames.front().transform;
    auto other = std::stable_partition(frames.begin(), frames.end(), [&](const MosaicFrame& f) {
        return SameScale(f.transform.columnX, scale.columnX) && SameScale(f.transform.rowY, scale.rowY);
    });
    for (auto it = other; it != frames.end(); ++it)
        Refuse(collected, it->path, "its pixel size differs from the first frame's");
    frames.erase(other, frames.end());
    PutInOneLongitudeRange(frames);

    double west = HUGE_VAL, north = -HUGE_VAL, east = -HUGE_VAL, south = HUGE_VAL;
    for (const MosaicFrame& f : frames) {
        west = std::min(west, f.transform.originX);
        north = std::max(north, f.transform.originY);
        east = std::max(east, f.transform.X(f.width, f.height));
        south = std::min(south, f.transform.Y(f.width, f.height));
    }
    grid.transform = scale;
    grid.transform.originX = west;
    grid.transform.originY = north;
    const double width = std::round((east - west) / scale.columnX);
    const double height = std::round((south - north) / scale.rowY);
    if (width * height > kMaxMosaicPixels) {
        message = "the frames span " + std::to_string(long(width)) + " x " + std::to_string(long(height)) +
                  " pixels, more than a mosaic may hold";
        return false;
    }
    grid.width = uint32_t(width);
    grid.height = uint32_t(height);
    return true;
}

} // namespace host
