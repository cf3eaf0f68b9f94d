// Runs the stand-in host (or any program) as a child process, its output
// captured and its peak memory measured.
#pragma once

#include <string>
#include <vector>

struct ProcessResult {
    int exitCode = -1;
    std::string out, err;
    long peakKilobytes = 0; // the child's peak resident set
};

ProcessResult RunProgram(const std::vector<std::string>& argv);
// rhlhost --handler VANTIRAX.rhl ARGS...
ProcessResult RunHost(const std::vector<std::string>& args);
