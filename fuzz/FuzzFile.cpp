#include "FuzzFile.h"

#ifdef VX_MEMORY_FILES
#include "base/MemoryFiles.h"
#endif

#include <algorithm>
#include <cctype>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <unistd.h>
#include <vector>

// The fuzzing build reads through in-memory file calls: the input is published under a fixed name; the other builds
// write it to a file removed at exit.
const std::string& FuzzFilePath()
{
#ifdef VX_MEMORY_FILES
    static const std::string path = "fuzz-input";
    return path;
#else
    static const struct File {
        std::string path = std::string(std::getenv("TMPDIR") ? std::getenv("TMPDIR") : "/tmp") + "/vx_fuzz_XXXXXX";
        File()
        {
            if (close(mkstemp(path.data())) != 0) // as when mkstemp fails: close(-1)
                std::abort();
        }
        ~File() { unlink(path.c_str()); }
    } file;
    return file.path;
#endif
}

bool WriteFuzzFile(const uint8_t* data, size_t size)
{
#ifdef VX_MEMORY_FILES
    static std::vector<uint8_t> published;
    published.assign(data, data + size);
    memoryfiles::Publish(FuzzFilePath().c_str(), published.data(), published.size());
    return true;
#else
    FILE* stream = std::fopen(FuzzFilePath().c_str(), "wb");
    const bool written = stream != nullptr && std::fwrite(data, 1, size, stream) == size;
    return stream != nullptr && std::fclose(stream) == 0 && written;
#endif
}

void DeclareInputLength(uint8_t* data, size_t size)
{
    constexpr size_t kFileLengthOffsets[] = {342, 382}, kFileLengthWidth = 12;
    for (size_t offset : kFileLengthOffsets) // the first FL field of 12 digits, its value taken modulo 10^12
        if (size >= 4 && std::memcmp(data, "NITF", 4) == 0 && offset + kFileLengthWidth <= size &&
            std::all_of(data + offset, data + offset + kFileLengthWidth, [](uint8_t c) { return std::isdigit(c); })) {
            for (size_t i = kFileLengthWidth, value = size; i-- > 0; value /= 10)
                data[offset + i] = static_cast<uint8_t>('0' + value % 10);
            return;
        }
}
