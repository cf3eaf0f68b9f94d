// ReadSubheader: the image subheader of the first image segment, in the NITF
// 2.0 and 2.1 layouts, and the mask table that leads masked image data.
#include "base/CheckedRead.h"
#include "base/FieldNumbers.h"
#include "nitf/NitfFileHeader.h"
#include "nitf/NitfImage.h"

#include <algorithm>
#include <cstring>
#include <strings.h>

namespace {

// The front of the subheader up to ISDWNG (NITF 2.0) or ISCTLN (NITF 2.1);
// ENCRYP..ICORDS follow at the same positions in both layouts.
constexpr unsigned kFrontBeforeEncryp = 290;
constexpr unsigned kEncrypToIcords = 82;
constexpr unsigned kIsdwngPosition = 284;
constexpr unsigned kIsdwngWidth = 6;
constexpr int32_t kDowngradeEvent = 999998;
constexpr unsigned kIsdevtSize = 40;
constexpr unsigned kNrowsPosition = 333;
constexpr unsigned kNcolsPosition = 341;
constexpr unsigned kAbppPosition = 368;
constexpr unsigned kBandTextSize = 12;        // IREPBAND, ISUBCAT, IFC, IMFLT
constexpr unsigned kSmallestBandSize = 13;    // the band text and NLUTS
constexpr uint32_t kUserDataOverflowSize = 3; // UDOFL / IXSOFL, counted in UDIDL / IXSHDL
constexpr unsigned kBlockRecordSize = 4;
constexpr char kBlank = ' ';

bool CodeIs(const char* field, const char* code)
{
    return field[0] == code[0] && field[1] == code[1];
}

// compressionKind for an IC code; -1 for a code this library does not know.
int32_t CompressionKindOf(const char IC[2])
{
    if (CodeIs(IC, "NC") || CodeIs(IC, "NM"))
        return kUncompressed;
    if (CodeIs(IC, "I1"))
        return kDownsampledJpeg;
    if (CodeIs(IC, "C8"))
        return kJpeg2000;
    if ((IC[0] == 'C' || IC[0] == 'M') && IC[1] >= '1' && IC[1] <= '5')
        return IC[1] - '0';
    return -1;
}

// Reads a length-led block of user-defined or extended data: the length
// (5), then, when it is not 0, the overflow (3) and length - 3 bytes.
bool ReadTaggedData(FileCursor& cursor, int32_t& length, int32_t& overflow, std::vector<uint8_t>& data)
{
    overflow = 0;
    if (!cursor.Number(5, length) || length < 0)
        return false;
    if (length == 0)
        return true;
    const uint32_t dataSize = uint32_t(length) - kUserDataOverflowSize;
    if (uint32_t(length) < kUserDataOverflowSize || !cursor.Number(3, overflow) || dataSize > cursor.Remaining())
        return false;
    data.resize(dataSize);
    return cursor.Read(data.data(), dataSize);
}

} // namespace

void CNitfImage::ClearParsed()
{
    dataOffset = 0;
    NBPR = NBPC = NPPBH = NPPBV = NBPP = ABPP = bytesPerPixel = 0;
    isMono = isRgb = isMulti = isMasked = isPrepared = 0;
    drawnBandCount = 0;
    compressionKind = kUncompressed;
    FreeVector(blockOffsets);
    FreeVector(streamIndex);
    maskTableLength = 0;
    storedBlockCount = 0;
    std::memset(subheaderText, 0, sizeof subheaderText);
    IGEOLO.reset();
    NICOM = 0;
    FreeVector(comments);
    std::memset(IC, 0, sizeof IC);
    std::memset(COMRAT, 0, sizeof COMRAT);
    comrat = 0;
    NBANDS = 0;
    FreeVector(bands);
    std::memset(blockingText, 0, sizeof blockingText);
    UDIDL = UDOFL = IXSHDL = IXSOFL = 0;
    FreeVector(UDID);
    FreeVector(IXSHD);
    NCOLS = NROWS = 0;
    refusal = Refusal::kNone;
}

void CNitfImage::Release()
{
    FreeVector(lineBuffer);
    ReleaseBlockCache();
    ClearParsed();
    decoder.FreeBitmaps();
    jpeg2000.Release();
}

