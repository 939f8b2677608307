#include "fleet/link/facts/facts_teller.h"

#include <algorithm>

namespace fleet {

void FactsTeller::lookAt(Moment when) {
    if (lookedAt_) when = std::max(when, *lookedAt_ + kInventoryPause);
    if (!lookAt_ || when < *lookAt_) lookAt_ = when;
}

void FactsTeller::hostIs(const std::string& journal, Moment now) {
    const bool isNew = !isHere_ || facts_.journal != journal;
    isHere_ = true;
    facts_.journal = journal;
    if (isNew) lookAt(now);
}

void FactsTeller::hostIsAway() {
    isHere_ = false;
    facts_.journal.clear();
}

void FactsTeller::tasksChanged(Moment now) {
    lookAt(now + kSettleTime);
}

bool FactsTeller::wantsLook(Moment now) {
    if (isLooking_ || !isHere_ || !lookAt_ || now < *lookAt_) return false;
    isLooking_ = true;
    lookedAt_ = now;
    lookAt_ = now + kInventoryTime;
    return true;
}

void FactsTeller::found(const std::optional<HostLook>& look, Moment now) {
    isLooking_ = false;
    if (!look) return lookAt(now + kInventoryPause);
    facts_.version = look->version;
    // When it was asked: what is installed since then it may not have said.
    facts_.inventory = Inventory{*lookedAt_, look->inventory};
}

std::optional<Facts> FactsTeller::next(Moment now) {
    const bool isPause = toldAt_ && now < *toldAt_ + kTellPause;
    if (!isConnected_ || telling_ || isPause) return std::nullopt;
    // What is about to be known goes along.
    if (isLooking_ || (isHere_ && lookAt_ && *lookAt_ <= now)) return std::nullopt;
    const auto takenIn = [](const Facts& facts) {
        return facts.inventory ? facts.inventory->time : Moment{};
    };
    // The same inventory an hour later is news, too: it is that much younger.
    const bool isNews =
        !told_ || !saySame(*told_, facts_) || takenIn(facts_) >= takenIn(*told_) + kInventoryTime;
    if (!isNews) return std::nullopt;
    toldAt_ = now;
    telling_ = facts_;
    telling_->time = now;
    return telling_;
}

void FactsTeller::stored(bool isStored) {
    if (isStored) told_ = telling_;
    telling_.reset();
}

}  // namespace fleet
