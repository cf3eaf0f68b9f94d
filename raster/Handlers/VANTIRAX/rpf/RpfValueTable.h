// A table of fixed-size 8-bit records: the VQ codebooks of the compression
// lookup subsection and the colour/grayscale tables of the colormap subsection.
#pragma once

#include "base/FileReader.h"

#include <cstdint>
#include <vector>

// The code written for every position of a masked subframe, and the pixel
// value (palette entry 216, white) that it decodes to.
constexpr uint16_t MaskedCode = 0xFFFF;
constexpr uint8_t MaskedPixel = 216;

struct RpfValueTable {
    std::vector<uint8_t> data; // empty when the table is empty
    uint32_t totalSize = 0;
    uint32_t recordSize = 0;
    uint32_t recordCount = 0;
    uint16_t valuesPerRecord = 0;
    uint16_t valueBitLength = 0;

    // Sizes the table; false when its data would not fit in a file of fileSize bytes.
    bool SetShape(uint32_t records, uint16_t values, uint16_t bitLength, uint64_t fileSize);
    // Reads totalSize bytes of table data at location (nothing for an empty table).
    bool ReadTableData(CFileReader& reader, uint64_t location);
    // Copies the valuesPerRecord bytes of record index into output.
    bool ReadTableEntry(uint32_t index, uint8_t* output) const;
};
