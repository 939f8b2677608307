/// The file in which a link tells its metrics.
#pragma once

#include <chrono>
#include <string>
#include <utility>

#include "fleet/link/metrics/link_metrics.h"

namespace fleet {

/// A link opens connections and takes none, so nobody can ask it: it writes its figures into a
/// file, which the node exporter of the machine reads as one of its textfile collector's. Who
/// watches sees by the file's time whether the link still lives.
///
/// The file goes with the object: what a link that has ended once told is no figure of today. One
/// thread at a time.
class MetricsFile {
public:
    using Clock = std::chrono::steady_clock;

    /// Between two writes.
    static constexpr std::chrono::seconds kPause{15};

    /// "" for no file.
    explicit MetricsFile(std::string path) : path_(std::move(path)) {}
    ~MetricsFile();
    MetricsFile(const MetricsFile&) = delete;
    MetricsFile& operator=(const MetricsFile&) = delete;

    bool isDue(Clock::time_point now) const { return !path_.empty() && now >= next_; }
    /// Puts the file in the place of the one before. A link works without it as well: what goes
    /// wrong is said once.
    void write(const LinkScrape& scrape, Clock::time_point now);

private:
    const std::string path_;
    Clock::time_point next_{};
    std::string trouble_;
};

}  // namespace fleet
