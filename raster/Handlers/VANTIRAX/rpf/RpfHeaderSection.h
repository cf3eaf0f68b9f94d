// The RPF header section: the 48 bytes of RPFHDR TRE data in the NITF file
// header's user-defined header data.
#pragma once

#include "base/FileReader.h"

#include <cstdint>

struct RpfHeaderSection {
    bool bigEndian = false; // endian indicator 0x00: every number is stored most significant byte first
    uint16_t headerSectionLength = 0;
    char fileName[13] = {};
    uint8_t updateIndicator = 0;
    char governingStandardNumber[16] = {};
    char governingStandardDate[9] = {};
    char securityClassification = ' ';
    char securityCountryCode[3] = {};
    char securityReleaseMarking[3] = {};
    uint32_t locationSectionLocation = 0; // absolute file offset

    bool ReadHeaderSection(CFileReader& reader, uint64_t location);
};
