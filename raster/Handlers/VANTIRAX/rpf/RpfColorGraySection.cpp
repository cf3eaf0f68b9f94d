#include "rpf/RpfColorGraySection.h"

#include "rpf/RpfFieldReader.h"

namespace {

constexpr uint32_t kSubheaderBytes = 14;      // the two offset record counts and the external file name
constexpr uint32_t kColormapHeaderBytes = 6;  // offset table offset and offset record length
constexpr uint16_t kColorOffsetRecordBytes = 17;
constexpr uint8_t kColorElementLength = 3;      // red, green, blue
constexpr uint8_t kMonochromeElementLength = 4; // red, green, blue, monochrome
constexpr uint8_t kGreyElementLength = 1;
constexpr uint16_t kColorValueBits = 8;

} // namespace

bool RpfColorGraySection::ReadColorGraySection(CFileReader& reader, uint32_t subheaderLocation,
                                               uint32_t colormapLocation, uint32_t /*converterLocation*/,
                                               bool bigEndian)
{
    uint8_t subheader[kSubheaderBytes];
    uint8_t colormapHeader[kColormapHeaderBytes];
    const uint64_t fileSize = reader.FileSize();
    if (!CheckedRead(reader, fileSize, subheaderLocation, subheader, sizeof subheader))
        return false;
    RpfFields fields(subheader, bigEndian);
    fields.Number(colorGrayOffsetRecordCount);
    fields.Number(colorConverterOffsetRecordCount);
    fields.Text(externalFileName, 12);
    if (!CheckedRead(reader, fileSize, colormapLocation, colormapHeader, sizeof colormapHeader))
        return false;
    RpfFields colormapFields(colormapHeader, bigEndian);
    colormapFields.Number(colormapOffsetTableOffset);
    colormapFields.Number(colorGrayOffsetRecordLength);
    if (colorGrayOffsetRecordLength != kColorOffsetRecordBytes)
        return false;
    if (colorGrayOffsetRecordCount == 0)
        return true;
    auto placeOf = [colormapLocation](const RpfColorOffsetRecord& record) {
        return RpfTablePlace{record.recordCount, record.elementLength, kColorValueBits,
                             uint64_t(colormapLocation) + record.tableOffset};
    };
    return ReadOffsetRecords(reader, colormapLocation, bigEndian) &&
           ReadValueTables(reader, offsetRecords, placeOf, colorTables);
}

bool RpfColorGraySection::ReadOffsetRecords(CFileReader& reader, uint32_t colormapLocation, bool bigEndian)
{
    return ReadRecordTable(reader, uint64_t(colormapLocation) + colormapOffsetTableOffset, colorGrayOffsetRecordCount,
                           kColorOffsetRecordBytes, bigEndian, offsetRecords,
                           [](RpfFields& fields, RpfColorOffsetRecord& record) {
                               fields.Number(record.tableId);
                               fields.Number(record.recordCount);
                               fields.Number(record.elementLength);
                               fields.Number(record.histogramRecordLength);
                               fields.Number(record.tableOffset);
                               fields.Number(record.histogramTableOffset);
                           });
}

const RpfValueTable* RpfColorGraySection::FindPaletteTable() const
{
    if (colorTables.empty())
        return nullptr;
    if (offsetRecords.size() == 1)
        return &colorTables[0];
    for (size_t index = 0; index < offsetRecords.size(); ++index)
        if (offsetRecords[index].recordCount == kPaletteRecords)
            return &colorTables[index];
    return nullptr;
}

bool RpfColorGraySection::HasTableOf(uint32_t elementLength, bool orLonger) const
{
    auto fits = [&](const RpfColorOffsetRecord& record) {
        return orLonger ? record.elementLength >= elementLength : record.elementLength == elementLength;
    };
    if (colorTables.empty())
        return false;
    // A single table serves whatever its record count; among several only a
    // 216-record table does (the 32- and 16-colour CADRG tables never do).
    if (offsetRecords.size() == 1)
        return fits(offsetRecords[0]);
    for (const RpfColorOffsetRecord& record : offsetRecords)
        if (record.recordCount == kPaletteRecords && fits(record))
            return true;
    return false;
}

bool RpfColorGraySection::IsColorTable() const
{
    return HasTableOf(kColorElementLength, true);
}

bool RpfColorGraySection::IsGrayTable() const
{
    return HasTableOf(kGreyElementLength, false);
}

bool RpfColorGraySection::ReadSelectedEntry(const RpfValueTable& table, uint32_t index)
{
    if (scratchEntry.empty())
        scratchEntry.assign(table.valuesPerRecord, 0);
    return scratchEntry.size() >= table.valuesPerRecord && table.ReadTableEntry(index, scratchEntry.data());
}

bool RpfColorGraySection::GetPaletteColor(uint32_t index, uint8_t& red, uint8_t& green, uint8_t& blue)
{
    // Indices past the masked value are white without a table.
    if (index > kMaskedPixel) {
        red = green = blue = 255;
        return true;
    }
    const RpfValueTable* table = FindPaletteTable();
    if (table == nullptr || table->valuesPerRecord < kColorElementLength || !ReadSelectedEntry(*table, index))
        return false;
    red = scratchEntry[0];
    green = scratchEntry[1];
    blue = scratchEntry[2];
    return true;
}

bool RpfColorGraySection::GetPaletteGray(uint32_t index, uint8_t& grey)
{
    if (index > kMaskedPixel) {
        grey = 255;
        return true;
    }
    const RpfValueTable* table = FindPaletteTable();
    if (table == nullptr)
        return false;
    if (IsColorTable()) {
        // The fourth byte of a colour record is its monochrome value.
        if (table->valuesPerRecord < kMonochromeElementLength || !ReadSelectedEntry(*table, index))
            return false;
        grey = scratchEntry[3];
        return true;
    }
    if (!IsGrayTable() || table->valuesPerRecord != kGreyElementLength || !ReadSelectedEntry(*table, index))
        return false;
    grey = scratchEntry[0];
    return true;
}
