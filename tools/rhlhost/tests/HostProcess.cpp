#include "HostProcess.h"

#include "tests/fixtures/NitfFileWriter.h"
#include "tests/fixtures/TempFiles.h"

#include <fcntl.h>
#include <spawn.h>
#include <sys/resource.h>
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
    if (spawned != 0)
        return result;
    int status = 0;
    struct rusage usage {};
    wait4(child, &status, 0, &usage);
    result.exitCode = WIFEXITED(status) ? WEXITSTATUS(status) : -1;
    result.peakKilobytes = usage.ru_maxrss;
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
