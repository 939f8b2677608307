#include "routes/description/description.h"

#include <algorithm>
#include <cctype>
#include <stdexcept>
#include <string_view>

#include "routes/description/schema.h"

namespace routes {

Schema errorSchema;

namespace {

using Json = nlohmann::ordered_json;

/// The segments of a path without its version: "tasks", "{id}", "output".
std::vector<std::string> segmentsOf(std::string_view path) {
    std::vector<std::string> segments;
    while (!path.empty()) {
        path.remove_prefix(1);
        const std::size_t end = std::min(path.find('/'), path.size());
        segments.emplace_back(path.substr(0, end));
        path.remove_prefix(end);
    }
    segments.erase(segments.begin());
    return segments;
}

bool isPlaceholder(const std::string& segment) {
    return segment.front() == '{';
}

/// "TryAgain" of "try-again".
std::string capitalized(const std::string& words) {
    std::string name;
    bool isFirst = true;
    for (const char letter : words) {
        const auto plain = static_cast<unsigned char>(letter);
        if (letter != '-') name += static_cast<char>(isFirst ? std::toupper(plain) : plain);
        isFirst = letter == '-';
    }
    return name;
}

/// "task" of "tasks", "batch" of "batches".
std::string oneOf(const std::string& words) {
    constexpr std::string_view kHissing = "ches";
    const std::size_t ending = words.size() < kHissing.size() ? 0 : words.size() - kHissing.size();
    if (words.substr(ending) == kHissing) return words.substr(0, words.size() - 2);
    return words.back() == 's' ? words.substr(0, words.size() - 1) : words;
}

Json shapeOf(Type type) {
    switch (type) {
        case Type::Text:
            break;
        case Type::Texts:
            return {{"type", "array"}, {"items", {{"type", "string"}}}};
        case Type::Number:
            return {{"type", "integer"}, {"minimum", 0}};
        case Type::Flag:
            return {{"type", "integer"}, {"enum", {0, 1}}};
    }
    return {{"type", "string"}};
}

Json shapeOf(JsonType type) {
    switch (type) {
        case JsonType::String:
            break;
        case JsonType::Number:
            return {{"type", "number"}};
        case JsonType::Boolean:
            return {{"type", "boolean"}};
        case JsonType::Array:
            return {{"type", "array"}};
        case JsonType::Object:
            return {{"type", "object"}};
    }
    return {{"type", "string"}};
}

bool isInPath(const RouteFacts& route, const Parameter& parameter) {
    const std::string segment = '{' + std::string(parameter.name) + '}';
    return std::string_view(route.path).find(segment) != std::string_view::npos;
}

/// The parameters of a query whose names are those of columns.
Json columnParameters() {
    return {{"name", "columns"},
            {"in", "query"},
            {"description", "any column of the table, with the value that it is to have"},
            {"style", "form"},
            {"explode", true},
            {"schema", {{"type", "object"}, {"additionalProperties", {{"type", "string"}}}}}};
}

Json parametersOf(const RouteFacts& route, Components& components) {
    Json list = Json::array();
    for (const Parameter& parameter : route.parameters) {
        const bool inPath = isInPath(route, parameter);
        list.push_back({{"name", parameter.name},
                        {"in", inPath ? "path" : "query"},
                        {"required", inPath || parameter.need == Need::Required},
                        {"description", parameter.doc},
                        {"schema", parameter.schema != nullptr ? components.ref(parameter.schema)
                                                               : shapeOf(parameter.type)}});
    }
    if (route.others == Others::Columns) list.push_back(columnParameters());
    return list;
}

/// The host refuses members that it does not know.
Json bodyOf(const RouteFacts& route, Components& components) {
    std::vector<shape::Property> properties;
    for (const Member& member : route.body) {
        properties.push_back(
            {member.name,
             shape::about(member.doc, member.schema != nullptr ? components.ref(member.schema)
                                                               : shapeOf(member.type)),
             member.need});
    }
    const std::string title = capitalized(operationName(route)) + "Body";
    Json object = shape::object(title.c_str(), "What is asked for.", properties);
    object["additionalProperties"] = false;
    return {{"required", true}, {"content", {{"application/json", {{"schema", object}}}}}};
}

Json contentOf(const RouteAnswer& answer, Components& components) {
    if (answer.document != nullptr) {
        return {{"application/json", {{"schema", components.ref(answer.document)}}}};
    }
    const Json text = {{"type", "string"}};
    if (answer.events.empty()) return {{answer.media, {{"schema", text}}}};
    Json events = Json::object();
    for (const StreamEvent& event : answer.events)
        events[event.name] = components.ref(event.data);
    return {{"text/event-stream", {{"schema", text}, {"x-events", events}}}};
}

const StatusMeaning& meaningOf(const Interface& about, unsigned status) {
    for (const StatusMeaning& meaning : about.meanings) {
        if (meaning.status == status) return meaning;
    }
    throw std::logic_error("no meaning of the status " + std::to_string(status) + " is known");
}

bool hasInput(const RouteFacts& route, std::string_view name) {
    const auto isIt = [name](const auto& named) { return name == named.name; };
    return std::any_of(route.parameters.begin(), route.parameters.end(), isIt) ||
           std::any_of(route.body.begin(), route.body.end(), isIt);
}

bool mayFailWith(const Interface& about, const RouteFacts& route, const StatusMeaning& meaning) {
    if (meaning.status == about.statusOfMember) return hasInput(route, about.memberOfStatus);
    const bool isForAll = route.access == http::Access::None;
    if (meaning.status == about.statusOfStrangers && !isForAll) return true;
    return meaning.ofEvery || std::find(route.errors.begin(), route.errors.end(), meaning.status) !=
                                  route.errors.end();
}

/// Of a status that a server may give before the endpoint is asked as well.
void addError(Json& answer, Components& components) {
    Json& document = answer["content"]["application/json"]["schema"];
    document = {{"anyOf", {document, components.ref(errorSchema)}}};
}

Json answersOf(const Interface& about, const RouteFacts& route, Components& components) {
    std::map<unsigned, Json> answers;
    for (const RouteAnswer& answer : route.answers) {
        answers[answer.status] = {{"description", answer.doc},
                                  {"content", contentOf(answer, components)}};
    }
    for (const unsigned status : route.errors)
        meaningOf(about, status);
    for (const StatusMeaning& meaning : about.meanings) {
        if (!mayFailWith(about, route, meaning)) continue;
        if (answers.count(meaning.status) != 0) {
            addError(answers[meaning.status], components);
        } else {
            answers[meaning.status] = {
                {"$ref", "#/components/responses/" + std::to_string(meaning.status)}};
        }
    }
    Json all = Json::object();
    for (auto& [status, answer] : answers)
        all[std::to_string(status)] = std::move(answer);
    return all;
}

Json errorAnswers(const Interface& about, Components& components) {
    Json answers = Json::object();
    for (const StatusMeaning& meaning : about.meanings) {
        Json answer = {
            {"description", meaning.when},
            {"content", {{"application/json", {{"schema", components.ref(errorSchema)}}}}}};
        if (meaning.saysWhen) {
            answer["headers"]["Retry-After"] = {
                {"description", "after how many seconds to ask again, where that is known"},
                {"schema", {{"type", "integer"}}}};
        }
        answers[std::to_string(meaning.status)] = std::move(answer);
    }
    return answers;
}

const char* nameOf(http::Access access) {
    switch (access) {
        case http::Access::None:
            return "none";
        case http::Access::Read:
            return "read";
        case http::Access::Act:
            break;
    }
    return "act";
}

Json operationOf(const Interface& about, const RouteFacts& route, Components& components) {
    Json operation = {{"operationId", operationName(route)},
                      {"summary", route.doc},
                      {"x-access", nameOf(route.access)}};
    const Json parameters = parametersOf(route, components);
    if (!parameters.empty()) operation["parameters"] = parameters;
    if (!route.body.empty()) operation["requestBody"] = bodyOf(route, components);
    operation["responses"] = answersOf(about, route, components);
    return operation;
}

std::string inSmallLetters(std::string text) {
    for (char& letter : text)
        letter = static_cast<char>(std::tolower(static_cast<unsigned char>(letter)));
    return text;
}

}  // namespace

std::string operationName(const RouteFacts& route) {
    std::string name = inSmallLetters(route.method);
    const std::vector<std::string> segments = segmentsOf(route.path);
    for (std::size_t i = 0; i < segments.size(); ++i) {
        if (isPlaceholder(segments[i])) continue;
        const std::string word = segments[i].substr(0, segments[i].find('.'));
        // What a parameter chooses is one of them.
        const bool isOne = i + 1 < segments.size() && isPlaceholder(segments[i + 1]);
        name += capitalized(isOne ? oneOf(word) : word);
    }
    return name;
}

std::string describe(const Interface& about, const std::vector<RouteFacts>& routes) {
    Components components;
    Json paths = Json::object();
    for (const RouteFacts& route : routes)
        paths[route.path][inSmallLetters(route.method)] = operationOf(about, route, components);
    const Json answers = errorAnswers(about, components);
    const Json document = {
        {"openapi", "3.1.0"},
        {"info",
         {{"title", about.title},
          {"version", about.version},
          {"summary", about.summary},
          {"description", about.overview}}},
        {"servers", Json::array({{{"url", about.serverUrl}, {"description", about.serverDoc}}})},
        {"paths", paths},
        {"components", {{"schemas", components.all()}, {"responses", answers}}}};
    return document.dump(2) + '\n';
}

}  // namespace routes
