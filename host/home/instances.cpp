#include "host/home/instances.h"

#include <unistd.h>

#include <array>
#include <charconv>
#include <chrono>
#include <cstddef>
#include <optional>
#include <sstream>
#include <string_view>
#include <utility>

namespace host {
namespace {

// One other user's processes may take ten seconds. Whoever asks waits a little longer than this.
constexpr CommandLimits kInstanceLimits{std::chrono::seconds(12), std::size_t{1} << 20};

constexpr std::array<std::pair<std::string_view, AgentInstance::State>, 3> kStates = {{
    {"running", AgentInstance::State::Running},
    {"missing", AgentInstance::State::Missing},
    {"stopped", AgentInstance::State::Stopped},
}};

std::vector<std::string> tabbed(const std::string& line) {
    std::vector<std::string> pieces(1);
    for (const char c : line) {
        if (c == '\t') {
            pieces.emplace_back();
        } else {
            pieces.back() += c;
        }
    }
    return pieces;
}

std::optional<AgentInstance> instanceIn(const std::string& line) {
    constexpr std::size_t kPieces = 5;
    std::vector<std::string> pieces = tabbed(line);
    if (pieces.size() != kPieces || pieces[0].empty()) return std::nullopt;
    for (const auto& [name, state] : kStates) {
        if (pieces[3] != name) continue;
        AgentInstance found{std::move(pieces[0]), std::move(pieces[1]), std::move(pieces[2]), state,
                            0};
        const std::string& pid = pieces[4];
        std::from_chars(pid.data(), pid.data() + pid.size(), found.pid);
        return found;
    }
    return std::nullopt;
}

}  // namespace

InstanceList readInstances(const std::string& home) {
    InstanceList list;
    const std::string program = home + "/bin/instances";
    list.isOffered = ::access(program.c_str(), X_OK) == 0;
    if (!list.isOffered) return list;
    list.result = runCommand({program, "list"}, kInstanceLimits);
    if (list.result.succeeded()) list.instances = instancesIn(list.result.out);
    return list;
}

std::vector<AgentInstance> instancesIn(const std::string& list) {
    std::vector<AgentInstance> instances;
    std::istringstream lines(list);
    for (std::string line; std::getline(lines, line);) {
        if (auto found = instanceIn(line)) instances.push_back(*std::move(found));
    }
    return instances;
}

const char* nameOf(AgentInstance::State state) {
    for (const auto& [name, known] : kStates) {
        if (known == state) return name.data();
    }
    return "";
}

}  // namespace host
