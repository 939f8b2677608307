/// Clients of the event stream.
#pragma once

#include <functional>
#include <string>
#include <utility>

#include "soak/load/client.h"
#include "soak/load/commands.h"
#include "soak/load/http_text.h"

namespace soak {

/// The subscription that sees everything and stays to the end: its rows are the ledger's.
class ControlSubscriber final : public Client {
public:
    /// Continues behind this event; without one it begins with the next.
    explicit ControlSubscriber(World& world, std::string after = {})
        : Client(world, "control", world.home.socket()), position_(std::move(after)) {}

    bool live() const { return live_; }
    /// The last event that has come.
    const std::string& position() const { return position_; }

protected:
    bool begin() override;
    bool proceed(bool readable, bool writable) override;

private:
    void take(const EventMessage& message);
    void follow(const std::string& id);

    std::string position_;
    bool live_ = false;
};

/// A subscription for some time, which then goes without a word.
class Subscriber final : public Client {
public:
    struct Manner {
        double stays = 5;           ///< seconds
        double sleepsBefore = 0;    ///< seconds in which nothing is read
        bool goesAtOnce = false;    ///< vanishes without having read the rest
        bool awaitsItsOwn = false;  ///< goes when the one outcome of its filter has come
    };

    /// `live`, which may be empty, is called when the subscription stands.
    Subscriber(World& world, std::string kind, EventFilter filter, Manner manner,
               std::function<void()> live = {});

    bool wantsToRead() const override;
    void hostDied() override;

protected:
    bool begin() override;
    bool proceed(bool readable, bool writable) override;

private:
    bool takeHead();
    void takeRows();
    void lookForAnswer();
    void decideToGo();
    bool leave();
    bool breakOff();

    const Manner manner_;
    const std::function<void()> announceLive_;
    SubscriptionRecord record_;
    bool live_ = false;
    double sleepsUntil_ = 0;
    double decidesAt_ = 0;
    double leavesAt_ = 0;
    bool decided_ = false;
    bool served_ = false;
};

}  // namespace soak
