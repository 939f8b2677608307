#include "ctl/show/transfers/transfer_progress.h"

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
    done_ += bytes;
    if (!enabled_) return;
    const auto now = std::chrono::steady_clock::now();
    if (now - lastDrawn_ < std::chrono::milliseconds(100)) return;
    lastDrawn_ = now;
    draw();
}

void Progress::draw() {
    constexpr int kWidth = 30;
    const std::chrono::duration<double> elapsed = lastDrawn_ - start_;
    const auto total = double(total_);
    const auto done = double(done_);
    const double share = total_ == 0 ? 1 : std::min(1.0, done / total);
    const double rate = done / elapsed.count();  // at least 0.1 s have passed
    const auto left = static_cast<long>((total - done) / std::max(rate, 1.0));
    const std::string bar(static_cast<std::size_t>(share * kWidth), '#');
    std::fprintf(stderr, "\r[%-*s] %3.0f %%  %s of %s  %s/s  %ld s left\033[K", kWidth, bar.c_str(),
                 share * 100, bytesText(done).c_str(), bytesText(total).c_str(),
                 bytesText(rate).c_str(), left);
    std::fflush(stderr);
    drawn_ = true;
}

}  // namespace ctl
