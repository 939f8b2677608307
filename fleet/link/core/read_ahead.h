/// Reads a host's orders from the bus before they are carried out, so that a cancel is known in
/// time.
#pragma once

#include <cstddef>
#include <deque>
#include <optional>

#include "fleet/link/core/directive.h"

namespace fleet {

/// Decides which number is read next and keeps what was read. One thread at a time.
///
/// A scan reads one number after the other up to the first that the bus does not have. Only a
/// finished scan says that nothing is known that could cancel the next order. A missing number and
/// a number seen elsewhere never move a host on: the one may come from a server that lags behind,
/// the other may be lost.
class ReadAhead {
public:
    /// Orders kept whole; of those behind them only the cancels count until their turn comes near.
    static constexpr std::size_t kMostKept = 64;

    /// Begins anew behind `taken`; what was read before no longer counts.
    void restart(Number taken);

    /// There is an order with this number, somebody says.
    void expect(Number number);

    /// The number that is to be read now; asked for once. Nothing while a reading is under way or
    /// nothing is left to be read.
    std::optional<Number> next();

    /// Asks for another scan, because time has passed.
    void scanAgain();

    /// What was read under `number`. Returns whether an answer to this number was awaited.
    bool found(Number number, Directive directive);
    /// The bus has no order with this number. Returns as found().
    bool missing(Number number);
    /// The bus did not answer, so nothing is known. Returns as found().
    bool unanswered(Number number);

    /// All up to this one are done with.
    void drop(Number taken);

    /// The order behind those that are done with; null if it has not been read.
    const Directive* front() const { return kept_.empty() ? nullptr : &kept_.front(); }
    /// Whether nothing is under way that might cancel the next order.
    bool isScanned() const { return isScanned_; }
    /// Whether a number is known to exist that the bus did not have.
    bool hasGap() const { return isScanned_ && known_ > scanned_; }

private:
    bool isAwaited(Number number);
    Number nextKept() const { return taken_ + kept_.size() + 1; }

    Number taken_ = 0;
    Number scanned_ = 0;          ///< all up to this one were read at least once
    Number known_ = 0;            ///< the highest number that was heard of
    std::deque<Directive> kept_;  ///< those behind `taken_`, without a gap
    std::optional<Number> awaited_;
    bool isScanned_ = false;
    bool isWanted_ = false;  ///< a scan is to begin or to go on
    bool isAgain_ = false;   ///< the answer that is awaited may be older than what was heard since
};

}  // namespace fleet
