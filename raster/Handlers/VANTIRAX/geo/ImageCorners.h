// Ground location of a NITF image from its subheader's ICORDS and IGEOLO:
// the x and y of three corners and the EPSG code that names their
// coordinate system. Geographic corners stay in degrees (geocentric
// latitudes become geodetic); UTM corners stay in metres; MGRS corners are
// converted to UTM metres.
#pragma once

#include <cstdint>

constexpr unsigned kIgeoloLength = 60;  // four corner slots of 15 characters

constexpr int32_t kEpsgNone = 0;
constexpr int32_t kEpsgUtmNorthBase = 32600;  // + zone
constexpr int32_t kEpsgUtmSouthBase = 32700;  // + zone

// The corner fields of an image subheader.
struct ImageCornerFields {
    char icords = ' ';              // ICORDS
    const char* igeolo = nullptr;   // IGEOLO, 60 characters (a NUL ends it early), or null: no corners
    bool version21 = true;          // false in NITF 2.0, where "N" means no corners
};

// Writes the corners of IGEOLO slots 1, 2 and 4: (first row, first column),
// (first row, last column) and (last row, first column). x is a longitude in
// degrees or a UTM easting, y a latitude in degrees or a UTM northing.
// Longitudes of the second and third corner lie within 180 degrees of the
// first's (LongitudeNear). For an ICORDS without corners (blank, "N" in NITF
// 2.0, any unknown form) nothing is written.
void ReadImageCorners(const ImageCornerFields& fields, double& x1, double& y1, double& x2,
                      double& y2, double& x3, double& y3) noexcept;

// The EPSG code of the corners: geographicCode for geographic forms, 326zz or
// 327zz for UTM and MGRS forms (the zone and hemisphere of the first corner),
// kEpsgNone when there are no corners, the zone is not 1 to 60 or the first
// MGRS reference is rejected: corners then name no coordinate system.
int32_t ImageCornerEpsgCode(const ImageCornerFields& fields, int32_t geographicCode) noexcept;
