// The records that cross the boundary to the host. Their byte layouts are a
// fixed contract with a closed program: every offset is pinned below.
#pragma once

#include <cstddef>
#include <cstdint>

// Status values the handle carries after every call.
constexpr uint32_t kStatusOk = 0;
constexpr uint32_t kStatusFailed = 5;

// Pixel kinds: how the bytes of a delivered row are to be read.
enum RHPixelKind : uint32_t {
    kPixelRpfNoTable = 0,   // RPF frame without a colour or grey table
    kPixelPaletted = 1,     // one byte per pixel, an index into the palette
    kPixelGreyPaletted = 2, // as 1, every palette entry grey
    kPixelDirect = 3,       // pixel values as read: three bytes per pixel for RGB
};

constexpr size_t kIdentityNameSize = 512;
constexpr size_t kExtensionSlotSize = 10;
constexpr size_t kExtensionSlots = 100;

#pragma pack(push, 2)
struct RHIdentity {
    uint16_t version;
    char handlerName[kIdentityNameSize];
    char description[kIdentityNameSize];
    uint16_t extensionCount;
    char extensions[kExtensionSlots][kExtensionSlotSize];
};
#pragma pack(pop)

constexpr size_t kHandlePathSize = 512;

struct RHPalette {
    uint32_t signature;
    int32_t entryCount;
    uint8_t* entries; // entryCount x (red, green, blue)
};

constexpr uint32_t kPaletteAlive = 0xFAFA;
constexpr uint32_t kPaletteReleased = 0xAFAF;

struct RHControlPoint {
    double column;
    double row;
    double pixelZ;
    double worldX;
    double worldY;
    double worldZ;
};

constexpr uint32_t kGeoRefMagic = 56506;
constexpr uint32_t kGeoRefControlPoints = 3;

struct RHGeoRef {
    uint32_t magic;
    uint32_t recordSize;
    uint8_t georeferenced;
    uint8_t reserved0[7];
    uint32_t epsgCode;
    uint8_t reserved1[164];
    uint32_t controlPointCount;
    uint8_t reserved2[4];
    RHControlPoint points[kGeoRefControlPoints];
};

class CRasterHandler;

// The host's per-image record. Only the named fields are the library's; the
// padding members are bytes the host owns and the library never writes.
struct RHHandle {
    uint8_t hostBytes0[4];
    uint32_t openMarker;
    char path[kHandlePathSize];
    uint32_t width;
    uint32_t height;
    uint8_t hostBytes528[4];
    uint32_t pixelKind;
    RHPalette* palette;
    uint8_t hostBytes544[8];
    RHGeoRef* geoRef;
    uint32_t status;
    uint8_t hostBytes564[12];
    CRasterHandler* handler;
};

static_assert(sizeof(void*) == 8, "the host records are laid out for a 64-bit host");
static_assert(sizeof(RHIdentity) == 2028);
static_assert(offsetof(RHIdentity, handlerName) == 2);
static_assert(offsetof(RHIdentity, description) == 514);
static_assert(offsetof(RHIdentity, extensionCount) == 1026);
static_assert(offsetof(RHIdentity, extensions) == 1028);

static_assert(offsetof(RHHandle, openMarker) == 4);
static_assert(offsetof(RHHandle, path) == 8);
static_assert(offsetof(RHHandle, width) == 520);
static_assert(offsetof(RHHandle, height) == 524);
static_assert(offsetof(RHHandle, pixelKind) == 532);
static_assert(offsetof(RHHandle, palette) == 536);
static_assert(offsetof(RHHandle, geoRef) == 552);
static_assert(offsetof(RHHandle, status) == 560);
static_assert(offsetof(RHHandle, handler) == 576);
static_assert(sizeof(RHHandle) == 584);

static_assert(sizeof(RHPalette) == 16);
static_assert(offsetof(RHPalette, entryCount) == 4);
static_assert(offsetof(RHPalette, entries) == 8);

static_assert(sizeof(RHControlPoint) == 48);
static_assert(sizeof(RHGeoRef) == 336);
static_assert(offsetof(RHGeoRef, georeferenced) == 8);
static_assert(offsetof(RHGeoRef, epsgCode) == 16);
static_assert(offsetof(RHGeoRef, controlPointCount) == 184);
static_assert(offsetof(RHGeoRef, points) == 192);
