// The files the benchmark reads: real RPF frames from the sample corpus and
// synthetic NITF images written once into a data folder (uncompressed in every
// IMODE, JPEG in one and in many blocks, bi-level).
#pragma once

#include <string>
#include <vector>

struct BenchCase {
    std::string name;
    std::string path;
    bool jpeg = false; // the limit includes decoding the JPEG streams
};

// Writes the synthetic files that dataDir lacks (GDAL's drivers registered)
// and lists every case whose
// file is present.
std::vector<BenchCase> PrepareCases(const std::string& dataDir, const std::string& corpusDir);

// Real-sized images, written once: a sparse uncompressed MONO image of about
// 5 GiB (73,000 x 73,000), JPEG images of 32768 x 32768 in 512 x 512 blocks
// and 65536 x 65536 in 1024 x 1024 blocks, whose blocks repeat a few streams,
// and a 32768 x 32768 grey JPEG 2000 image in tiles of 1024.
struct LargeCase {
    std::string name;
    std::string path;
    bool jpeg = false;
    int blockSide = 0; // 0: JPEG 2000, whose tiling the codestream gives
};
std::vector<LargeCase> PrepareLargeCases(const std::string& dataDir);

// Writes a size x size JPEG NITF cut into blocks of blockSize (used for the
// memory measurement of a large image).
bool WriteJpegImage(const std::string& path, int size, int blockSize);
