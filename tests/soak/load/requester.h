/// A client that asks, waits for the answers, thinks, and asks again on the same connection.
#pragma once

#include <deque>
#include <functional>
#include <string>
#include <vector>

#include "soak/load/client.h"
#include "soak/load/http_text.h"

namespace soak {

/// A request and what its answer is to be.
struct Exchange {
    std::string request;
    /// Called before the first byte is sent.
    std::function<void()> sending;
    /// Called with the answer, or with null when the connection ended without one.
    std::function<void(const Answer*)> answered;
};

/// Makes the requests that are sent at once, without waiting for answers between them.
using NextExchanges = std::function<std::vector<Exchange>()>;

class Requester final : public Client {
public:
    /// Asks `rounds` times, and fewer when the traffic comes to its end.
    Requester(World& world, std::string kind, NextExchanges next, std::size_t rounds);
    void hostDied() override { cutOff(true); }

protected:
    bool begin() override;
    bool proceed(bool readable, bool writable) override;

private:
    bool ask();
    bool takeAnswers();
    bool cutOff(bool byHost);
    bool next();

    const NextExchanges next_;
    std::size_t rounds_;
    std::deque<Exchange> pending_;
    bool answeredBefore_ = false;
    double askedAt_ = 0;
};

/// Vanishes in the middle of a request or of its answer.
class Vanisher final : public Client {
public:
    Vanisher(World& world, Exchange exchange);

protected:
    bool begin() override;
    bool proceed(bool readable, bool writable) override;

private:
    const Exchange exchange_;
    std::size_t sends_ = 0;
    std::size_t reads_ = 0;
    double leavesAt_ = 0;
};

}  // namespace soak
