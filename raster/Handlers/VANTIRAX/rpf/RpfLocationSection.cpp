#include "rpf/RpfLocationSection.h"

#include "rpf/RpfFieldReader.h"

namespace {
constexpr uint32_t kLocationHeaderBytes = 14;
constexpr uint32_t kLocationRecordBytes = 10;
}

bool RpfLocationSection::ReadLocationSection(CFileReader& reader, uint32_t location, bool bigEndian)
{
    uint8_t header[kLocationHeaderBytes];
    if (!CheckedRead(reader, reader.FileSize(), location, header, sizeof header))
        return false;
    RpfFields fields(header, bigEndian);
    fields.Number(locationSectionLength);
    fields.Number(componentLocationTableOffset);
    fields.Number(componentLocationRecordCount);
    fields.Number(componentLocationRecordLength);
    fields.Number(componentAggregateLength);
    return ReadRecordTable(reader, uint64_t(location) + kLocationHeaderBytes, componentLocationRecordCount,
                           kLocationRecordBytes, bigEndian, components,
                           [](RpfFields& recordFields, RpfComponentLocation& record) {
                               recordFields.Number(record.componentId);
                               recordFields.Number(record.componentLength);
                               recordFields.Number(record.componentLocation);
                           });
}

uint32_t RpfLocationSection::FindComponentLocation(uint16_t componentId) const
{
    for (const RpfComponentLocation& record : components)
        if (record.componentId == componentId)
            return record.componentLocation;
    return 0;
}
