#include "host/process/configuration/task_timeout.h"

#include <charconv>
#include <climits>
#include <cstdlib>
#include <string_view>
#include <system_error>

#include "host/process/start_error.h"

namespace host {
namespace {

/// The plug-in takes the largest int for a number out of range.
constexpr int kLongestTimeout = INT_MAX - 1;

std::optional<int> secondsIn(std::string_view text) {
    int seconds = 0;
    const char* const end = text.data() + text.size();
    const auto [rest, error] = std::from_chars(text.data(), end, seconds);
    if (error != std::errc() || rest != end || seconds < 1 || seconds > kLongestTimeout) {
        return std::nullopt;
    }
    return seconds;
}

}  // namespace

int taskTimeoutOf(const std::string& name, const std::string& text) {
    const std::optional<int> seconds = secondsIn(text);
    if (!seconds) {
        throw StartError(name + " takes a number of seconds from 1 to " +
                         std::to_string(kLongestTimeout) + ", not \"" + text + "\"");
    }
    return *seconds;
}

std::optional<int> taskTimeoutIn(const Environment& environment) {
    const char* const set = environment(kTimeoutVariable);
    return set == nullptr ? std::nullopt : secondsIn(set);
}

int timeoutThatHolds(std::optional<int> given, bool guarded, const Environment& environment) {
    if (given) return *given;
    const char* const set = environment(kTimeoutVariable);
    if (set == nullptr || (guarded && *set == '\0')) return kUsualTimeout;
    return guarded ? taskTimeoutOf(kTimeoutVariable, set) : secondsIn(set).value_or(0);
}

void chooseTaskTimeout(std::optional<int> given, bool guarded, const Environment& environment) {
    if (given) {
        ::setenv(kTimeoutVariable, std::to_string(*given).c_str(), 1);
        return;
    }
    const char* const set = environment(kTimeoutVariable);
    if (set == nullptr || !guarded) return;
    // The plug-in takes an empty one for 0 seconds.
    if (*set == '\0') {
        ::unsetenv(kTimeoutVariable);
        return;
    }
    taskTimeoutOf(kTimeoutVariable, set);
}

}  // namespace host
