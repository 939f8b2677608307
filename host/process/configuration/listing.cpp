#include "host/process/configuration/listing.h"

#include <chrono>
#include <cstdint>
#include <map>
#include <optional>
#include <string_view>
#include <utility>
#include <vector>

#include "host/process/configuration/option_table.h"
#include "host/process/configuration/task_timeout.h"

namespace host {
namespace {

struct ListedValue {
    std::optional<std::string> text;       ///< as it stands in a file; absent: none holds
    std::vector<const char*> variables{};  ///< the first that is set decides, if nothing else does
};

/// A basic string of TOML.
std::string quotedForToml(std::string_view text) {
    constexpr const char* kDigits = "0123456789ABCDEF";
    std::string result = "\"";
    for (const char character : text) {
        const auto code = static_cast<unsigned char>(character);
        if (character == '"' || character == '\\') {
            result += '\\';
            result += character;
        } else if (code < 0x20 || code == 0x7F) {
            result += "\\u00";
            result += kDigits[code >> 4U];
            result += kDigits[code & 0xFU];
        } else {
            result += character;
        }
    }
    return result + '"';
}

ListedValue listedText(const std::string& value, std::vector<const char*> variables = {}) {
    return {quotedForToml(value), std::move(variables)};
}

ListedValue listedText(const std::optional<std::string>& value) {
    return value ? listedText(*value) : ListedValue{};
}

ListedValue listedGroup(const std::optional<Group>& group) {
    return group ? listedText(group->name) : ListedValue{};
}

ListedValue listedNumber(std::int64_t value, std::vector<const char*> variables = {}) {
    return {std::to_string(value), std::move(variables)};
}

ListedValue listedFlag(bool isSet) {
    return {isSet ? "true" : "false"};
}

ListedValue listedTimeout(const HostOptions& options, const Environment& environment) {
    return listedNumber(timeoutThatHolds(options.taskTimeout, options.guarded, environment),
                        {kTimeoutVariable});
}

std::map<std::string, ListedValue> listedValues(const HostOptions& options,
                                                const Environment& environment) {
    return {
        {"home", listedText(options.home, {"TOVRINHOME"})},
        {"socket", listedText(options.socket, {"ZAV_SOCKET", "XDG_RUNTIME_DIR"})},
        {"rpc-socket", listedText(options.rpcSocket)},
        {"rpc-port", options.rpcPort ? listedNumber(*options.rpcPort) : ListedValue{}},
        {"group", listedGroup(options.groups.act)},
        {"read-only-group", listedGroup(options.groups.read)},
        {"origin-node", listedText(options.originNode)},
        {"plugin", listedText(options.plugin)},
        {"state", listedText(options.state, {"STATE_DIRECTORY"})},
        {"no-journal", listedFlag(!options.journal)},
        {"max-queued", listedNumber(options.maxQueued)},
        {"keep-tasks", listedNumber(options.keepDays)},
        {"keep-rows", listedNumber(options.keepRows)},
        {"orphan-wait", listedNumber(options.orphanWait.count())},
        {"on-interrupt", listedText(std::string(options.rerunInterrupted ? "rerun" : "keep"))},
        {"task-timeout", listedTimeout(options, environment)},
        {"grace", listedNumber(options.grace.count())},
        {"max-output", listedNumber(options.maxOutput)},
        {"log-format",
         listedText(std::string(options.logFormat == LogFormat::Json ? "json" : "text"))},
        {"log-size", listedNumber(options.logSize)},
        {"trace-secrets", listedFlag(options.traceSecrets)},
        {"unguarded", listedFlag(!options.guarded)},
    };
}

std::string sourceOf(const std::string& name, const ListedValue& value, const Settings& settings,
                     const Environment& environment) {
    const std::string written = settings.source(name);
    if (!written.empty()) return written;
    for (const char* const variable : value.variables) {
        const char* const set = environment(variable);
        if (set != nullptr && *set != '\0') return std::string("environment, ") + variable;
    }
    return "default";
}

}  // namespace

std::string listOptions(const HostOptions& options, const Settings& settings,
                        const Environment& environment) {
    const std::map<std::string, ListedValue> values = listedValues(options, environment);
    std::string lines;
    for (const OptionRow& row : optionTable()) {
        if (row.place == OptionPlace::CommandLineOnly) continue;
        const ListedValue& value = values.at(row.name);
        lines += value.text ? std::string(row.name) + " = " + *value.text
                            : std::string("# ") + row.name + " has no value";
        lines += "  # " + sourceOf(row.name, value, settings, environment) + "\n";
    }
    return lines;
}

}  // namespace host
