#include "ExitCodes.h"

#include <cstdio>

namespace host {

int Fail(int code, const std::string& message)
{
    std::fprintf(stderr, "rhlhost: %s\n", message.c_str());
    return code;
}

} // namespace host
