/// The requests that clients make.
#pragma once

#include <vector>

#include "soak/load/client.h"
#include "soak/load/requester.h"

namespace soak {

/// Makes requests of all kinds, entered in the ledger where something is to come of them.
class Commands {
public:
    explicit Commands(World& world) : world_(world) {}

    /// One request, or a few that are sent at once.
    std::vector<Exchange> next();
    /// One command of any kind that is queued.
    Exchange queued(std::size_t burst = 0);
    /// A command that is queued, for a request that has been announced.
    Exchange announced(Ledger::Number number) const;
    /// The same, to be carried out when its turn comes. It may be made any number of times.
    Exchange announcedInTurn(Ledger::Number number) const;
    /// A request to /v1/tasks, or its repetition.
    Exchange task(Ledger::Number number, const std::string& body) const;
    /// A start that always is to succeed; announces it.
    Ledger::Number announceStart();
    /// "GET /v1/health".
    Exchange health() const;

    /// Queued commands are left out while that many are on their way.
    static constexpr std::size_t kMostOutstanding = 250;

private:
    struct Shape;
    Exchange one();
    Exchange query();
    Exchange inventory();
    Exchange getConfiguration();
    Exchange completeInstall();
    Exchange refused();
    Exchange make(const Shape& shape, std::size_t burst);
    Exchange entered(Ledger::Number number, std::string body) const;
    Exchange inTurn(const Shape& shape, Ledger::Number number) const;
    Shape startStop();
    Shape configuration();
    Shape install();
    Shape removal();
    std::string product();
    std::string target();

    World& world_;
};

}  // namespace soak
