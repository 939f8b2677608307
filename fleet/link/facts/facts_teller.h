/// What a link tells about its host, and when.
#pragma once

#include <optional>
#include <string>

#include "fleet/bus/messages/facts.h"

namespace fleet {

/// What the host itself says when it is asked.
struct HostLook {
    std::string version;    ///< the host's
    std::string inventory;  ///< see Inventory::document
};

/// Decides when the host is asked and when facts are told. It has neither a clock nor a socket.
/// Times never go back. One thread at a time.
class FactsTeller {
public:
    /// The host is asked once an hour, besides when it comes and when tasks have ended: what
    /// somebody installs without a task is seen by then, and ages stay below that.
    static constexpr Moment kInventoryTime{60 * 60 * 1000};
    /// But not more often than that: each time a program runs on the host.
    static constexpr Moment kInventoryPause{60 * 1000};
    /// Tasks often come together.
    static constexpr Moment kSettleTime{3 * 1000};
    /// No two messages in a shorter time. Ten thousand hosts may have something to tell at once.
    static constexpr Moment kTellPause{60 * 1000};

    /// `own` has what never changes while the link runs: host, name, labels and its version.
    explicit FactsTeller(Facts own) : facts_(std::move(own)) {}

    void connected() { isConnected_ = true; }
    void disconnected() { isConnected_ = false; }
    void hostIs(const std::string& journal, Moment now);
    void hostIsAway();
    /// Tasks have begun or ended on the host, whoever asked for them.
    void tasksChanged(Moment now);
    void blockedIs(const std::string& why) { facts_.blocked = why; }

    /// Whether the host is to be asked now; then found() must follow.
    bool wantsLook(Moment now);
    /// Nothing, if the host did not answer: it is asked again after kInventoryPause.
    void found(const std::optional<HostLook>& look, Moment now);

    /// What is to be told now, if anything; then stored() must follow.
    std::optional<Facts> next(Moment now);
    /// Whether the bus has acknowledged it. Otherwise it is told again after kTellPause.
    void stored(bool isStored);

private:
    void lookAt(Moment when);

    Facts facts_;
    bool isConnected_ = false;
    bool isHere_ = false;
    bool isLooking_ = false;
    std::optional<Moment> lookAt_;    ///< when the host is asked next
    std::optional<Moment> lookedAt_;  ///< when it was asked last
    std::optional<Facts> told_;       ///< what the bus has
    std::optional<Facts> telling_;    ///< whether the bus has it is not known yet
    std::optional<Moment> toldAt_;    ///< when it was last tried
};

}  // namespace fleet
