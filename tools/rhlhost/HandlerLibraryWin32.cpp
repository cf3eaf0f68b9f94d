#include "PlatformLibrary.h"

#include <windows.h>

namespace host {

void* OpenLibrary(const std::string& path, std::string& message)
{
    HMODULE library = LoadLibraryA(path.c_str());
    if (library == nullptr)
        message = "LoadLibraryA failed with error " + std::to_string(GetLastError());
    return reinterpret_cast<void*>(library);
}

void* FindExport(void* library, const char* name)
{
    return reinterpret_cast<void*>(GetProcAddress(static_cast<HMODULE>(library), name));
}

} // namespace host
