#include "imaging/JpegMarkers.h"

#include <cstring>

namespace {

// Markers that stand alone, without a length and payload.
bool IsStandalone(uint8_t code)
{
    return code == kStartOfImage || code == kEndOfImage || code == kTemporary || IsRestartMarker(code);
}

}  // namespace

bool JpegMarkerWalk::Byte(uint64_t at, uint8_t& value)
{
    // One unsigned comparison also sends a position before the window to a refill.
    if (at - windowStart >= windowCount) {
        if (at >= size)
            return false;
        size_t count = 0;
        const uint8_t* bytesAt = bytes.Window(at, count);
        if (bytesAt == nullptr || count == 0 || count > size - at)
            return false;
        window = bytesAt;
        windowStart = at;
        windowCount = count;
    }
    value = window[at - windowStart];
    return true;
}

// Moves `next` to the FF of the first marker after the scan's data.
bool JpegMarkerWalk::SkipEntropyData()
{
    uint8_t value = 0, code = 0;
    for (;;) {
        if (!Byte(next, value))
            return false;
        if (value != kMarkerPrefix) {
            const size_t offset = size_t(next - windowStart);
            const void* found = std::memchr(window + offset, kMarkerPrefix, windowCount - offset);
            next = found ? windowStart + size_t(static_cast<const uint8_t*>(found) - window) : windowStart + windowCount;
            continue;
        }
        if (!Byte(next + 1, code))
            return false;
        if (code != 0 && !IsRestartMarker(code))
            return true;
        next += 2;
    }
}

bool JpegMarkerWalk::Break()
{
    broken = true;
    return false;
}

bool JpegMarkerWalk::Next(JpegSegment& segment)
{
    if (complete || broken)
        return false;
    if (inScan && !SkipEntropyData())
        return Break();
    inScan = false;
    uint8_t value = 0, code = kMarkerPrefix;
    if (!Byte(next, value) || value != kMarkerPrefix)
        return Break();
    for (; code == kMarkerPrefix; ++next)
        if (!Byte(next + 1, code))
            return Break();
    --next;   // the FF before the code
    if (code == 0 || (code == kStartOfImage) == started)
        return Break();
    started = true;
    segment.code = code;
    segment.marker = next;
    segment.payload = next + 2;
    segment.length = 0;
    next += 2;
    if (IsStandalone(code)) {
        complete = code == kEndOfImage;
        return true;
    }
    uint8_t high = 0, low = 0;
    if (!Byte(next, high) || !Byte(next + 1, low))
        return Break();
    const uint64_t length = (uint64_t(high) << 8) | low;
    if (length < 2 || length > size - next)
        return Break();
    segment.payload = next + 2;
    segment.length = length - 2;
    next += length;
    inScan = code == kStartOfScan;
    return true;
}
