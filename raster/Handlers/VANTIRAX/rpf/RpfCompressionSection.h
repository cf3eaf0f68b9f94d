// The RPF compression section: the VQ codebook, one lookup table per kernel
// row, record c of table r holding the pixel values of kernel row r for code c.
#pragma once

#include "base/FileReader.h"
#include "rpf/RpfValueTable.h"

#include <cstdint>
#include <vector>

struct RpfLookupOffsetRecord {
    uint16_t tableId = 0; // not used: tables serve kernel rows by position
    uint32_t recordCount = 0;
    uint16_t valuesPerRecord = 0;
    uint16_t valueBitLength = 0;
    uint32_t tableOffset = 0; // from the start of the lookup subsection
};

struct RpfCompressionSection {
    uint16_t algorithmId = 0;
    uint16_t lookupOffsetRecordCount = 0;
    uint16_t parameterOffsetRecordCount = 0;
    uint32_t lookupOffsetTableOffset = 0; // from the start of the lookup subsection
    uint16_t lookupOffsetRecordLength = 0;
    std::vector<RpfLookupOffsetRecord> lookupOffsetRecords;
    std::vector<RpfValueTable> lookupTables; // one per offset record, same order
    uint32_t lookupSubsectionLocation = 0;

    bool ReadCompressionSection(CFileReader& reader, uint32_t subheaderLocation, uint32_t lookupLocation,
                                uint32_t parameterLocation, bool bigEndian);
    // Writes the kernelWidth pixel values of one kernel row of one code.
    bool DecodeKernelRow(uint16_t kernelRow, uint16_t code, uint16_t kernelWidth, uint8_t* output) const;
    // The table of a kernel row when its records are exactly kernelWidth
    // 8-bit values, so that a code's pixels can be taken straight from it
    // (DecodeKernelRow gives the same pixels); null otherwise.
    const RpfValueTable* ByteTable(uint16_t kernelRow, uint16_t kernelWidth) const;

private:
    bool ReadLookupSubsection(CFileReader& reader, bool bigEndian);
};
