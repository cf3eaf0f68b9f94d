#include "rpf/RpfImageSection.h"

#include "base/Limits.h"
#include "rpf/RpfFieldReader.h"
#include "rpf/RpfValueTable.h"

#include <algorithm>

namespace {

constexpr uint32_t kNoMaskTable = 0xFFFFFFFF;
constexpr uint64_t kMaskedSubframeStart = 0xFFFFFFFF;
constexpr uint8_t kCodeBits = 12; // the only code length of CADRG and CIB frames
constexpr uint32_t kDescriptionBytes = 6 * 2 + 4 * 4;
constexpr uint32_t kMaskHeaderBytes = 3 * 2;
constexpr uint32_t kDisplayParametersBytes = 2 * 4 + 1;

} // namespace

bool RpfImageSection::ReadImageSection(CFileReader& reader, uint32_t descriptionLocation, uint32_t maskLocation,
                                       uint32_t displayLocation, uint32_t spatialLocation, bool bigEndian)
{
    spatialDataLocation = spatialLocation;
    fileSize = reader.FileSize();
    if (!ReadDescription(reader, descriptionLocation, bigEndian))
        return false;
    if (maskLocation != 0 && !ReadMaskHeader(reader, maskLocation, bigEndian))
        return false;
    if (!ReadDisplayParameters(reader, displayLocation, bigEndian) || !DeriveGeometry())
        return false;
    if (subframeMaskTableOffset != kNoMaskTable &&
        !ReadMaskTable(reader, maskLocation, subframeMaskTableOffset, bigEndian, subframeMaskTable))
        return false;
    return transparencyMaskTableOffset == kNoMaskTable ||
           ReadMaskTable(reader, maskLocation, transparencyMaskTableOffset, bigEndian, transparencyMaskTable);
}

bool RpfImageSection::ReadDescription(CFileReader& reader, uint32_t location, bool bigEndian)
{
    uint8_t bytes[kDescriptionBytes];
    if (!CheckedRead(reader, fileSize, location, bytes, sizeof bytes))
        return false;
    RpfFields fields(bytes, bigEndian);
    fields.Number(spectralGroupCount);
    fields.Number(subframeTableCount);
    fields.Number(spectralBandTableCount);
    fields.Number(spectralBandLinesPerImageRow);
    fields.Number(subframesEastWest);
    fields.Number(subframesNorthSouth);
    fields.Number(outputColumnsPerSubframe);
    fields.Number(outputRowsPerSubframe);
    fields.Number(subframeMaskTableOffset);
    fields.Number(transparencyMaskTableOffset);
    return true;
}

bool RpfImageSection::ReadMaskHeader(CFileReader& reader, uint32_t location, bool bigEndian)
{
    uint8_t bytes[kMaskHeaderBytes];
    if (!CheckedRead(reader, fileSize, location, bytes, sizeof bytes))
        return false;
    RpfFields fields(bytes, bigEndian);
    fields.Number(subframeSequenceRecordLength);
    fields.Number(transparencySequenceRecordLength);
    fields.Number(transparentOutputPixelCodeLength);
    return true;
}

bool RpfImageSection::ReadDisplayParameters(CFileReader& reader, uint32_t location, bool bigEndian)
{
    uint8_t bytes[kDisplayParametersBytes];
    if (!CheckedRead(reader, fileSize, location, bytes, sizeof bytes))
        return false;
    RpfFields fields(bytes, bigEndian);
    fields.Number(imageRows);
    fields.Number(imageCodesPerRow);
    fields.Number(imageCodeBitLength);
    return true;
}

