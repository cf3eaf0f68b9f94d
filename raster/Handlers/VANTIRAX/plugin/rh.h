/* The contract between a host application and the VANTIRAX.rhl raster format
 * handler: the seven exports and the records they fill, whose byte layouts
 * are fixed (every offset is pinned below) and laid out for a 64-bit host.
 * The handler is built against this header: these are the only definitions.
 * Installed as <vantirax/rh.h>; C99 or C++. */
#ifndef VANTIRAX_RH_H
#define VANTIRAX_RH_H

#include <stddef.h>
#include <stdint.h>

/* Status values the handle carries after every call. */
#define RH_STATUS_OK 0u
#define RH_STATUS_FAILED 5u

/* Pixel kinds: how the bytes of a delivered row are to be read. */
#define RH_PIXEL_RPF_NO_TABLE 0u   /* RPF frame without a colour or grey table */
#define RH_PIXEL_PALETTED 1u       /* one byte per pixel, an index into the palette */
#define RH_PIXEL_GREY_PALETTED 2u  /* as 1, every palette entry grey */
#define RH_PIXEL_DIRECT 3u         /* pixel values as read: three bytes per pixel for RGB */

#define RH_IDENTITY_NAME_SIZE 512
#define RH_EXTENSION_SLOT_SIZE 10
#define RH_EXTENSION_SLOTS 100
#define RH_HANDLE_PATH_SIZE 512

#define RH_PALETTE_ALIVE 0xFAFAu
#define RH_PALETTE_RELEASED 0xAFAFu
#define RH_GEOREF_MAGIC 56506u
#define RH_GEOREF_CONTROL_POINTS 3

#pragma pack(push, 2)
typedef struct RHIdentity {
    uint16_t version;
    char handlerName[RH_IDENTITY_NAME_SIZE];
    char description[RH_IDENTITY_NAME_SIZE];
    uint16_t extensionCount;
    char extensions[RH_EXTENSION_SLOTS][RH_EXTENSION_SLOT_SIZE];
} RHIdentity;
#pragma pack(pop)

typedef struct RHPalette {
    uint32_t signature; /* RH_PALETTE_ALIVE, RH_PALETTE_RELEASED once freed */
    int32_t entryCount;
    uint8_t* entries; /* entryCount x (red, green, blue) */
} RHPalette;

typedef struct RHControlPoint {
    double column;
    double row;
    double pixelZ;
    double worldX;
    double worldY;
    double worldZ;
} RHControlPoint;

typedef struct RHGeoRef {
    uint32_t magic; /* RH_GEOREF_MAGIC */
    uint32_t recordSize;
    uint8_t georeferenced;
    uint8_t reserved0[7];
    uint32_t epsgCode; /* 0: the corners name no coordinate system */
    uint8_t reserved1[164];
    uint32_t controlPointCount;
    uint8_t reserved2[4];
    RHControlPoint points[RH_GEOREF_CONTROL_POINTS];
} RHGeoRef;

/* The handler's own state behind a handle; the host never looks inside. */
#ifdef __cplusplus
class CRasterHandler;
#else
typedef struct CRasterHandler CRasterHandler;
#endif

/* The host's per-image record. Only the named fields are the handler's; the
 * padding members are bytes the host owns and the handler never writes. */
typedef struct RHHandle {
    uint8_t hostBytes0[4];
    uint32_t openMarker;
    char path[RH_HANDLE_PATH_SIZE];
    uint32_t width;
    uint32_t height;
    uint8_t hostBytes528[4];
    uint32_t pixelKind; /* RH_PIXEL_... */
    RHPalette* palette;
    uint8_t hostBytes544[8];
    RHGeoRef* geoRef;
    uint32_t status; /* RH_STATUS_... */
    uint8_t hostBytes564[12];
    CRasterHandler* handler;
} RHHandle;

#ifdef __cplusplus
#define RH_LAYOUT(condition) static_assert(condition, #condition)
#else
#define RH_LAYOUT(condition) _Static_assert(condition, #condition)
#endif
RH_LAYOUT(sizeof(void*) == 8);
RH_LAYOUT(sizeof(RHIdentity) == 2028);
RH_LAYOUT(offsetof(RHIdentity, handlerName) == 2);
RH_LAYOUT(offsetof(RHIdentity, description) == 514);
RH_LAYOUT(offsetof(RHIdentity, extensionCount) == 1026);
RH_LAYOUT(offsetof(RHIdentity, extensions) == 1028);
RH_LAYOUT(offsetof(RHHandle, openMarker) == 4);
RH_LAYOUT(offsetof(RHHandle, path) == 8);
RH_LAYOUT(offsetof(RHHandle, width) == 520);
RH_LAYOUT(offsetof(RHHandle, height) == 524);
RH_LAYOUT(offsetof(RHHandle, pixelKind) == 532);
RH_LAYOUT(offsetof(RHHandle, palette) == 536);
RH_LAYOUT(offsetof(RHHandle, geoRef) == 552);
RH_LAYOUT(offsetof(RHHandle, status) == 560);
RH_LAYOUT(offsetof(RHHandle, handler) == 576);
RH_LAYOUT(sizeof(RHHandle) == 584);
RH_LAYOUT(sizeof(RHPalette) == 16);
RH_LAYOUT(offsetof(RHPalette, entryCount) == 4);
RH_LAYOUT(offsetof(RHPalette, entries) == 8);
RH_LAYOUT(sizeof(RHControlPoint) == 48);
RH_LAYOUT(sizeof(RHGeoRef) == 336);
RH_LAYOUT(offsetof(RHGeoRef, georeferenced) == 8);
RH_LAYOUT(offsetof(RHGeoRef, epsgCode) == 16);
RH_LAYOUT(offsetof(RHGeoRef, controlPointCount) == 184);
RH_LAYOUT(offsetof(RHGeoRef, points) == 192);
#undef RH_LAYOUT

#ifdef __cplusplus
extern "C" {
#endif

/* 1 when the handler reads the file, else 0. */
int32_t RH_IsFormat(const char* path);
/* Fills the identity record; returns 1. */
int32_t RH_Identify(RHIdentity* identity);
/* Opens the image into a zero-filled handle: 1 with status RH_STATUS_OK when it is ready. */
int32_t RH_Open(RHHandle* handle, const char* path);
/* Starts a draw of rect: first column, first row, end column, end row (the ends exclusive);
 * *rowWidth gets the pixels of a row. */
int32_t RH_StartDraw(RHHandle* handle, void* hostContext, const int32_t* rect, double scale, uint32_t* rowWidth);
/* Points *rowAddress at the row's pixels, valid until the next call on the handle. */
int32_t RH_GetLine(RHHandle* handle, uint32_t row, uint8_t** rowAddress, uint16_t* lineFlag);
int32_t RH_EndDraw(RHHandle* handle);
/* Releases everything the handle holds. */
int32_t RH_Close(RHHandle* handle);

#ifdef __cplusplus
}
#endif

#endif /* VANTIRAX_RH_H */
