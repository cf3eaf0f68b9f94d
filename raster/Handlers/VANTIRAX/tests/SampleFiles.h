// Small files of every kind the handler serves, built by the fixture writers, for the outcome table, the
// handle and thread tests, the host's tests, the Windows comparison and the fuzz seeds; hostile files; and
// what one open, draw and close of a file gives.
#pragma once

#include "tests/fixtures/HandlerLoader.h"

struct SampleFile { std::string name, bytes; };

// RPF frames of both products and byte orders, uncompressed NITF 2.1 and 2.0 images in every IMODE and corner form, a
// lookup table, wide samples, masked blocks, JPEG and bi-level images. Compressed kinds first: the first open of such
// a file binds the imaging library. Files of other seeds differ in pixels.
std::vector<SampleFile> FilesOfEveryKind(unsigned seed = 0);
// Files that are refused at open, or (the last) open with rows that fail.
std::vector<SampleFile> HostileFiles();
// The bytes of the file of either list with this name.
const std::string& SampleBytes(const std::string& name);
// One open, draw of full-width rows [0, maxRows) and close, as a line "result R status S failed F size W x H kind K"
// (failed 0 when not drawn), then the palette's bytes and the rows'.
std::string OpenDrawClose(const HandlerExports& rh, const std::string& path, uint32_t maxRows);
// How it begins for a file that opens and draws every row.
constexpr char kDrawnClean[] = "result 1 status 0 failed 0 ";
// A sparse NITF 2.1 file of 4.7 GB: one column of kLargeImageSide-square MONO blocks, holes (pixel 0) but for
// its last two rows, which hold LargeImagePixel. False when it cannot be written.
constexpr int32_t kLargeImageSide = 8192, kLargeImageRows = kLargeImageSide * 70;
uint8_t LargeImagePixel(int32_t row, int32_t column);
bool WriteSparseLargeImage(const std::string& path);