// Refuses a geometry that cannot be decoded: no code grid, a kernel of zero
// width or height, subframes that are not whole kernels, an image or code
// row larger than can be addressed or than the file holds.
bool RpfImageSection::DeriveGeometry()
{
    if (imageRows == 0 || imageCodesPerRow == 0)
        return false;
    uint32_t columnsPerCode = outputColumnsPerSubframe / imageCodesPerRow;
    uint32_t rowsPerCode = outputRowsPerSubframe / imageRows;
    if (columnsPerCode == 0 || rowsPerCode == 0 || columnsPerCode > UINT16_MAX || rowsPerCode > UINT16_MAX)
        return false;
    if (outputColumnsPerSubframe % imageCodesPerRow != 0 || outputRowsPerSubframe % imageRows != 0)
        return false;
    uint64_t columns = uint64_t(subframesEastWest) * outputColumnsPerSubframe;
    uint64_t rows = uint64_t(subframesNorthSouth) * outputRowsPerSubframe;
    uint64_t codeRowBytes = uint64_t(imageCodeBitLength) * imageCodesPerRow / 8;
    uint64_t subframeBytes = uint64_t(imageCodeBitLength) * imageCodesPerRow * imageRows / 8;
    if (columns > UINT32_MAX || rows > UINT32_MAX || codeRowBytes > fileSize || subframeBytes > UINT32_MAX)
        return false;
    kernelWidth = static_cast<uint16_t>(columnsPerCode);
    kernelHeight = static_cast<uint16_t>(rowsPerCode);
    totalColumns = static_cast<uint32_t>(columns);
    totalRows = static_cast<uint32_t>(rows);
    bytesPerCodeRow = static_cast<uint32_t>(codeRowBytes);
    bytesPerSubframe = static_cast<uint32_t>(subframeBytes);
    return true;
}

bool RpfImageSection::ReadMaskTable(CFileReader& reader, uint32_t maskLocation, uint32_t offset, bool bigEndian,
                                    std::vector<uint32_t>& table)
{
    const uint64_t subframeCount = uint64_t(subframesEastWest) * subframesNorthSouth;
    const uint64_t location = uint64_t(maskLocation) + offset;
    const uint64_t bytes = subframeCount * sizeof(uint32_t);
    if (!Readable(location, bytes, fileSize))
        return false;
    table.assign(subframeCount, 0);
    if (!CheckedRead(reader, fileSize, location, table.data(), bytes))
        return false;
    if (bigEndian)
        for (uint32_t& entry : table)
            ReverseBytes(entry);
    return true;
}

// The file offset of a subframe's codes; false when the subframe is masked:
// its table entry is 0xFFFFFFFF or the offset runs past 32 bits.
bool RpfImageSection::SubframeStart(uint32_t subframe, uint64_t& start) const
{
    uint64_t offset = subframeMaskTable.empty() ? uint64_t(subframe) * bytesPerSubframe : subframeMaskTable[subframe];
    start = uint64_t(spatialDataLocation) + offset;
    return start < kMaskedSubframeStart;
}

void RpfImageSection::ReleaseSubframeCache()
{
    subframeCache.Release();
}

// The bytes of a code row from the subframe cache, reading the whole subframe
// into its slot first when the slot holds another. Null when the subframes
// are too large to cache or this one does not lie whole in the file: the
// caller then reads the code row alone.
const uint8_t* RpfImageSection::CachedCodeRow(CFileReader& reader, uint32_t subframe, uint64_t start,
                                              uint32_t codeRow)
{
    if (uint64_t(subframesEastWest) * bytesPerSubframe > kMaxSubframeCacheBytes)
        return nullptr;
    subframeCache.Shape(subframesEastWest, bytesPerSubframe);
    const uint8_t* held = subframeCache.Fetch(reader, fileSize, subframe % subframesEastWest, start, bytesPerSubframe);
    return held == nullptr ? nullptr : held + size_t(codeRow) * bytesPerCodeRow;
}

// Refused before the read rather than left to a short read, whose end-of-file
// flag would stay set for the rest of the draw.
const uint8_t* RpfImageSection::ReadCodeRowBytes(CFileReader& reader, uint64_t rowStart)
{
    return CheckedRead(reader, fileSize, rowStart, rawCodeRow.data(), bytesPerCodeRow) ? rawCodeRow.data() : nullptr;
}

bool RpfImageSection::ReadSubframeCodes(CFileReader& reader, uint32_t subframe, uint32_t codeRow,
                                        uint32_t firstCode, uint32_t count, uint16_t* output)
{
    uint64_t start = 0;
    if (!SubframeStart(subframe, start)) {
        std::fill(output, output + count, kMaskedCode);
        return true;
    }
    const uint8_t* packed = CachedCodeRow(reader, subframe, start, codeRow);
    if (packed == nullptr)
        packed = ReadCodeRowBytes(reader, start + uint64_t(codeRow) * bytesPerCodeRow);
    if (packed == nullptr)
        return false;
    UnpackCodes(packed, bytesPerCodeRow, unpackedCodeRow.data(), imageCodesPerRow, imageCodeBitLength);
    std::copy(unpackedCodeRow.begin() + firstCode, unpackedCodeRow.begin() + firstCode + count, output);
    return true;
}

