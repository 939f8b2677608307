/// Which clients there are.
#pragma once

#include "soak/load/client.h"
#include "soak/load/commands.h"

namespace soak {

/// Sees to it that there are always as many clients of each kind as there are to be.
class Mix {
public:
    /// `clients`: how many hold connections to the request socket, apart from short crowds.
    Mix(World& world, Crowd& crowd, std::size_t clients)
        : world_(world), crowd_(crowd), commands_(world), clients_(clients) {}

    void pass();
    Commands& commands() { return commands_; }

private:
    /// Clients of the kind join, one after the other, until there are `share` percent of all.
    template <typename Make>
    void keepUp(const char* kind, std::size_t share, Make make);
    void joinRush();
    void repeatWhatWasLost();
    std::unique_ptr<Client> requester();
    std::unique_ptr<Client> subscriber();
    std::unique_ptr<Client> waiting();
    std::unique_ptr<Client> slow();

    World& world_;
    Crowd& crowd_;
    Commands commands_;
    const std::size_t clients_;
    std::map<std::string, double> nextJoin_;
    double nextRush_ = 8;
    double nextVanisher_ = 0;
    double nextPush_ = 0;
};

}  // namespace soak
