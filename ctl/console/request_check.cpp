#include "ctl/console/request_check.h"

#include <algorithm>
#include <array>

namespace console {
namespace {

constexpr std::uint16_t kHttpPort = 80;
constexpr std::string_view kOwnField = "X-Zav-Console";
constexpr std::string_view kSite = "Sec-Fetch-Site";
constexpr std::string_view kScheme = "http://";

std::size_t countOf(const http::Request& request, std::string_view name) {
    return static_cast<std::size_t>(
        std::count_if(request.fields.begin(), request.fields.end(),
                      [name](const auto& field) { return field.first == name; }));
}

/// Browsers leave out the port that goes without saying.
bool isOwnName(std::string_view host, std::uint16_t port) {
    constexpr std::array<std::string_view, 2> kNames = {"127.0.0.1", "localhost"};
    return std::any_of(kNames.begin(), kNames.end(), [&](std::string_view name) {
        return host == std::string(name) + ':' + std::to_string(port) ||
               (port == kHttpPort && host == name);
    });
}

}  // namespace

const std::vector<std::string>& lookedAtFields() {
    static const std::vector<std::string> kFields = {
        "Host",   "Origin",        "Cookie",          std::string(kOwnField), "Content-Type",
        "Accept", "If-None-Match", "Accept-Encoding", std::string(kSite)};
    return kFields;
}

std::string_view fieldOf(const http::Request& request, std::string_view name) {
    if (countOf(request, name) != 1) return {};
    return std::find_if(request.fields.begin(), request.fields.end(),
                        [name](const auto& field) { return field.first == name; })
        ->second;
}

std::string complaintAbout(const http::Request& request, std::uint16_t port) {
    const std::string_view host = fieldOf(request, "Host");
    if (!isOwnName(host, port)) return "the console answers to its own address only";
    if (onlyReads(request)) return "";
    if (!isOfPage(request)) {
        return "a request that may change something needs the field X-Zav-Console: 1";
    }
    const std::size_t origins = countOf(request, "Origin");
    const bool isOwnOrigin = fieldOf(request, "Origin") == std::string(kScheme) + std::string(host);
    if (origins > 0 && !isOwnOrigin) return "another page may not ask for this";
    return "";
}

bool isOfAnotherSite(const http::Request& request) {
    if (countOf(request, kSite) == 0) return false;  // older browsers do not say
    const std::string_view site = fieldOf(request, kSite);
    return site != "same-origin" && site != "none";
}

bool isOfPage(const http::Request& request) {
    return fieldOf(request, kOwnField) == "1";
}

bool onlyReads(const http::Request& request) {
    return request.method == "GET" || request.method == "HEAD";
}

std::string_view pathOf(const http::Request& request) {
    const std::string_view target = request.target;
    return target.substr(0, target.find_first_of("?#"));
}

}  // namespace console
