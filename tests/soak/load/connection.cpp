#include "soak/load/connection.h"

#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <utility>

namespace soak {

Connection::Opening Connection::open(const std::string& path) {
    close();
    descriptor_ = ::socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0);
    if (descriptor_ < 0) return Opening::Refused;
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    path.copy(address.sun_path, sizeof address.sun_path - 1);
    if (::connect(descriptor_, reinterpret_cast<const sockaddr*>(&address), sizeof address) == 0) {
        return Opening::Done;
    }
    const Opening result = errno == EAGAIN ? Opening::Later : Opening::Refused;
    close();
    return result;
}

void Connection::close() {
    if (descriptor_ >= 0) ::close(std::exchange(descriptor_, -1));
}

bool Connection::flush(std::size_t most) {
    const std::size_t end = sent_ + std::min(most, out_.size() - sent_);
    while (sent_ < end) {
        const ssize_t count = ::send(descriptor_, out_.data() + sent_, end - sent_, MSG_NOSIGNAL);
        if (count < 0) return errno == EAGAIN || errno == EINTR;
        sent_ += static_cast<std::size_t>(count);
        total_ += static_cast<std::size_t>(count);
    }
    if (sent_ == out_.size()) {
        out_.clear();
        sent_ = 0;
    }
    return true;
}

void Connection::endSending() const {
    ::shutdown(descriptor_, SHUT_WR);
}

bool Connection::fill(std::size_t most) {
    char piece[16384];
    while (most > 0) {
        const ssize_t count = ::recv(descriptor_, piece, std::min(most, sizeof piece), 0);
        if (count == 0) return false;
        if (count < 0) return errno == EAGAIN || errno == EINTR;
        in_.append(piece, static_cast<std::size_t>(count));
        most -= static_cast<std::size_t>(count);
    }
    return true;
}

}  // namespace soak
