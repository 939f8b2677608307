/// What a person at a terminal sees while files are sent.
#pragma once

#include <chrono>
#include <cstdint>
#include <string>

namespace ctl {

/// "12.3 MB" and the like.
std::string bytesText(double bytes);

/// A bar on a terminal, redrawn a few times a second; nothing elsewhere.
class Progress {
public:
    /// `total` bytes are to be sent.
    Progress(std::uintmax_t total, bool enabled);
    ~Progress();
    Progress(const Progress&) = delete;
    Progress& operator=(const Progress&) = delete;

    void add(std::uintmax_t bytes);
    /// Since it was made.
    double seconds() const;
    std::uintmax_t sent() const { return sent_; }

private:
    void draw();

    std::uintmax_t total_;
    bool enabled_;
    bool drawn_ = false;
    std::uintmax_t sent_ = 0;
    std::chrono::steady_clock::time_point start_ = std::chrono::steady_clock::now();
    std::chrono::steady_clock::time_point lastDrawn_ = start_;
};

}  // namespace ctl
