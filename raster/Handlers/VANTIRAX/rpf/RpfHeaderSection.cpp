#include "rpf/RpfHeaderSection.h"

#include "rpf/RpfFieldReader.h"

namespace {
constexpr uint8_t kBigEndianIndicator = 0x00;
}

bool RpfHeaderSection::ReadHeaderSection(CFileReader& reader, uint32_t location)
{
    if (!SeekToLocation(reader, location))
        return false;
    uint8_t endianIndicator = 0xFF;
    reader.ReadBytes(&endianIndicator, 1);
    bigEndian = endianIndicator == kBigEndianIndicator;
    ReadNumber(reader, headerSectionLength, bigEndian);
    ReadText(reader, fileName, 12);
    reader.ReadBytes(&updateIndicator, 1);
    ReadText(reader, governingStandardNumber, 15);
    ReadText(reader, governingStandardDate, 8);
    reader.ReadBytes(&securityClassification, 1);
    ReadText(reader, securityCountryCode, 2);
    ReadText(reader, securityReleaseMarking, 2);
    ReadNumber(reader, locationSectionLocation, bigEndian);
    return !reader.Failed();
}
