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

#ifdef VX_MEMORY_FILES

// The fuzzing build reads through in-memory file calls: the input is
// published under a fixed name instead of being written to a file.
std::vector<uint8_t> publishedInput;

} // namespace

const std::string& FuzzFilePath()
{
    static const std::string path = "fuzz-input";
    return path;
}

bool WriteFuzzFile(const uint8_t* data, size_t size)
{
    publishedInput.assign(data, data + size);
    memoryfiles::Publish(FuzzFilePath().c_str(), publishedInput.data(), publishedInput.size());
    return true;
}

#else

std::string CreateFuzzFile()
{
    const char* directory = std::getenv("TMPDIR");
    std::string pattern = std::string(directory != nullptr ? directory : "/tmp") + "/vx_fuzz_XXXXXX";
    const int descriptor = mkstemp(pattern.data());
    if (descriptor < 0)
        std::abort();
    close(descriptor);
    return pattern;
}

struct FuzzFile {
    std::string path = CreateFuzzFile();
    ~FuzzFile() { unlink(path.c_str()); }
};

} // namespace

const std::string& FuzzFilePath()
{
    static const FuzzFile file;
    return file.path;
}

bool WriteFuzzFile(const uint8_t* data, size_t size)
{
    FILE* stream = std::fopen(FuzzFilePath().c_str(), "wb");
    if (stream == nullptr)
        return false;
    const bool written = std::fwrite(data, 1, size, stream) == size;
    return std::fclose(stream) == 0 && written;
}

#endif

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
