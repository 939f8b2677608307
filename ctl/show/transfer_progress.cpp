#include "ctl/show/transfer_progress.h"

#include <unistd.h>

#include <algorithm>
#include <cstdio>
#include <iterator>

namespace ctl {

std::string bytesText(double bytes) {
    static const char* const kUnits[] = {"B", "kB", "MB", "GB", "TB"};
    std::size_t unit = 0;
    while (bytes >= 1000 && unit + 1 < std::size(kUnits)) {
        bytes /= 1000;
        ++unit;
    }
    char text[32];
    std::snprintf(text, sizeof text, unit == 0 ? "%.0f %s" : "%.1f %s", bytes, kUnits[unit]);
    return text;
}

Progress::Progress(std::uintmax_t total, bool enabled)
    : total_(total), enabled_(enabled && ::isatty(STDERR_FILENO) == 1) {}

Progress::~Progress() {
    if (drawn_) std::fputs("\r\033[K", stderr);
}

void Progress::add(std::uintmax_t bytes) {
    sent_ += bytes;
    const auto now = std::chrono::steady_clock::now();
    if (!enabled_ || now - lastDrawn_ < std::chrono::milliseconds(100)) return;
    lastDrawn_ = now;
    draw();
}

double Progress::seconds() const {
    return std::chrono::duration<double>(std::chrono::steady_clock::now() - start_).count();
}

void Progress::draw() {
    constexpr int kWidth = 30;
    const double share = total_ == 0 ? 1 : std::min(1.0, double(sent_) / double(total_));
    const double rate = double(sent_) / std::max(seconds(), 1e-6);
    const auto left = static_cast<long>((double(total_) - double(sent_)) / std::max(rate, 1.0));
    const std::string bar(static_cast<std::size_t>(share * kWidth), '#');
    std::fprintf(stderr, "\r[%-*s] %3.0f %%  %s of %s  %s/s  %ld s left\033[K", kWidth, bar.c_str(),
                 share * 100, bytesText(double(sent_)).c_str(), bytesText(double(total_)).c_str(),
                 bytesText(rate).c_str(), left);
    std::fflush(stderr);
    drawn_ = true;
}

}  // namespace ctl
