#include "ctl/show/tasks/running_clock.h"

#include <unistd.h>

#include <cstdio>
#include <utility>

namespace ctl {

std::string elapsedText(std::chrono::milliseconds time) {
    const auto seconds = std::chrono::duration_cast<std::chrono::seconds>(time).count();
    if (seconds < 60) return std::to_string(seconds) + " s";
    return std::to_string(seconds / 60) + " min " + std::to_string(seconds % 60) + " s";
}

RunningClock::RunningClock(std::string what, bool enabled)
    : what_(std::move(what)), enabled_(enabled && ::isatty(STDERR_FILENO) == 1) {}

RunningClock::~RunningClock() {
    erase();
}

void RunningClock::tick() {
    if (!enabled_) return;
    const auto elapsed = std::chrono::duration_cast<std::chrono::milliseconds>(
        std::chrono::steady_clock::now() - start_);
    std::fprintf(stderr, "\r%s: waiting, %s \033[K", what_.c_str(), elapsedText(elapsed).c_str());
    std::fflush(stderr);
    shown_ = true;
}

void RunningClock::erase() {
    if (!shown_) return;
    std::fputs("\r\033[K", stderr);
    std::fflush(stderr);
    shown_ = false;
}

}  // namespace ctl
