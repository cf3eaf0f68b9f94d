// CNitfImage: which images are served, their colours, and the set-up of the
// decoder for compressed images.
#include "nitf/NitfImage.h"

#include "base/CheckedMath.h"
#include "base/CheckedRead.h"
#include "imaging/JpegMarkers.h"

#include <algorithm>
#include <strings.h>

namespace {

constexpr unsigned kPvtypePosition = 349;
constexpr int32_t kGreyPaletteSize = 256;
constexpr int32_t kLastPaletteIndex = 255;
constexpr unsigned kRgbTables = 3;
constexpr uint32_t kRgbPixelBytes = 3;
constexpr uint8_t kWhite = 255;

// Depths whose samples are reduced to 8 bits; 12-bit pixels are packed.
bool IsReducedDepth(int32_t NBPP)
{
    return NBPP == 8 || NBPP == 12 || NBPP == 16 || NBPP == 32 || NBPP == 64;
}

} // namespace

bool CNitfImage::IsRgbLut() const
{
    return strncasecmp(IREP(), "RGB/LUT", 7) == 0;
}

// Uncompressed and JPEG 2000 MONO and MULTI images show one band through the
// palette unless they have R, G and B bands; other compressed ones keep the
// decoder's bands.
bool CNitfImage::IsPaletted() const
{
    if ((compressionKind == kUncompressed || compressionKind == kJpeg2000) && (isMono || isMulti))
        return drawnBandCount == 1;
    return IsRgbLut() || isMono;
}

// A MULTI image's first band shows through its tables as colours when it
// has three, as an RGB/LUT band does.
bool CNitfImage::ColourPalette() const
{
    return IsRgbLut() || (isMulti && !bands.empty() && bands[0].NLUTS >= int32_t(kRgbTables));
}

// Uncompressed 1-bit pixels are palette indices 0 and 1, not reduced samples.
bool CNitfImage::OneBitIndices() const
{
    return compressionKind == kUncompressed && NBPP == 1;
}

int32_t CNitfImage::GetPaletteSize() const
{
    if (bands.empty())
        return kGreyPaletteSize;
    if (ColourPalette() || (OneBitIndices() && !bands[0].LUT.empty()))
        return bands[0].NELUT;
    return OneBitIndices() ? 2 : kGreyPaletteSize;
}

// Entries whose table position lies past the lookup data are not answered
// (false); the caller leaves them black.
bool CNitfImage::GetPaletteEntry(int32_t index, uint8_t& red, uint8_t& green, uint8_t& blue) const
{
    if (index < 0 || index > kLastPaletteIndex || index >= GetPaletteSize() || bands.empty())
        return false;
    const std::vector<uint8_t>& LUT = bands[0].LUT;
    const size_t i = size_t(index);
    if (!ColourPalette()) {
        const size_t position = bytesPerPixel < 2 ? i : i * size_t(bytesPerPixel);
        if (LUT.empty()) {
            // Without a table 1-bit pixels are black and white.
            red = green = blue = OneBitIndices() ? uint8_t(index * kWhite) : uint8_t(index);
            return true;
        }
        if (position >= LUT.size())
            return false;
        red = green = blue = LUT[position];
        return true;
    }
    const size_t NELUT = size_t(bands[0].NELUT);
    if (LUT.empty() || (kRgbTables - 1) * NELUT + i >= LUT.size())
        return false;
    red = LUT[i];
    green = LUT[NELUT + i];
    blue = LUT[2 * NELUT + i];
    return true;
}

bool CNitfImage::PrepareData(CFileReader& reader, uint64_t dataLength)
{
    isPrepared = 0;
    refusal = Refusal::kNone;
    FreeVector(streamIndex);
    readLimit = ReachableBytes(reader.FileSize());
    if (!ValidGeometry())
        return Refuse(refusal, Refusal::kBlockGeometryInvalid);
    bool served = false;
    switch (compressionKind) {
    case kUncompressed:
        refusal = UncompressedRefusal();
        served = refusal == Refusal::kNone && Check(DataFitsFile(), refusal, Refusal::kDataOutsideFile);
        break;
    case kBiLevel:
        // The decoder wraps all LI bytes at once; one byte per pixel comes out.
        served = NBANDS == 1 && dataLength != 0 && dataLength <= readLimit - dataOffset && decoder.PrepareBiLevel();
        break;
    case kJpeg:
    case kLosslessJpeg:
    case kDownsampledJpeg:
        served = PrepareJpegData(reader, dataLength);
        break;
    case kJpeg2000:
        served = PrepareJpeg2000Data(reader, dataLength);
        break;
    case kVectorQuantized:
        served = NBANDS == 1 && IsPaletted();
        break;
    default:
        refusal = Refusal::kUnservedCompression;
        break;
    }
    // A compressed kind whose preparation refused it records no cause of its own.
    if (!served && refusal == Refusal::kNone)
        refusal = Refusal::kCompressedDataInvalid;
    // The host reads rows by the pixel kind that IsPaletted chooses.
    served = served && Check(OutputPixelBytes() == HostPixelBytes(), refusal, Refusal::kUnservedRepresentation);
    isPrepared = served ? 1 : 0;
    return served;
}

