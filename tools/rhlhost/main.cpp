// rhlhost: a stand-in for the host application. It loads a handler file at
// run time and drives it only through its seven exports.
//
//   rhlhost [--handler PATH] identify
//   rhlhost [--handler PATH] probe FILE...
//   rhlhost [--handler PATH] info FILE [--text]
//   rhlhost [--handler PATH] dump FILE OUT.raw [--window X0,Y0,X1,Y1]
//   rhlhost [--handler PATH] render FILE OUT.tif|OUT.png [--window X0,Y0,X1,Y1] [--no-overviews|--world-file]
//   rhlhost [--handler PATH] render [--jobs N] [--format tif|png] [--window X0,Y0,X1,Y1] [-v] -o OUTDIR FILE_OR_DIR...
//   rhlhost [--handler PATH] mosaic [--no-overviews] -o OUT.tif FILE_OR_DIR...
//   rhlhost [--handler PATH] mosaic [--no-overviews] -o OUT.tif --toc A.TOC --product N
//   rhlhost toc A.TOC
//   rhlhost [--handler PATH] --version
#include "Batch.h"
#include "CommandLine.h"
#include "Drawing.h"
#include "ExitCodes.h"
#include "HandlerLibrary.h"
#include "Info.h"
#include "Mosaic.h"
#include "PlatformFiles.h"
#include "Render.h"
#include "TableOfContents.h"

#include <cstdio>
#include <cstring>
#include <filesystem>
#include <string>
#include <vector>

using namespace host;

