#include "rpf/RpfLocationSection.h"

#include "rpf/RpfFieldReader.h"

namespace {
constexpr uint32_t kLocationHeaderBytes = 14;
constexpr uint32_t kLocationRecordBytes = 10;
}

bool RpfLocationSection::ReadLocationSection(CFileReader& reader, uint32_t location, bool bigEndian)
{
    if (!SeekToLocation(reader, location))
        return false;
    ReadNumber(reader, locationSectionLength, bigEndian);
    ReadNumber(reader, componentLocationTableOffset, bigEndian);
    ReadNumber(reader, componentLocationRecordCount, bigEndian);
    ReadNumber(reader, componentLocationRecordLength, bigEndian);
    ReadNumber(reader, componentAggregateLength, bigEndian);
    if (reader.Failed())
        return false;
    uint64_t recordBytes = uint64_t(componentLocationRecordCount) * kLocationRecordBytes;
    if (!FitsInFile(uint64_t(location) + kLocationHeaderBytes, recordBytes, reader.FileSize()))
        return false;
    components.reserve(componentLocationRecordCount);
    for (uint32_t index = 0; index < componentLocationRecordCount; ++index) {
        RpfComponentLocation record;
        ReadNumber(reader, record.componentId, bigEndian);
        ReadNumber(reader, record.componentLength, bigEndian);
        ReadNumber(reader, record.componentLocation, bigEndian);
        if (reader.Failed())
            return false;
        components.push_back(record);
    }
    return true;
}

uint32_t RpfLocationSection::FindComponentLocation(uint16_t componentId) const
{
    for (const RpfComponentLocation& record : components)
        if (record.componentId == componentId)
            return record.componentLocation;
    return 0;
}
