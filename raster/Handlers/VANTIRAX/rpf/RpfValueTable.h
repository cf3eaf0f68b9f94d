// A table of fixed-size 8-bit records: the VQ codebooks of the compression
// lookup subsection and the colour/grayscale tables of the colormap subsection.
#pragma once

#include "base/FileReader.h"

#include <cstdint>
#include <vector>

// Pixel values 0 to 215 index the frame's 216-record colour or grey table;
// 216 is the masked value (white), which masked subframes and masked codes
// decode to. kMaskedCode is the code written for every position of a masked subframe.
constexpr uint8_t kMaskedPixel = 216;
constexpr uint32_t kPaletteRecords = kMaskedPixel;
constexpr uint16_t kMaskedCode = 0xFFFF;

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
