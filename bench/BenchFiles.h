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

// Writes a size x size JPEG NITF cut into blocks of blockSize (used for the
// memory measurement of a large image).
bool WriteJpegImage(const std::string& path, int size, int blockSize);
