#include "plugin/FileReader.h"

#include <cerrno>
#include <cstring>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

CFileReader::~CFileReader()
{
    CloseFile();
}

void CFileReader::OpenFile(const char* filePath, uint32_t /*shareMode*/)
{
    if (HoldsFile()) {
        CloseFile();
        handle = 0;
        ResetState();
    }
    std::memset(path, 0, sizeof path);
    handle = kNoFile;
    if (filePath == nullptr || std::strlen(filePath) >= kReaderPathSize)
        return;
    int descriptor = ::open(filePath, O_RDONLY | O_CLOEXEC);
    // Handle 0 means "no file" to every caller, so a descriptor 0 is moved.
    if (descriptor == 0) {
        int moved = ::fcntl(descriptor, F_DUPFD_CLOEXEC, 1);
        ::close(descriptor);
        descriptor = moved;
    }
    if (descriptor < 0)
        return;
    handle = static_cast<uint32_t>(descriptor);
    std::memcpy(path, filePath, std::strlen(filePath) + 1);
}

void CFileReader::ReadBytes(void* buffer, uint32_t count)
{
    if (!HoldsFile() || error == kSeekFailed)
        return;
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
    if (done != count)
        endOfFile = 1;
    position += done;
}

void CFileReader::SeekTo(int32_t offset, int origin)
{
    if (!HoldsFile() || error == kSeekFailed)
        return;
    int whence = origin == kSeekCurrent ? SEEK_CUR : origin == kSeekEnd ? SEEK_END : SEEK_SET;
    off_t reached = ::lseek(static_cast<int>(handle), offset, whence);
    if (reached < 0 || reached > off_t(UINT32_MAX - 1)) {
        error = kSeekFailed;
        position = 0xFFFFFFFF;
        return;
    }
    position = static_cast<uint32_t>(reached);
}

void CFileReader::CloseFile()
{
    if (!HoldsFile())
        return;
    ::close(static_cast<int>(handle));
    handle = 0;
}

uint64_t CFileReader::FileSize() const
{
    struct stat info {};
    if (!HoldsFile() || ::fstat(static_cast<int>(handle), &info) != 0 || info.st_size < 0)
        return 0;
    return static_cast<uint64_t>(info.st_size);
}

void CFileReader::ResetState()
{
    error = 0;
    position = 0;
    endOfFile = 0;
}
