// Small files of every kind the handler serves, built by the fixture writers,
// for tests that open, draw and close many handles: a JPEG image, a bi-level
// image, an RPF frame and an uncompressed image. Files of different seeds
// differ in their pixels.
#pragma once

#include "tests/fixtures/HandlerLoader.h"

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

struct StressFile {
    std::string kind;
    std::string bytes;
};

// Compressed kinds first: the first open of such a file binds the imaging library.
std::vector<StressFile> FilesOfEveryKind(unsigned seed);

// What one open, draw and close gives: the handle's description and a digest
// of the drawn rows (FNV-1a over every row, failed rows included as zeros).
struct DrawResult {
    int32_t openResult = 0;
    uint32_t status = 0;
    uint32_t width = 0, height = 0, pixelKind = 0;
    uint32_t failedRows = 0;
    uint64_t digest = 0;
    bool operator==(const DrawResult& other) const;
};

// Bytes of heap the process holds: the sanitizer's count in sanitized builds,
// the C library's otherwise.
size_t HeapInUse();

// Draws full-width rows [0, maxRows) of the file (all rows when it has fewer).
DrawResult OpenDrawClose(const HandlerExports& rh, const std::string& path, uint32_t maxRows);
