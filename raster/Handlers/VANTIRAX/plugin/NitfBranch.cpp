// Plain NITF branch: the handler serves the first image segment of a NITF
// file that is not an RPF frame, through its CNitfImage.
#include "plugin/RasterHandler.h"

#include "geo/ImageCorners.h"
#include "nitf/NitfFileHeader.h"
#include "plugin/FailureCodes.h"
#include "plugin/GeoRefRecord.h"
#include "plugin/Palette.h"

#include <cstring>

namespace {

constexpr char kNoCorners = ' ';

// The georeference record of the image corners, or null when the subheader
// has none (or the record cannot be allocated). Corners whose coordinate
// system cannot be named (a UTM zone outside 1 to 60, a rejected first MGRS
// reference, an unknown ICORDS) keep the code kEpsgNone: the host sees the
// corners and no coordinate system, never metres labelled as degrees.
RHGeoRef* CornerGeoRef(const CNitfImage& image, uint32_t width, uint32_t height)
{
    if (image.ICORDS() == kNoCorners || image.IGEOLO == nullptr)
        return nullptr;
    const ImageCornerFields fields{image.ICORDS(), image.IGEOLO.get(), image.version21 != 0};
    double corners[3][2] = {};
    ReadImageCorners(fields, corners[0][0], corners[0][1], corners[1][0], corners[1][1], corners[2][0],
                     corners[2][1]);
    const int32_t epsgCode = ImageCornerEpsgCode(fields, int32_t(kEpsgGeographic));
    return CreateGeoRef(uint32_t(epsgCode), width, height, corners);
}

// A palette of GetPaletteSize entries filled from the last index down;
// entries the image does not answer stay black.
RHPalette* ImagePalette(const CNitfImage& image)
{
    RHPalette* palette = CreatePalette(image.GetPaletteSize());
    if (palette == nullptr || palette->entryCount <= 0)
        return palette;
    std::memset(palette->entries, 0, size_t(palette->entryCount) * 3);
    for (int32_t index = palette->entryCount - 1; index >= 0; --index) {
        uint8_t* entry = palette->entries + size_t(index) * 3;
        image.GetPaletteEntry(index, entry[0], entry[1], entry[2]);
    }
    return palette;
}

} // namespace

int32_t CRasterHandler::NitfOpen(RHHandle* handle, CFileReader& reader, const CNitfFileHeader& header)
{
    if (!nitfImage.ReadSubheader(reader, header)) {
        refusal = nitfImage.refusal;
        throw kCodeSubheader;
    }
    const NitfSegmentLength& segment = header.imageSegments[0];
    // A kind this library does not serve: the open answers 1, the status 5 says it failed.
    if (!nitfImage.PrepareData(reader, segment.dataLength)) {
        refusal = nitfImage.refusal;
        lastError = static_cast<int32_t>(kCodePrepare);
        return 1;
    }
    handle->width = uint32_t(nitfImage.NCOLS);
    handle->height = uint32_t(nitfImage.NROWS);
    handle->geoRef = CornerGeoRef(nitfImage, handle->width, handle->height);
    if (nitfImage.IsPaletted()) {
        handle->pixelKind = nitfImage.ColourPalette() ? kPixelPaletted : kPixelGreyPaletted;
        handle->palette = ImagePalette(nitfImage);
    } else {
        handle->pixelKind = kPixelDirect;
        handle->palette = nullptr;
    }
    nitfImage.AllocLineBuffer();
    // A failed decode shows as failing rows.
    nitfImage.OpenCompressed(reader, segment.dataLength);
    handle->status = kStatusOk;
    return 1;
}

bool CRasterHandler::NitfReadLine(CFileReader& reader, uint32_t row, int32_t firstColumn, int32_t lastColumn,
                                  uint8_t* buffer)
{
    return nitfImage.ReadLine(reader, row, firstColumn, lastColumn, buffer);
}

void CRasterHandler::NitfClose()
{
    FreeVector(nitfImage.lineBuffer);
    nitfImage.ReleaseDecoder();
}
