// The options that follow a command, in any order among its file arguments.
#pragma once

#include "Drawing.h"

#include <string>
#include <vector>

namespace host {

struct CommandLine {
    std::vector<std::string> positional;
    Window window;               // --window X0,Y0,X1,Y1
    std::string output;          // -o PATH: the batch's output directory, or the mosaic file
    unsigned jobs = 1;           // --jobs N
    std::string format = "tif";  // --format tif|png
    bool text = false;           // --text
    std::string toc;             // --toc A.TOC: the mosaic's table of contents
    unsigned product = 0;        // --product N: its boundary rectangle, from 1
    bool overviews = true;       // --no-overviews clears it
    bool worldFile = false;      // --world-file
    bool verbose = false;        // -v, --verbose: a batch names every file it leaves out
};

// The options of command, each "--name value" or "--name=value". False with
// a message on an unknown option, a bad value, an option given twice or one
// that does not apply to the command.
bool ParseCommandLine(const std::string& command, const std::vector<std::string>& args, CommandLine& line,
                      std::string& message);

} // namespace host
