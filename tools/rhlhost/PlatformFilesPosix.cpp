#include "PlatformFiles.h"

#include <cstdio>

namespace host {

bool MoveReplacing(const std::string& from, const std::string& to)
{
    return std::rename(from.c_str(), to.c_str()) == 0;
}

} // namespace host
