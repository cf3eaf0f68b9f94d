#pragma once
#include "plugin/FileReader.h"
class CNitfImage {
public:
    uint16_t fixedLayout = 0;
    uint16_t version21 = 0;
    uint32_t subheaderLength = 0;
    bool ReadSubheader(CFileReader&, uint32_t) { return false; }
    bool PrepareData(CFileReader&, uint32_t) { return false; }
    void Release() {}
};
