#include "OutputFile.h"

#include "PlatformFiles.h"

#include <atomic>
#include <cerrno>
#include <cstdio>
#include <cstring>
#include <unistd.h>

namespace host {
namespace {

std::atomic<unsigned> nextSerial{0};

} // namespace

OutputFile::OutputFile(std::string finalPath) : final_(std::move(finalPath))
{
    temporary_ = final_ + ".part-" + std::to_string(getpid()) + "-" + std::to_string(nextSerial++);
}

OutputFile::~OutputFile()
{
    if (!committed_)
        std::remove(temporary_.c_str());
}

bool OutputFile::Commit(std::string& message)
{
    if (!MoveReplacing(temporary_, final_)) {
        message = CannotWrite(final_);
        return false;
    }
    committed_ = true;
    return true;
}

std::string CannotWrite(const std::string& path)
{
    return "cannot write " + path + ": " + std::strerror(errno);
}

} // namespace host
