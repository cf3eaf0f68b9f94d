// The one way a section, subheader, table, block or stream is read from a
// file: count bytes at an absolute offset, made only when they lie within
// the file and within the offsets the reader can seek to.
#pragma once

#include "base/CheckedMath.h"
#include "base/FileReader.h"
#include "base/Limits.h"

#include <cstdint>

// The bytes of a file of fileSize bytes that reads can reach.
constexpr uint64_t ReachableBytes(uint64_t fileSize)
{
    return fileSize < kLargestReaderOffset ? fileSize : kLargestReaderOffset;
}

// True when count bytes at offset lie within the reachable bytes of the file.
constexpr bool Readable(uint64_t offset, uint64_t count, uint64_t fileSize)
{
    return SpanWithin(offset, count, ReachableBytes(fileSize));
}

// Reads count bytes at offset into buffer from a file of fileSize bytes (its
// size when the caller measured it). False when they are not Readable or the
// reader holds no file: the reader is not touched then, its position, error
// and end-of-file flag stay as they were. False also when the read reaches
// the file and does not deliver every byte (a failed seek, a short read),
// which the reader's sticky flags record as for any of its reads.
bool CheckedRead(CFileReader& reader, uint64_t fileSize, uint64_t offset, void* buffer, uint64_t count);

// Consecutive fields from a position on, each read through CheckedRead: a
// field that would run past the reachable bytes is refused before anything
// is read, so every length and count read from the file can be checked
// against the bytes that are really there before anything is sized by it.
class FileCursor {
public:
    FileCursor(CFileReader& reader, uint64_t fileSize) : reader(reader), reach(ReachableBytes(fileSize)) {}

    // Moves to an absolute offset; false (not moved) past the reachable bytes.
    bool SeekTo(uint64_t offset);
    bool Skip(uint64_t count) { return count <= Remaining() && SeekTo(position + count); }
    // Reads count bytes and moves past them; false when they are not all there.
    bool Read(void* target, uint64_t count);
    // A decimal text field of width characters (at most 15).
    bool Number(unsigned width, int32_t& value);
    bool Number(unsigned width, int64_t& value);
    // A most-significant-byte-first binary number of 2 or 4 bytes.
    bool Binary(unsigned width, uint32_t& value);

    uint64_t Position() const { return position; }
    uint64_t Remaining() const { return position < reach ? reach - position : 0; }

private:
    CFileReader& reader;
    uint64_t reach;
    uint64_t position = 0;
};