bool RpfImageSection::ReadCodeRow(CFileReader& reader, uint32_t imageRow, uint32_t firstColumn, uint32_t lastColumn,
                                  uint32_t capacity, uint16_t* output)
{
    if (output == nullptr || !reader.HoldsFile() || imageRow >= totalRows || firstColumn >= totalColumns ||
        lastColumn >= totalColumns || imageCodeBitLength != kCodeBits)
        return false;
    if (rawCodeRow.empty()) {
        rawCodeRow.assign(bytesPerCodeRow, 0);
        unpackedCodeRow.assign(imageCodesPerRow, 0);
    }
    uint32_t columnsPerSubframe = outputColumnsPerSubframe;
    uint32_t subframeRow = imageRow / outputRowsPerSubframe;
    uint32_t codeRow = (imageRow % outputRowsPerSubframe) / kernelHeight;
    uint32_t firstSubframe = firstColumn / columnsPerSubframe + subframesEastWest * subframeRow;
    uint32_t firstCode = (firstColumn % columnsPerSubframe) / kernelWidth;
    uint32_t lastSubframe = lastColumn / columnsPerSubframe + subframesEastWest * subframeRow;
    uint32_t lastCode = (lastColumn % columnsPerSubframe) / kernelWidth;
    if (firstCode >= imageCodesPerRow || lastCode >= imageCodesPerRow)
        return false;
    if (firstSubframe == lastSubframe) {
        if (firstCode > lastCode || capacity < lastCode - firstCode + 1)
            return false;
        uint64_t start = 0;
        if (!SubframeStart(firstSubframe, start)) {
            std::fill(output, output + capacity, kMaskedCode);
            return true;
        }
        return ReadSubframeCodes(reader, firstSubframe, codeRow, firstCode, lastCode - firstCode + 1, output);
    }
    if (lastSubframe < firstSubframe)
        return false;
    uint64_t total = uint64_t(lastSubframe - firstSubframe - 1) * imageCodesPerRow + (lastCode + 1) +
                     (imageCodesPerRow - firstCode);
    if (capacity < total)
        return false;
    for (uint32_t subframe = firstSubframe; subframe <= lastSubframe; ++subframe) {
        uint32_t startCode = subframe == firstSubframe ? firstCode : 0;
        uint32_t count = subframe == lastSubframe ? lastCode + 1 : imageCodesPerRow - startCode;
        if (!ReadSubframeCodes(reader, subframe, codeRow, startCode, count, output))
            return false;
        output += count;
    }
    return true;
}

namespace {

// UnpackCodes when every code's bytes are there: a pair of codes per three bytes.
void UnpackWholeCodes(const uint8_t* packed, uint16_t* codes, uint32_t codeCount)
{
    uint32_t index = 0;
    for (; index + 1 < codeCount; index += 2, packed += 3) {
        codes[index] = static_cast<uint16_t>(packed[0] << 4 | packed[1] >> 4);
        codes[index + 1] = static_cast<uint16_t>((packed[1] & 0x0F) << 8 | packed[2]);
    }
    if (index < codeCount)
        codes[index] = static_cast<uint16_t>(packed[0] << 4 | packed[1] >> 4);
}

} // namespace

bool UnpackCodes(const uint8_t* packed, uint32_t byteCount, uint16_t* codes, uint32_t codeCount,
                 uint8_t codeBitLength)
{
    if (codeBitLength != kCodeBits)
        return false;
    if ((uint64_t(codeCount) + 1) / 2 * 3 <= byteCount) {
        UnpackWholeCodes(packed, codes, codeCount);
        return true;
    }
    // A code whose last bits lie past byteCount takes zero bits from there.
    auto byteAt = [&](uint64_t index) -> uint16_t { return index < byteCount ? packed[index] : 0; };
    uint64_t consumed = 0;
    for (uint32_t index = 0; index < codeCount && consumed < byteCount; ++index) {
        uint64_t first = uint64_t(index / 2) * 3;
        if (index % 2 == 0) {
            codes[index] = static_cast<uint16_t>((byteAt(first) << 4) | (byteAt(first + 1) >> 4));
            consumed += 1;
        } else {
            codes[index] = static_cast<uint16_t>(((byteAt(first + 1) & 0x0F) << 8) | byteAt(first + 2));
            consumed += 2;
        }
    }
    return true;
}
