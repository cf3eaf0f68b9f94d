#include "HostSamples.h"

#include "tests/fixtures/NitfFileWriter.h"
#include "tests/fixtures/NitfImageWriter.h"

#include <cstdio>

namespace {

constexpr int32_t kUtmColumns = 40, kUtmRows = 30;
constexpr int32_t kGreyColumns = 20, kGreyRows = 10;

uint64_t Pattern(int32_t band, int32_t row, int32_t column)
{
    return uint64_t(band * 80 + row * 5 + column * 3) & 0xFF;
}

std::string UtmSlot(double easting, double northing)
{
    char slot[16];
    std::snprintf(slot, sizeof slot, "33%06.0f%07.0f", easting, northing);
    return slot;
}

std::string DegreeSlot(double latitude, double longitude)
{
    char slot[16];
    std::snprintf(slot, sizeof slot, "%+07.3f%+08.3f", latitude, longitude);
    return slot;
}

std::string ImageFile(const NitfImagePlan& plan)
{
    return BuildImageFile(plan, JoinBlocks(BuildImageBlocks(plan, Pattern)));
}

NitfImagePlan UtmRgbPlan()
{
    NitfImagePlan plan;
    plan.rows = kUtmRows;
    plan.columns = kUtmColumns;
    plan.IREP = "RGB";
    plan.bands = {NitfBandPlan{"R", 0, 0, ""}, NitfBandPlan{"G", 0, 0, ""}, NitfBandPlan{"B", 0, 0, ""}};
    plan.IMODE = 'P';
    plan.ICORDS = 'N';
    const double east = kUtmWest + kUtmColumns * kUtmPixel;
    const double south = kUtmNorth - kUtmRows * kUtmPixel;
    plan.IGEOLO = UtmSlot(kUtmWest, kUtmNorth) + UtmSlot(east, kUtmNorth) + UtmSlot(east, south) +
                  UtmSlot(kUtmWest, south);
    return plan;
}

} // namespace

std::string FrameFile(const RpfCorners& corners, RpfProduct product, const std::set<uint32_t>& maskedSubframes)
{
    RpfFramePlan plan;
    plan.product = product;
    plan.indexImage = PatternIndexImage();
    plan.corners = corners;
    plan.maskedSubframes = maskedSubframes;
    return BuildRpfFrame(plan).bytes;
}

std::string SmallFrameFile(const RpfCorners& corners)
{
    std::set<uint32_t> masked;
    for (uint32_t subframe = 1; subframe < kRpfSubframeCount; ++subframe)
        masked.insert(subframe);
    return FrameFile(corners, RpfProduct::Cadrg, masked);
}

std::string UtmRgbImage()
{
    return ImageFile(UtmRgbPlan());
}

std::string RotatedGreyImage()
{
    NitfImagePlan plan;
    plan.rows = kGreyRows;
    plan.columns = kGreyColumns;
    plan.ICORDS = 'D';
    plan.IGEOLO = DegreeSlot(45.0, 10.0) + DegreeSlot(45.1, 10.2) + DegreeSlot(45.05, 10.25) +
                  DegreeSlot(44.95, 10.05);
    return ImageFile(plan);
}

std::string BrokenFrame()
{
    NitfFilePlan plan;
    plan.images.push_back({std::string(100, 'x'), std::string(100, 'y')});
    plan.userHeaderData = Tre("RPFHDR", std::string(48, '\0'));
    return BuildNitfFile(plan);
}
