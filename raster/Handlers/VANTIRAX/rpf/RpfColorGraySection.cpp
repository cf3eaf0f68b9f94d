#include "rpf/RpfColorGraySection.h"

#include "rpf/RpfFieldReader.h"

namespace {

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
    if (!SeekToLocation(reader, subheaderLocation))
        return false;
    reader.ReadBytes(&colorGrayOffsetRecordCount, 1);
    reader.ReadBytes(&colorConverterOffsetRecordCount, 1);
    ReadText(reader, externalFileName, 12);
    if (reader.Failed() || !SeekToLocation(reader, colormapLocation))
        return false;
    ReadNumber(reader, colormapOffsetTableOffset, bigEndian);
    ReadNumber(reader, colorGrayOffsetRecordLength, bigEndian);
    if (reader.Failed() || colorGrayOffsetRecordLength != kColorOffsetRecordBytes)
        return false;
    if (colorGrayOffsetRecordCount == 0)
        return true;
    return ReadOffsetRecords(reader, colormapLocation, bigEndian) && ReadColorTables(reader, colormapLocation);
}

bool RpfColorGraySection::ReadOffsetRecords(CFileReader& reader, uint32_t colormapLocation, bool bigEndian)
{
    if (!SeekToLocation(reader, uint64_t(colormapLocation) + colormapOffsetTableOffset))
        return false;
    offsetRecords.reserve(colorGrayOffsetRecordCount);
    for (uint32_t index = 0; index < colorGrayOffsetRecordCount; ++index) {
        RpfColorOffsetRecord record;
        ReadNumber(reader, record.tableId, bigEndian);
        ReadNumber(reader, record.recordCount, bigEndian);
        reader.ReadBytes(&record.elementLength, 1);
        ReadNumber(reader, record.histogramRecordLength, bigEndian);
        ReadNumber(reader, record.tableOffset, bigEndian);
        ReadNumber(reader, record.histogramTableOffset, bigEndian);
        if (reader.Failed())
            return false;
        offsetRecords.push_back(record);
    }
    return true;
}

bool RpfColorGraySection::ReadColorTables(CFileReader& reader, uint32_t colormapLocation)
{
    uint64_t fileSize = reader.FileSize();
    uint64_t bytesLeft = fileSize;
    colorTables.reserve(offsetRecords.size());
    for (const RpfColorOffsetRecord& record : offsetRecords) {
        RpfValueTable table;
        if (!table.SetShape(record.recordCount, record.elementLength, kColorValueBits, bytesLeft))
            return false;
        bytesLeft -= table.totalSize;
        uint64_t location = uint64_t(colormapLocation) + record.tableOffset;
        if (!FitsInFile(location, table.totalSize, fileSize) || !table.ReadTableData(reader, location))
            return false;
        colorTables.push_back(std::move(table));
    }
    return true;
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
