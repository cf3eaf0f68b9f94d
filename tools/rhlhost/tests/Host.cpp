#include "Host.h"

#include "tests/fixtures/NitfFileWriter.h"
#include "tests/fixtures/TempFiles.h"

#include <fcntl.h>
#include <filesystem>
#include <fstream>
#include <regex>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

ProcessResult RunProgram(const std::vector<std::string>& argv)
{
    TempFile out(".out"), err(".err");
    posix_spawn_file_actions_t actions;
    posix_spawn_file_actions_init(&actions);
    posix_spawn_file_actions_addopen(&actions, 1, out.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0644);
    posix_spawn_file_actions_addopen(&actions, 2, err.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0644);
    std::vector<char*> args;
    for (const std::string& arg : argv)
        args.push_back(const_cast<char*>(arg.c_str()));
    args.push_back(nullptr);
    ProcessResult result;
    pid_t child = 0;
    const int spawned = posix_spawnp(&child, args[0], &actions, nullptr, args.data(), environ);
    posix_spawn_file_actions_destroy(&actions);
    // The child's own peak is the VmHWM of its image, read while it runs: the
    // kernel's account of a spawned child counts the spawning process's peak too.
    int status = 0;
    while (spawned == 0 && waitpid(child, &status, WNOHANG) == 0) {
        std::ifstream proc("/proc/" + std::to_string(child) + "/status");
        for (std::string line; std::getline(proc, line);)
            if (line.rfind("VmHWM:", 0) == 0)
                result.peakKilobytes = std::max(result.peakKilobytes, std::stol(line.substr(6)));
        usleep(1000);
    }
    if (spawned != 0)
        return result;
    result.exitCode = WIFEXITED(status) ? WEXITSTATUS(status) : -1;
    result.out = ReadWholeFile(out.path());
    result.err = ReadWholeFile(err.path());
    return result;
}

ProcessResult RunHost(const std::vector<std::string>& args)
{
    std::vector<std::string> argv = {VX_HOST_PATH, "--handler", VX_HANDLER_PATH};
    argv.insert(argv.end(), args.begin(), args.end());
    return RunProgram(argv);
}

HostInfo ReadHostInfo(const std::string& path)
{
    HostInfo info;
    const std::string json = RunHost({"info", path}).out;
    const std::string n = "([-+0-9.eE]+)";
    const std::regex size("\"width\": (\\d+), \"height\": (\\d+)"), epsg("\"epsg\": (\\d+)"),
        point("\\[" + n + ", " + n + ", " + n + ", " + n + "\\]"), entry("\\[(\\d+), (\\d+), (\\d+)\\]");
    std::smatch m;
    if (std::regex_search(json, m, size)) {
        info.width = uint32_t(std::stoul(m[1]));
        info.height = uint32_t(std::stoul(m[2]));
    }
    if (std::regex_search(json, m, epsg))
        info.epsg = std::stoi(m[1]);
    for (std::sregex_iterator it(json.begin(), json.end(), point), end; it != end; ++it)
        info.points.push_back({std::stod((*it)[1]), std::stod((*it)[2]), std::stod((*it)[3]), std::stod((*it)[4])});
    const std::string palette = json.substr(0, json.find("\"georef\""));
    for (std::sregex_iterator it(palette.begin(), palette.end(), entry), end; it != end; ++it)
        info.palette.push_back({std::stoi((*it)[1]), std::stoi((*it)[2]), std::stoi((*it)[3])});
    return info;
}

std::vector<std::string> FilesBelow(const std::string& directory)
{
    namespace fs = std::filesystem;
    std::vector<std::string> files;
    std::error_code error, typeError;
    for (fs::recursive_directory_iterator it(directory, error), end; !error && it != end; it.increment(error))
        if (it->is_regular_file(typeError))
            files.push_back(fs::relative(it->path(), directory).string());
    std::sort(files.begin(), files.end());
    return files;
}

std::string FrameFile(const RpfCorners& corners, RpfProduct product, const std::set<uint32_t>& masked)
{
    RpfFramePlan plan;
    plan.product = product;
    plan.indexImage = PatternIndexImage();
    plan.corners = corners;
    plan.maskedSubframes = masked;
    return BuildRpfFrame(plan).bytes;
}

std::string SmallFrameFile(const RpfCorners& corners)
{
    std::set<uint32_t> masked;
    for (uint32_t subframe = 1; subframe < kRpfSubframeCount; ++subframe)
        masked.insert(subframe);
    return FrameFile(corners, RpfProduct::Cadrg, masked);
}
