#include "fleet/server/keys/tls/server_names.h"

#include <arpa/inet.h>

#include <algorithm>
#include <array>
#include <cstddef>

#include "fleet/server/keys/files/keys_error.h"

namespace fleet {
namespace {

constexpr std::size_t kLongestName = 253;
constexpr std::size_t kMostNames = 64;

bool isDnsName(const std::string& text) {
    const auto isCharacter = [](char c) {
        return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || (c >= '0' && c <= '9') ||
               c == '-' || c == '.';
    };
    const auto isEdge = [](char c) { return c == '-' || c == '.'; };
    return !text.empty() && text.size() <= kLongestName &&
           std::all_of(text.begin(), text.end(), isCharacter) && !isEdge(text.front()) &&
           !isEdge(text.back()) && text.find("..") == std::string::npos;
}

}  // namespace

bool isIpAddress(const std::string& text) {
    std::array<unsigned char, sizeof(in6_addr)> address{};
    return ::inet_pton(AF_INET, text.c_str(), address.data()) == 1 ||
           ::inet_pton(AF_INET6, text.c_str(), address.data()) == 1;
}

void checkServerNames(const std::vector<std::string>& names) {
    if (names.empty()) throw KeysError("name the DNS name by which hosts reach the servers");
    if (names.size() > kMostNames) throw KeysError("these are too many names of servers");
    for (const std::string& name : names) {
        if (!isIpAddress(name) && !isDnsName(name)) {
            throw KeysError("\"" + name + "\" is neither a DNS name nor an IP address");
        }
    }
    if (isIpAddress(names.front())) throw KeysError("the first name of the servers is a DNS name");
}

}  // namespace fleet
