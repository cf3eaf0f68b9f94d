#include "CommandLine.h"

#include <cstdio>

namespace host {
namespace {

constexpr unsigned kMaxJobs = 256;

bool ParseJobs(const std::string& text, unsigned& jobs)
{
    char tail = '\0';
    return std::sscanf(text.c_str(), "%u%c", &jobs, &tail) == 1 && jobs >= 1 && jobs <= kMaxJobs;
}

// Applies the option at args[i] and its value; false with a message.
bool ApplyOption(const std::vector<std::string>& args, size_t& i, CommandLine& line, std::string& message)
{
    const std::string& name = args[i];
    if (name == "--text") {
        line.text = true;
        return true;
    }
    if (i + 1 >= args.size()) {
        message = name + " needs a value";
        return false;
    }
    const std::string& value = args[++i];
    if (name == "--window" && ParseWindow(value.c_str(), line.window))
        return true;
    if (name == "--jobs" && ParseJobs(value, line.jobs))
        return true;
    if (name == "-o") {
        line.output = value;
        return true;
    }
    if (name == "--format" && (value == "tif" || value == "png")) {
        line.format = value;
        return true;
    }
    message = "bad option " + name + " " + value +
              " (--window X0,Y0,X1,Y1 with X1 > X0 and Y1 > Y0; --jobs 1 to 256; --format tif or png)";
    return false;
}

} // namespace

bool ParseCommandLine(const std::vector<std::string>& args, CommandLine& line, std::string& message)
{
    for (size_t i = 0; i < args.size(); ++i) {
        if (args[i].size() > 1 && args[i][0] == '-') {
            if (!ApplyOption(args, i, line, message))
                return false;
        } else {
            line.positional.push_back(args[i]);
        }
    }
    return true;
}

} // namespace host
