/// Documents of roll-outs, for tests.
#pragma once

#include <nlohmann/json.hpp>
#include <string>

namespace operator_test {

inline const char* const kRolloutId = "0123456789abcdef0123456789abcdef";

/// A START of "ux" on 4 hosts, of which `over` have ended.
inline nlohmann::json rolloutIn(const std::string& state, const nlohmann::json& over,
                                unsigned released, unsigned waiting) {
    const nlohmann::json counts = {{"waiting", waiting}, {"released", released}, {"over", over}};
    return {{"id", kRolloutId},
            {"operator", "mary"},
            {"kind", "START"},
            {"product", "ux"},
            {"selector", "env=test"},
            {"created", "2026-03-01T12:00:00.000Z"},
            {"state", state},
            {"cause", ""},
            {"reason", ""},
            {"since", "2026-03-01T12:00:00.000Z"},
            {"plan", {{"waves", "1,100%"}, {"maxFailures", "0"}, {"pause", 60}}},
            {"hosts", 4},
            {"mostFailures", 0},
            {"wave", 1},
            {"waves", {counts}},
            {"counts", counts},
            {"failures", over.value("failed", 0)},
            {"away", 0},
            {"unconfirmed", 0},
            {"expired", 0}};
}

inline nlohmann::json failedPart(const std::string& name, const std::string& order) {
    return {{"host", "U" + name}, {"name", name},        {"order", order},
            {"state", "failed"},  {"reason", "no disk"}, {"failure", true}};
}

}  // namespace operator_test
