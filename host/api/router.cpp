#include "host/api/router.h"

#include <nlohmann/json.hpp>

#include "host/tables/conditions.h"

namespace host {
namespace {

using nlohmann::json;

/// Deeper documents than a request's are refused before they are built.
constexpr int kMaxDepth = 4;

Refusal unknownTable(std::string_view name) {
    return {404, "there is no table \"" + std::string(name) + "\"", ""};
}

json parseBody(std::string_view body) {
    const auto limitDepth = [](int depth, json::parse_event_t, json&) {
        if (depth > kMaxDepth) throw BadRequest("the body is nested too deeply");
        return true;
    };
    try {
        return json::parse(body.begin(), body.end(), limitDepth);
    } catch (const json::parse_error& error) {
        throw BadRequest("the body is not JSON: error at byte " + std::to_string(error.byte));
    } catch (const json::exception&) {
        throw BadRequest("the body is not JSON: a number is out of range");
    }
}

/// Checks the document's outer shape; returns its conditions, or null when it has none.
const json* conditionsOf(const json& document) {
    if (!document.is_object()) throw BadRequest("the body is not a JSON object");
    for (const auto& member : document.items()) {
        if (member.key() != "table" && member.key() != "where") {
            throw BadRequest("unknown member \"" + member.key() + "\" in the body");
        }
    }
    if (!document.contains("table")) throw BadRequest("the body lacks \"table\"");
    if (!document.at("table").is_string()) throw BadRequest("\"table\" is not a string");
    const auto where = document.find("where");
    if (where == document.end()) return nullptr;
    if (!where->is_array()) throw BadRequest("\"where\" is not an array");
    return &*where;
}

}  // namespace

const oxa::Table* Router::find(std::string_view name) const {
    for (const oxa::Table& table : tables_) {
        if (table.name == name) return &table;
    }
    return nullptr;
}

Request Router::query(std::string_view body) const {
    const json document = parseBody(body);
    const json* const conditions = conditionsOf(document);
    const auto& name = document.at("table").get_ref<const std::string&>();
    const oxa::Table* const table = find(name);
    if (table == nullptr) return unknownTable(name);
    QueryRequest request{table, {}};
    if (conditions != nullptr) {
        const ConditionReader reader(*table, codePage_);
        for (const json& condition : *conditions)
            request.where.push_back(reader.fromJson(condition));
    }
    return request;
}

Request Router::events(const Target& target) const {
    const std::string* name = nullptr;
    for (const auto& [parameter, value] : target.parameters) {
        if (parameter != "table") continue;
        if (name != nullptr) throw BadRequest("the parameter \"table\" is given twice");
        name = &value;
    }
    if (name == nullptr) throw BadRequest("the parameter \"table\" is missing");
    const oxa::Table* const table = find(*name);
    if (table == nullptr) return unknownTable(*name);
    EventsRequest request{table, {}};
    const ConditionReader reader(*table, codePage_);
    for (const auto& [parameter, value] : target.parameters) {
        if (parameter != "table") request.where.push_back(reader.equality(parameter, value));
    }
    return request;
}

Request Router::route(std::string_view method, std::string_view target,
                      std::string_view body) const {
    static constexpr std::pair<const char*, const char*> kMethods[] = {
        {"/v1/tables", "GET"}, {"/v1/query", "POST"}, {"/v1/events", "GET"}, {"/v1/health", "GET"}};
    const std::optional<Target> parsed = parseTarget(target);
    if (!parsed) return Refusal{400, "the request's target has a malformed escape", ""};
    const char* wanted = nullptr;
    for (const auto& [path, name] : kMethods) {
        if (parsed->path == path) wanted = name;
    }
    if (wanted == nullptr) return Refusal{404, "there is nothing at " + parsed->path, ""};
    if (method != wanted) {
        return Refusal{405, parsed->path + " knows only the method " + wanted, wanted};
    }
    try {
        if (parsed->path == "/v1/events") return events(*parsed);
        if (!parsed->parameters.empty()) {
            throw BadRequest(parsed->path + " takes no parameter \"" +
                             parsed->parameters.front().first + "\"");
        }
        if (parsed->path == "/v1/query") return query(body);
    } catch (const BadRequest& bad) {
        return Refusal{400, bad.what(), ""};
    }
    if (parsed->path == "/v1/tables") return TablesRequest{};
    return HealthRequest{};
}

}  // namespace host
