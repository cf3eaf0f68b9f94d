// The readers take paths, so every target hands its input on under one path per process: published in memory in the
// fuzzing build (VX_FILE_CALLS memory), written to a file in the replay programs of the other builds.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>

// The path of the process's input; a file is created on first use and removed at exit.
const std::string& FuzzFilePath();
// Replaces the input's content; false when it cannot be written.
bool WriteFuzzFile(const uint8_t* data, size_t size);

// Sets a NITF header's FL field (at offset 342, or 382 in NITF 2.0 with a downgrade event) to the input's size, so
// that mutations which change the size still reach the parsers behind the length check.
void DeclareInputLength(uint8_t* data, size_t size);

// Little-endian numbers from the control prefix some targets read before their payload.
inline uint32_t PrefixNumber(const uint8_t* bytes, unsigned width)
{
    uint32_t value = 0;
    for (unsigned i = width; i-- > 0;)
        value = (value << 8) | bytes[i];
    return value;
}
