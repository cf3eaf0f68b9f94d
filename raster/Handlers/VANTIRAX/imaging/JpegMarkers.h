// The marker segments of one JPEG stream (ITU-T T.81 B.1), walked by their
// lengths: a segment's payload is stepped over whole, so a marker pair inside
// an APP or COM payload (an embedded thumbnail's EOI) is never taken for a
// marker. Only the entropy-coded data after a scan header is searched byte
// by byte; there FF 00 is a data byte FF and RSTn belongs to the scan. Any
// number of fill bytes (FF) may stand before a marker, SOI included.
#pragma once

#include <cstddef>
#include <cstdint>

constexpr uint8_t kMarkerPrefix = 0xFF;
constexpr uint8_t kTemporary = 0x01;       // TEM
constexpr uint8_t kFirstFrame = 0xC0;      // SOF0
constexpr uint8_t kLosslessFrame = 0xC3;   // SOF3: lossless, Huffman coded
constexpr uint8_t kDefineHuffmanTables = 0xC4;
constexpr uint8_t kJpegExtension = 0xC8;   // JPG
constexpr uint8_t kDefineArithmeticConditioning = 0xCC;
constexpr uint8_t kLastFrame = 0xCF;       // SOF15
constexpr uint8_t kFirstRestart = 0xD0;    // RST0
constexpr uint8_t kLastRestart = 0xD7;     // RST7
constexpr uint8_t kStartOfImage = 0xD8;
constexpr uint8_t kEndOfImage = 0xD9;
constexpr uint8_t kStartOfScan = 0xDA;
constexpr uint8_t kDefineQuantisationTables = 0xDB;
constexpr uint8_t kDefineRestartInterval = 0xDD;
constexpr uint8_t kApplication6 = 0xE6;    // APP6, which leads every NITF JPEG stream

// The fewest bytes a stream can take: SOI and EOI alone.
constexpr uint32_t kMarkersOnlyJpegBytes = 2 + 2;
// The fewest bytes of a stream that decodes to pixels: SOI, a one-component
// frame header, a one-component scan header and EOI.
constexpr uint32_t kSmallestDecodableJpegBytes = 2 + 13 + 10 + 2;

// SOF0 to SOF15 without DHT, JPG and DAC.
constexpr bool IsFrameMarker(uint8_t code)
{
    return code >= kFirstFrame && code <= kLastFrame && code != kDefineHuffmanTables && code != kJpegExtension &&
           code != kDefineArithmeticConditioning;
}

constexpr bool IsRestartMarker(uint8_t code)
{
    return code >= kFirstRestart && code <= kLastRestart;
}

// The bytes of a stream, by their distance from its first byte.
class JpegBytes {
public:
    virtual ~JpegBytes() = default;
    virtual uint64_t Size() const = 0;
    // Bytes from `at` on (at < Size()): count gets how many lie one after
    // another, at least one and at most Size() - at. Null when they cannot be read.
    virtual const uint8_t* Window(uint64_t at, size_t& count) = 0;
};

class JpegMemoryBytes : public JpegBytes {
public:
    JpegMemoryBytes(const uint8_t* bytes, size_t byteCount) : data(bytes), size(byteCount) {}
    uint64_t Size() const override { return size; }
    const uint8_t* Window(uint64_t at, size_t& count) override
    {
        count = size - size_t(at);
        return data + at;
    }

private:
    const uint8_t* data;
    size_t size;
};

struct JpegSegment {
    uint8_t code = 0;        // the marker's second byte
    uint64_t marker = 0;     // distance of the marker's FF, after any fill bytes
    uint64_t payload = 0;    // distance of the bytes after the length field
    uint64_t length = 0;     // payload bytes; 0 for SOI, EOI, RSTn and TEM, which have none
};

class JpegMarkerWalk {
public:
    explicit JpegMarkerWalk(JpegBytes& source) : bytes(source), size(source.Size()) {}

    // The next segment, SOI first. False after EOI, and where the bytes break
    // the structure: no marker where one is due, a length past the end, a
    // scan whose data runs to the end, a second SOI.
    bool Next(JpegSegment& segment);
    // EOI has been walked.
    bool Complete() const { return complete; }

private:
    bool Byte(uint64_t at, uint8_t& value);
    bool SkipEntropyData();
    bool Break();

    JpegBytes& bytes;
    const uint64_t size;
    uint64_t next = 0;           // where the next marker, or its fill bytes, is due
    bool started = false;
    bool inScan = false;         // entropy-coded data lies before the next marker
    bool complete = false;
    bool broken = false;
    const uint8_t* window = nullptr;
    uint64_t windowStart = 0;
    size_t windowCount = 0;
};
