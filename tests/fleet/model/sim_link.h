/// A link's program: it carries out what the link decides, and may be killed between any two
/// actions.
#pragma once

#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "fleet/link/core/link.h"
#include "tests/fleet/model/sim_bus.h"
#include "tests/fleet/model/sim_host.h"

namespace model {

/// Makes a directive of an order's bytes; nothing if its number was not signed for this host.
std::optional<fleet::Directive> directiveOf(const std::string& bytes, const std::string& host,
                                            fleet::Number number);

/// The bytes of an order with its number, as the model's centre publishes them.
struct SimOrder {
    std::string host;
    std::string order;
    std::string cancels;
    bool hasFiles = false;
    bool isBad = false;        ///< the host will not take it
    bool isForbidden = false;  ///< the link will not
    fleet::Moment issued{};
    fleet::Moment expires{};
};
std::string bytesOf(const SimOrder& order, fleet::Number number);
SimOrder orderIn(const std::string& bytes, fleet::Number& number);

class SimLink {
public:
    SimLink(SimHost& host, SimBus& bus, Dice& dice, std::string name);

    bool isUp() const { return link_ != nullptr; }
    bool isConnected() const { return isUp() && isConnected_; }
    void start(fleet::Moment now);
    void kill();
    void connect(fleet::Moment now);
    void disconnect();
    void tick(fleet::Moment now);

    /// Lets one of the answers under way arrive, any of them. False if there is none.
    bool deliver(fleet::Moment now);

    void seen(fleet::Number number, fleet::Moment now);
    void replied(const fleet::Reply& reply, fleet::Moment now);
    /// The host tells what has ended, if the link listens.
    void ended(const fleet::Outcome& outcome, fleet::Moment now);
    void hostStarted(fleet::Moment now);
    void hostEnded(fleet::Moment now);

    /// Called for each hello.
    std::function<void(const fleet::Hello&)> onHello;

    const SimHost& host() const { return host_; }
    const fleet::Kept& disk() const { return disk_; }
    /// A backup of its file is put back.
    void putBack(const fleet::Kept& kept) { disk_ = kept; }
    const std::string& stopped() const { return stopped_; }

private:
    using Arrival = std::function<fleet::Actions(fleet::Link&, fleet::Moment)>;

    void carryOut(const fleet::Actions& actions, fleet::Moment now);
    void apply(const fleet::ReadOrder& action);
    void apply(const fleet::PrepareFiles& action);
    void apply(const fleet::HandOver& action);
    void apply(const fleet::EnterEnd& action);
    void apply(const fleet::CancelTask& action);
    void apply(const fleet::LookUp& action);
    void apply(const fleet::Report& action);
    void apply(const fleet::Keep& action);
    void apply(const fleet::SayHello& action);
    void apply(const fleet::StopLink& action);
    fleet::LinkSettings settings();

    SimHost& host_;
    SimBus& bus_;
    Dice& dice_;
    const std::string name_;
    int starts_ = 0;
    int nonces_ = 0;
    fleet::Kept disk_;
    std::unique_ptr<fleet::Link> link_;
    bool isConnected_ = false;
    bool listensToHost_ = false;
    std::vector<Arrival> underWay_;
    std::string stopped_;
};

}  // namespace model
