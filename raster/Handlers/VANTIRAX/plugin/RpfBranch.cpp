// RPF frame branch of the handler: a CADRG or CIB frame, found by the RPFHDR
// extension in the NITF file header, described to the host as a 1536 x 1536
// paletted image tied to its coverage corners, and drawn line by line by the
// handler's RPF frame reader.
#include "geo/Angles.h"
#include "nitf/NitfFileHeader.h"
#include "plugin/GeoRefRecord.h"
#include "plugin/Palette.h"
#include "plugin/RasterHandler.h"
#include "rpf/RpfValueTable.h"

namespace {

constexpr uint32_t kRpfFrameSize = 1536;         // columns and rows, whatever the frame's own geometry
constexpr uint32_t kRpfHeaderDataOffset = 14;    // UDHOFL (3), extension tag (6), extension length (5)
constexpr int32_t kRpfPaletteEntries = kMaskedPixel + 1; // the table's colours and white for the masked value
constexpr uint8_t kWhite = 255;

// Fills the palette entries below the masked value from the frame's colour
// table, or from its grey table with each grey repeated three times; the
// masked value's entry is white.
bool FillPalette(RpfColorGraySection& colors, uint8_t* entries)
{
    const bool fromColors = colors.IsColorTable();
    for (uint32_t index = 0; index < kPaletteRecords; ++index) {
        uint8_t* entry = entries + index * 3;
        if (fromColors) {
            if (!colors.GetPaletteColor(index, entry[0], entry[1], entry[2]))
                return false;
        } else {
            if (!colors.GetPaletteGray(index, entry[0]))
                return false;
            entry[1] = entry[2] = entry[0];
        }
    }
    uint8_t* masked = entries + kMaskedPixel * 3;
    masked[0] = masked[1] = masked[2] = kWhite;
    return true;
}

} // namespace

int32_t CRasterHandler::RpfOpen(RHHandle* handle, CFileReader& reader, const CNitfFileHeader& header)
{
    if (header.userHeaderOffset == kNoUserHeader ||
        !rpfReader.Open(reader, uint64_t(header.userHeaderOffset) + kRpfHeaderDataOffset)) {
        refusal = rpfReader.refusal;
        return 0;
    }
    handle->width = kRpfFrameSize;
    handle->height = kRpfFrameSize;
    RpfColorGraySection& colors = rpfReader.colorGraySection;
    const bool paletted = colors.IsColorTable() || colors.IsGrayTable();
    handle->pixelKind = paletted ? kPixelPaletted : kPixelRpfNoTable;

    // Control points (0, 0), (1535, 0) and (0, 1535): the north-west,
    // north-east and south-west corners, longitude before latitude. A frame
    // across the 180 degree meridian keeps running east (LongitudeNear).
    const RpfCoverage& coverage = rpfReader.coverage;
    const double west = coverage.northWestLongitude;
    const double corners[3][2] = {{west, coverage.northWestLatitude},
                                  {LongitudeNear(coverage.northEastLongitude, west), coverage.northEastLatitude},
                                  {LongitudeNear(coverage.southWestLongitude, west), coverage.southWestLatitude}};
    handle->geoRef = CreateGeoRef(kEpsgGeographic, kRpfFrameSize, kRpfFrameSize, corners);
    if (handle->geoRef == nullptr)
        return 0;
    if (paletted) {
        handle->palette = CreatePalette(kRpfPaletteEntries);
        if (handle->palette == nullptr ||
            !Check(FillPalette(colors, handle->palette->entries), refusal, Refusal::kRpfSectionInvalid))
            return 0;
    }
    handle->status = kStatusOk;
    return 1;
}

void CRasterHandler::RpfDrawStart(int32_t rowWidth)
{
    rpfReader.PrepareDraw(rowWidth > 0 ? static_cast<uint32_t>(rowWidth) : 0);
}

bool CRasterHandler::RpfReadLine(CFileReader& reader, uint32_t row, int32_t firstColumn, int32_t lastColumn,
                                 uint8_t* lineBuffer)
{
    if (row >= kRpfFrameSize || firstColumn < 0 || lastColumn < firstColumn ||
        static_cast<uint32_t>(lastColumn) >= kRpfFrameSize)
        return false;
    return rpfReader.ReadLine(reader, row, static_cast<uint32_t>(firstColumn), static_cast<uint32_t>(lastColumn),
                              lineBuffer);
}

void CRasterHandler::RpfDrawEnd()
{
    rpfReader.ReleaseCodeBuffer();
}