uint32_t CNitfImage::HostPixelBytes() const
{
    return IsPaletted() ? 1 : kRgbPixelBytes;
}

// The block geometry every row read relies on: blocks that cover the image,
// no block size of 0 (NPPBH or NPPBV 0 with one block stands for the image's
// width or height, as NITF writes it for large images), a known IMODE.
bool CNitfImage::ValidGeometry()
{
    if (NCOLS < 1 || NROWS < 1 || NBPR < 1 || NBPC < 1 || NBPP < 1 || NBANDS < 1 || dataOffset > readLimit)
        return false;
    if (NPPBH == 0 && NBPR == 1)
        NPPBH = NCOLS;
    if (NPPBV == 0 && NBPC == 1)
        NPPBV = NROWS;
    if (NPPBH < 1 || NPPBV < 1)
        return false;
    if (int64_t(NBPR) * NPPBH < NCOLS || int64_t(NBPC) * NPPBV < NROWS)
        return false;
    const char mode = IMODE();
    return mode == 'B' || mode == 'P' || mode == 'R' || mode == 'S';
}

// Real and complex pixels would show only their sign and exponent bits.
// 1-bit pixels are palette indices; wider ones are reduced to 8 bits, except
// through an RGB/LUT table. Packed pixels of several bands are read only
// where each band's block stands alone (IMODE "B" and "S"). kNone: served.
Refusal CNitfImage::UncompressedRefusal() const
{
    const char PVTYPE = subheaderText[kPvtypePosition];
    if (PVTYPE == 'R' || PVTYPE == 'C')
        return Refusal::kUnservedPixelType;
    if (IsPacked() && NBANDS > 1 && IMODE() != 'B' && IMODE() != 'S')
        return Refusal::kUnservedDepth;
    if (IsRgbLut() ? NBANDS != 1 : !isMono && !isMulti && !(isRgb && drawnBandCount == int32_t(kRgbTables)))
        return Refusal::kUnservedRepresentation;
    const bool served = IsRgbLut()    ? NBPP == 1 || NBPP == 8
                        : NBPP == 1 ? drawnBandCount == 1
                                    : IsReducedDepth(NBPP);
    return served ? Refusal::kNone : Refusal::kUnservedDepth;
}

// NBPP 1 and 12: pixels that do not fill whole bytes.
bool CNitfImage::IsPacked() const
{
    return NBPP % 8 != 0;
}

// Packed pixels run on across the rows of a block, and each band's block
// starts on a byte. No overflow: sizes of 8 digits and an NBPP of 2.
uint64_t CNitfImage::BandBlockBytes() const
{
    return (uint64_t(NPPBH) * uint64_t(NPPBV) * uint64_t(NBPP) + 7) / 8;
}

// Every block the rows address must lie in the file: the whole image data
// without a mask table, every stored block with one.
bool CNitfImage::DataFitsFile() const
{
    const uint64_t available = readLimit - dataOffset;
    const uint64_t bandBlock = BandBlockBytes();
    if (bandBlock > available)
        return false;
    const bool bandsApart = IMODE() == 'S';
    uint64_t storedBlock = bandBlock;
    if (!bandsApart && !MultiplyWithin(storedBlock, uint64_t(NBANDS), available))
        return false;
    if (isMasked) {
        for (uint32_t blockOffset : blockOffsets)
            if (blockOffset != kBlockNotStored && !SpanWithin(blockOffset, storedBlock, available))
                return false;
        return true;
    }
    uint64_t total = uint64_t(NBPR);
    return MultiplyWithin(total, uint64_t(NBPC), available) && MultiplyWithin(total, uint64_t(NBANDS), available) &&
           MultiplyWithin(total, bandBlock, available);
}

