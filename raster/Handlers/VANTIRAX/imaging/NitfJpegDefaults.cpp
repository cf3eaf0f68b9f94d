#include "imaging/NitfJpegDefaults.h"

#include "base/ByteOrder.h"
#include "imaging/JpegMarkers.h"

#include <cstddef>

#define VX_DQT_HEADER kMarkerPrefix, kDefineQuantisationTables, 0x00, 0x43, 0x00

const uint8_t kDefaultDqt[kDefaultQualities][kDqtSegmentSize] = {
    {VX_DQT_HEADER, 8, 72, 72, 72, 72, 72, 72, 72, 72, 72, 78, 74, 76, 74, 78, 89, 81, 84, 84, 81, 89, 106, 93, 94,
     99, 94, 93, 106, 129, 111, 108, 116, 116, 108, 111, 129, 135, 128, 136, 145, 136, 128, 135, 155, 160, 177, 177,
     160, 155, 193, 213, 228, 213, 193, 255, 255, 255, 255, 255, 255, 255, 255, 255, 255},
    {VX_DQT_HEADER, 8, 36, 36, 36, 36, 36, 36, 36, 36, 36, 39, 37, 38, 37, 39, 45, 41, 42, 42, 41, 45, 53, 47, 47, 50,
     47, 47, 53, 65, 56, 54, 59, 59, 54, 56, 65, 68, 64, 69, 73, 69, 64, 68, 78, 81, 89, 89, 81, 78, 98, 108, 115,
     108, 98, 130, 144, 144, 130, 178, 190, 178, 243, 243, 255},
    {VX_DQT_HEADER, 8, 10, 10, 10, 10, 10, 10, 10, 10, 10, 11, 10, 11, 10, 11, 13, 11, 12, 12, 11, 13, 15, 13, 13, 14,
     13, 13, 15, 18, 16, 15, 16, 16, 15, 16, 18, 19, 18, 19, 21, 19, 18, 19, 22, 23, 25, 25, 23, 22, 27, 30, 32, 30,
     27, 36, 40, 40, 36, 50, 53, 50, 68, 68, 91},
    {VX_DQT_HEADER, 8, 7, 7, 7, 7, 7, 7, 7, 7, 7, 8, 7, 8, 7, 8, 9, 8, 8, 8, 8, 9, 11, 9, 9, 10, 9, 9, 11, 13, 11, 11,
     12, 12, 11, 11, 13, 14, 13, 14, 15, 14, 13, 14, 16, 16, 18, 18, 16, 16, 20, 22, 23, 22, 20, 26, 29, 29, 26, 36,
     38, 36, 49, 49, 65},
    {VX_DQT_HEADER, 4, 4, 4, 4, 4, 4, 4, 4, 4, 4, 4, 4, 4, 4, 4, 5, 5, 5, 5, 5, 5, 6, 5, 5, 6, 5, 5, 6, 7, 6, 6, 6, 6,
     6, 6, 7, 8, 7, 8, 8, 8, 7, 8, 9, 9, 10, 10, 9, 9, 11, 12, 13, 12, 11, 14, 16, 16, 14, 20, 21, 20, 27, 27, 36},
};

#undef VX_DQT_HEADER

// The luminance DC and AC tables of ITU-T T.81 Annex K (K.3 and K.5).
const uint8_t kDefaultDht[kDhtSegmentSize] = {
    kMarkerPrefix, kDefineHuffmanTables, 0x00, 0xD2,
    0x00, 0, 1, 5, 1, 1, 1, 1, 1, 1, 0, 0, 0, 0, 0, 0, 0,
    0, 1, 2, 3, 4, 5, 6, 7, 8, 9, 10, 11,
    0x10, 0, 2, 1, 3, 3, 2, 4, 3, 5, 5, 4, 4, 0, 0, 1, 0x7D,
    0x01, 0x02, 0x03, 0x00, 0x04, 0x11, 0x05, 0x12, 0x21, 0x31, 0x41, 0x06, 0x13, 0x51, 0x61, 0x07,
    0x22, 0x71, 0x14, 0x32, 0x81, 0x91, 0xA1, 0x08, 0x23, 0x42, 0xB1, 0xC1, 0x15, 0x52, 0xD1, 0xF0,
    0x24, 0x33, 0x62, 0x72, 0x82, 0x09, 0x0A, 0x16, 0x17, 0x18, 0x19, 0x1A, 0x25, 0x26, 0x27, 0x28,
    0x29, 0x2A, 0x34, 0x35, 0x36, 0x37, 0x38, 0x39, 0x3A, 0x43, 0x44, 0x45, 0x46, 0x47, 0x48, 0x49,
    0x4A, 0x53, 0x54, 0x55, 0x56, 0x57, 0x58, 0x59, 0x5A, 0x63, 0x64, 0x65, 0x66, 0x67, 0x68, 0x69,
    0x6A, 0x73, 0x74, 0x75, 0x76, 0x77, 0x78, 0x79, 0x7A, 0x83, 0x84, 0x85, 0x86, 0x87, 0x88, 0x89,
    0x8A, 0x92, 0x93, 0x94, 0x95, 0x96, 0x97, 0x98, 0x99, 0x9A, 0xA2, 0xA3, 0xA4, 0xA5, 0xA6, 0xA7,
    0xA8, 0xA9, 0xAA, 0xB2, 0xB3, 0xB4, 0xB5, 0xB6, 0xB7, 0xB8, 0xB9, 0xBA, 0xC2, 0xC3, 0xC4, 0xC5,
    0xC6, 0xC7, 0xC8, 0xC9, 0xCA, 0xD2, 0xD3, 0xD4, 0xD5, 0xD6, 0xD7, 0xD8, 0xD9, 0xDA, 0xE1, 0xE2,
    0xE3, 0xE4, 0xE5, 0xE6, 0xE7, 0xE8, 0xE9, 0xEA, 0xF1, 0xF2, 0xF3, 0xF4, 0xF5, 0xF6, 0xF7, 0xF8,
    0xF9, 0xFA,
};

