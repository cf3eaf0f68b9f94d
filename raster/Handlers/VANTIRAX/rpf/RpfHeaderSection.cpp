#include "rpf/RpfHeaderSection.h"

#include "rpf/RpfFieldReader.h"

namespace {
constexpr uint8_t kBigEndianIndicator = 0x00;
constexpr uint32_t kHeaderSectionBytes = 48;
}

bool RpfHeaderSection::ReadHeaderSection(CFileReader& reader, uint64_t location)
{
    uint8_t bytes[kHeaderSectionBytes];
    if (!CheckedRead(reader, reader.FileSize(), location, bytes, sizeof bytes))
        return false;
    bigEndian = bytes[0] == kBigEndianIndicator;
    RpfFields fields(bytes + 1, bigEndian);
    fields.Number(headerSectionLength);
    fields.Text(fileName, 12);
    fields.Number(updateIndicator);
    fields.Text(governingStandardNumber, 15);
    fields.Text(governingStandardDate, 8);
    fields.Number(securityClassification);
    fields.Text(securityCountryCode, 2);
    fields.Text(securityReleaseMarking, 2);
    fields.Number(locationSectionLocation);
    return true;
}