// JPEG rows come out one byte per pixel (grey) or three (colour), which is
// what the row buffer holds; the decoder decodes one stream per stored block.
bool CNitfImage::PrepareJpegData(CFileReader& reader, uint64_t dataLength)
{
    const int64_t bits = int64_t(NBPP) * NBANDS;
    if ((bits != 8 && bits != 24) || dataLength <= maskTableLength)
        return false;
    const uint64_t blocks = uint64_t(NBPR) * uint64_t(NBPC);
    if (blocks > (readLimit - dataOffset) / kMarkersOnlyJpegBytes)
        return false;
    storedBlockCount = static_cast<uint32_t>(blocks);
    FreeVector(decoder.streamOffsets);
    if (isMasked && !IndexMaskedStreams())
        return false;
    const uint64_t firstStream = isMasked ? dataOffset + decoder.streamOffsets[0] : dataOffset;
    return decoder.PrepareJpeg(reader, firstStream, dataLength, uint32_t(NBPP));
}

// A masked JPEG image stores only some blocks, each its own stream, where
// the mask table's block records place them: in any order, with any bytes
// between them. Block b is the decoder's stream of its rank among the stored
// blocks in block order.
bool CNitfImage::IndexMaskedStreams()
{
    const size_t blocks = size_t(NBPR) * size_t(NBPC);
    if (blockOffsets.size() < blocks)
        return false;
    streamIndex.assign(blocks, kBlockNotStored);
    std::vector<uint32_t>& offsets = decoder.streamOffsets;
    for (size_t b = 0; b < blocks; ++b) {
        const uint32_t blockOffset = blockOffsets[b];
        if (blockOffset == kBlockNotStored)
            continue;
        if (uint64_t(dataOffset) + blockOffset >= readLimit)
            return false;
        streamIndex[b] = static_cast<uint32_t>(offsets.size());
        offsets.push_back(blockOffset);
    }
    storedBlockCount = static_cast<uint32_t>(offsets.size());
    return storedBlockCount > 0;
}

// A JPEG 2000 image shows the bands an uncompressed one of its IREP would,
// wide samples reduced alike; its codestream's header must agree with the
// subheader.
bool CNitfImage::PrepareJpeg2000Data(CFileReader& reader, uint64_t dataLength)
{
    const bool rgbLut = IsRgbLut();
    if (rgbLut ? NBANDS != 1 || NBPP > 8 : !isMono && !isMulti && !(isRgb && drawnBandCount == int32_t(kRgbTables)))
        return false;
    Jpeg2000Expectation expected;
    expected.columns = uint32_t(NCOLS);
    expected.rows = uint32_t(NROWS);
    expected.components = uint32_t(NBANDS);
    expected.largestPrecision = uint32_t(NBPP);
    expected.significantBits = NBPP > 8 ? SignificantBits() : 0;
    expected.drawn.assign(drawnBands, drawnBands + drawnBandCount);
    return jpeg2000.Open(reader, dataOffset, std::min(dataLength, readLimit - dataOffset), expected);
}

void CNitfImage::AllocLineBuffer()
{
    FreeVector(lineBuffer);
    if (isPrepared && compressionKind == kUncompressed)
        lineBuffer.resize(size_t(IMODE() == 'P' ? NBANDS : 1) * size_t(NPPBH) * size_t(bytesPerPixel));
}

bool CNitfImage::OpenCompressed(CFileReader& reader, uint64_t dataLength)
{
    const bool jpeg =
        compressionKind == kJpeg || compressionKind == kLosslessJpeg || compressionKind == kDownsampledJpeg;
    // A masked bi-level image ("M1") is not decoded; its rows fail.
    const bool biLevel = compressionKind == kBiLevel && IC[0] == 'C';
    if (!jpeg && !biLevel)
        return true;
    if (!isPrepared)
        return false;
    const uint32_t blocks = jpeg ? storedBlockCount : uint32_t(NBPR) * uint32_t(NBPC);
    // The mask table counts in LI: the blocks end where the image data ends.
    const uint64_t blockedLength = dataLength > maskTableLength ? dataLength - maskTableLength : 0;
    const uint64_t length = std::min<uint64_t>(blockedLength, readLimit - dataOffset);
    return decoder.Open(reader, dataOffset, blocks, length, uint32_t(NBPP), uint32_t(NBANDS), uint32_t(NCOLS),
                        uint32_t(NROWS), COMRAT[0] == '1', uint32_t(NPPBH), uint32_t(NPPBV),
                        compressionKind == kDownsampledJpeg);
}

void CNitfImage::ReleaseDecoder()
{
    decoder.FreeBitmaps();
    jpeg2000.Release();
}
