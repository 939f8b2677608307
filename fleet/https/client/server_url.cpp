#include "fleet/https/client/server_url.h"

#include <algorithm>

namespace fleet {
namespace {

constexpr std::string_view kScheme = "https://";
constexpr const char* kUsualPort = "8443";
constexpr std::size_t kLongestHost = 255;
constexpr unsigned kHighestPort = 65535;

bool isOf(std::string_view text, std::string_view more) {
    return !text.empty() && std::all_of(text.begin(), text.end(), [more](char c) {
        return (c >= '0' && c <= '9') || (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') ||
               more.find(c) != std::string_view::npos;
    });
}

bool isPort(std::string_view text) {
    const bool isNumber =
        !text.empty() && text.size() <= 5 && text.front() != '0' &&
        std::all_of(text.begin(), text.end(), [](char c) { return c >= '0' && c <= '9'; });
    return isNumber && std::stoul(std::string(text)) <= kHighestPort;
}

}  // namespace

std::string ServerUrl::authority() const {
    const bool isIpV6 = host.find(':') != std::string::npos;
    return (isIpV6 ? "[" + host + "]" : host) + ":" + port;
}

ServerUrl readServerUrl(std::string_view url) {
    const UrlError wrong("\"" + std::string(url.substr(0, kLongestHost)) +
                         "\" is no URL of a server, such as https://centre.example:8443");
    if (url.substr(0, kScheme.size()) != kScheme) throw wrong;
    std::string_view rest = url.substr(kScheme.size());
    if (!rest.empty() && rest.back() == '/') rest.remove_suffix(1);
    const bool isBracketed = !rest.empty() && rest.front() == '[';
    const std::size_t end = rest.find(isBracketed ? ']' : ':');
    if (isBracketed && end == std::string_view::npos) throw wrong;
    ServerUrl read;
    read.host = rest.substr(isBracketed ? 1 : 0, isBracketed ? end - 1 : end);
    rest.remove_prefix(end == std::string_view::npos ? rest.size() : end + (isBracketed ? 1 : 0));
    read.port = kUsualPort;
    if (!rest.empty()) {
        if (rest.front() != ':' || !isPort(rest.substr(1))) throw wrong;
        read.port = rest.substr(1);
    }
    const bool isHost = isBracketed
                            ? isOf(read.host, ":.") && read.host.find(':') != std::string::npos
                            : isOf(read.host, "-._");
    if (!isHost || read.host.size() > kLongestHost) throw wrong;
    return read;
}

}  // namespace fleet
