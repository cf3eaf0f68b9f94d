// The platform's file calls beneath CFileReader, one source per platform
// (FileReaderPosix.cpp, FileReaderWin32.cpp). Handles are 32-bit values in
// which 0 and kNoFile never name a file.
#pragma once

#include <cstdint>

namespace filecalls {

// Opens path for reading; kNoFile when that fails.
uint32_t Open(const char* path, uint32_t shareMode);
// Reads up to count bytes; the result is the number read, 0 on failure.
uint32_t Read(uint32_t handle, void* buffer, uint32_t count);

struct SeekOutcome {
    bool failed;
    bool endOfFile;     // the failure was the system's end-of-file error
    uint64_t position;  // the new position when the seek succeeded
};
SeekOutcome Seek(uint32_t handle, int64_t offset, int origin);
void Close(uint32_t handle);
// The file's size in bytes, 0 when it cannot be learnt.
uint64_t Size(uint32_t handle);
// Reads count bytes at offset without going through the handle's position
// as CFileReader tracks it; false unless every byte was read.
bool ReadAt(uint32_t handle, uint64_t offset, void* buffer, uint32_t count);

} // namespace filecalls
