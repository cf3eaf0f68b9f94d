#include "rpf/RpfValueTable.h"

#include "base/CheckedRead.h"

#include <cstring>

namespace {
constexpr uint16_t kByteValueBits = 8;
}

bool RpfValueTable::Read(CFileReader& reader, const RpfTablePlace& place, uint64_t& bytesLeft)
{
    recordCount = place.records;
    valuesPerRecord = place.values;
    valueBitLength = place.bitLength;
    recordSize = static_cast<uint32_t>((uint64_t(place.values) * place.bitLength) / 8);
    uint64_t bytes = uint64_t(recordSize) * place.records;
    if (place.values == 0 || place.bitLength == 0 || place.records == 0)
        bytes = 0;
    if (bytes > bytesLeft)
        return false;
    bytesLeft -= bytes;
    totalSize = static_cast<uint32_t>(bytes);
    data.assign(totalSize, 0);
    return CheckedRead(reader, reader.FileSize(), place.location, data.data(), totalSize);
}

bool RpfValueTable::ReadTableEntry(uint32_t index, uint8_t* output) const
{
    if (totalSize == 0 || data.empty() || valueBitLength != kByteValueBits)
        return false;
    uint64_t first = uint64_t(index) * recordSize;
    if (index >= recordCount || !SpanWithin(first, valuesPerRecord, totalSize))
        return false;
    std::memcpy(output, data.data() + first, valuesPerRecord);
    return true;
}
