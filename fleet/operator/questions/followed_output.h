/// What a task's commands write on a host, while they write it.
#pragma once

#include <chrono>
#include <functional>
#include <string>

#include "fleet/bus/messages/output_news.h"
#include "fleet/operator/centre/centre.h"
#include "fleet/operator/identity/operator_identity.h"
#include "fleet/operator/orders/chosen_hosts.h"

namespace fleet {

/// Whose output of what.
struct WantedOutput {
    ChosenHost host;
    std::string selector;  ///< the one that chose the host
    std::string task;      ///< its name or its number on the host
    bool isFollowed = false;
    std::string after = {};  ///< behind which position it goes on; "" at the beginning
    /// For whom the host seals the pieces, at any time for one stream only; else a new key.
    std::optional<KeyPair> reader = {};
};

struct OutputPace {
    using Clock = std::chrono::steady_clock;
    Clock::time_point deadline;
    std::function<Clock::time_point()> now;
    /// Called between two looks for output, with the time until the next one.
    std::function<void(std::chrono::milliseconds)> pause;
};

/// What the output is shown to.
struct OutputListener {
    /// False if nobody wants more.
    std::function<bool(const OutputText& text)> take;
    /// Bytes that came too fast for the link.
    std::function<void(Number bytes)> lost;
    /// Something was lost on the way, and nobody knows how much.
    std::function<void()> gap;
    /// The host shows it, and all texts up to this position have been taken; "" if the host has
    /// told none. Who names it as `after` goes on there. Empty if nobody wants to know.
    std::function<void(const std::string& position)> reached = {};
};

/// Asks for the output again and again until it is over. Throws ctl::Failure: what the host says
/// with the status that it would have there, kNoHost if the host is away or nothing was heard of it
/// for kOutputGoodFor, and kNoOutcome after the deadline. A centre that is away for less than that
/// is not noticed.
void followOutput(Centre& centre, const OperatorIdentity& identity, const WantedOutput& wanted,
                  const OutputPace& pace, const OutputListener& listener);

}  // namespace fleet
