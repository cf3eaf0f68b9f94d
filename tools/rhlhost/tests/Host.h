// The stand-in host as a child process: its exit code, output and peak
// memory; what `rhlhost info` reports; the frames the tests place.
#pragma once

#include "tests/fixtures/RpfFrameWriter.h"

#include <array>
#include <set>
#include <string>
#include <vector>

struct ProcessResult {
    int exitCode = -1;
    std::string out, err;
    long peakKilobytes = 0; // the child's peak resident set (VmHWM)
};

ProcessResult RunProgram(const std::vector<std::string>& argv);
// rhlhost --handler VANTIRAX.rhl ARGS...
ProcessResult RunHost(const std::vector<std::string>& args);

struct HostInfo {
    uint32_t width = 0, height = 0;
    int epsg = 0;
    std::vector<std::array<double, 4>> points; // column, row, x, y
    std::vector<std::array<int, 3>> palette;
};
HostInfo ReadHostInfo(const std::string& path);

// Regular files below the directory, relative and sorted; files the host
// renames meanwhile are passed over.
std::vector<std::string> FilesBelow(const std::string& directory);

// A CADRG (or CIB) frame of the pattern image at these corners.
std::string FrameFile(const RpfCorners& corners = {}, RpfProduct product = RpfProduct::Cadrg,
                      const std::set<uint32_t>& maskedSubframes = {});
// A frame with only its first subframe stored: small, quick to write in bulk.
std::string SmallFrameFile(const RpfCorners& corners = {});
