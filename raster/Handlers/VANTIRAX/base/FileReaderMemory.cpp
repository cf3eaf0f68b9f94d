// File calls over byte ranges published in memory (MemoryFiles.h). A handle
// is a slot number plus one, so 0 and kNoFile never name a file.
#include "base/FileCalls.h"
#include "base/MemoryFiles.h"

#include "base/FileReader.h"

#include <algorithm>
#include <cstring>
#include <map>
#include <mutex>
#include <string>
#include <vector>

namespace {

struct Contents {
    const uint8_t* data = nullptr;
    size_t size = 0;
};

struct OpenFile {
    Contents contents;
    uint64_t position = 0;
    bool open = false;
};

std::mutex registryLock;
std::map<std::string, Contents> published;
std::vector<OpenFile> slots;

OpenFile* Slot(uint32_t handle)
{
    if (handle == 0 || handle > slots.size() || !slots[handle - 1].open)
        return nullptr;
    return &slots[handle - 1];
}

} // namespace

void memoryfiles::Publish(const char* path, const uint8_t* data, size_t size)
{
    std::lock_guard<std::mutex> hold(registryLock);
    published[path] = Contents{data, size};
}

namespace filecalls {

uint32_t Open(const char* path, uint32_t /*shareMode*/)
{
    std::lock_guard<std::mutex> hold(registryLock);
    auto found = published.find(path);
    if (found == published.end())
        return kNoFile;
    auto freeSlot = std::find_if(slots.begin(), slots.end(), [](const OpenFile& file) { return !file.open; });
    if (freeSlot == slots.end())
        freeSlot = slots.insert(slots.end(), OpenFile{});
    *freeSlot = OpenFile{found->second, 0, true};
    return static_cast<uint32_t>(freeSlot - slots.begin()) + 1;
}

uint32_t Read(uint32_t handle, void* buffer, uint32_t count)
{
    std::lock_guard<std::mutex> hold(registryLock);
    OpenFile* file = Slot(handle);
    if (file == nullptr || count == 0 || file->position >= file->contents.size)
        return 0;
    uint32_t got = static_cast<uint32_t>(std::min<uint64_t>(count, file->contents.size - file->position));
    std::memcpy(buffer, file->contents.data + file->position, got);
    file->position += got;
    return got;
}

SeekOutcome Seek(uint32_t handle, int64_t offset, int origin)
{
    std::lock_guard<std::mutex> hold(registryLock);
    OpenFile* file = Slot(handle);
    if (file == nullptr)
        return {true, false, 0};
    int64_t base = origin == kSeekCurrent ? int64_t(file->position)
                   : origin == kSeekEnd   ? int64_t(file->contents.size)
                                          : 0;
    int64_t reached = 0;
    if (__builtin_add_overflow(base, offset, &reached) || reached < 0)
        return {true, false, 0};
    file->position = uint64_t(reached);
    return {false, false, file->position};
}

void Close(uint32_t handle)
{
    std::lock_guard<std::mutex> hold(registryLock);
    if (OpenFile* file = Slot(handle))
        file->open = false;
}

uint64_t Size(uint32_t handle)
{
    std::lock_guard<std::mutex> hold(registryLock);
    OpenFile* file = Slot(handle);
    return file == nullptr ? 0 : file->contents.size;
}

bool ReadAt(uint32_t handle, uint64_t offset, void* buffer, uint32_t count)
{
    std::lock_guard<std::mutex> hold(registryLock);
    OpenFile* file = Slot(handle);
    if (file == nullptr || offset > file->contents.size || count > file->contents.size - offset)
        return false;
    if (count == 0)
        return true;
    std::memcpy(buffer, file->contents.data + offset, count);
    return true;
}

} // namespace filecalls
