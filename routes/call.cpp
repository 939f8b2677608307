#include "routes/call.h"

#include <algorithm>
#include <cstdlib>
#include <nlohmann/json.hpp>
#include <unordered_set>

#include "routes/bad_request.h"
#include "text/nearest_name.h"

namespace routes {
namespace {

using nlohmann::json;

/// Deeper documents than any request needs are refused before they are built.
constexpr int kMaxDepth = 4;

/// Refuses while the parser reads: a document that is nested too deeply, and a member that an
/// object has already. Of two equal ones a reader would take the first and another the last.
class Supervisor {
public:
    bool operator()(int depth, json::parse_event_t event, const json& value) {
        if (depth > kMaxDepth) throw BadRequest("the body is nested too deeply");
        if (event == json::parse_event_t::object_start) open_.emplace_back();
        if (event == json::parse_event_t::object_end) open_.pop_back();
        if (event == json::parse_event_t::key) {
            const auto& name = value.get_ref<const std::string&>();
            if (!open_.back().insert(name).second) {
                throw BadRequest("the body has the member \"" + name + "\" twice");
            }
        }
        return true;
    }

private:
    std::vector<std::unordered_set<std::string>>
        open_;  ///< the names in each object around this place
};

json parse(const std::string& body) {
    Supervisor supervisor;
    const auto supervise = [&supervisor](int depth, json::parse_event_t event, const json& value) {
        return supervisor(depth, event, value);
    };
    try {
        return json::parse(body.begin(), body.end(), supervise);
    } catch (const json::parse_error& error) {
        throw BadRequest("the body is not JSON: error at byte " + std::to_string(error.byte));
    } catch (const json::exception&) {
        throw BadRequest("the body is not JSON: a number is out of range");
    }
}

bool hasType(const json& value, JsonType type) {
    switch (type) {
        case JsonType::String:
            return value.is_string();
        case JsonType::Number:
            return value.is_number();
        case JsonType::Boolean:
            return value.is_boolean();
        case JsonType::Array:
            return value.is_array();
        case JsonType::Object:
            return value.is_object();
    }
    return false;
}

const char* nameOf(JsonType type) {
    switch (type) {
        case JsonType::String:
            return "a string";
        case JsonType::Number:
            return "a number";
        case JsonType::Boolean:
            return "true or false";
        case JsonType::Array:
            return "an array";
        case JsonType::Object:
            return "an object";
    }
    return "";
}

[[noreturn]] void refuseMember(const std::string& name, const std::vector<Member>& members) {
    std::vector<std::string> known;
    for (const Member& member : members)
        known.emplace_back(member.name);
    const std::string nearest = text::nearestName(name, known);
    throw BadRequest("unknown member \"" + name + "\" in the body" +
                     (nearest.empty() ? "" : "; did you mean \"" + nearest + "\"?"));
}

void checkNames(const json& document, const std::vector<Member>& members) {
    for (const auto& given : document.items()) {
        const bool known =
            std::any_of(members.begin(), members.end(),
                        [&given](const Member& member) { return given.key() == member.name; });
        if (!known) refuseMember(given.key(), members);
    }
}

void checkMembers(const json& document, const std::vector<Member>& members) {
    if (!document.is_object()) throw BadRequest("the body is not a JSON object");
    checkNames(document, members);
    for (const Member& member : members) {
        const std::string quoted = '"' + std::string(member.name) + '"';
        const auto given = document.find(member.name);
        if (given == document.end()) {
            if (member.need == Need::Required) throw BadRequest("the body lacks " + quoted);
        } else if (!hasType(*given, member.type)) {
            throw BadRequest(quoted + " is not " + nameOf(member.type));
        }
    }
}

}  // namespace

void Call::readBody() {
    if (route().body.empty()) return;
    auto document = std::make_shared<const json>(parse(request_.body));
    std::string().swap(request_.body);
    checkMembers(*document, route().body);
    body_ = std::move(document);
}

const std::string* Call::text(const char* name) const {
    for (const auto& [known, value] : match_.parameters) {
        if (known == name) return &value;
    }
    return nullptr;
}

std::vector<std::string> Call::texts(const char* name) const {
    std::vector<std::string> values;
    for (const auto& [known, value] : match_.parameters) {
        if (known == name) values.push_back(value);
    }
    return values;
}

/// The field of a client that reconnects by itself is newer than the parameter, which it repeats.
std::string Call::after() const {
    if (!request_.lastEventId.empty()) return request_.lastEventId;
    const std::string* const given = text("after");
    return given == nullptr ? std::string() : *given;
}

long long Call::number(const char* name, long long otherwise) const {
    const std::string* const value = text(name);
    return value == nullptr ? otherwise : std::atoll(value->c_str());
}

bool Call::flag(const char* name) const {
    const std::string* const value = text(name);
    return value != nullptr && *value == "1";
}

}  // namespace routes
