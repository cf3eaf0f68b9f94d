#include "PlatformFiles.h"

#include <cerrno>
#include <cstring>
#include <windows.h>

namespace host {

// rename() on Windows refuses to replace an existing file.
bool MoveReplacing(const std::string& from, const std::string& to)
{
    if (MoveFileExA(from.c_str(), to.c_str(), MOVEFILE_REPLACE_EXISTING))
        return true;
    errno = GetLastError() == ERROR_ACCESS_DENIED ? EACCES : EIO;
    return false;
}

std::string ExecutablePath(const char* argv0)
{
    char path[MAX_PATH];
    const DWORD length = GetModuleFileNameA(nullptr, path, sizeof path);
    if (length > 0 && length < sizeof path)
        return std::string(path, length);
    return std::strpbrk(argv0, "/\\") != nullptr ? argv0 : "";
}

} // namespace host
