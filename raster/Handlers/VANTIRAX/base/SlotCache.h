// SlotCache: stretches of a file held in memory during a draw, one per slot,
// each known by where it starts and how long it is, so that a stretch read
// whole once serves every later read inside it until another takes its slot.
#pragma once

#include "base/FileReader.h"

#include <cstdint>
#include <vector>

class SlotCache {
public:
    // Gives the cache slotCount empty slots of slotBytes bytes each, unless
    // it has that shape already.
    void Shape(uint64_t slotCount, uint64_t slotBytes);
    // The bytes of the stretch of `bytes` bytes at `start` (in a file of
    // fileSize bytes), held in `slot`, read through CheckedRead when the slot
    // holds another. Null when the stretch does not fit its slot or the read
    // fails; the slot then holds nothing.
    const uint8_t* Fetch(CFileReader& reader, uint64_t fileSize, uint64_t slot, uint64_t start, uint64_t bytes);
    // Frees the memory; every draw starts and ends with an empty cache.
    void Release();

private:
    struct Stretch {
        uint64_t start;
        uint64_t bytes; // 0: the slot holds nothing
    };
    std::vector<uint8_t> memory;
    std::vector<Stretch> held; // what each slot holds
    uint64_t bytesPerSlot = 0;
};
