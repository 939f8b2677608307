#include "http/turned_away.h"

#include <sys/socket.h>

#include <boost/beast/http/message.hpp>
#include <string>

namespace http {
namespace {

namespace wire = boost::beast::http;

std::string bytesOf(const Reply& reply, const Fields& fields) {
    const auto reason = wire::obsolete_reason(static_cast<wire::status>(reply.status));
    std::string head = "HTTP/1.1 " + std::to_string(reply.status) + ' ' +
                       std::string(reason.data(), reason.size()) + "\r\nConnection: close\r\n";
    for (const auto& [name, value] : fields)
        head += name + ": " + value + "\r\n";
    return head + "Content-Type: " + reply.type +
           "\r\nContent-Length: " + std::to_string(reply.body.size()) + "\r\n\r\n" + reply.body;
}

}  // namespace

void turnAway(int connection, const Reply& reply, const Fields& fields) {
    const std::string answer = bytesOf(reply, fields);
    if (::send(connection, answer.data(), answer.size(), MSG_NOSIGNAL | MSG_DONTWAIT) < 0) return;
    ::shutdown(connection, SHUT_WR);
    // A request that lies there unread would make the close a reset.
    char dropped[4096];
    ::recv(connection, dropped, sizeof dropped, MSG_DONTWAIT);
}

}  // namespace http
