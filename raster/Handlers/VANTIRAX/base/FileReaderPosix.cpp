// File calls over POSIX descriptors.
#include "base/FileCalls.h"

#include "base/FileReader.h"

#include <cerrno>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

namespace filecalls {

uint32_t Open(const char* path, uint32_t /*shareMode*/)
{
    int descriptor = ::open(path, O_RDONLY | O_CLOEXEC);
    // Handle 0 means "no file" to every caller, so a descriptor 0 is moved.
    if (descriptor == 0) {
        int moved = ::fcntl(descriptor, F_DUPFD_CLOEXEC, 1);
        ::close(descriptor);
        descriptor = moved;
    }
    return descriptor < 0 ? kNoFile : static_cast<uint32_t>(descriptor);
}

uint32_t Read(uint32_t handle, void* buffer, uint32_t count)
{
    auto* target = static_cast<char*>(buffer);
    uint32_t done = 0;
    while (done < count) {
        ssize_t got = ::read(static_cast<int>(handle), target + done, count - done);
        if (got < 0 && errno == EINTR)
            continue;
        if (got <= 0)
            break;
        done += static_cast<uint32_t>(got);
    }
    return done;
}

SeekOutcome Seek(uint32_t handle, int64_t offset, int origin)
{
    static_assert(sizeof(off_t) == sizeof(int64_t), "file offsets must be 64-bit");
    int whence = origin == kSeekCurrent ? SEEK_CUR : origin == kSeekEnd ? SEEK_END : SEEK_SET;
    off_t reached = ::lseek(static_cast<int>(handle), static_cast<off_t>(offset), whence);
    if (reached < 0)
        return {true, false, 0};
    return {false, false, static_cast<uint64_t>(reached)};
}

void Close(uint32_t handle)
{
    ::close(static_cast<int>(handle));
}

uint64_t Size(uint32_t handle)
{
    struct stat info {};
    if (::fstat(static_cast<int>(handle), &info) != 0 || info.st_size < 0)
        return 0;
    return static_cast<uint64_t>(info.st_size);
}

bool ReadAt(uint32_t handle, uint64_t offset, void* buffer, uint32_t count)
{
    auto* target = static_cast<char*>(buffer);
    uint32_t done = 0;
    while (done < count) {
        ssize_t got = ::pread(static_cast<int>(handle), target + done, count - done, static_cast<off_t>(offset + done));
        if (got < 0 && errno == EINTR)
            continue;
        if (got <= 0)
            return false;
        done += static_cast<uint32_t>(got);
    }
    return true;
}

} // namespace filecalls
