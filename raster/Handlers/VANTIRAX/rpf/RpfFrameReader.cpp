#include "rpf/RpfFrameReader.h"

#include <algorithm>
#include <cstring>
#include <iterator>

namespace {
constexpr uint32_t kCommonKernelWidth = 4; // CADRG and CIB kernels are 4 x 4
// The components every frame's sections are read from.
constexpr uint16_t kNeededComponents[] = {kCoverageSectionSubheader,     kCompressionSectionSubheader,
                                          kCompressionLookupSubsection,  kColorGraySectionSubheader,
                                          kColormapSubsection,           kImageDescriptionSubheader,
                                          kImageDisplayParametersSubheader};
} // namespace

bool CRpfFrameReader::Open(CFileReader& reader, uint64_t headerSectionOffset)
{
    refusal = Refusal::kRpfSectionInvalid;
    if (!headerSection.ReadHeaderSection(reader, headerSectionOffset))
        return false;
    bool bigEndian = headerSection.bigEndian;
    if (!locationSection.ReadLocationSection(reader, headerSection.locationSectionLocation, bigEndian))
        return false;
    // A section whose component is not listed is read from offset 0 and fails there.
    if (!ListsNeededComponents())
        refusal = Refusal::kRpfSectionMissing;
    if (!coverage.ReadCoverage(reader, FindComponentLocation(kCoverageSectionSubheader), bigEndian))
        return false;
    if (!compressionSection.ReadCompressionSection(reader, FindComponentLocation(kCompressionSectionSubheader),
                                                   FindComponentLocation(kCompressionLookupSubsection),
                                                   FindComponentLocation(kCompressionParameterSubsection),
                                                   bigEndian))
        return false;
    if (!colorGraySection.ReadColorGraySection(reader, FindComponentLocation(kColorGraySectionSubheader),
                                               FindComponentLocation(kColormapSubsection),
                                               FindComponentLocation(kColorConverterSubsection), bigEndian))
        return false;
    if (!imageSection.ReadImageSection(reader, FindComponentLocation(kImageDescriptionSubheader),
                                       FindComponentLocation(kMaskSubsection),
                                       FindComponentLocation(kImageDisplayParametersSubheader),
                                       FindComponentLocation(kSpatialDataSubsection), bigEndian))
        return false;
    refusal = Refusal::kNone;
    return true;
}

bool CRpfFrameReader::ListsNeededComponents() const
{
    return std::all_of(std::begin(kNeededComponents), std::end(kNeededComponents),
                       [this](uint16_t id) { return FindComponentLocation(id) != 0; });
}

uint32_t CRpfFrameReader::FindComponentLocation(uint16_t componentId) const
{
    return locationSection.FindComponentLocation(componentId);
}

void CRpfFrameReader::PrepareDraw(uint32_t width)
{
    // Only columns inside the frame are ever read, however wide the host's
    // span: a span of width columns touches at most width / kernel width + 2 codes.
    const uint32_t servedWidth = std::min(width, imageSection.totalColumns);
    codeCapacity = servedWidth / imageSection.kernelWidth + 2;
    codeBuffer.assign(codeCapacity, 0);
    codesHeld = false;
    imageSection.ReleaseSubframeCache();
}

void CRpfFrameReader::ReleaseCodeBuffer()
{
    codeBuffer = std::vector<uint16_t>();
    codeCapacity = 0;
    codesHeld = false;
    imageSection.ReleaseSubframeCache();
}

bool CRpfFrameReader::FetchCodes(CFileReader& reader, uint32_t imageRow, uint32_t firstColumn, uint32_t lastColumn)
{
    // Subframes are whole kernels high (checked at open), so rows with the
    // same quotient share one code row of every subframe.
    uint32_t codeRow = imageRow / imageSection.kernelHeight;
    if (codesHeld && codeRow == heldCodeRow && firstColumn == heldFirstColumn && lastColumn == heldLastColumn)
        return true;
    codesHeld = imageSection.ReadCodeRow(reader, imageRow, firstColumn, lastColumn, codeCapacity,
                                         codeBuffer.empty() ? nullptr : codeBuffer.data());
    heldCodeRow = codeRow;
    heldFirstColumn = firstColumn;
    heldLastColumn = lastColumn;
    return codesHeld;
}

