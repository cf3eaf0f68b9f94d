#include "PlatformFiles.h"

#include <cerrno>
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

} // namespace host
