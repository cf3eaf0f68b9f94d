// The RPF location section: the directory of the frame's components, each
// named by its MIL-STD-2411 component ID and found at an absolute file offset.
#pragma once

#include "base/FileReader.h"

#include <cstdint>
#include <vector>

// The component IDs the frame reader looks up.
enum RpfComponentId : uint16_t {
    kCoverageSectionSubheader = 130,
    kCompressionSectionSubheader = 131,
    kCompressionLookupSubsection = 132,
    kCompressionParameterSubsection = 133,
    kColorGraySectionSubheader = 134,
    kColormapSubsection = 135,
    kImageDescriptionSubheader = 136,
    kImageDisplayParametersSubheader = 137,
    kMaskSubsection = 138,
    kColorConverterSubsection = 139,
    kSpatialDataSubsection = 140,
};

struct RpfComponentLocation {
    uint16_t componentId = 0;
    uint32_t componentLength = 0;
    uint32_t componentLocation = 0; // absolute file offset
};

struct RpfLocationSection {
    uint16_t locationSectionLength = 0;
    uint32_t componentLocationTableOffset = 0; // not used: the records follow the 14-byte header
    uint16_t componentLocationRecordCount = 0;
    uint16_t componentLocationRecordLength = 0; // not used: every record is read as 10 bytes
    uint32_t componentAggregateLength = 0;
    std::vector<RpfComponentLocation> components;

    bool ReadLocationSection(CFileReader& reader, uint32_t location, bool bigEndian);
    // The location of the first component with this ID in file order; 0 when none.
    uint32_t FindComponentLocation(uint16_t componentId) const;
};
