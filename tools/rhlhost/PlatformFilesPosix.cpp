#include "PlatformFiles.h"

#include <climits>
#include <cstdio>
#include <cstring>
#include <unistd.h>

namespace host {

bool MoveReplacing(const std::string& from, const std::string& to)
{
    return std::rename(from.c_str(), to.c_str()) == 0;
}

std::string ExecutablePath(const char* argv0)
{
    char path[PATH_MAX];
    const ssize_t length = ::readlink("/proc/self/exe", path, sizeof path);
    if (length > 0 && size_t(length) < sizeof path)
        return std::string(path, size_t(length));
    return std::strchr(argv0, '/') != nullptr ? argv0 : "";
}

} // namespace host
