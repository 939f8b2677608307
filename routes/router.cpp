#include "routes/router.h"

#include <algorithm>
#include <optional>
#include <stdexcept>
#include <string_view>

#include "routes/bad_request.h"

namespace routes {
namespace {

constexpr std::size_t kMaxDigits = 18;

bool isVariable(std::string_view segment) {
    return segment.size() > 2 && segment.front() == '{' && segment.back() == '}';
}

std::string_view variableName(std::string_view segment) {
    return segment.substr(1, segment.size() - 2);
}

const Parameter* parameterOf(const RouteFacts& route, std::string_view name) {
    const auto found =
        std::find_if(route.parameters.begin(), route.parameters.end(),
                     [name](const Parameter& parameter) { return name == parameter.name; });
    return found == route.parameters.end() ? nullptr : &*found;
}

bool hasType(const std::string& value, Type type) {
    switch (type) {
        case Type::Text:
        case Type::Texts:
            return true;
        case Type::Number:
            return !value.empty() && value.size() <= kMaxDigits &&
                   value.find_first_not_of("0123456789") == std::string::npos;
        case Type::Flag:
            return value == "0" || value == "1";
    }
    return false;
}

const char* nameOf(Type type) {
    switch (type) {
        case Type::Text:
        case Type::Texts:
            return "text";
        case Type::Number:
            return "a whole number";
        case Type::Flag:
            return "0 or 1";
    }
    return "";
}

bool fits(const std::string& segment, const std::string& pattern, const RouteFacts& route) {
    if (!isVariable(pattern)) return segment == pattern;
    const Parameter* const parameter = parameterOf(route, variableName(pattern));
    return !segment.empty() && hasType(segment, parameter->type);
}

using Segments = std::vector<std::string>;

/// Whether the two paths stand for the same requests: the names of parameters do not matter.
bool areAlike(const Segments& one, const Segments& other) {
    return std::equal(one.begin(), one.end(), other.begin(), other.end(),
                      [](const std::string& left, const std::string& right) {
                          return left == right || (isVariable(left) && isVariable(right));
                      });
}

/// Whether `one` has a literal segment where, for the first time, only one of the two has.
bool isMoreExact(const Segments& one, const Segments& other) {
    return std::lexicographical_compare(one.begin(), one.end(), other.begin(), other.end(),
                                        [](const std::string& left, const std::string& right) {
                                            return !isVariable(left) && isVariable(right);
                                        });
}

bool answers(const RouteFacts& route, std::string_view method) {
    return method == route.method || (method == "HEAD" && std::string_view(route.method) == "GET");
}

/// The methods as a list for the header field. OPTIONS is known everywhere and not listed.
std::string allowed(const std::vector<const RouteFacts*>& routes) {
    std::string list;
    for (const RouteFacts* route : routes) {
        if (!list.empty()) list += ", ";
        list += route->method;
        if (std::string_view(route->method) == "GET") list += ", HEAD";
    }
    return list;
}

http::Reply wrongMethod(const std::string& path, const std::vector<const RouteFacts*>& routes) {
    std::string text = path + (routes.size() == 1 ? " knows only the method " : " knows only ");
    for (std::size_t i = 0; i < routes.size(); ++i) {
        if (i > 0) text += i + 1 == routes.size() ? " and " : ", ";
        text += routes[i]->method;
    }
    http::Reply reply = http::errorReply(405, text);
    reply.fields.emplace_back("Allow", allowed(routes));
    return reply;
}

void takeParameter(Match& match, const Parameter& parameter, const std::string& value) {
    const std::string name = parameter.name;
    for (const auto& taken : match.parameters) {
        if (taken.first == name && parameter.type != Type::Texts)
            throw BadRequest("the parameter \"" + name + "\" is given twice");
    }
    if (!hasType(value, parameter.type)) {
        throw BadRequest("the parameter \"" + name + "\" is not " + nameOf(parameter.type));
    }
    match.parameters.emplace_back(name, value);
}

void takePath(Match& match, const std::vector<std::string>& pattern, const http::Target& target) {
    for (std::size_t i = 0; i < pattern.size(); ++i) {
        if (!isVariable(pattern[i])) continue;
        match.parameters.emplace_back(variableName(pattern[i]), target.segments[i]);
    }
}

void takeQuery(Match& match, const http::Target& target) {
    for (const auto& [name, value] : target.parameters) {
        if (const Parameter* const parameter = parameterOf(*match.route, name)) {
            takeParameter(match, *parameter, value);
        } else if (match.route->others == Others::Columns) {
            match.others.emplace_back(name, value);
        } else {
            throw BadRequest(target.path + " takes no parameter \"" + name + "\"");
        }
    }
    for (const Parameter& parameter : match.route->parameters) {
        const auto given =
            std::find_if(match.parameters.begin(), match.parameters.end(),
                         [&parameter](const auto& entry) { return entry.first == parameter.name; });
        if (parameter.need == Need::Required && given == match.parameters.end()) {
            throw BadRequest("the parameter \"" + std::string(parameter.name) + "\" is missing");
        }
    }
}

}  // namespace

Router::Router(std::vector<RouteFacts> routes, std::string readersRefusal)
    : routes_(std::move(routes)), readersRefusal_(std::move(readersRefusal)) {
    for (const RouteFacts& route : routes_) {
        const std::optional<http::Target> pattern = http::parseTarget(route.path);
        if (!pattern) throw std::logic_error(std::string("malformed path ") + route.path);
        for (const std::string& segment : pattern->segments) {
            if (isVariable(segment) && parameterOf(route, variableName(segment)) == nullptr) {
                throw std::logic_error(std::string(route.path) + " does not describe " + segment);
            }
        }
        for (const Entry& other : entries_) {
            if (areAlike(other.segments, pattern->segments) &&
                std::string_view(other.route->method) == route.method) {
                throw std::logic_error(std::string("two routes for ") + route.path);
            }
        }
        entries_.push_back({&route, pattern->segments});
    }
    // So that the order of the rows does not matter: "/v1/tasks/all" is found before
    // "/v1/tasks/{id}".
    std::stable_sort(entries_.begin(), entries_.end(), [](const Entry& one, const Entry& other) {
        return isMoreExact(one.segments, other.segments);
    });
}

std::vector<const Router::Entry*> Router::atPath(const http::Target& target) const {
    std::vector<const Entry*> found;
    for (const Entry& entry : entries_) {
        // What a more exact path stands for is no longer looked for among the others.
        if (!found.empty() && !areAlike(entry.segments, found.front()->segments)) continue;
        const RouteFacts& route = *entry.route;
        if (std::equal(target.segments.begin(), target.segments.end(), entry.segments.begin(),
                       entry.segments.end(),
                       [&route](const std::string& segment, const std::string& pattern) {
                           return fits(segment, pattern, route);
                       })) {
            found.push_back(&entry);
        }
    }
    return found;
}

std::variant<Match, http::Reply> Router::find(const http::Request& request) const {
    const std::optional<http::Target> target = http::parseTarget(request.target);
    if (!target) return http::errorReply(400, "the request's target has a malformed escape");
    const std::vector<const Entry*> entries = atPath(*target);
    if (entries.empty()) return http::errorReply(404, "there is nothing at " + target->path);
    std::vector<const RouteFacts*> here;
    const Entry* wanted = nullptr;
    for (const Entry* entry : entries) {
        here.push_back(entry->route);
        if (wanted == nullptr && answers(*entry->route, request.method)) wanted = entry;
    }
    if (request.method == "OPTIONS") return http::Reply{204, "", "", {{"Allow", allowed(here)}}};
    if (wanted == nullptr) return wrongMethod(target->path, here);
    if (request.peer.access < wanted->route->access) {
        return http::errorReply(403, readersRefusal_);
    }
    Match match{wanted->route,
                static_cast<std::size_t>(wanted->route - routes_.data()),
                target->path,
                {},
                {}};
    takePath(match, wanted->segments, *target);
    try {
        takeQuery(match, *target);
    } catch (const BadRequest& bad) {
        return http::errorReply(400, bad.what());
    }
    return match;
}

}  // namespace routes
