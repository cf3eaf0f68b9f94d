// MGRS references, as the corner reader hands them over: NUL-terminated text.
#include "geo/Mgrs.h"

#include <cstdint>

#include <cstddef>
#include <string>

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size)
{
    const std::string text(reinterpret_cast<const char*>(data), size);
    MgrsReference reference;
    ParseMgrs(text.c_str(), reference);
    int32_t zone = 0;
    char hemisphere = 0;
    double easting = 0, northing = 0;
    MgrsToUtm(text.c_str(), zone, hemisphere, easting, northing);
    return 0;
}
