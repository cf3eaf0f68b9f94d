// Exit codes of rhlhost, and the one-line message that goes with a failure.
#pragma once

#include <string>

namespace host {

constexpr int kExitOk = 0;
constexpr int kExitRefused = 1;    // a file was refused or an output could not be written
constexpr int kExitUsage = 2;      // bad arguments, or the handler did not load
constexpr int kExitRowsFailed = 3; // rows that failed to decode were written as zeros

// Prints "rhlhost: MESSAGE" on stderr and returns code.
int Fail(int code, const std::string& message);

} // namespace host
