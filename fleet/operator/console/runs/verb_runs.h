/// The operator's own program, run for a browser.
#pragma once

#include <chrono>
#include <cstddef>
#include <mutex>
#include <string>

#include "fleet/loop/run_list.h"
#include "fleet/operator/console/runs/run_request.h"
#include "http/handler.h"

namespace fleet {

struct RunLimits {
    std::size_t runs = 4;                 ///< at a time
    std::chrono::seconds time{120};       ///< of each
    std::chrono::seconds pushTime{600};   ///< of each that brings a file
    std::size_t bytes = 4 * 1024 * 1024;  ///< that each may write
};

/// Each run has a process and a thread, both of which end with the browser that waits for it, or
/// with this object. Any thread.
class VerbRuns {
public:
    /// `program` is the path of zavctl-fleet.
    explicit VerbRuns(std::string program, const RunLimits& limits = {});
    ~VerbRuns();
    VerbRuns(const VerbRuns&) = delete;
    VerbRuns& operator=(const VerbRuns&) = delete;

    /// Starts a run, which answers when it is over: {"exit": 0, "command": "zavctl ...", "output":
    /// {...}, "messages": ""}. "output" is null if the program has printed no JSON; of a verb that
    /// begins a roll-out it has its identifier as "rollout". As many as there may be already get a
    /// reply with status 429.
    http::Answer begin(RunRequest request);

    /// Kills what runs; each still answers.
    void stopAll();
    /// Whether nothing runs.
    bool empty() const;

private:
    class Run;

    const std::string program_;
    const RunLimits limits_;
    mutable std::mutex mutex_;
    RunList<Run> runs_;
};

}  // namespace fleet
