// NitfBand: one band of a NITF image subheader, with its lookup tables.
#pragma once

#include <cstdint>
#include <vector>

struct NitfBand {
    char IREPBAND[2] = {};
    char ISUBCAT[6] = {};
    char IFC[1] = {};
    char IMFLT[3] = {};
    int32_t NLUTS = 0;
    int32_t NELUT = 0;                 // 0 when the band has no tables
    std::vector<uint8_t> LUT;          // NLUTS x NELUT bytes, table 1 first; empty without tables
};
