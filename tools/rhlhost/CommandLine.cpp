#include "CommandLine.h"

#include <cstdio>
#include <set>

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
    if (name == "--no-overviews") {
        line.overviews = false;
        return true;
    }
    if (name == "--world-file") {
        line.worldFile = true;
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

// Which options each command takes; render takes --jobs and --format only
// with -o, as a batch.
bool Applies(const std::string& command, const std::string& option, bool batch)
{
    if (command == "info")
        return option == "--text";
    if (command == "dump")
        return option == "--window";
    if (command == "render")
        return option == "--window" || option == "-o" || option == "--no-overviews" || option == "--world-file" ||
               (batch && (option == "--jobs" || option == "--format"));
    if (command == "mosaic")
        return option == "-o" || option == "--no-overviews";
    return false;
}

} // namespace

bool ParseCommandLine(const std::string& command, const std::vector<std::string>& args, CommandLine& line,
                      std::string& message)
{
    std::vector<std::string> words;
    for (const std::string& arg : args) {
        const size_t equals = arg.find('=');
        if (arg.rfind("--", 0) == 0 && equals != std::string::npos) {
            words.push_back(arg.substr(0, equals));
            words.push_back(arg.substr(equals + 1));
        } else {
            words.push_back(arg);
        }
    }
    std::set<std::string> given;
    for (size_t i = 0; i < words.size(); ++i) {
        if (words[i].size() > 1 && words[i][0] == '-') {
            if (!given.insert(words[i]).second) {
                message = words[i] + " is given twice";
                return false;
            }
            if (!ApplyOption(words, i, line, message))
                return false;
        } else {
            line.positional.push_back(words[i]);
        }
    }
    for (const std::string& option : given)
        if (!Applies(command, option, given.count("-o") != 0)) {
            message = option + " does not apply to " + command + (command == "render" ? " without -o" : "");
            return false;
        }
    return true;
}

} // namespace host
