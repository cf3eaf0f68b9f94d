#include "FuzzFile.h"

#ifdef VX_MEMORY_FILES
#include "base/MemoryFiles.h"
#endif

#include <algorithm>
#include <cstdio>
#include <cstring>
#include <cstdlib>
#include <unistd.h>
#include <vector>

namespace {

constexpr size_t kFileLengthOffsets[] = {342, 382};
constexpr size_t kFileLengthWidth = 12;

bool AllDigits(const uint8_t* field, size_t width)
{
    return std::all_of(field, field + width, [](uint8_t c) { return c >= '0' && c <= '9'; });
}

} // namespace

// The fuzzing build reads through in-memory file calls: the input is
// published under a fixed name; the other builds write it to a file
// removed at exit.
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
            const int descriptor = mkstemp(path.data());
            if (descriptor < 0)
                std::abort();
            close(descriptor);
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
    if (stream == nullptr)
        return false;
    const bool written = std::fwrite(data, 1, size, stream) == size;
    return std::fclose(stream) == 0 && written;
#endif
}

void DeclareInputLength(uint8_t* data, size_t size)
{
    if (size < 4 || std::memcmp(data, "NITF", 4) != 0)
        return;
    for (size_t offset : kFileLengthOffsets) {
        if (offset + kFileLengthWidth > size || !AllDigits(data + offset, kFileLengthWidth))
            continue;
        size_t value = size;
        for (size_t i = kFileLengthWidth; i-- > 0; value /= 10)
            data[offset + i] = static_cast<uint8_t>('0' + value % 10);
        return;
    }
}
