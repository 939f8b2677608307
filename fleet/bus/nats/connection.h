/// A connection to the bus.
#pragma once

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <functional>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include "fleet/bus/nats/options.h"
#include "fleet/bus/nats/status.h"

namespace fleet {

class Subscription;

/// A connection that finds its way back by itself, for as long as it takes. All operations may be
/// called from any thread at the same time, but not from ConnectionEvents if they wait for the
/// server.
class Connection {
public:
    using Milliseconds = std::chrono::milliseconds;
    struct Result;

    /// Tries each server once. A failure that only another attempt can cure, because the client
    /// library cannot send each signature, is followed by one at once, four times at most.
    static Result connect(const ConnectionOptions& options);

    /// Closes it without waiting for what has been published: call close() before. No subscription
    /// may be left, and no other thread may use it.
    ~Connection();
    Connection(const Connection&) = delete;
    Connection& operator=(const Connection&) = delete;

    bool connected() const;
    /// Since connect(): how often it tried in vain to come back, and how often a signature had to
    /// be made for another nonce.
    std::uint64_t failedReconnects() const;
    std::uint64_t unsendableSignatures() const;

    /// Sends the bytes. It is not known whether the server has got them: flush() makes sure of
    /// that, and a missing permission shows in ConnectionEvents::error only. While there is no
    /// server the client library keeps messages until they are as long as the options allow, then
    /// this says NoAnswer. A server that reads nothing more holds it up for 10 seconds at most.
    BusStatus publish(const std::string& subject, std::string_view bytes,
                      const BusHeaders& headers = {});

    /// The same, with a subject to which others may answer.
    BusStatus publishAsking(const std::string& subject, const std::string& reply,
                            std::string_view bytes);

    /// A new subject below the prefix of this connection's inboxes, for answers to publishAsking().
    std::string newInbox() const;

    struct Reply;
    /// Publishes with a subject for the answer and waits for that. Nothing is sent while there is
    /// no server. A missing permission is told at once, unless two are missed at the same instant:
    /// then the client library tells one of them only, and the other request ends with NoAnswer.
    Reply request(const std::string& subject, std::string_view bytes, Milliseconds deadline,
                  const BusHeaders& headers = {});

    /// One of several requests. What it refers to outlives the call.
    struct Request {
        std::string subject;
        std::string_view bytes;
        BusHeaders headers;
    };
    /// The same for several at once: all are published before the first answer is waited for, which
    /// costs one round trip and not many. The replies are in the order of the requests, and the
    /// deadline is that of all together. None is under way any more when it returns.
    std::vector<Reply> requestAll(const std::vector<Request>& requests, Milliseconds deadline);

    /// What a subscription may hold that its callback has not yet taken; the rest is dropped and
    /// counted.
    struct QueueLimit {
        int messages = 65536;
        int bytes = 64 << 20;
    };
    using Receiver = std::function<void(const BusMessage&)>;
    struct Subscribed;
    /// Messages of the subject, with wildcards, go to the callback, one at a time and in their
    /// order, on a thread of the client library. It may throw nothing, and may use the connection.
    /// Waits until the server knows of it.
    Subscribed subscribe(const std::string& subject, Receiver receiver, Milliseconds deadline,
                         QueueLimit limit);
    Subscribed subscribe(const std::string& subject, Receiver receiver, Milliseconds deadline);

    /// Waits until the server has got all that was published before.
    BusStatus flush(Milliseconds deadline);

    /// Waits for the same and closes the connection, whatever the result, which says whether the
    /// server has got everything. Once it is over no event comes any more, and each operation ends
    /// with NoAnswer.
    BusStatus close(Milliseconds deadline);

private:
    friend class Subscription;
    class Impl;
    explicit Connection(std::shared_ptr<Impl> impl);
    std::shared_ptr<Impl> impl_;
};

struct Connection::Result {
    enum class Failure {
        None,
        Unreachable,   ///< no server answered
        Refused,       ///< a server does not take the credentials
        NotTrusted,    ///< no encryption with whom the options trust
        Misconfigured  ///< the options cannot be meant
    };
    std::unique_ptr<Connection> connection;  ///< none if it failed
    Failure failure = Failure::None;
    std::string text;  ///< for people
};

struct Connection::Reply {
    BusStatus status;
    BusMessage message;  ///< if it is done
};

/// Messages of one subject. Ends with the object.
class Subscription {
public:
    /// Once it is over the callback neither runs nor will run again. Not from the callback itself.
    ~Subscription();
    Subscription(const Subscription&) = delete;
    Subscription& operator=(const Subscription&) = delete;

    /// How many messages had no room in the queue.
    std::uint64_t dropped() const;

private:
    friend class Connection;
    class Impl;
    explicit Subscription(std::unique_ptr<Impl> impl);
    std::unique_ptr<Impl> impl_;
};

struct Connection::Subscribed {
    BusStatus status;
    std::unique_ptr<Subscription> subscription;  ///< none unless it is done
};

}  // namespace fleet
