/// How a connection to the bus is made and kept.
#pragma once

#include <chrono>
#include <cstdint>
#include <functional>
#include <string>
#include <string_view>
#include <variant>
#include <vector>

namespace fleet {

/// A signature of 64 bytes over what the server chose. Runs on the thread that connects and, for
/// later connections, on one of the client library's; may throw, which makes that one attempt fail.
using Signer = std::function<std::string(std::string_view nonce)>;

/// Nobody says who they are.
using Anonymous = std::monostate;

struct UserPassword {
    std::string user;
    std::string password;
};

/// A key pair that the server's configuration lists.
struct UserKey {
    std::string publicKey;  ///< "U..."
    Signer sign;
};

/// A key pair whose rights stand in a token that an account has signed.
struct UserToken {
    /// The token, asked for at each connection: a renewed one is used at the next. Threads and
    /// exceptions as with the signer.
    std::function<std::string()> token;
    Signer sign;
};

using Credentials = std::variant<Anonymous, UserPassword, UserKey, UserToken>;

struct TlsOptions {
    std::string caFile;      ///< certificates of who may sign the server's, PEM
    std::string serverName;  ///< the DNS name that the server's certificate must have
};

/// Tells what happens to a connection. All of them run on one thread of the client library, which
/// all connections of the process share: they must be short, may not close or destroy the
/// connection, and may not wait for an answer from the bus. They may throw nothing. None runs once
/// close() is over.
struct ConnectionEvents {
    /// The server is gone; the client tries to reach one until the connection is closed.
    std::function<void()> disconnected;
    /// It is there again, or another one. Subscriptions have been made again. What was published
    /// shortly before may be lost, what the server sent meanwhile is.
    std::function<void()> reconnected;
    /// The connection has ended for good: close() was called, or a server has refused the
    /// credentials twice in a row. Then the object is of no use any more.
    std::function<void(const std::string& why)> closed;
    /// The server or the client complains: of a missing permission, of a subscriber that is too
    /// slow.
    std::function<void(const std::string& what)> error;
};

struct ConnectionOptions {
    std::vector<std::string> urls;                 ///< "nats://HOST:PORT"; tried in random order
    std::variant<std::monostate, TlsOptions> tls;  ///< without it nothing is encrypted
    Credentials credentials;
    std::string name;                    ///< shown in the server's lists
    std::string inboxPrefix = "_INBOX";  ///< answers come to subjects below it
    /// For one attempt, with the handshake. Generous: thousands may connect at once.
    std::chrono::milliseconds connectTimeout = std::chrono::seconds(30);
    /// Before each attempt to come back: see pauseBefore().
    std::chrono::milliseconds reconnectWait = std::chrono::seconds(2);
    std::chrono::milliseconds reconnectJitter = std::chrono::seconds(3);
    /// How many bytes may be published while there is no server; 0 for none.
    std::uint32_t reconnectBuffer = 1U << 20U;
    std::chrono::milliseconds pingInterval =
        std::chrono::seconds(20);  ///< two missed: disconnected
    /// Messages are delivered by threads that all connections of the process share, in place of one
    /// each. For programs with thousands of connections.
    bool sharesThreads = false;
    ConnectionEvents events;
};

/// The pause before an attempt to reach a server again, the first of which has the number 1: the
/// wait, and a part of the jitter that is drawn, which is twice as long after each attempt up to 16
/// times.
///
/// Thousands come back at the same time when a server was away, and each attempt costs it a TLS
/// handshake. It expects that a client is through with it within some seconds; one that comes when
/// there are too many others fails and tries again. If all of them did so within the same few
/// seconds for ever, none of them would get through.
std::chrono::milliseconds pauseBefore(const ConnectionOptions& options, int attempt);

}  // namespace fleet