namespace {

enum TiffType : uint16_t { kAscii = 2, kShort = 3, kLong = 4, kRational = 5 };

struct TiffEntry {
    uint16_t tag;
    uint16_t type;
    uint32_t count;
    uint32_t value;   // the value, or the data-area offset of ASCII and RATIONAL values
};

constexpr TiffEntry kBiLevelEntries[] = {
    {254, kLong, 1, 0},       {256, kLong, 1, 1024},    {257, kLong, 1, 1024},    {258, kShort, 1, 1},
    {259, kShort, 1, 3},      {262, kShort, 1, 0},      {269, kAscii, 7, 310},    {270, kAscii, 21, 318},
    {271, kAscii, 8, 340},    {272, kAscii, 7, 348},    {273, kLong, 1, 424},     {277, kShort, 1, 1},
    {278, kLong, 1, 1024},    {279, kLong, 1, 3224},    {282, kRational, 1, 356}, {283, kRational, 1, 356},
    {286, kRational, 1, 364}, {287, kRational, 1, 364}, {292, kLong, 1, 5},       {296, kShort, 1, 2},
    {305, kAscii, 8, 372},    {306, kAscii, 20, 380},   {315, kAscii, 8, 400},    {316, kAscii, 15, 408},
};

struct TiffText {
    unsigned offset;
    const char* text;   // copied without its terminator; the bytes after it stay zero
};

// The DateTime text ends in a blank where TIFF expects a NUL, as files of
// this form have it.
constexpr TiffText kBiLevelTexts[] = {
    {310, "BiLevI"},  {318, "Some bi-level image"}, {340, "Unknown"}, {348, "000000"},
    {372, "Unknown"}, {380, "0000:00:00 00:00:00 "}, {400, "Unknown"}, {408, "BiLevelWrapper"},
};

constexpr unsigned kFirstDirectory = 16;
constexpr unsigned kResolution = 356;     // 400/1 pixels per inch
constexpr unsigned kPosition = 364;       // 0/1
constexpr unsigned kNextDirectory = 306;

constexpr std::array<uint8_t, kBiLevelHeaderSize> MakeBiLevelTiffTemplate()
{
    std::array<uint8_t, kBiLevelHeaderSize> bytes {};
    bytes[0] = 'M';
    bytes[1] = 'M';
    PutBigEndian16(bytes.data() + 2, 42);
    PutBigEndian32(bytes.data() + 4, kFirstDirectory);
    constexpr unsigned entryCount = sizeof kBiLevelEntries / sizeof kBiLevelEntries[0];
    PutBigEndian16(bytes.data() + kFirstDirectory, entryCount);
    for (unsigned i = 0; i < entryCount; ++i) {
        const TiffEntry& entry = kBiLevelEntries[i];
        unsigned at = kFirstDirectory + 2 + 12 * i;
        PutBigEndian16(bytes.data() + at, entry.tag);
        PutBigEndian16(bytes.data() + at + 2, entry.type);
        PutBigEndian32(bytes.data() + at + 4, entry.count);
        if (entry.type == kShort)     // a SHORT stands in the first two bytes of the value field
            PutBigEndian16(bytes.data() + at + 8, entry.value);
        else
            PutBigEndian32(bytes.data() + at + 8, entry.value);
    }
    PutBigEndian32(bytes.data() + kNextDirectory, 0);
    for (const TiffText& text : kBiLevelTexts)
        for (unsigned i = 0; text.text[i] != '\0'; ++i)
            bytes[text.offset + i] = static_cast<uint8_t>(text.text[i]);
    PutBigEndian32(bytes.data() + kResolution, 400);
    PutBigEndian32(bytes.data() + kResolution + 4, 1);
    PutBigEndian32(bytes.data() + kPosition, 0);
    PutBigEndian32(bytes.data() + kPosition + 4, 1);
    return bytes;
}

}  // namespace

const std::array<uint8_t, kBiLevelHeaderSize> kBiLevelTiffTemplate = MakeBiLevelTiffTemplate();
