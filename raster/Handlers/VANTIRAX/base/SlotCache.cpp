#include "base/SlotCache.h"

#include "base/CheckedRead.h"

void SlotCache::Shape(uint64_t slotCount, uint64_t slotBytes)
{
    if (held.size() == slotCount && bytesPerSlot == slotBytes)
        return;
    memory.assign(slotCount * slotBytes, 0);
    held.assign(slotCount, Stretch{0, 0});
    bytesPerSlot = slotBytes;
}

const uint8_t* SlotCache::Fetch(CFileReader& reader, uint64_t fileSize, uint64_t slot, uint64_t start,
                                uint64_t bytes)
{
    if (slot >= held.size() || bytes == 0 || bytes > bytesPerSlot)
        return nullptr;
    uint8_t* slotMemory = memory.data() + slot * bytesPerSlot;
    Stretch& stretch = held[slot];
    if (stretch.start != start || stretch.bytes != bytes) {
        stretch = Stretch{start, 0};
        if (!CheckedRead(reader, fileSize, start, slotMemory, bytes))
            return nullptr;
        stretch.bytes = bytes;
    }
    return slotMemory;
}

void SlotCache::Release()
{
    memory = std::vector<uint8_t>();
    held = std::vector<Stretch>();
    bytesPerSlot = 0;
}
