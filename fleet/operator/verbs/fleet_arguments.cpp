#include "fleet/operator/verbs/fleet_arguments.h"

#include <algorithm>
#include <array>
#include <cstdlib>
#include <string>
#include <utility>

#include "ctl/client/failure.h"
#include "ctl/show/printable.h"

namespace fleet {
namespace {

constexpr std::array<std::pair<char, int>, 4> kUnits = {
    {{'s', 1}, {'m', 60}, {'h', 3600}, {'d', 86400}}};
constexpr std::size_t kMostDigits = 8;
constexpr Moment kLongestTime = std::chrono::hours(24 * 365);

constexpr const ctl::Argument* kOfRollouts[] = {&kOn,   &kWaves,    &kMaxFailures, &kPause,
                                                &kWait, &kParallel, &kDryRun};
/// What only makes sense for one host: orders have identifiers of their own, and each host sees an
/// install to its end by itself.
constexpr const char* kOfOneHost[] = {"--transid", "--once", "--complete"};
/// The verbs that sign orders anew.
constexpr const char* kRenewals[] = {"rollout resume", "rollout abort", "rollout retry-failed"};

/// The verbs that look at many hosts and change none.
constexpr const char* kLooks[] = {"agents", "tasks", "config get", "doctor"};
/// Those that look at one, and may be told which.
constexpr const char* kLooksAtOne[] = {"task output"};

ctl::Failure misplaced(const ctl::Verb& verb, const std::string& option) {
    return {ctl::kWrongUsage, std::string(verb.name) + " does not go with " + option};
}

template <typename List>
bool isOneOf(const ctl::Verb& verb, const List& names) {
    return std::find(std::begin(names), std::end(names), std::string(verb.name)) != std::end(names);
}

void insistOnHosts(const ctl::Values& given) {
    if (!given.text(kOn).empty()) return;
    throw ctl::Failure(ctl::kWrongUsage, "--on is missing: it says which hosts are meant",
                       "--on '*' means all of them.");
}

}  // namespace

Moment timeOf(const ctl::Values& given, const ctl::Argument& option) {
    std::string digits = given.text(option);
    const ctl::Failure wrong(ctl::kWrongUsage, std::string(option.name) + ": \"" +
                                                   ctl::printable(digits) +
                                                   "\" is no time such as 60s, 10m, 24h or 7d");
    int unit = 1;
    for (const auto& [letter, seconds] : kUnits) {
        if (digits.empty() || digits.back() != letter) continue;
        unit = seconds;
        digits.pop_back();
        break;
    }
    if (digits.empty() || digits.size() > kMostDigits ||
        digits.find_first_not_of("0123456789") != std::string::npos) {
        throw wrong;
    }
    const Moment time = std::chrono::seconds(std::strtoll(digits.c_str(), nullptr, 10) * unit);
    if (time > kLongestTime) throw wrong;
    return time;
}

void insistOnMeaning(const ctl::Verb& verb, const ctl::Values& given) {
    if (verb.requestOf == nullptr) {
        for (const ctl::Argument* const option : kOfRollouts) {
            const bool goesWithOn = isOneOf(verb, kLooks) || isOneOf(verb, kLooksAtOne);
            if (option == &kOn && goesWithOn) continue;
            if (given.has(*option)) throw misplaced(verb, option->name);
        }
        if (given.has(kExpires) && !isOneOf(verb, kRenewals)) throw misplaced(verb, kExpires.name);
        if (isOneOf(verb, kLooks)) insistOnHosts(given);
        return;
    }
    insistOnHosts(given);
    for (const ctl::Argument& argument : verb.arguments) {
        const bool isOfOne = std::find(std::begin(kOfOneHost), std::end(kOfOneHost),
                                       std::string(argument.name)) != std::end(kOfOneHost);
        if (isOfOne && given.has(argument)) throw misplaced(verb, argument.name);
    }
}

}  // namespace fleet
