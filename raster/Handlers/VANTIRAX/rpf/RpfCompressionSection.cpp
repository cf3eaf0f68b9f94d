#include "rpf/RpfCompressionSection.h"

#include "rpf/RpfFieldReader.h"

#include <cstring>

namespace {

constexpr uint16_t kVqAlgorithm = 1;
constexpr uint16_t kVqAlgorithmAlternate = 2; // decoded exactly as algorithm 1
constexpr uint16_t kLookupOffsetRecordBytes = 14;

} // namespace

bool RpfCompressionSection::ReadCompressionSection(CFileReader& reader, uint32_t subheaderLocation,
                                                   uint32_t lookupLocation, uint32_t /*parameterLocation*/,
                                                   bool bigEndian)
{
    if (!SeekToLocation(reader, subheaderLocation))
        return false;
    ReadNumber(reader, algorithmId, bigEndian);
    ReadNumber(reader, lookupOffsetRecordCount, bigEndian);
    ReadNumber(reader, parameterOffsetRecordCount, bigEndian);
    if (reader.Failed())
        return false;
    if (algorithmId != kVqAlgorithm && algorithmId != kVqAlgorithmAlternate)
        return false;
    lookupSubsectionLocation = lookupLocation;
    if (lookupOffsetRecordCount != 0 && !ReadLookupSubsection(reader, bigEndian))
        return false;
    // Compression parameters are not supported: such a frame is refused.
    return parameterOffsetRecordCount == 0;
}

bool RpfCompressionSection::ReadLookupSubsection(CFileReader& reader, bool bigEndian)
{
    if (!SeekToLocation(reader, lookupSubsectionLocation))
        return false;
    ReadNumber(reader, lookupOffsetTableOffset, bigEndian);
    ReadNumber(reader, lookupOffsetRecordLength, bigEndian);
    if (reader.Failed() || lookupOffsetRecordLength != kLookupOffsetRecordBytes)
        return false;
    uint64_t tableLocation = uint64_t(lookupSubsectionLocation) + lookupOffsetTableOffset;
    uint64_t recordBytes = uint64_t(lookupOffsetRecordCount) * kLookupOffsetRecordBytes;
    if (!FitsInFile(tableLocation, recordBytes, reader.FileSize()) || !SeekToLocation(reader, tableLocation))
        return false;
    lookupOffsetRecords.reserve(lookupOffsetRecordCount);
    for (uint32_t index = 0; index < lookupOffsetRecordCount; ++index) {
        RpfLookupOffsetRecord record;
        ReadNumber(reader, record.tableId, bigEndian);
        ReadNumber(reader, record.recordCount, bigEndian);
        ReadNumber(reader, record.valuesPerRecord, bigEndian);
        ReadNumber(reader, record.valueBitLength, bigEndian);
        ReadNumber(reader, record.tableOffset, bigEndian);
        if (reader.Failed())
            return false;
        lookupOffsetRecords.push_back(record);
    }
    return ReadLookupTables(reader);
}

bool RpfCompressionSection::ReadLookupTables(CFileReader& reader)
{
    // All tables together can hold no more than the file: offset records that
    // share one stretch of the file cannot multiply the memory it costs.
    uint64_t fileSize = reader.FileSize();
    uint64_t bytesLeft = fileSize;
    lookupTables.reserve(lookupOffsetRecords.size());
    for (const RpfLookupOffsetRecord& record : lookupOffsetRecords) {
        RpfValueTable table;
        if (!table.SetShape(record.recordCount, record.valuesPerRecord, record.valueBitLength, bytesLeft))
            return false;
        bytesLeft -= table.totalSize;
        uint64_t location = uint64_t(lookupSubsectionLocation) + record.tableOffset;
        if (!FitsInFile(location, table.totalSize, fileSize) || !table.ReadTableData(reader, location))
            return false;
        lookupTables.push_back(std::move(table));
    }
    return true;
}

bool RpfCompressionSection::DecodeKernelRow(uint16_t kernelRow, uint16_t code, uint16_t kernelWidth,
                                            uint8_t* output) const
{
    if (output == nullptr || kernelRow >= lookupTables.size())
        return false;
    const RpfValueTable& table = lookupTables[kernelRow];
    if (table.recordSize > kernelWidth)
        return false;
    // A record narrower than the kernel leaves the remaining columns masked.
    uint16_t valuesWritten = table.valuesPerRecord < kernelWidth ? table.valuesPerRecord : kernelWidth;
    std::memset(output + valuesWritten, kMaskedPixel, kernelWidth - valuesWritten);
    if (code == kMaskedCode) {
        std::memset(output, kMaskedPixel, valuesWritten);
        return true;
    }
    return table.ReadTableEntry(code, output);
}

const RpfValueTable* RpfCompressionSection::ByteTable(uint16_t kernelRow, uint16_t kernelWidth) const
{
    if (kernelRow >= lookupTables.size())
        return nullptr;
    const RpfValueTable& table = lookupTables[kernelRow];
    const bool exact = table.valueBitLength == 8 && table.valuesPerRecord == kernelWidth &&
                       table.recordSize == kernelWidth && table.totalSize != 0 &&
                       table.data.size() == table.totalSize &&
                       uint64_t(table.recordCount) * table.recordSize <= table.totalSize;
    return exact ? &table : nullptr;
}
