#include "rpf/RpfCompressionSection.h"

#include "rpf/RpfFieldReader.h"

#include <cstring>

namespace {

constexpr uint16_t kVqAlgorithm = 1;
constexpr uint16_t kVqAlgorithmAlternate = 2; // decoded exactly as algorithm 1
constexpr uint32_t kSubheaderBytes = 6;       // algorithm ID and the two offset record counts
constexpr uint32_t kLookupHeaderBytes = 6;    // lookup offset table offset and record length
constexpr uint16_t kLookupOffsetRecordBytes = 14;

} // namespace

bool RpfCompressionSection::ReadCompressionSection(CFileReader& reader, uint32_t subheaderLocation,
                                                   uint32_t lookupLocation, uint32_t /*parameterLocation*/,
                                                   bool bigEndian)
{
    uint8_t subheader[kSubheaderBytes];
    if (!CheckedRead(reader, reader.FileSize(), subheaderLocation, subheader, sizeof subheader))
        return false;
    RpfFields fields(subheader, bigEndian);
    fields.Number(algorithmId);
    fields.Number(lookupOffsetRecordCount);
    fields.Number(parameterOffsetRecordCount);
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
    uint8_t header[kLookupHeaderBytes];
    if (!CheckedRead(reader, reader.FileSize(), lookupSubsectionLocation, header, sizeof header))
        return false;
    RpfFields fields(header, bigEndian);
    fields.Number(lookupOffsetTableOffset);
    fields.Number(lookupOffsetRecordLength);
    const auto readRecord = [](RpfFields& recordFields, RpfLookupOffsetRecord& record) {
        recordFields.Number(record.tableId);
        recordFields.Number(record.recordCount);
        recordFields.Number(record.valuesPerRecord);
        recordFields.Number(record.valueBitLength);
        recordFields.Number(record.tableOffset);
    };
    if (lookupOffsetRecordLength != kLookupOffsetRecordBytes ||
        !ReadRecordTable(reader, uint64_t(lookupSubsectionLocation) + lookupOffsetTableOffset,
                         lookupOffsetRecordCount, kLookupOffsetRecordBytes, bigEndian, lookupOffsetRecords, readRecord))
        return false;
    auto placeOf = [this](const RpfLookupOffsetRecord& record) {
        return RpfTablePlace{record.recordCount, record.valuesPerRecord, record.valueBitLength,
                             uint64_t(lookupSubsectionLocation) + record.tableOffset};
    };
    return ReadValueTables(reader, lookupOffsetRecords, placeOf, lookupTables);
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
