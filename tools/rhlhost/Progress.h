// A progress bar on stderr (files done of the total, rate, time left), drawn
// only when stderr is a terminal, with message lines printed above it. Safe to
// use from several worker threads.
#pragma once

#include <chrono>
#include <cstddef>
#include <mutex>
#include <string>

namespace host {

class Progress {
public:
    explicit Progress(size_t total);
    // One more file done; the bar is redrawn at most a few times a second.
    void Advance();
    // A line for the user, printed above the bar.
    void Report(const std::string& line);
    // Removes the bar.
    void Finish();

private:
    using Clock = std::chrono::steady_clock;
    void DrawLocked();
    void ClearLocked();

    std::mutex mutex_;
    const size_t total_;
    size_t done_ = 0;
    const bool visible_;
    const Clock::time_point start_;
    Clock::time_point lastDraw_;
};

} // namespace host
