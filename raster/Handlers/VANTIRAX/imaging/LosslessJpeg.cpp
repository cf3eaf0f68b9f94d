// JPEG streams of the lossless process (SOF3, ITU-T T.81 Annex H), which
// libjpeg does not decode here: every sample is a prediction from its
// decoded neighbours plus a Huffman-coded difference. Samples of up to 8
// bits, one or three components without subsampling, one or more scans,
// restart intervals of whole rows.
#include "base/ByteOrder.h"
#include "imaging/BitmapKernel.h"
#include "imaging/FileLoader.h"
#include "imaging/JpegMarkers.h"

#include <cstring>

namespace {

constexpr unsigned kMaxCodeLength = 16;
constexpr unsigned kTableSlots = 4;
constexpr unsigned kMaxComponents = 3;
constexpr unsigned kMinPrecision = 2;
constexpr unsigned kMaxPrecision = 8;
constexpr unsigned kLargestCategory = 16;     // SSSS 16: the difference 32768, no extra bits
constexpr unsigned kUnsubsampled = 0x11;      // horizontal and vertical sampling factor 1

struct HuffmanTable {
    bool present;
    uint8_t values[256];
    int32_t maxCode[kMaxCodeLength + 1];        // -1 where no code has that length
    int32_t valueOffset[kMaxCodeLength + 1];    // value index = code + valueOffset[length]
};

struct LosslessFrame {
    unsigned precision;
    uint32_t width;
    uint32_t height;
    unsigned componentCount;
    uint8_t componentIds[kMaxComponents];
};

struct LosslessScan {
    unsigned componentCount;
    unsigned component[kMaxComponents];     // frame component index
    unsigned table[kMaxComponents];
    unsigned predictor;                     // 1 to 7
    unsigned pointTransform;
};

// Entropy-coded bits with 0xFF00 stuffing removed. Reading past the data or
// into a marker yields zero bits and marks the stream as overrun.
struct BitReader {
    const uint8_t* data;
    size_t size;
    size_t at;
    uint32_t byte;
    unsigned bitsLeft;
    bool overrun;

    unsigned Bit()
    {
        if (bitsLeft == 0) {
            if (at < size && data[at] != kMarkerPrefix) {
                byte = data[at++];
            } else if (at + 1 < size && data[at + 1] == 0) {
                byte = kMarkerPrefix;
                at += 2;
            } else {
                byte = 0;
                overrun = true;
            }
            bitsLeft = 8;
        }
        --bitsLeft;
        return (byte >> bitsLeft) & 1;
    }

    uint32_t Bits(unsigned count)
    {
        uint32_t value = 0;
        while (count-- > 0)
            value = (value << 1) | Bit();
        return value;
    }

