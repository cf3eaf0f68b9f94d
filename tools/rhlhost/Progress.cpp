#include "Progress.h"

#include <cstdio>
#include <unistd.h>

namespace host {
namespace {

constexpr auto kRedrawInterval = std::chrono::milliseconds(100);
constexpr size_t kBarWidth = 30;
constexpr int kSecondsPerMinute = 60;

std::string Bar(size_t done, size_t total)
{
    const size_t filled = total == 0 ? kBarWidth : done * kBarWidth / total;
    return "[" + std::string(filled, '#') + std::string(kBarWidth - filled, '-') + "]";
}

} // namespace

Progress::Progress(size_t total)
    : total_(total), visible_(isatty(STDERR_FILENO) != 0), start_(Clock::now()), lastDraw_(start_)
{
}

void Progress::Advance()
{
    std::lock_guard<std::mutex> lock(mutex_);
    ++done_;
    const Clock::time_point now = Clock::now();
    if (now - lastDraw_ >= kRedrawInterval || done_ == total_) {
        lastDraw_ = now;
        DrawLocked();
    }
}

void Progress::Report(const std::string& line)
{
    std::lock_guard<std::mutex> lock(mutex_);
    ClearLocked();
    std::fprintf(stderr, "rhlhost: %s\n", line.c_str());
    DrawLocked();
}

void Progress::Finish()
{
    std::lock_guard<std::mutex> lock(mutex_);
    ClearLocked();
}

void Progress::DrawLocked()
{
    if (!visible_)
        return;
    const double seconds = std::chrono::duration<double>(Clock::now() - start_).count();
    const double rate = seconds > 0 ? done_ / seconds : 0;
    const long left = rate > 0 ? long((total_ - done_) / rate + 0.5) : 0;
    std::fprintf(stderr, "\r%s %zu/%zu files  %.1f files/s  %ld:%02ld left\033[K", Bar(done_, total_).c_str(), done_,
                 total_, rate, left / kSecondsPerMinute, left % kSecondsPerMinute);
    std::fflush(stderr);
}

void Progress::ClearLocked()
{
    if (visible_)
        std::fprintf(stderr, "\r\033[K");
}

} // namespace host
