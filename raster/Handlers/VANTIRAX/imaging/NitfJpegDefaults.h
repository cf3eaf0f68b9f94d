// Built-in data of the NITF compressed forms: the default DQT segments chosen
// by the APP6 quality byte, the default DHT segment, and the TIFF header that
// wraps a bi-level CCITT T.4 strip.
#pragma once

#include <array>
#include <cstdint>

constexpr unsigned kDefaultQualities = 5;
constexpr unsigned kDqtSegmentSize = 69;      // FF DB, length 67, Pq/Tq 0, 64 values
constexpr unsigned kDhtSegmentSize = 212;     // FF C4, length 210, one DC and one AC table
constexpr unsigned kBiLevelHeaderSize = 424;

// kDefaultDqt[q - 1] is the segment for quality q.
extern const uint8_t kDefaultDqt[kDefaultQualities][kDqtSegmentSize];
extern const uint8_t kDefaultDht[kDhtSegmentSize];
extern const std::array<uint8_t, kBiLevelHeaderSize> kBiLevelTiffTemplate;

// Positions of the 32-bit values set at decode (most significant byte first).
constexpr unsigned kTiffImageWidthValue = 18 + 12 * 1 + 8;
constexpr unsigned kTiffImageLengthValue = 18 + 12 * 2 + 8;
constexpr unsigned kTiffRowsPerStripValue = 18 + 12 * 12 + 8;
constexpr unsigned kTiffStripByteCountsValue = 18 + 12 * 13 + 8;
constexpr unsigned kTiffT4OptionsValue = 18 + 12 * 18 + 8;
constexpr uint32_t kT4OneDimensional = 4;     // bit 2: uncompressed mode allowed
constexpr uint32_t kT4TwoDimensional = 5;     // bit 0: 2-D coding
