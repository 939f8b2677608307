/// The book of requests: what was asked, what the host said to it, and which outcomes came.
#pragma once

#include <cstddef>
#include <cstdint>
#include <map>
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

/// The end of a task as the control subscription gets it.
struct TaskEnd {
    std::string transid;
    std::string state;
};

/// The two ways in. Each has an order of its own.
enum class Way {
    Table,  ///< a query on the table of requests
    Turn,   ///< a task that waits for its turn
};

/// The expected outcome of an accepted request, unless its child is interfered with: a killed child
/// counts as one that ended with 0, and a stopped one runs out of time.
enum class Hope { Any, Success, Failure };

class Ledger {
public:
    using Number = std::size_t;
    static constexpr Number kNone = static_cast<Number>(-1);

    enum class Answer {
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
        Answer answer = Answer::Announced;
        Way way = Way::Table;
        bool notesItsRun = false;
        std::size_t burst = 0;  ///< requests of one connection, sent without waiting; 0: alone
        double sent = 0;        ///< before its first byte
        double answered = 0;    ///< after its answer's last byte
        unsigned life = 0;      ///< of the host, in which it was answered
        unsigned ends = 0;      ///< how many times it was over
        unsigned endLife = 0;   ///< of the host, in which that was heard of
        std::string state;      ///< of the task that is over
        unsigned outcomes = 0;
        std::size_t firstRow = 0;  ///< index of its first outcome among all
        int retval = 0;            ///< its last outcome's
    };

    /// One outcome that the control subscription got.
    struct Row {
        Number number = kNone;
        int retval = 0;
        std::string messageId;
        unsigned life = 0;  ///< of the host, in which it came
    };

    explicit Ledger(std::string prefix) : prefix_(std::move(prefix)) {}

    Number announce(const std::string& command, const std::string& target, unsigned rows, Hope hope,
                    std::size_t burst);
    std::string transid(Number number) const { return prefix_ + std::to_string(number); }
    /// The request with that TRANSID; kNone when there is none.
    Number find(const std::string& transid) const;

    /// Its run writes its name() down.
    void notesItsRun(Number number) { entries_[number].notesItsRun = true; }
    void takesItsTurn(Number number) { entries_[number].way = Way::Turn; }
    /// The host has died and been started again.
    void newLife() { ++life_; }
    void sending(Number number, double now) { entries_[number].sent = now; }
    void answered(Number number, bool accepted, double now);
    void lost(Number number);
    /// A row of the control subscription.
    void outcome(const OutcomeRow& row, Tally& tally);
    void ended(const TaskEnd& end, Tally& tally);

    /// Accepted and not over.
    std::size_t outstanding() const { return outstanding_; }
    bool done(Number number) const { return entries_[number].outcomes >= entries_[number].rows; }
    std::size_t size() const { return entries_.size(); }
    const Entry& entry(Number number) const { return entries_[number]; }
    const std::vector<Row>& rows() const { return rows_; }
    std::size_t newBurst() { return ++bursts_; }

    /// Counts and order, when nothing is on its way any more.
    void judge(Tally& tally) const;
    /// Holds it against all tasks that the journal lists, by their TRANSIDs.
    void judgeListed(const std::multimap<std::string, std::string>& states, Tally& tally) const;
    /// Holds it against what the tasks noted themselves: a line per run, the name() of the request.
    void judgeRuns(const std::string& notes, Tally& tally) const;
    /// A product by which a run shows whose it is.
    static std::string name(Number number) { return "k" + std::to_string(number); }

private:
    void judgeCounts(Tally& tally) const;
    void judgeAccepted(Number number, Tally& tally) const;
    void judgeOrder(Tally& tally) const;
    void judgeBursts(Tally& tally) const;
    void judgePairs(Tally& tally) const;
    void judgeHopes(Tally& tally) const;

    const std::string prefix_;
    std::vector<Entry> entries_;
    std::vector<Row> rows_;
    std::size_t outstanding_ = 0;
    std::size_t bursts_ = 0;
    unsigned life_ = 0;
};

}  // namespace soak
