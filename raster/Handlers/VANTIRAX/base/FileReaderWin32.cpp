// File calls over the Windows HFILE functions (_lopen, _lread, _llseek,
// _lclose).
#include "base/FileCalls.h"

#include "base/FileReader.h"

#include <windows.h>

namespace filecalls {
namespace {

// An HFILE is a kernel handle cut to 32 bits; kernel handles are defined to
// survive that, and sign extension brings back the full value.
HANDLE KernelHandle(uint32_t handle)
{
    return reinterpret_cast<HANDLE>(static_cast<intptr_t>(static_cast<int32_t>(handle)));
}

} // namespace

uint32_t Open(const char* path, uint32_t shareMode)
{
    HFILE file = _lopen(path, static_cast<int>(shareMode));
    return file == HFILE_ERROR ? kNoFile : static_cast<uint32_t>(file);
}

uint32_t Read(uint32_t handle, void* buffer, uint32_t count)
{
    UINT got = _lread(static_cast<HFILE>(handle), buffer, count);
    return got == static_cast<UINT>(HFILE_ERROR) ? 0 : got;
}

SeekOutcome Seek(uint32_t handle, int32_t offset, int origin)
{
    LONG reached = _llseek(static_cast<HFILE>(handle), offset, origin);
    if (reached == HFILE_ERROR)
        return {true, GetLastError() == ERROR_HANDLE_EOF, 0};
    return {false, false, static_cast<uint32_t>(reached)};
}

void Close(uint32_t handle)
{
    _lclose(static_cast<HFILE>(handle));
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
