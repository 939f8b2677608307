/// The book of requests: what was asked, what the host said to it, and which outcomes came.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

#include "soak/tally.h"

namespace soak {

/// One outcome row as a subscriber gets it.
struct OutcomeRow {
    std::string originNode;
    std::string transid;
    std::string command;
    int retval = 0;
    std::string messageId;
    std::string target;
};

/// The expected outcome of an accepted request, unless its child is interfered with: a killed child
/// counts as one that ended with 0, and a stopped one runs out of time.
enum class Hope { Any, Success, Failure };

class Ledger {
public:
    using Number = std::size_t;
    static constexpr Number kNone = static_cast<Number>(-1);

    enum class State {
        Announced,  ///< not sent yet, or no answer yet
        Accepted,
        Refused,  ///< nothing may come of it
        Unknown,  ///< the connection went before the answer: it may have been accepted
    };

    struct Entry {
        std::string command;
        std::string target;
        unsigned rows = 1;
        Hope hope = Hope::Any;
        State state = State::Announced;
        std::size_t burst = 0;  ///< requests of one connection, sent without waiting; 0: alone
        double sent = 0;        ///< before its first byte
        double answered = 0;    ///< after its answer's last byte
        unsigned outcomes = 0;
        std::size_t firstRow = 0;  ///< index of its first outcome among all
        int retval = 0;            ///< its last outcome's
    };

    /// One outcome that the control subscription got.
    struct Row {
        Number number = kNone;
        int retval = 0;
        std::string messageId;
    };

    explicit Ledger(std::string prefix) : prefix_(std::move(prefix)) {}

    Number announce(const std::string& command, const std::string& target, unsigned rows, Hope hope,
                    std::size_t burst);
    std::string transid(Number number) const { return prefix_ + std::to_string(number); }
    /// The request with that TRANSID; kNone when there is none.
    Number find(const std::string& transid) const;

    void sending(Number number, double now) { entries_[number].sent = now; }
    void answered(Number number, bool accepted, double now);
    void lost(Number number);
    /// A row of the control subscription.
    void outcome(const OutcomeRow& row, Tally& tally);

    /// Accepted, and not all of its outcomes have come.
    std::size_t outstanding() const { return outstanding_; }
    bool done(Number number) const { return entries_[number].outcomes >= entries_[number].rows; }
    std::size_t size() const { return entries_.size(); }
    const Entry& entry(Number number) const { return entries_[number]; }
    const std::vector<Row>& rows() const { return rows_; }
    std::size_t newBurst() { return ++bursts_; }

    /// Counts and order, when nothing is on its way any more.
    void judge(Tally& tally) const;

private:
    void judgeCounts(Tally& tally) const;
    void judgeOrder(Tally& tally) const;
    void judgeBursts(Tally& tally) const;
    void judgePairs(Tally& tally) const;
    void judgeHopes(Tally& tally) const;

    const std::string prefix_;
    std::vector<Entry> entries_;
    std::vector<Row> rows_;
    std::size_t outstanding_ = 0;
    std::size_t bursts_ = 0;
};

}  // namespace soak
