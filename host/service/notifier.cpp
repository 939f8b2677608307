#include "host/service/notifier.h"

#include <sys/socket.h>
#include <sys/time.h>
#include <sys/un.h>

#include <cerrno>
#include <cstddef>
#include <cstdint>
#include <ctime>
#include <system_error>

#include "host/process/start_error.h"

namespace host {
namespace {

constexpr time_t kLongestWait = 5;  // seconds

std::string systemAddress(std::string address) {
    if (address.empty()) return address;
    if (address.front() != '/' && address.front() != '@') {
        throw StartError("NOTIFY_SOCKET is set to \"" + address +
                         "\", which is neither a path nor an abstract name");
    }
    // A path has room for its terminating 0, an abstract name needs none.
    if (address.size() >= sizeof sockaddr_un::sun_path) {
        throw StartError("NOTIFY_SOCKET is too long: " + address);
    }
    if (address.front() == '@') address.front() = '\0';
    return address;
}

sys::FileDescriptor datagramSocket() {
    sys::FileDescriptor made(::socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC, 0));
    const timeval wait{kLongestWait, 0};
    if (!made || ::setsockopt(made.get(), SOL_SOCKET, SO_SNDTIMEO, &wait, sizeof wait) != 0) {
        throw StartError("no socket for the service manager: " +
                         std::generic_category().message(errno));
    }
    return made;
}

}  // namespace

Notifier::Notifier(const std::string& address) : address_(systemAddress(address)) {
    if (isWanted()) socket_ = datagramSocket();
}

bool Notifier::send(const std::string& lines, bool waits) const {
    if (!isWanted()) return false;
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    address_.copy(address.sun_path, address_.size());
    // The length tells an abstract name from one that ends in zeros.
    const bool isPath = address_.front() == '/';
    const auto length = static_cast<socklen_t>(offsetof(sockaddr_un, sun_path) + address_.size() +
                                               (isPath ? 1U : 0U));
    const int flags = MSG_NOSIGNAL | (waits ? 0 : MSG_DONTWAIT);
    while (true) {
        const ssize_t sent = ::sendto(socket_.get(), lines.data(), lines.size(), flags,
                                      reinterpret_cast<const sockaddr*>(&address), length);
        if (sent >= 0) return true;
        if (errno != EINTR) return false;
    }
}

std::string reloadingNotice() {
    timespec now{};
    ::clock_gettime(CLOCK_MONOTONIC, &now);
    const std::int64_t microseconds =
        std::int64_t{now.tv_sec} * 1'000'000 + std::int64_t{now.tv_nsec} / 1'000;
    return "RELOADING=1\nMONOTONIC_USEC=" + std::to_string(microseconds) + "\n";
}

}  // namespace host