bool CRpfFrameReader::ReadLine(CFileReader& reader, uint32_t imageRow, uint32_t firstColumn, uint32_t lastColumn,
                               uint8_t* output)
{
    if (output == nullptr || lastColumn < firstColumn || !FetchCodes(reader, imageRow, firstColumn, lastColumn))
        return false;
    return AssembleLine(imageRow, firstColumn, lastColumn, output);
}

bool CRpfFrameReader::AssembleLine(uint32_t imageRow, uint32_t firstColumn, uint32_t lastColumn, uint8_t* output)
{
    uint16_t kernelWidth = imageSection.kernelWidth;
    uint16_t kernelRow = static_cast<uint16_t>(imageRow % imageSection.kernelHeight);
    uint32_t firstOffset = firstColumn % kernelWidth; // column of the span's first pixel inside its code
    uint32_t span = lastColumn - firstColumn + 1;
    uint64_t codesNeeded = (uint64_t(firstOffset) + span - 1) / kernelWidth + 1;
    if (codesNeeded > codeCapacity)
        return false;
    if (kernelRowBuffer.empty())
        kernelRowBuffer.assign(kernelWidth, 0);
    if (const RpfValueTable* table = compressionSection.ByteTable(kernelRow, kernelWidth))
        return AssembleFromTable(*table, firstOffset, span, output);
    uint8_t* kernel = kernelRowBuffer.data();
    uint32_t written = 0;
    for (uint32_t codeIndex = 0; written < span; ++codeIndex) {
        if (!compressionSection.DecodeKernelRow(kernelRow, codeBuffer[codeIndex], kernelWidth, kernel))
            return false;
        uint32_t from = codeIndex == 0 ? firstOffset : 0;
        uint32_t count = kernelWidth - from;
        if (count > span - written)
            count = span - written;
        std::memcpy(output + written, kernel + from, count);
        written += count;
    }
    return true;
}

// AssembleLine for a table whose records are whole kernel rows of bytes: each
// code's pixels are copied straight from its record. The span's first and
// last codes may be cut; every code between gives a whole kernel row.
bool CRpfFrameReader::AssembleFromTable(const RpfValueTable& table, uint32_t firstOffset, uint32_t span,
                                        uint8_t* output)
{
    const uint16_t kernelWidth = imageSection.kernelWidth;
    uint8_t* masked = kernelRowBuffer.data();
    std::memset(masked, kMaskedPixel, kernelWidth);
    const uint16_t* code = codeBuffer.data();
    // Copied into the lambda: writes to output may not reload them.
    const uint8_t* records = table.data.data();
    const uint32_t recordCount = table.recordCount;
    auto kernelOf = [masked, records, recordCount, kernelWidth](uint16_t value) -> const uint8_t* {
        if (value == kMaskedCode)
            return masked;
        return value < recordCount ? records + size_t(value) * kernelWidth : nullptr;
    };
    const uint8_t* kernel = kernelOf(*code++);
    if (kernel == nullptr)
        return false;
    uint32_t written = std::min<uint32_t>(kernelWidth - firstOffset, span);
    std::memcpy(output, kernel + firstOffset, written);
    for (; span - written >= kernelWidth; written += kernelWidth) {
        if ((kernel = kernelOf(*code++)) == nullptr)
            return false;
        if (kernelWidth == kCommonKernelWidth)
            std::memcpy(output + written, kernel, kCommonKernelWidth); // fixed size: one move
        else
            std::memcpy(output + written, kernel, kernelWidth);
    }
    if (written == span)
        return true;
    if ((kernel = kernelOf(*code)) == nullptr)
        return false;
    std::memcpy(output + written, kernel, span - written);
    return true;
}
