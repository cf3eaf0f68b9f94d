#include "rpf/RpfValueTable.h"

#include "rpf/RpfFieldReader.h"

#include <cstring>

namespace {
constexpr uint16_t kByteValueBits = 8;
}

bool RpfValueTable::SetShape(uint32_t records, uint16_t values, uint16_t bitLength, uint64_t fileSize)
{
    recordCount = records;
    valuesPerRecord = values;
    valueBitLength = bitLength;
    recordSize = static_cast<uint32_t>((uint64_t(values) * bitLength) / 8);
    uint64_t bytes = uint64_t(recordSize) * records;
    if (values == 0 || bitLength == 0 || records == 0)
        bytes = 0;
    // A table can hold no more bytes than the file it is read from.
    if (bytes > fileSize)
        return false;
    totalSize = static_cast<uint32_t>(bytes);
    return true;
}

bool RpfValueTable::ReadTableData(CFileReader& reader, uint64_t location)
{
    if (totalSize == 0)
        return true;
    if (!SeekToLocation(reader, location))
        return false;
    data.assign(totalSize, 0);
    reader.ReadBytes(data.data(), totalSize);
    return !reader.Failed();
}

bool RpfValueTable::ReadTableEntry(uint32_t index, uint8_t* output) const
{
    if (totalSize == 0 || data.empty() || valueBitLength != kByteValueBits)
        return false;
    uint64_t first = uint64_t(index) * recordSize;
    if (index >= recordCount || !FitsInFile(first, valuesPerRecord, totalSize))
        return false;
    std::memcpy(output, data.data() + first, valuesPerRecord);
    return true;
}
