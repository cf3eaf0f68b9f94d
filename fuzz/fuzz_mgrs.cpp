// MGRS references as NUL-terminated text, and the same input read as image
// corners: its first byte as ICORDS, the rest as IGEOLO.
#include "geo/ImageCorners.h"
#include "geo/Mgrs.h"

#include <cstddef>
#include <cstdint>
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

    if (size < 1)
        return 0;
    std::string igeolo = text.substr(1, kIgeoloLength);
    igeolo.resize(kIgeoloLength, ' ');
    for (bool version21 : {true, false}) {
        const ImageCornerFields fields{text[0], igeolo.c_str(), version21};
        double x1 = 0, y1 = 0, x2 = 0, y2 = 0, x3 = 0, y3 = 0;
        ReadImageCorners(fields, x1, y1, x2, y2, x3, y3);
        ImageCornerEpsgCode(fields, 4326);
    }
    return 0;
}