bool CNitfImage::ReadSubheader(CFileReader& reader, uint32_t offset)
{
    try {
        ClearParsed();
        FileCursor cursor(reader, reader.FileSize());
        if (!ReadFront(cursor, offset) || !ReadCorners(cursor))
            return Refuse(refusal, Refusal::kSubheaderInvalid);
        // IC is read before its kind is known: an unknown code fails it.
        if (!ReadCompression(cursor))
            return Refuse(refusal, compressionKind < 0 ? Refusal::kUnservedCompression : Refusal::kSubheaderInvalid);
        if (!ReadBands(cursor))
            return Refuse(refusal, Refusal::kBandsInvalid);
        if (!ReadBlocking(cursor) || !ReadExtensions(cursor) || !PlaceData(cursor, offset))
            return Refuse(refusal, Refusal::kSubheaderInvalid);
        return Check(!isMasked || ReadMaskTable(cursor), refusal, Refusal::kMaskTableInvalid);
    } catch (...) {
        return Refuse(refusal, Refusal::kUnexpected);
    }
}

bool CNitfImage::ReadSubheader(CFileReader& reader, const CNitfFileHeader& header)
{
    if (header.NUMI < 1 || header.imageSegments == nullptr)
        return Refuse(refusal, Refusal::kNoImage);
    version21 = header.version21;
    subheaderLength = header.imageSegments[0].subheaderLength;
    return ReadSubheader(reader, header.HL);
}

bool CNitfImage::ReadFront(FileCursor& cursor, uint32_t offset)
{
    if (!cursor.SeekTo(offset) || !cursor.Read(subheaderText, kFrontBeforeEncryp))
        return false;
    // A NITF 2.0 subheader whose ISDWNG is 999998 carries the 40-character
    // ISDEVT before ENCRYP, whether or not the file header had a downgrade event.
    if (!version21 && FieldToLong(subheaderText + kIsdwngPosition, kIsdwngWidth) == kDowngradeEvent &&
        !cursor.Skip(kIsdevtSize))
        return false;
    if (!cursor.Read(subheaderText + kFrontBeforeEncryp, kEncrypToIcords))
        return false;
    NROWS = FieldToLong(subheaderText + kNrowsPosition, 8);
    NCOLS = FieldToLong(subheaderText + kNcolsPosition, 8);
    isMono = strncasecmp(IREP(), "MONO", 4) == 0;
    isRgb = strncasecmp(IREP(), "RGB", 3) == 0;
    isMulti = strncasecmp(IREP(), "MULTI", 5) == 0;
    return true;
}

bool CNitfImage::ReadCorners(FileCursor& cursor)
{
    // In NITF 2.0 ICORDS "N" means the image has no corner locations.
    if (ICORDS() == kBlank || (ICORDS() == 'N' && !version21)) {
        subheaderText[kIcordsPosition] = kBlank;
        return true;
    }
    IGEOLO.reset(new char[kIgeoloSize + 1]);
    IGEOLO[kIgeoloSize] = '\0';
    return cursor.Read(IGEOLO.get(), kIgeoloSize);
}

bool CNitfImage::ReadCompression(FileCursor& cursor)
{
    if (!cursor.Number(1, NICOM) || NICOM < 0)
        return false;
    comments.resize(size_t(NICOM) * kCommentSize);
    if (!cursor.Read(comments.data(), comments.size()) || !cursor.Read(IC, sizeof IC))
        return false;
    if (!CodeIs(IC, "NC") && !CodeIs(IC, "NM")) {
        if (!cursor.Read(COMRAT, sizeof COMRAT))
            return false;
        comrat = FieldToDouble(COMRAT, sizeof COMRAT);
    }
    isMasked = IC[0] == 'M' || CodeIs(IC, "NM");
    compressionKind = CompressionKindOf(IC);
    return compressionKind >= 0;
}

bool CNitfImage::ReadBands(FileCursor& cursor)
{
    if (!cursor.Number(1, NBANDS))
        return false;
    // NBANDS "0" hands the count to XBANDS, a field NITF 2.0 does not have.
    if (NBANDS == 0 && (!version21 || !cursor.Number(5, NBANDS)))
        return false;
    if (NBANDS < 1 || uint64_t(NBANDS) * kSmallestBandSize > cursor.Remaining())
        return false;
    bands.resize(size_t(NBANDS));
    for (NitfBand& band : bands) {
        char text[kBandTextSize];
        if (!cursor.Read(text, sizeof text) || !cursor.Number(1, band.NLUTS) || band.NLUTS < 0)
            return false;
        std::memcpy(band.IREPBAND, text, 2);
        std::memcpy(band.ISUBCAT, text + 2, 6);
        band.IFC[0] = text[8];
        std::memcpy(band.IMFLT, text + 9, 3);
        if (band.NLUTS == 0)
            continue;
        if (!cursor.Number(5, band.NELUT) || band.NELUT < 0)
            return false;
        const uint64_t lutSize = uint64_t(band.NLUTS) * uint64_t(band.NELUT);
        if (lutSize > cursor.Remaining())
            return false;
        band.LUT.resize(size_t(lutSize));
        if (!cursor.Read(band.LUT.data(), lutSize))
            return false;
    }
    ChooseDrawnBands();
    return true;
}

