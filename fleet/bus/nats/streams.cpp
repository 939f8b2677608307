#include "fleet/bus/nats/streams.h"

#include <nlohmann/json.hpp>
#include <set>
#include <utility>

#include "fleet/bus/nats/api.h"

namespace fleet {

namespace {

using Json = nlohmann::json;

constexpr int kNoSuchStream = 10059;
constexpr int kStreamIsThere = 10058;
constexpr int kOutcomesOfHost = 64;
constexpr int kBytesOfOutcome = 256 << 10;
constexpr int kBytesOfFacts = 64 << 10;
constexpr std::int64_t kShortestWindowNs = 100'000'000;

/// All that matters is said, so that what differs is seen.
Json plainStream(const std::string& name, const std::string& subjects, int perSubject,
                 const StreamLimits& limits) {
    return {{"name", name},
            {"subjects", {subjects}},
            {"storage", "file"},
            {"retention", "limits"},
            {"discard", "old"},
            {"max_msgs_per_subject", perSubject},
            {"max_msgs", -1},
            {"max_bytes", -1},
            {"max_age", 0},
            {"max_msg_size", -1},
            {"max_consumers", -1},
            {"num_replicas", limits.replicas},
            {"duplicate_window", kShortestWindowNs},
            {"allow_direct", true},
            {"allow_rollup_hdrs", false},
            {"deny_delete", false},
            {"deny_purge", false}};
}

StreamSettings settingsOf(const Json& json) {
    return {json.at("name").get<std::string>(), json.dump()};
}

std::vector<std::string> differencesOf(const Json& wanted, const Json& answer) {
    const auto config = answer.find("config");
    if (config == answer.end() || !config->is_object()) return {"it tells no settings"};
    std::vector<std::string> differences;
    for (const auto& [key, value] : wanted.items()) {
        const Json is = config->value(key, Json());
        if (is != value) differences.push_back(key + " is " + is.dump() + ", not " + value.dump());
    }
    return differences;
}

EnsureResult compared(const StreamSettings& settings, ApiAnswer answer) {
    EnsureResult result;
    result.status = std::move(answer.status);
    if (result.status.done()) {
        result.differences = differencesOf(Json::parse(settings.json), Json::parse(answer.json));
    }
    return result;
}

}  // namespace

StreamSettings tasksStream(const StreamLimits& limits) {
    Json json = plainStream(kTasksStream, "task.>", 1, limits);
    json["discard"] = "new";
    json["max_bytes"] = limits.tasksBytes;
    json["republish"] = {{"src", "task.>"}, {"dest", "rp.task.>"}};
    return settingsOf(json);
}

StreamSettings outStream(const StreamLimits& limits) {
    Json json = plainStream(kOutStream, "out.*", kOutcomesOfHost, limits);
    json["max_msg_size"] = kBytesOfOutcome;
    return settingsOf(json);
}

StreamSettings hostsStream(const StreamLimits& limits) {
    Json json = plainStream(kHostsStream, "$KV.HOSTS.*", 1, limits);
    json["max_msg_size"] = kBytesOfFacts;
    return settingsOf(json);
}

StreamSettings centreStream(const StreamLimits& limits) {
    return settingsOf(plainStream(kCentreStream, "$KV.CENTRE.*", 1, limits));
}

EnsureResult ensureStream(Connection& connection, const StreamSettings& settings,
                          Connection::Milliseconds deadline) {
    const std::string info = "STREAM.INFO." + settings.name;
    ApiAnswer there = askStore(connection, info, "", deadline);
    if (there.status.code != kNoSuchStream) return compared(settings, std::move(there));
    ApiAnswer made =
        askStore(connection, "STREAM.CREATE." + settings.name, settings.json, deadline);
    // Somebody else was faster.
    if (made.status.code == kStreamIsThere) {
        return compared(settings, askStore(connection, info, "", deadline));
    }
    EnsureResult result = compared(settings, std::move(made));
    result.made = result.status.done();
    return result;
}

SubjectsResult subjectsOf(Connection& connection, const std::string& stream,
                          const std::string& filter, Connection::Milliseconds deadline) {
    SubjectsResult result;
    std::set<std::string> seen;  // a server that repeats a page is not asked without end
    for (;;) {
        const Json request = {{"subjects_filter", filter}, {"offset", result.subjects.size()}};
        const ApiAnswer answer =
            askStore(connection, "STREAM.INFO." + stream, request.dump(), deadline);
        result.status = answer.status;
        if (!answer.status.done()) return result;
        const Json info = Json::parse(answer.json);
        const Json subjects = info.value(Json::json_pointer("/state/subjects"), Json::object());
        const std::size_t before = result.subjects.size();
        for (const auto& subject : subjects.items()) {
            if (seen.insert(subject.key()).second) result.subjects.push_back(subject.key());
        }
        // Some go while they are listed; the next listing shows what came instead.
        if (result.subjects.size() == before) return result;
    }
}

}  // namespace fleet
