#include "fleet/server/keys/setup/fleet_plan.h"

#include <algorithm>
#include <cctype>
#include <filesystem>
#include <string_view>
#include <system_error>

#include "fleet/server/keys/files/keys_error.h"
#include "fleet/server/keys/tls/server_names.h"

namespace fleet {
namespace {

namespace fs = std::filesystem;

constexpr std::size_t kLongestFleetName = 40;
constexpr int kHighestPort = 65535;

struct Address {
    std::string host;
    std::string port;  ///< "" if there is none
};

bool isPort(const std::string& text) {
    const auto isDigit = [](unsigned char c) { return std::isdigit(c) != 0; };
    return !text.empty() && text.size() <= 5 && std::all_of(text.begin(), text.end(), isDigit) &&
           std::stoi(text) >= 1 && std::stoi(text) <= kHighestPort;
}

/// HOST, HOST:PORT, [ADDRESS] or [ADDRESS]:PORT.
std::optional<Address> addressIn(const std::string& text) {
    const bool isBracketed = !text.empty() && text.front() == '[';
    const std::size_t end = isBracketed ? text.find(']') : text.find(':');
    if (isBracketed && end == std::string::npos) return std::nullopt;
    Address address;
    address.host = isBracketed ? text.substr(1, end - 1) : text.substr(0, end);
    const std::string rest =
        end == std::string::npos ? "" : text.substr(end + (isBracketed ? 1 : 0));
    if (rest.empty()) return address;
    address.port = rest.substr(1);
    if (rest.front() != ':' || !isPort(address.port)) return std::nullopt;
    return address;
}

Address addressOf(const std::string& url, const std::string& scheme, const FleetPlan& plan) {
    const bool fits = url.rfind(scheme, 0) == 0;
    const auto address = fits ? addressIn(url.substr(scheme.size())) : std::nullopt;
    if (!address) throw KeysError("\"" + url + "\" is no address such as " + scheme + "HOST:PORT");
    if (std::find(plan.names.begin(), plan.names.end(), address->host) == plan.names.end()) {
        throw KeysError("\"" + url + "\": " + address->host +
                        " is none of the servers' names, so no certificate would fit");
    }
    return *address;
}

void checkFleetName(const std::string& name) {
    const auto fits = [](unsigned char c) {
        return c < 0x80 && (std::isalnum(c) != 0 || c == '-' || c == '_' || c == '.');
    };
    if (name.empty() || name.size() > kLongestFleetName ||
        !std::all_of(name.begin(), name.end(), fits)) {
        throw KeysError("a fleet's name has 1 to 40 letters, digits, \"-\", \"_\" and \".\"");
    }
}

/// Absolute, and fit to stand in quotation marks.
std::string plainPath(const std::string& path, const char* what) {
    const bool isPlain = !path.empty() && std::none_of(path.begin(), path.end(), [](char c) {
        return c == '"' || c == '\\' || static_cast<unsigned char>(c) < ' ';
    });
    if (!isPlain) throw KeysError(std::string(what) + " has no path that can be written down");
    return fs::absolute(path).lexically_normal().string();
}

}  // namespace

FleetPlan completed(FleetPlan plan) {
    checkFleetName(plan.fleet);
    checkServerNames(plan.names);
    plan.directory = plainPath(plan.directory, "the centre's directory");
    plan.rootFile = plainPath(plan.rootFile, "the root's file");
    if (plan.busDirectory.empty()) plan.busDirectory = plan.directory + "/bus";
    plan.busDirectory = plainPath(plan.busDirectory, "the bus's directory");
    insistOnRootApart(plan);
    if (plan.busUrls.empty()) plan.busUrls = {"nats://" + plan.names.front() + ":4222"};
    for (const std::string& url : plan.busUrls) {
        if (addressOf(url, "nats://", plan).port.empty()) {
            throw KeysError("\"" + url + "\" lacks a port");
        }
    }
    if (plan.url.empty()) plan.url = "https://" + plan.names.front() + ":8443";
    if (plan.url.back() == '/') plan.url.pop_back();
    addressOf(plan.url, "https://", plan);
    return plan;
}

void insistOnRootApart(const FleetPlan& plan) {
    std::error_code error;
    const fs::path folder = fs::weakly_canonical(plan.directory, error);
    const fs::path file = error ? fs::path() : fs::weakly_canonical(plan.rootFile, error);
    if (error) throw KeysError("cannot look for " + plan.rootFile + ": " + error.message());
    const auto [ended, rest] =
        std::mismatch(folder.begin(), folder.end(), file.begin(), file.end());
    if (ended == folder.end()) {
        throw KeysError("the root must not be in the centre's directory; keep it apart");
    }
}

std::string portOfBus(const std::string& url) {
    return url.substr(url.rfind(':') + 1);
}

}  // namespace fleet
