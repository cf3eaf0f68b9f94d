// The limit of a JPEG image: its streams decoded by libjpeg-turbo alone.
#pragma once

#include <cstddef>
#include <cstdint>
#include <limits>
#include <vector>

struct JpegStream {
    size_t offset = 0;
    size_t length = 0;
};

// Finds the JPEG streams stored one after another in a file's bytes (the
// first maxStreams of them).
std::vector<JpegStream> FindJpegStreams(const std::vector<uint8_t>& file, size_t maxStreams = SIZE_MAX);
// Decodes every stream into pixels (reused from stream to stream); false
// when one does not decode.
bool DecodeJpegStreams(const std::vector<uint8_t>& file, const std::vector<JpegStream>& streams,
                       std::vector<uint8_t>& pixels);
