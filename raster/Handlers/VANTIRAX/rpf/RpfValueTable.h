// A table of fixed-size 8-bit records: the VQ codebooks of the compression
// lookup subsection and the colour/grayscale tables of the colormap subsection.
#pragma once

#include "base/FileReader.h"

#include <cstdint>
#include <utility>
#include <vector>

// Pixel values 0 to 215 index the frame's 216-record colour or grey table;
// 216 is the masked value (white), which masked subframes and masked codes
// decode to. kMaskedCode is the code written for every position of a masked subframe.
constexpr uint8_t kMaskedPixel = 216;
constexpr uint32_t kPaletteRecords = kMaskedPixel;
constexpr uint16_t kMaskedCode = 0xFFFF;

// A table's shape and absolute file offset, as its offset record gives them.
struct RpfTablePlace {
    uint32_t records;
    uint16_t values;    // per record
    uint16_t bitLength; // per value
    uint64_t location;
};

struct RpfValueTable {
    std::vector<uint8_t> data; // empty when the table is empty
    uint32_t totalSize = 0;
    uint32_t recordSize = 0;
    uint32_t recordCount = 0;
    uint16_t valuesPerRecord = 0;
    uint16_t valueBitLength = 0;

    // Sizes the table and reads its data; false when the data would take more
    // than bytesLeft bytes (which it is then charged) or does not lie in the file.
    bool Read(CFileReader& reader, const RpfTablePlace& place, uint64_t& bytesLeft);
    // Copies the valuesPerRecord bytes of record index into output.
    bool ReadTableEntry(uint32_t index, uint8_t* output) const;
};

// Reads the table of every offset record, in order, placeOf(record) giving
// its RpfTablePlace. All tables together can hold no more than the file:
// offset records that share one stretch of it cannot multiply the memory it costs.
template <typename OffsetRecord, typename PlaceOf>
bool ReadValueTables(CFileReader& reader, const std::vector<OffsetRecord>& records, PlaceOf placeOf,
                     std::vector<RpfValueTable>& tables)
{
    uint64_t bytesLeft = reader.FileSize();
    tables.reserve(records.size());
    for (const OffsetRecord& record : records) {
        RpfValueTable table;
        if (!table.Read(reader, placeOf(record), bytesLeft))
            return false;
        tables.push_back(std::move(table));
    }
    return true;
}
