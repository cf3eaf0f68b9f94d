// The RPF colour/grayscale section: the colour or grey tables that the pixel
// values of the frame index, and the choice of the 216-record table among them.
#pragma once

#include "base/FileReader.h"
#include "rpf/RpfValueTable.h"

#include <cstdint>
#include <vector>

struct RpfColorOffsetRecord {
    uint16_t tableId = 0; // not used
    uint32_t recordCount = 0;
    uint8_t elementLength = 0; // bytes per record: 4 (red, green, blue, monochrome) or 1 (grey)
    uint16_t histogramRecordLength = 0;
    uint32_t tableOffset = 0; // from the start of the colormap subsection
    uint32_t histogramTableOffset = 0;
};

struct RpfColorGraySection {
    std::vector<uint8_t> scratchEntry; // one record of the selected table
    uint8_t colorGrayOffsetRecordCount = 0;
    uint8_t colorConverterOffsetRecordCount = 0;
    char externalFileName[13] = {};
    uint32_t colormapOffsetTableOffset = 0; // from the start of the colormap subsection
    uint16_t colorGrayOffsetRecordLength = 0;
    std::vector<RpfColorOffsetRecord> offsetRecords;
    std::vector<RpfValueTable> colorTables; // one per offset record, same order

    bool ReadColorGraySection(CFileReader& reader, uint32_t subheaderLocation, uint32_t colormapLocation,
                              uint32_t converterLocation, bool bigEndian);
    // The table the palette is built from: the only one, or the first of 216 records.
    const RpfValueTable* FindPaletteTable() const;
    bool IsColorTable() const;
    bool IsGrayTable() const;
    bool GetPaletteColor(uint32_t index, uint8_t& red, uint8_t& green, uint8_t& blue);
    bool GetPaletteGray(uint32_t index, uint8_t& grey);

private:
    bool ReadOffsetRecords(CFileReader& reader, uint32_t colormapLocation, bool bigEndian);
    bool HasTableOf(uint32_t elementLength, bool orLonger) const;
    bool ReadSelectedEntry(const RpfValueTable& table, uint32_t index);
};
