// The RPF image section: image description, mask subsection and display
// parameters, the geometry derived from them, and the reading of one code row
// across the subframes that a column span touches.
#pragma once

#include "base/FileReader.h"
#include "base/SlotCache.h"

#include <cstdint>
#include <vector>

struct RpfImageSection {
    std::vector<uint8_t> rawCodeRow;       // one packed code row, allocated by the first ReadCodeRow
    std::vector<uint16_t> unpackedCodeRow; // the same row unpacked
    // Whole subframes read during one draw, one slot per column of subframes,
    // so that the code rows of a subframe cost one file read between them.
    SlotCache subframeCache;

    // Derived geometry.
    uint16_t kernelWidth = 1;
    uint16_t kernelHeight = 1;
    uint32_t totalColumns = 0;
    uint32_t totalRows = 0;
    uint32_t bytesPerSubframe = 0;
    uint32_t bytesPerCodeRow = 0;

    // Image description subheader.
    uint16_t spectralGroupCount = 0;
    uint16_t subframeTableCount = 0;
    uint16_t spectralBandTableCount = 0;
    uint16_t spectralBandLinesPerImageRow = 0;
    uint16_t subframesEastWest = 0;
    uint16_t subframesNorthSouth = 0;
    uint32_t outputColumnsPerSubframe = 0;
    uint32_t outputRowsPerSubframe = 0;
    uint32_t subframeMaskTableOffset = 0;    // from the mask subsection; kNoMaskTable = none
    uint32_t transparencyMaskTableOffset = 0; // likewise

    // Mask subsection header (stored, not used).
    uint16_t subframeSequenceRecordLength = 0;
    uint16_t transparencySequenceRecordLength = 0;
    uint16_t transparentOutputPixelCodeLength = 0;

    // Image display parameters.
    uint32_t imageRows = 0;         // code rows per subframe
    uint32_t imageCodesPerRow = 0;
    uint8_t imageCodeBitLength = 0;

    std::vector<uint32_t> subframeMaskTable;     // empty when there is none
    std::vector<uint32_t> transparencyMaskTable; // stored, never consulted
    uint32_t spatialDataLocation = 0;
    uint64_t fileSize = 0; // of the file at open: every code row read must lie inside it

    bool ReadImageSection(CFileReader& reader, uint32_t descriptionLocation, uint32_t maskLocation,
                          uint32_t displayLocation, uint32_t spatialLocation, bool bigEndian);
    // Writes the codes of the code row covering imageRow, one per kernel-wide
    // column group from firstColumn's group to lastColumn's (both inclusive).
    bool ReadCodeRow(CFileReader& reader, uint32_t imageRow, uint32_t firstColumn, uint32_t lastColumn,
                     uint32_t capacity, uint16_t* output);
    // Empties the subframe cache; every draw starts with an empty one.
    void ReleaseSubframeCache();

private:
    bool ReadDescription(CFileReader& reader, uint32_t location, bool bigEndian);
    bool ReadMaskHeader(CFileReader& reader, uint32_t location, bool bigEndian);
    bool ReadDisplayParameters(CFileReader& reader, uint32_t location, bool bigEndian);
    bool DeriveGeometry();
    bool ReadMaskTable(CFileReader& reader, uint32_t maskLocation, uint32_t offset, bool bigEndian,
                       std::vector<uint32_t>& table);
    bool SubframeStart(uint32_t subframe, uint64_t& start) const;
    const uint8_t* CachedCodeRow(CFileReader& reader, uint32_t subframe, uint64_t start, uint32_t codeRow);
    const uint8_t* ReadCodeRowBytes(CFileReader& reader, uint64_t rowStart);
    bool ReadSubframeCodes(CFileReader& reader, uint32_t subframe, uint32_t codeRow, uint32_t firstCode,
                           uint32_t count, uint16_t* output);
};

// Unpacks up to codeCount 12-bit codes, two in three bytes, most significant
// bits first, stopping when byteCount bytes are consumed. False for any other
// code bit length (nothing is written then).
bool UnpackCodes(const uint8_t* packed, uint32_t byteCount, uint16_t* codes, uint32_t codeCount,
                 uint8_t codeBitLength);
