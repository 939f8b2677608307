/// A progress bar on the terminal while files are sent.
#pragma once

#include <chrono>
#include <cstdint>
#include <string>

namespace ctl {

/// "12.3 MB" and the like; units are powers of 1000.
std::string bytesText(double bytes);

/// A bar on standard error, redrawn at most ten times a second, and erased at the end. Shows
/// nothing when standard error is no terminal, or when it is not enabled.
class Progress {
public:
    /// `total` bytes are to be sent. The time counts from now.
    Progress(std::uintmax_t total, bool enabled);
    ~Progress();
    Progress(const Progress&) = delete;
    Progress& operator=(const Progress&) = delete;

    /// Adds that many bytes to what has been sent.
    void add(std::uintmax_t bytes);

private:
    void draw();

    std::uintmax_t total_;
    bool enabled_;
    bool drawn_ = false;
    std::uintmax_t done_ = 0;
    std::chrono::steady_clock::time_point start_ = std::chrono::steady_clock::now();
    std::chrono::steady_clock::time_point lastDrawn_ = start_;
};

}  // namespace ctl
