// Creation and release of the host-visible palette record.
#pragma once

#include "plugin/HostRecords.h"

// Allocates a palette of entryCount entries (contents not cleared); null when
// an allocation fails. A count of 0 or less gives a record without entries.
RHPalette* CreatePalette(int32_t entryCount);

// Releases a palette made by CreatePalette; null is accepted.
void DestroyPalette(RHPalette* palette);
