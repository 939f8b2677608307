#include "soak/mix.h"

#include "soak/load/garbage.h"
#include "soak/load/pusher.h"
#include "soak/load/requester.h"
#include "soak/load/subscriber.h"

namespace soak {
namespace {

/// Seconds between two clients of one kind that join: whoever is turned away comes back at once.
constexpr double kBetweenJoins = 0.02;

/// The host has 64 places for transfers.
constexpr std::size_t kMostPushing = 20;

}  // namespace

template <typename Make>
void Mix::keepUp(const char* kind, std::size_t share, Make make) {
    double& next = nextJoin_[kind];
    const double now = world_.clock.now();
    if (now < next || crowd_.count(kind) >= clients_ * share / 100) return;
    next = now + kBetweenJoins;
    crowd_.add(make());
}

void Mix::pass() {
    keepUp("requester", 70, [this] { return requester(); });
    keepUp("subscriber", 14, [this] { return subscriber(); });
    keepUp("waiting", 4, [this] { return waiting(); });
    keepUp("slow", 2, [this] { return slow(); });
    keepUp("garbage", 10, [this] {
        return std::make_unique<GarbageClient>(world_, GarbageClient::Socket::Requests);
    });
    keepUp("transfer garbage", 4, [this] {
        return std::make_unique<GarbageClient>(world_, GarbageClient::Socket::Transfers);
    });
    const double now = world_.clock.now();
    if (now >= nextPush_ && crowd_.count("pushing") < kMostPushing) {
        nextPush_ = now + world_.chance.seconds(0.01, 0.15);
        crowd_.add(std::make_unique<Pusher>(world_));
    }
    if (now >= nextVanisher_) {
        nextVanisher_ = now + world_.chance.seconds(0.02, 0.4);
        const bool room = world_.ledger.outstanding() < Commands::kMostOutstanding;
        crowd_.add(std::make_unique<Vanisher>(
            world_, room && !world_.chance.oneIn(4) ? commands_.queued() : commands_.health()));
    }
    if (now >= nextRush_) joinRush();
    repeatWhatWasLost();
}

/// Whoever has lost the answer asks again.
void Mix::repeatWhatWasLost() {
    if (world_.repeats.empty()) return;
    const auto lost = world_.repeats.front();
    world_.repeats.erase(world_.repeats.begin());
    crowd_.add(std::make_unique<Requester>(
        world_, "repeating",
        [this, lost] {
            std::vector<Exchange> exchanges;
            exchanges.push_back(commands_.task(lost.first, lost.second));
            return exchanges;
        },
        1));
}

/// More than the host has places for: some are told so, and some only see the door.
void Mix::joinRush() {
    nextRush_ = world_.clock.now() + world_.chance.seconds(12, 24);
    world_.tally.count("rushes");
    for (std::size_t i = world_.chance.between(60, 200); i > 0; --i)
        crowd_.add(std::make_unique<Squatter>(world_, world_.chance.seconds(0.1, 2)));
}

std::unique_ptr<Client> Mix::requester() {
    return std::make_unique<Requester>(
        world_, "requester", [this] { return commands_.next(); }, world_.chance.between(1, 12));
}

std::unique_ptr<Client> Mix::subscriber() {
    Chance& chance = world_.chance;
    EventFilter filter;
    switch (chance.below(6)) {
        case 0:
            filter.command = chance.of<std::string>({"START", "INSTALL", "SETCONFIG", "UNINSTALL"});
            break;
        case 1:
            filter.target = "node" + std::to_string(chance.below(8)) + ":soak";
            break;
        case 2:
            filter.retval = 0;
            break;
        case 3:
            filter.messageId = chance.of<std::string>({"ZAV1031E", "ZAV1021E", "ZAV1099E"});
            break;
        case 4:
            filter.command = "SETCONFIG";
            filter.retval = 0;
            filter.target = "node" + std::to_string(chance.below(8)) + ":soak";
            break;
        default:
            break;
    }
    Subscriber::Manner manner;
    manner.stays = chance.oneIn(4) ? chance.seconds(0, 0.2) : chance.seconds(0.5, 15);
    manner.goesAtOnce = chance.oneIn(3);
    return std::make_unique<Subscriber>(world_, "subscriber", filter, manner);
}

/// What a server does that wants to know how its command ends: subscribe first, then ask.
std::unique_ptr<Client> Mix::waiting() {
    EventFilter filter;
    filter.number = commands_.announceStart();
    Subscriber::Manner manner;
    manner.stays = 120;
    manner.awaitsItsOwn = true;
    return std::make_unique<Subscriber>(
        world_, "waiting", filter, manner, [this, number = filter.number] {
            world_.joining.push_back(std::make_unique<Requester>(
                world_, "asking",
                [this, number] {
                    std::vector<Exchange> exchanges;
                    exchanges.push_back(commands_.announced(number));
                    return exchanges;
                },
                1));
        });
}

std::unique_ptr<Client> Mix::slow() {
    Subscriber::Manner manner;
    manner.sleepsBefore = world_.chance.seconds(5, 60);
    manner.stays = world_.chance.seconds(1, 5);
    manner.goesAtOnce = world_.chance.oneIn(3);
    return std::make_unique<Subscriber>(world_, "slow", EventFilter{}, manner);
}

}  // namespace soak