// An RGB image shows its three bands in file order; a MULTI one, or a MONO
// one of several bands, the first bands whose IREPBAND is "R", "G" and "B"
// when it has all three; any other image its first band.
void CNitfImage::ChooseDrawnBands()
{
    drawnBandCount = 1;
    drawnBands[0] = 0;
    if (isRgb && NBANDS == int32_t(kRgbBands)) {
        drawnBandCount = NBANDS;
        drawnBands[1] = 1;
        drawnBands[2] = 2;
        return;
    }
    if (!isMono && !isMulti)
        return;
    int32_t found[kRgbBands] = {-1, -1, -1};
    for (int32_t b = NBANDS - 1; b >= 0; --b)
        for (size_t k = 0; k < kRgbBands; ++k)
            if (bands[size_t(b)].IREPBAND[0] == "RGB"[k] && bands[size_t(b)].IREPBAND[1] == kBlank)
                found[k] = b;
    if (found[0] < 0 || found[1] < 0 || found[2] < 0)
        return;
    drawnBandCount = int32_t(kRgbBands);
    std::copy(found, found + kRgbBands, drawnBands);
}

bool CNitfImage::ReadBlocking(FileCursor& cursor)
{
    if (!cursor.Read(blockingText, sizeof blockingText))
        return false;
    NBPR = FieldToLong(blockingText + 2, 4);
    NBPC = FieldToLong(blockingText + 6, 4);
    NPPBH = FieldToLong(blockingText + 10, 4);
    NPPBV = FieldToLong(blockingText + 14, 4);
    NBPP = FieldToLong(blockingText + 18, 2);
    bytesPerPixel = (NBPP + 7) / 8;
    ABPP = FieldToLong(subheaderText + kAbppPosition, 2);
    return true;
}

bool CNitfImage::ReadExtensions(FileCursor& cursor)
{
    return ReadTaggedData(cursor, UDIDL, UDOFL, UDID) && ReadTaggedData(cursor, IXSHDL, IXSOFL, IXSHD);
}

// Image data begins LISH bytes after the subheader's start: writers may pad
// the subheader past its last field, so the parsed end is only checked.
bool CNitfImage::PlaceData(FileCursor& cursor, uint32_t offset)
{
    if (subheaderLength == 0) {
        dataOffset = cursor.Position();
        return true;
    }
    const uint64_t declaredEnd = uint64_t(offset) + subheaderLength;
    if (cursor.Position() > declaredEnd || declaredEnd > kLargestReaderOffset)
        return false;
    dataOffset = declaredEnd;
    return true;
}

// The mask table: IMDATOFF, BMRLNTH, TMRLNTH, TPXCDLNTH, the pad pixel code,
// then one 4-byte block record per block (per band and block in IMODE "S",
// where each band's blocks are stored apart). The transparent-pixel records
// that may follow are not read.
bool CNitfImage::ReadMaskTable(FileCursor& cursor)
{
    uint32_t IMDATOFF = 0, BMRLNTH = 0, TMRLNTH = 0, TPXCDLNTH = 0;
    if (!cursor.SeekTo(dataOffset) || !cursor.Binary(4, IMDATOFF) || !cursor.Binary(2, BMRLNTH) ||
        !cursor.Binary(2, TMRLNTH) || !cursor.Binary(2, TPXCDLNTH))
        return false;
    const uint64_t blockedData = dataOffset + IMDATOFF;
    if (blockedData > kLargestReaderOffset)
        return false;
    dataOffset = blockedData;
    maskTableLength = IMDATOFF;
    if (TPXCDLNTH != 0 && !cursor.Skip((TPXCDLNTH - 1) / 8 + 1))
        return false;
    if (BMRLNTH == 0) {
        isMasked = 0;
        return true;
    }
    if (NBPR < 1 || NBPC < 1)
        return false;
    uint64_t records = uint64_t(NBPR) * uint64_t(NBPC);
    if (IMODE() == 'S')
        records *= uint64_t(NBANDS);
    if (records > cursor.Remaining() / kBlockRecordSize)
        return false;
    blockOffsets.resize(size_t(records));
    for (uint32_t& blockOffset : blockOffsets)
        if (!cursor.Binary(4, blockOffset))
            return false;
    return true;
}