namespace {

constexpr const char* kUsage =
    "usage: rhlhost [--handler PATH] COMMAND\n"
    "  identify\n"
    "  probe FILE...\n"
    "  info FILE [--text]\n"
    "  dump FILE OUT.raw [--window X0,Y0,X1,Y1]\n"
    "  render FILE OUT.tif|OUT.png [--window X0,Y0,X1,Y1] [--no-overviews|--world-file]\n"
    "  render [--jobs N] [--format tif|png] [--window X0,Y0,X1,Y1] [--no-overviews|--world-file] [-v] -o OUTDIR FILE_OR_DIR...\n"
    "  mosaic [--no-overviews] -o OUT.tif FILE_OR_DIR...\n"
    "  mosaic [--no-overviews] -o OUT.tif --toc A.TOC --product N\n"
    "  toc A.TOC\n"
    "  --version | --help";

// The handler beside this executable's own file, wherever it was started
// from: never one that happens to lie in the working directory.
std::string DefaultHandlerPath(const char* argv0)
{
    const std::string self = ExecutablePath(argv0);
    const size_t slash = self.find_last_of("/\\");   // Windows paths use backslashes
    return slash == std::string::npos ? std::string() : self.substr(0, slash + 1) + VX_DEFAULT_HANDLER;
}

std::string JsonString(const char* text)
{
    std::string quoted = "\"";
    for (const char* c = text; *c != '\0'; ++c) {
        if (*c == '"' || *c == '\\')
            quoted += '\\';
        quoted += *c;
    }
    return quoted + "\"";
}

struct Identity {
    uint16_t version = 0;
    std::string name, description;
    std::vector<std::string> extensions;
};

Identity ReadIdentity(const Exports& rh)
{
    alignas(8) char record[kIdentitySize] = {};
    rh.identify(record);
    Identity identity;
    uint16_t extensionCount;
    std::memcpy(&identity.version, record, 2);
    std::memcpy(&extensionCount, record + 1026, 2);
    for (uint16_t i = 0; i < extensionCount && i < 100; ++i)
        identity.extensions.push_back(std::string(record + 1028 + 10 * i, strnlen(record + 1028 + 10 * i, 10)));
    record[2 + 511] = record[514 + 511] = '\0';
    identity.name = record + 2;
    identity.description = record + 514;
    return identity;
}

int Identify(const Exports& rh)
{
    const Identity identity = ReadIdentity(rh);
    std::string extensions;
    for (const std::string& extension : identity.extensions)
        extensions += (extensions.empty() ? "" : ", ") + JsonString(extension.c_str());
    std::printf("{\"version\": %u, \"name\": %s, \"description\": %s, \"extensions\": [%s]}\n", identity.version,
                JsonString(identity.name.c_str()).c_str(), JsonString(identity.description.c_str()).c_str(),
                extensions.c_str());
    return kExitOk;
}

int Version(const Exports& rh, const std::string& handlerPath)
{
    const Identity identity = ReadIdentity(rh);
    std::printf("rhlhost %s\nhandler %s version %u, %s (%s)\n", VX_VERSION, identity.name.c_str(), identity.version,
                identity.description.c_str(), handlerPath.c_str());
    return kExitOk;
}

int Toc(const std::string& path)
{
    TableOfContents toc;
    std::string message;
    if (!ReadTableOfContents(path, toc, message))
        return Fail(kExitRefused, path + ": " + message);
    PrintTableOfContents(path, toc);
    return kExitOk;
}

// A named input that is not there: reported, exit code 1.
bool Missing(const std::string& path)
{
    std::error_code error;
    if (std::filesystem::exists(path, error))
        return false;
    Fail(kExitRefused, path + ": no such file");
    return true;
}

// A file that is not there is answered 0 like any other, and is an error.
int Probe(const Exports& rh, const std::vector<std::string>& files)
{
    int exitCode = kExitOk;
    for (const std::string& file : files) {
        std::printf("%d %s\n", rh.isFormat(file.c_str()), file.c_str());
        std::error_code error;
        if (!std::filesystem::exists(file, error))
            exitCode = Fail(kExitRefused, file + ": no such file");
    }
    return exitCode;
}

int Info(const Exports& rh, const std::string& path, bool asText)
{
    OpenFile file(rh, path);
    if (asText)
        PrintInfoText(path, file.image);
    else
        PrintInfoJson(file.image);
    return file.Ready() ? kExitOk : kExitRefused;
}

int RenderOne(const Exports& rh, const std::string& input, const std::string& output, OutputFormat format,
              const RenderOptions& options)
{
    RenderOutcome outcome = RenderFile(rh, input, output, format, options);
    if (!outcome.warning.empty())
        std::fprintf(stderr, "rhlhost: %s: %s\n", input.c_str(), outcome.warning.c_str());
    if (outcome.status == RenderStatus::Refused)
        return Fail(kExitRefused, input + ": " + outcome.message);
    if (outcome.status == RenderStatus::Failed)
        return Fail(kExitRefused, outcome.message);
    if (outcome.failedRows > 0)
        return Fail(kExitRowsFailed, input + ": " + std::to_string(outcome.failedRows) +
                                         " rows could not be decoded (written as zeros)");
    return kExitOk;
}

int Render(const Exports& rh, const CommandLine& line, bool raw)
{
    const RenderOptions options{line.window, line.overviews, line.worldFile};
    std::string message;
    if (!line.output.empty() && !raw) {
        if (!OptionsFitFormat(line.format == "png" ? OutputFormat::Png : OutputFormat::GeoTiff, options, message))
            return Fail(kExitUsage, message);
        return RunBatch(rh, BatchOptionsFrom(line));
    }
    if (line.positional.size() != 2)
        return Fail(kExitUsage, kUsage);
    OutputFormat format = OutputFormat::Raw;
    if (!FormatFromName(line.positional[1], format) || (format == OutputFormat::Raw) != raw)
        return Fail(kExitUsage, raw ? "dump writes .raw files" : "render writes .tif, .tiff or .png files");
    if (!OptionsFitFormat(format, options, message))
        return Fail(kExitUsage, message);
    if (Missing(line.positional[0]))
        return kExitRefused;
    return RenderOne(rh, line.positional[0], line.positional[1], format, options);
}

int Run(const Exports& rh, const std::string& command, const CommandLine& line)
{
    const std::vector<std::string>& args = line.positional;
    if (command == "identify" && args.empty())
        return Identify(rh);
    if (command == "probe" && !args.empty())
        return Probe(rh, args);
    if (command == "info" && args.size() == 1)
        return Missing(args[0]) ? kExitRefused : Info(rh, args[0], line.text);
    if (command == "dump" || command == "render")
        return Render(rh, line, command == "dump");
    const bool fromToc = !line.toc.empty();
    if (command == "mosaic" && !line.output.empty() && (fromToc ? args.empty() && line.product > 0 : !args.empty())) {
        OutputFormat format = OutputFormat::Raw;
        if (!FormatFromName(line.output, format) || format != OutputFormat::GeoTiff)
            return Fail(kExitUsage, "mosaic writes .tif or .tiff files");
        if (fromToc)
            return Missing(line.toc) ? kExitRefused
                                     : RunTocMosaic(rh, line.toc, line.product, line.output, line.overviews);
        return RunMosaic(rh, args, line.output, line.overviews);
    }
    return Fail(kExitUsage, kUsage);
}

bool IsCommand(const std::string& word)
{
    for (const char* command : {"identify", "probe", "info", "dump", "render", "mosaic", "toc", "--version"})
        if (word == command)
            return true;
    return false;
}

} // namespace

int main(int argc, char** argv)
{
    std::string handlerPath = DefaultHandlerPath(argv[0]);
    int next = 1;
    if (next + 1 < argc && std::strcmp(argv[next], "--handler") == 0) {
        handlerPath = argv[next + 1];
        next += 2;
    }
    if (next >= argc)
        return Fail(kExitUsage, kUsage);
    const std::string command = argv[next++];
    if (command == "help" || command == "--help" || command == "-h") {
        std::printf("%s\n", kUsage);
        return kExitOk;
    }
    if (!IsCommand(command))
        return Fail(kExitUsage, "unknown command " + command + "\n" + kUsage);
    CommandLine line;
    std::string message;
    if (!ParseCommandLine(command, std::vector<std::string>(argv + next, argv + argc), line, message))
        return Fail(kExitUsage, message);

    if (command == "toc") // read here, without the handler
        return line.positional.size() == 1 ? Toc(line.positional[0]) : Fail(kExitUsage, kUsage);

    Exports rh{};
    if (handlerPath.empty())
        return Fail(kExitUsage, "cannot tell where this program lies: give --handler PATH");
    if (!LoadHandler(handlerPath, rh, message))
        return Fail(kExitUsage, message);
    if (command == "--version")
        return line.positional.empty() ? Version(rh, handlerPath) : Fail(kExitUsage, kUsage);
    return Run(rh, command, line);
}
