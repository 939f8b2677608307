/// A link's connection to the bus.
#pragma once

#include <atomic>
#include <functional>
#include <memory>
#include <string>
#include <vector>

#include "fleet/bus/messages/facts.h"
#include "fleet/bus/nats/connection.h"
#include "fleet/link/core/actions.h"
#include "fleet/link/judge.h"
#include "fleet/loop/worker.h"

namespace fleet {

/// Connects, and connects again, for as long as it takes; does what the link wants of the bus, one
/// thing after the other. Answers and events come on threads of its own; it may be called from any
/// thread.
class BusSide {
public:
    /// Each must return soon and throw nothing.
    struct Events {
        std::function<void()> connected;  ///< and subscribed
        std::function<void()> disconnected;
        std::function<void(Number)> seen;  ///< an order with this number was published
        std::function<void(Number, Directive)> read;
        std::function<void(Number)> missing;
        std::function<void(Number)> unanswered;
        std::function<void(Reply)> replied;
        std::function<void(const std::string& nonce)> unheard;
        std::function<void(const std::string& bytes)> asked;  ///< something, by anybody
    };

    /// `signing` and the bus's key in `options` are this host's.
    BusSide(ConnectionOptions options, Trust trust, const KeyPair& bus, const KeyPair& signing,
            Events events);
    /// No event comes any more once it is over. What is under way is waited for, some seconds.
    ~BusSide();
    BusSide(const BusSide&) = delete;
    BusSide& operator=(const BusSide&) = delete;

    void read(Number number);
    void sayHello(Hello hello);
    void report(const Outcome& outcome);
    /// Publishes the pieces of an answer.
    void answer(std::vector<std::string> pieces);
    /// `answer` is told whether the bus has them; on the worker's thread.
    void tell(Facts facts, std::function<void(bool isStored)> answer);

    /// Orders whose number the centre has not signed.
    std::uint64_t unsignedNumbers() const { return unsignedNumbers_; }

private:
    void connect();
    void disconnect();
    ConnectionOptions optionsOfThis();
    bool subscribe();
    bool subscribeToQuestions();
    void readNow(Number number);
    void sayHelloNow(const Hello& hello);
    void reportNow(const Outcome& outcome);
    bool tellNow(const Facts& facts);

    ConnectionOptions options_;
    const Trust trust_;
    const KeyPair bus_;
    const KeyPair signing_;
    const Events events_;
    std::atomic<std::uint64_t> unsignedNumbers_{0};
    std::unique_ptr<Connection> connection_;  ///< the worker's
    std::unique_ptr<Subscription> published_;
    std::unique_ptr<Subscription> questions_;
    std::atomic<bool> isEnding_{false};
    std::atomic<int> attempt_{0};  ///< tells events of this connection from those of earlier ones
    Worker worker_;                ///< last: it uses everything above
};

/// The outcome as it is published: without the outputs of its commands, and in the end without the
/// task, where it would be longer than the bus takes.
std::string publishedOutcome(const Outcome& outcome, const KeyPair& signing);

}  // namespace fleet
