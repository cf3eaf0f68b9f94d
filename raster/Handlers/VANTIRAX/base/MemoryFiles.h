// Files held in memory, for the fuzzing build: its file calls
// (FileReaderMemory.cpp) open the bytes published under a path instead of
// the file system, so a fuzz input reaches the readers without a write.
#pragma once

#include <cstddef>
#include <cstdint>

namespace memoryfiles {

// Makes size bytes at data readable under path until the next Publish of
// that path; the bytes are not copied and must outlive every read of them.
void Publish(const char* path, const uint8_t* data, size_t size);

} // namespace memoryfiles
