#include "PlatformLibrary.h"

#include <dlfcn.h>

namespace host {

void* OpenLibrary(const std::string& path, std::string& message)
{
    void* library = dlopen(path.c_str(), RTLD_NOW | RTLD_LOCAL);
    if (library == nullptr) {
        const char* reason = dlerror();
        message = reason ? reason : "unknown error";
    }
    return library;
}

void* FindExport(void* library, const char* name)
{
    return dlsym(library, name);
}

} // namespace host
