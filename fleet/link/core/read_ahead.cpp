#include "fleet/link/core/read_ahead.h"

#include <algorithm>
#include <utility>

namespace fleet {

void ReadAhead::restart(Number taken) {
    *this = ReadAhead{};
    taken_ = scanned_ = known_ = taken;
    isWanted_ = true;
}

void ReadAhead::expect(Number number) {
    known_ = std::max(known_, number);
    if (known_ > scanned_) scanAgain();
}

void ReadAhead::scanAgain() {
    (awaited_ ? isAgain_ : isWanted_) = true;
}

std::optional<Number> ReadAhead::next() {
    if (awaited_) return std::nullopt;
    if (isWanted_) {
        isScanned_ = false;
        return awaited_ = scanned_ + 1;
    }
    // What a scan has passed over is read once more when its turn comes near.
    if (kept_.size() < kMostKept && nextKept() <= scanned_) return awaited_ = nextKept();
    return std::nullopt;
}

bool ReadAhead::isAwaited(Number number) {
    if (awaited_ != number) return false;
    awaited_.reset();
    return true;
}

bool ReadAhead::found(Number number, Directive directive) {
    if (!isAwaited(number)) return false;
    if (number > scanned_) scanned_ = number;
    if (number == nextKept() && kept_.size() < kMostKept) kept_.push_back(std::move(directive));
    return true;
}

bool ReadAhead::missing(Number number) {
    if (!isAwaited(number)) return false;
    if (number <= scanned_) {
        // It was there and is gone: it counts as never read.
        scanned_ = number - 1;
        known_ = std::max(known_, number);
    }
    isWanted_ = std::exchange(isAgain_, false);
    isScanned_ = true;
    return true;
}

bool ReadAhead::unanswered(Number number) {
    if (!isAwaited(number)) return false;
    isWanted_ = std::exchange(isAgain_, false);
    return true;
}

void ReadAhead::drop(Number taken) {
    while (!kept_.empty() && taken_ < taken) {
        kept_.pop_front();
        ++taken_;
    }
    taken_ = std::max(taken_, taken);
    scanned_ = std::max(scanned_, taken);
    known_ = std::max(known_, taken);
    // An answer under way to a number that is done with leads nowhere.
    if (awaited_ && *awaited_ <= taken_) {
        awaited_.reset();
        isWanted_ = true;
    }
}

}  // namespace fleet
