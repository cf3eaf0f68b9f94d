// Small files of every kind the handler serves, built by the fixture writers,
// for the outcome table, the handle and thread tests, the Windows comparison
// and the fuzz seeds; files it must refuse; and what one open, draw and close
// of a file gives.
#pragma once

#include "tests/fixtures/HandlerLoader.h"

#include <string>
#include <vector>

struct SampleFile {
    std::string name, bytes;
};

// RPF frames of both products and byte orders, uncompressed NITF 2.1 and 2.0
// images in every IMODE and corner form, a lookup table, wide samples, masked
// blocks, JPEG and bi-level images. Compressed kinds first: the first open of
// such a file binds the imaging library. Files of other seeds differ in pixels.
std::vector<SampleFile> FilesOfEveryKind(unsigned seed = 0);
// Files that are refused at open, or (the last) open with rows that fail.
std::vector<SampleFile> HostileFiles();
// The bytes of the file of either list with this name.
const std::string& SampleBytes(const std::string& name);

// What one open, draw of full-width rows [0, maxRows) and close gives: the
// handle's description and an FNV-1a digest of the palette and rows.
struct DrawResult {
    int32_t openResult = 0;
    uint32_t status = 0, width = 0, height = 0, pixelKind = 0, failedRows = 0;
    uint64_t digest = 0;
    bool operator==(const DrawResult& o) const;
};
DrawResult OpenDrawClose(const HandlerExports& rh, const std::string& path, uint32_t maxRows);

// Bytes of heap the process holds: the sanitizer's count in sanitized builds,
// the C library's otherwise.
size_t HeapInUse();
