#include "CommandLine.h"

#include <cstdio>
#include <set>

namespace host {
namespace {

constexpr unsigned kMaxJobs = 256;
constexpr unsigned kMaxProduct = 65535; // boundary rectangles are counted in two bytes

bool ParseCount(const std::string& text, unsigned& count, unsigned most)
{
    char tail = '\0';
    return std::sscanf(text.c_str(), "%u%c", &count, &tail) == 1 && count >= 1 && count <= most;
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
    if (name == "-v" || name == "--verbose") {
        line.verbose = true;
        return true;
    }
    if (i + 1 >= args.size()) {
        message = name + " needs a value";
        return false;
    }
    const std::string& value = args[++i];
    if (name == "--window" && ParseWindow(value.c_str(), line.window))
        return true;
    if (name == "--jobs" && ParseCount(value, line.jobs, kMaxJobs))
        return true;
    if (name == "--product" && ParseCount(value, line.product, kMaxProduct))
        return true;
    if (name == "-o" || name == "--toc") {
        (name == "-o" ? line.output : line.toc) = value;
        return true;
    }
    if (name == "--format" && (value == "tif" || value == "png")) {
        line.format = value;
        return true;
    }
    message = "bad option " + name + " " + value +
              " (--window X0,Y0,X1,Y1 with X1 > X0 and Y1 > Y0; --jobs 1 to 256; --format tif or png; --product 1 to 65535)";
    return false;
}

// Which options each command takes; render takes --jobs and --format only
// with -o, as a batch; mosaic takes --product only with --toc.
bool Applies(const std::string& command, const std::string& option, bool batch, bool toc)
{
    if (command == "info")
        return option == "--text";
    if (command == "dump")
        return option == "--window";
    if (command == "render")
        return option == "--window" || option == "-o" || option == "--no-overviews" || option == "--world-file" ||
               (batch && (option == "--jobs" || option == "--format" || option == "-v" || option == "--verbose"));
    if (command == "mosaic")
        return option == "-o" || option == "--no-overviews" || option == "--toc" || (toc && option == "--product");
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
        if (!Applies(command, option, given.count("-o") != 0, given.count("--toc") != 0)) {
            message = option + " does not apply to " + command +
                      (command == "render" ? " without -o" : command == "mosaic" ? " without --toc" : "");
            return false;
        }
    return true;
}

} // namespace host
