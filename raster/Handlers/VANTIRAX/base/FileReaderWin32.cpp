// File calls over the Win32 file functions (CreateFileA, ReadFile,
// SetFilePointerEx, CloseHandle), with 64-bit positions throughout.
#include "base/FileCalls.h"

#include "base/FileReader.h"

#include <windows.h>

namespace filecalls {
namespace {

// A handle is a kernel handle cut to 32 bits; kernel handles are defined to
// survive that, and sign extension brings back the full value.
HANDLE KernelHandle(uint32_t handle)
{
    return reinterpret_cast<HANDLE>(static_cast<intptr_t>(static_cast<int32_t>(handle)));
}

} // namespace

uint32_t Open(const char* path, uint32_t shareMode)
{
    const DWORD sharing = shareMode == kShareDenyWrite ? FILE_SHARE_READ : FILE_SHARE_READ | FILE_SHARE_WRITE;
    HANDLE file = CreateFileA(path, GENERIC_READ, sharing, nullptr, OPEN_EXISTING, FILE_ATTRIBUTE_NORMAL, nullptr);
    if (file == INVALID_HANDLE_VALUE)
        return kNoFile;
    return static_cast<uint32_t>(reinterpret_cast<uintptr_t>(file));
}

uint32_t Read(uint32_t handle, void* buffer, uint32_t count)
{
    auto* target = static_cast<char*>(buffer);
    uint32_t done = 0;
    while (done < count) {
        DWORD got = 0;
        if (!ReadFile(KernelHandle(handle), target + done, count - done, &got, nullptr) || got == 0)
            break;
        done += got;
    }
    return done;
}

SeekOutcome Seek(uint32_t handle, int64_t offset, int origin)
{
    const DWORD method = origin == kSeekCurrent ? FILE_CURRENT : origin == kSeekEnd ? FILE_END : FILE_BEGIN;
    LARGE_INTEGER distance {};
    distance.QuadPart = offset;
    LARGE_INTEGER reached {};
    if (!SetFilePointerEx(KernelHandle(handle), distance, &reached, method))
        return {true, GetLastError() == ERROR_HANDLE_EOF, 0};
    return {false, false, static_cast<uint64_t>(reached.QuadPart)};
}

void Close(uint32_t handle)
{
    CloseHandle(KernelHandle(handle));
}

uint64_t Size(uint32_t handle)
{
    DWORD high = 0;
    DWORD low = GetFileSize(KernelHandle(handle), &high);
    if (low == INVALID_FILE_SIZE && GetLastError() != NO_ERROR)
        return 0;
    return (uint64_t(high) << 32) | low;
}

// A read at an offset moves the file pointer on Windows; it is put back so
// that the reader's own reads carry on where they were, as after pread.
bool ReadAt(uint32_t handle, uint64_t offset, void* buffer, uint32_t count)
{
    HANDLE file = KernelHandle(handle);
    LARGE_INTEGER here {};
    LARGE_INTEGER zero {};
    if (!SetFilePointerEx(file, zero, &here, FILE_CURRENT))
        return false;
    OVERLAPPED at {};
    at.Offset = static_cast<DWORD>(offset);
    at.OffsetHigh = static_cast<DWORD>(offset >> 32);
    DWORD got = 0;
    bool read = ReadFile(file, buffer, count, &got, &at) && got == count;
    SetFilePointerEx(file, here, nullptr, FILE_BEGIN);
    return read;
}

} // namespace filecalls
