// The platform's way of loading a library at run time and finding its
// exports (HandlerLibraryPosix.cpp, HandlerLibraryWin32.cpp).
#pragma once

#include <string>

namespace host {

// The loaded library, or null with the reason in message.
void* OpenLibrary(const std::string& path, std::string& message);
// The address of an export, or null.
void* FindExport(void* library, const char* name);

} // namespace host
