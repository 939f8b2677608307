#include "host/service/service_environment.h"

#include <fcntl.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <algorithm>
#include <charconv>
#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <string_view>
#include <system_error>
#include <utility>

#include "host/process/start_error.h"

namespace host {
namespace {

constexpr int kFirstPassed = 3;
constexpr int kMostPassed = 64;
constexpr const char* kVariables[] = {"NOTIFY_SOCKET", "WATCHDOG_USEC", "WATCHDOG_PID",
                                      "LISTEN_FDS",    "LISTEN_PID",    "LISTEN_FDNAMES"};

std::string variableIn(const Environment& environment, const char* name) {
    const char* const value = environment(name);
    return value == nullptr ? "" : value;
}

/// Nothing if the variable is not set or empty.
std::optional<std::int64_t> numberVariable(const Environment& environment, const char* name) {
    const std::string text = variableIn(environment, name);
    if (text.empty()) return std::nullopt;
    std::int64_t number = 0;
    const char* const end = text.data() + text.size();
    const auto [rest, error] = std::from_chars(text.data(), end, number);
    if (error != std::errc() || rest != end || number < 0) {
        throw StartError(std::string(name) + " is set to \"" + text + "\", which is no number");
    }
    return number;
}

bool isForThisProcess(const std::optional<std::int64_t>& pid) {
    return pid == std::int64_t{::getpid()};
}

std::optional<std::chrono::microseconds> watchdogIn(const Environment& environment) {
    const auto time = numberVariable(environment, "WATCHDOG_USEC");
    const auto pid = numberVariable(environment, "WATCHDOG_PID");
    if (!time || *time == 0 || (pid && !isForThisProcess(pid))) return std::nullopt;
    return std::chrono::microseconds(*time);
}

std::vector<std::string> separatedByColons(const std::string& text) {
    std::vector<std::string> parts;
    std::size_t begin = 0;
    while (begin <= text.size()) {
        const std::size_t end = std::min(text.find(':', begin), text.size());
        parts.push_back(text.substr(begin, end - begin));
        begin = end + 1;
    }
    return parts;
}

bool hasOption(int descriptor, int option, int wanted) {
    int value = 0;
    socklen_t length = sizeof value;
    return ::getsockopt(descriptor, SOL_SOCKET, option, &value, &length) == 0 && value == wanted;
}

/// "" if it is no listening Unix stream socket with a file.
std::string socketPathOf(int descriptor) {
    sockaddr_un address{};
    socklen_t length = sizeof address;
    if (!hasOption(descriptor, SO_DOMAIN, AF_UNIX) ||
        !hasOption(descriptor, SO_TYPE, SOCK_STREAM) || !hasOption(descriptor, SO_ACCEPTCONN, 1) ||
        ::getsockname(descriptor, reinterpret_cast<sockaddr*>(&address), &length) != 0) {
        return "";
    }
    constexpr std::size_t kPathBegins = offsetof(sockaddr_un, sun_path);
    const std::size_t room = length > kPathBegins ? length - kPathBegins : 0;
    return std::string(address.sun_path, ::strnlen(address.sun_path, room));
}

PassedSocket adopt(int number, std::string name) {
    PassedSocket socket{sys::FileDescriptor(number), std::move(name), socketPathOf(number)};
    if (socket.path.empty()) {
        throw StartError("the service manager passed descriptor " + std::to_string(number) +
                         ", which is no listening Unix stream socket with a path");
    }
    const int flags = ::fcntl(number, F_GETFL);
    if (::fcntl(number, F_SETFD, FD_CLOEXEC) != 0 || flags < 0 ||
        ::fcntl(number, F_SETFL, flags | O_NONBLOCK) != 0) {
        throw StartError("descriptor " + std::to_string(number) + " cannot be set up");
    }
    return socket;
}

std::vector<PassedSocket> socketsIn(const Environment& environment) {
    std::vector<PassedSocket> sockets;
    if (!isForThisProcess(numberVariable(environment, "LISTEN_PID"))) return sockets;
    const std::int64_t count = numberVariable(environment, "LISTEN_FDS").value_or(0);
    if (count > kMostPassed) {
        throw StartError("LISTEN_FDS is set to " + std::to_string(count) + ", which is too many");
    }
    std::vector<std::string> names = separatedByColons(variableIn(environment, "LISTEN_FDNAMES"));
    names.resize(static_cast<std::size_t>(count));
    for (int i = 0; i < count; ++i)
        sockets.push_back(adopt(kFirstPassed + i, names[static_cast<std::size_t>(i)]));
    return sockets;
}

bool isRole(std::string_view name) {
    return name == "http" || name == "rpc";
}

}  // namespace

ServiceEnvironment readServiceEnvironment(const Environment& environment) {
    return {variableIn(environment, "NOTIFY_SOCKET"), watchdogIn(environment),
            socketsIn(environment)};
}

void forgetServiceEnvironment() {
    for (const char* const name : kVariables)
        ::unsetenv(name);
}

std::optional<PassedSocket> takeSocket(std::vector<PassedSocket>& sockets, const std::string& role,
                                       const std::string& path) {
    const auto found =
        std::find_if(sockets.begin(), sockets.end(),
                     [&](const PassedSocket& socket) { return socket.path == path; });
    if (found == sockets.end()) return std::nullopt;
    if (isRole(found->name) && found->name != role) {
        throw StartError("the service manager passed the socket " + path + " as \"" + found->name +
                         "\", but here it is \"" + role + "\"");
    }
    PassedSocket taken = std::move(*found);
    sockets.erase(found);
    return taken;
}

void refuseSuperfluous(const std::vector<PassedSocket>& sockets) {
    if (sockets.empty()) return;
    throw StartError("the service manager passed the socket " + sockets.front().path +
                     ", which is neither --socket nor --rpc-socket");
}

}  // namespace host
