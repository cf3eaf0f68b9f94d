// File operations whose meaning differs between platforms
// (PlatformFilesPosix.cpp, PlatformFilesWin32.cpp).
#pragma once

#include <string>

namespace host {

// Moves from over to, replacing a file already there; false with errno set.
bool MoveReplacing(const std::string& from, const std::string& to);
// The file of the running executable, links resolved; argv0 when the system
// cannot say and argv0 names a path; empty otherwise.
std::string ExecutablePath(const char* argv0);

} // namespace host
