/// Decides what the centre does: numbers, publishing, replies and outcomes.
///
/// It keeps nothing that counts: all of that is in the store. So the model of the protocol kills it
/// at every point and runs this very code.
#pragma once

#include <functional>
#include <map>
#include <optional>
#include <set>
#include <string>
#include <utility>
#include <vector>

#include "fleet/bus/messages/hello.h"
#include "fleet/server/core/centre_bus.h"
#include "fleet/server/core/centre_counts.h"
#include "fleet/server/core/centre_store.h"

namespace fleet {

/// What an operator of the centre must look at.
struct Alarm {
    std::string host;
    std::string text;
};

/// One thread at a time.
class Centre {
public:
    /// Orders named in one reply as open; the others are named in later ones.
    static constexpr std::size_t kMostOpen = 256;
    /// Numbers skipped by a restore, so that none that was given and forgotten is given again.
    static constexpr Number kRestoreGap = 1'000'000;
    /// How long after a restore the hosts are asked what they have.
    static constexpr Moment kListTime{10 * 60 * 1000};

    using TellAlarm = std::function<void(const Alarm&)>;

    /// Borrows the store and the bus, and the counts if there are any.
    Centre(CentreStore& store, CentreBus& bus, TellAlarm alarm, CentreCounts* counts = nullptr);

    /// Gives an order its number; it is durable when this returns. `seal` puts a signed number and
    /// the order together. Nothing if there is no such host.
    std::optional<Number> submit(const std::string& host, const std::string& order,
                                 const std::function<std::string(Number)>& seal);

    /// Publishes up to `most` orders and removes up to `most` that are over from the bus. Returns
    /// whether there is more to do at once.
    bool work(std::size_t most);

    /// The reply to a hello that its host has signed; nothing for a host that nobody has enrolled,
    /// nor to a hello that is older than one before, or the same.
    std::optional<Reply> greet(const std::string& host, const Hello& hello, Moment now);

    /// Takes an outcome that its host has signed. When this returns, the bus may forget it.
    void hear(const Outcome& outcome);

    /// Tells of an order that the hourly sweep has found on the bus. One that is over will be
    /// removed: a lost answer, or a bus that lost its newest messages, has left it there. If this
    /// database does not know it, one of both is wrong, and nothing is published for its host.
    ///
    /// While a database that was put back learns what it has forgotten, it adopts the order.
    void foundOnBus(const OrderRecord& order, Moment now);
    /// The same, while the database is being put back.
    void adoptFromBus(const OrderRecord& order);
    /// The end of a restore: numbers that may have been given are skipped, and from now on hosts
    /// are asked what they have.
    void restored(Moment now);

    /// Whether nothing is published, because the database is older than what several hosts know.
    /// One host alone might lie, and so stops only what is published for itself.
    bool isBehind() const { return ahead_.size() > 1; }

private:
    /// What the bus has taken of some orders. It has no room for the others, or says nothing of
    /// them.
    enum class Published { All, Some, Unanswered };

    bool publish(std::size_t most);
    Published publishAll(const std::vector<OrderRecord>& orders);
    Published publishTogether(const std::vector<OrderRecord>& orders);
    bool comparePublished(const std::vector<OrderRecord>& orders);
    void notePublished(const OrderRecord& order);
    bool publishAgain(std::size_t most);
    bool removeOver(std::size_t most);
    bool removeTogether(const std::vector<OrderPlace>& places);
    void noteSession(HostRecord& record, const Hello& hello);
    void noteTaken(HostRecord& record, const Hello& hello, bool isListing);
    void stopPublishing(HostRecord& record, const std::string& why);
    void adoptListed(const std::string& host, const Hello& hello);
    Number overOf(const HostRecord& record) const;

    CentreStore& store_;
    CentreBus& bus_;
    const TellAlarm alarm_;
    CentreCounts* const counts_;                 ///< may be null
    std::map<std::string, std::string> nonces_;  ///< of each host's latest hello
    std::size_t withoutRoom_ = 0;                ///< orders that the bus has refused in this turn
    std::set<OrderPlace> again_;   ///< published before, and perhaps lost by the bus since
    std::set<OrderPlace> over_;    ///< still to be removed from the bus
    std::set<std::string> ahead_;  ///< hosts that have taken what this database never gave
};

}  // namespace fleet