    // Drops the rest of the byte and expects a RSTn marker, after optional fill bytes.
    bool Restart()
    {
        bitsLeft = 0;
        while (at + 1 < size && data[at] == kMarkerPrefix && data[at + 1] == kMarkerPrefix)
            ++at;
        if (at + 1 >= size || data[at] != kMarkerPrefix || !IsRestartMarker(data[at + 1]))
            return false;
        at += 2;
        return true;
    }
};

struct LosslessState {
    HuffmanTable tables[kTableSlots];
    LosslessFrame frame;
    bool hasFrame;
    uint32_t restartInterval;   // in samples of every scan component (MCUs)
};

bool BuildTable(const uint8_t* counts, const uint8_t* values, unsigned valueCount, HuffmanTable& table)
{
    std::memcpy(table.values, values, valueCount);
    int32_t code = 0;
    unsigned index = 0;
    for (unsigned length = 1; length <= kMaxCodeLength; ++length) {
        unsigned count = counts[length - 1];
        table.maxCode[length] = count ? code + int32_t(count) - 1 : -1;
        table.valueOffset[length] = int32_t(index) - code;
        code += int32_t(count);
        index += count;
        if (code > (int32_t(1) << length))   // more codes than this length can hold
            return false;
        code <<= 1;
    }
    table.present = true;
    return true;
}

bool ReadHuffmanTables(const uint8_t* segment, size_t length, LosslessState& state)
{
    size_t at = 0;
    while (at < length) {
        if (length - at < 1 + kMaxCodeLength)
            return false;
        unsigned slot = segment[at] & 0x0F;
        bool dcClass = (segment[at] >> 4) == 0;
        const uint8_t* counts = segment + at + 1;
        unsigned valueCount = 0;
        for (unsigned i = 0; i < kMaxCodeLength; ++i)
            valueCount += counts[i];
        at += 1 + kMaxCodeLength;
        if (slot >= kTableSlots || valueCount > 256 || length - at < valueCount)
            return false;
        // Only the DC-class tables code lossless differences.
        if (dcClass && !BuildTable(counts, segment + at, valueCount, state.tables[slot]))
            return false;
        at += valueCount;
    }
    return true;
}

bool ReadFrame(const uint8_t* segment, size_t length, const LOADFILEOPTION& options, BITMAPHANDLE* bitmap,
               LosslessState& state)
{
    LosslessFrame& frame = state.frame;
    if (state.hasFrame || length < 6)
        return false;
    frame.precision = segment[0];
    frame.height = BigEndian16(segment + 1);
    frame.width = BigEndian16(segment + 3);
    frame.componentCount = segment[5];
    if (frame.precision < kMinPrecision || frame.precision > kMaxPrecision ||
        (frame.componentCount != 1 && frame.componentCount != kMaxComponents) ||
        length != 6 + 3 * size_t(frame.componentCount))
        return false;
    // Each component is described in three bytes: identifier, sampling
    // factors, quantisation table. The count is 1 or 3 here.
    for (unsigned c = 0; c < frame.componentCount; ++c) {
        if (segment[7 + 3 * c] != kUnsubsampled)
            return false;
    }
    frame.componentIds[0] = segment[6];
    if (frame.componentCount == kMaxComponents) {
        frame.componentIds[1] = segment[9];
        frame.componentIds[2] = segment[12];
    }
    state.hasFrame = true;
    return ShapeBitmap(bitmap, frame.width, frame.height, frame.componentCount == 1 ? 8 : 24, options);
}

bool ReadScanHeader(const uint8_t* segment, size_t length, const LosslessState& state, LosslessScan& scan)
{
    if (!state.hasFrame || length < 1)
        return false;
    scan.componentCount = segment[0];
    if (scan.componentCount < 1 || scan.componentCount > state.frame.componentCount ||
        length != 4 + 2 * size_t(scan.componentCount))
        return false;
    for (unsigned i = 0; i < scan.componentCount; ++i) {
        unsigned c = 0;
        while (c < state.frame.componentCount && state.frame.componentIds[c] != segment[1 + 2 * i])
            ++c;
        scan.component[i] = c;
        scan.table[i] = segment[2 + 2 * i] >> 4;
        if (c == state.frame.componentCount || scan.table[i] >= kTableSlots || !state.tables[scan.table[i]].present)
            return false;
    }
    const uint8_t* tail = segment + 1 + 2 * scan.componentCount;
    scan.predictor = tail[0];
    scan.pointTransform = tail[2] & 0x0F;
    bool wholeRows = state.restartInterval % state.frame.width == 0;
    return scan.predictor >= 1 && scan.predictor <= 7 && tail[1] == 0 && (tail[2] >> 4) == 0 &&
           scan.pointTransform < state.frame.precision && wholeRows;
}

// The arithmetic right shift by one of T.81's predictors, for negative values too.
int32_t Half(int32_t value)
{
    return value >= 0 ? value / 2 : -((1 - value) / 2);
}

int32_t Predict(unsigned predictor, int32_t a, int32_t b, int32_t c)
{
    switch (predictor) {
    case 1: return a;
    case 2: return b;
    case 3: return c;
    case 4: return a + b - c;
    case 5: return a + Half(b - c);
    case 6: return b + Half(a - c);
    default: return Half(a + b);
    }
}

bool DecodeDifference(BitReader& bits, const HuffmanTable& table, int32_t& difference)
{
    int32_t code = 0;
    unsigned length = 1;
    for (;; ++length) {
        code = (code << 1) | int32_t(bits.Bit());
        if (code <= table.maxCode[length])
            break;
        if (length == kMaxCodeLength)
            return false;
    }
    unsigned category = table.values[code + table.valueOffset[length]];
    if (category > kLargestCategory)
        return false;
    if (category == kLargestCategory) {
        difference = 32768;
        return true;
    }
    int32_t raw = int32_t(bits.Bits(category));
    // A leading 0 bit marks a negative difference (T.81 F.2.2.1, EXTEND).
    difference = (category && raw < (int32_t(1) << (category - 1))) ? raw - (int32_t(1) << category) + 1 : raw;
    return true;
}

// Decodes one scan into the bitmap; the entropy data starts at bits.at.
bool DecodeScan(BitReader& bits, const LosslessState& state, const LosslessScan& scan, BITMAPHANDLE* bitmap)
{
    const LosslessFrame& frame = state.frame;
    const unsigned shift = scan.pointTransform;
    const int32_t sampleMask = (int32_t(1) << (frame.precision - shift)) - 1;
    const uint32_t restartRows = state.restartInterval / frame.width;
    for (uint32_t y = 0; y < frame.height; ++y) {
        bool restarted = restartRows && y > 0 && y % restartRows == 0;
        if (restarted && !bits.Restart())
            return false;
        bool firstLine = y == 0 || restarted;
        uint8_t* row = bitmap->pixels + size_t(y) * bitmap->bytesPerLine;
        const uint8_t* above = row - (y > 0 ? bitmap->bytesPerLine : 0);
        for (uint32_t x = 0; x < frame.width; ++x) {
            for (unsigned i = 0; i < scan.componentCount; ++i) {
                size_t at = size_t(x) * frame.componentCount + scan.component[i];
                size_t left = at - frame.componentCount;
                int32_t prediction;
                if (firstLine)
                    prediction = x == 0 ? int32_t(1) << (frame.precision - shift - 1) : row[left] >> shift;
                else if (x == 0)
                    prediction = above[at] >> shift;
                else
                    prediction = Predict(scan.predictor, row[left] >> shift, above[at] >> shift, above[left] >> shift);
                int32_t difference = 0;
                if (!DecodeDifference(bits, state.tables[scan.table[i]], difference))
                    return false;
                row[at] = static_cast<uint8_t>(((prediction + difference) & sampleMask) << shift);
            }
        }
        // Data that has run out ends the scan: a frame can declare far more
        // samples than its stream codes.
        if (bits.overrun)
            return false;
    }
    return true;
}

}  // namespace

