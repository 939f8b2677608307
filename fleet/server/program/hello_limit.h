/// How often a host may say hello.
#pragma once

#include <chrono>
#include <map>
#include <string>

namespace fleet {

/// A link says hello every half minute, and every two seconds when something is missing. A host
/// that says it without end must not keep the centre from hearing the others. One thread at a
/// time.
class HelloLimit {
public:
    using Clock = std::chrono::steady_clock;

    /// So many at once, and one more each second.
    static constexpr int kBurst = 5;
    /// Hosts that are remembered. Who is not enrolled has no name on the bus, so there are not many
    /// more than enrolled hosts.
    static constexpr std::size_t kMostHosts = 200'000;

    /// Whether this one is heard.
    bool admits(const std::string& host, Clock::time_point now);

private:
    struct Allowance {
        int left = kBurst;
        Clock::time_point since{};
    };
    std::map<std::string, Allowance> hosts_;
};

}  // namespace fleet
