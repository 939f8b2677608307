#include "soak/answers.h"

namespace soak {

using nlohmann::json;

json documentOf(World& world, const Answer* answer, const std::string& what) {
    if (answer == nullptr || answer->status == 503) return {};
    if (answer->status != 200) {
        world.tally.fault(what + " was answered with status " + std::to_string(answer->status) +
                          ": " + answer->body);
        return {};
    }
    json document = json::parse(answer->body, nullptr, false);
    if (document.is_discarded()) {
        world.tally.fault(what + " was answered with what is no JSON: " + answer->body);
        return {};
    }
    return document;
}

json rowOf(World& world, const Answer* answer, const std::string& what) {
    const json document = documentOf(world, answer, what);
    if (document.is_null()) return {};
    if (!document.contains("rows") || document["rows"].size() != 1) {
        world.tally.fault(what + " was not answered with one row: " + answer->body);
        return {};
    }
    return document["rows"][0];
}

}  // namespace soak