bool LoadLosslessJpegStream(const LoadRequest& request)
{
    JpegMemoryBytes bytes(request.data, request.size);
    JpegMarkerWalk walk(bytes);
    JpegSegment marker;
    LosslessState state {};
    bool decodedScan = false;
    while (walk.Next(marker)) {
        const uint8_t* segment = request.data + marker.payload;
        const size_t payload = size_t(marker.length);
        bool good = true;
        if (marker.code == kDefineHuffmanTables) {
            good = ReadHuffmanTables(segment, payload, state);
        } else if (marker.code == kDefineRestartInterval) {
            good = payload == 2;
            state.restartInterval = good ? BigEndian16(segment) : 0;
        } else if (marker.code == kLosslessFrame) {
            good = ReadFrame(segment, payload, *request.options, request.bitmap, state);
        } else if (marker.code == kStartOfScan) {
            LosslessScan scan {};
            BitReader bits {request.data, request.size, size_t(marker.payload) + payload, 0, 0, false};
            good = ReadScanHeader(segment, payload, state, scan) && DecodeScan(bits, state, scan, request.bitmap);
            decodedScan = good;
        }
        if (!good)
            return false;
    }
    request.info->colorConverted = state.frame.componentCount == kMaxComponents ? 1 : 0;
    request.info->decodedRows = state.frame.height;
    return decodedScan && walk.Complete();
}
