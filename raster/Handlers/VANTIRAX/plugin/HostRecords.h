// The records that cross the boundary to the host, laid out once in the
// public header plugin/rh.h (installed as <vantirax/rh.h>); here the names
// the library's C++ code uses for its constants.
#pragma once

#include "plugin/rh.h"

#include <cstddef>
#include <cstdint>

constexpr uint32_t kStatusOk = RH_STATUS_OK;
constexpr uint32_t kStatusFailed = RH_STATUS_FAILED;

enum RHPixelKind : uint32_t {
    kPixelRpfNoTable = RH_PIXEL_RPF_NO_TABLE,
    kPixelPaletted = RH_PIXEL_PALETTED,
    kPixelGreyPaletted = RH_PIXEL_GREY_PALETTED,
    kPixelDirect = RH_PIXEL_DIRECT,
};

constexpr size_t kIdentityNameSize = RH_IDENTITY_NAME_SIZE;
constexpr size_t kExtensionSlotSize = RH_EXTENSION_SLOT_SIZE;
constexpr size_t kExtensionSlots = RH_EXTENSION_SLOTS;
constexpr size_t kHandlePathSize = RH_HANDLE_PATH_SIZE;

constexpr uint32_t kPaletteAlive = RH_PALETTE_ALIVE;
constexpr uint32_t kPaletteReleased = RH_PALETTE_RELEASED;

constexpr uint32_t kGeoRefMagic = RH_GEOREF_MAGIC;
constexpr uint32_t kGeoRefControlPoints = RH_GEOREF_CONTROL_POINTS;
