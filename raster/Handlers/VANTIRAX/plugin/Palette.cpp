#include "plugin/Palette.h"

#include <cstdlib>

RHPalette* CreatePalette(int32_t entryCount)
{
    auto* palette = static_cast<RHPalette*>(std::malloc(sizeof(RHPalette)));
    if (palette == nullptr)
        return nullptr;
    palette->signature = kPaletteAlive;
    palette->entryCount = entryCount;
    palette->entries = nullptr;
    if (entryCount > 0) {
        palette->entries = static_cast<uint8_t*>(std::malloc(static_cast<size_t>(entryCount) * 3));
        if (palette->entries == nullptr) {
            palette->signature = kPaletteReleased;
            std::free(palette);
            return nullptr;
        }
    }
    return palette;
}

void DestroyPalette(RHPalette* palette)
{
    if (palette == nullptr)
        return;
    std::free(palette->entries);
    palette->entries = nullptr;
    palette->signature = kPaletteReleased;
    std::free(palette);
}
