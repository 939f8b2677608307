/// Where the centre's records are.
#pragma once

#include <cstddef>
#include <functional>
#include <optional>
#include <string>
#include <vector>

#include "fleet/server/core/records.h"

namespace fleet {

/// Each function is one transaction: when it returns, what it changed is durable. One thread at a
/// time.
class CentreStore {
public:
    virtual ~CentreStore() = default;

    virtual std::optional<HostRecord> host(const std::string& host) const = 0;
    virtual void keepHost(const HostRecord& record) = 0;

    /// Gives the host's next number to an order, and keeps the bytes that `seal` makes of it as not
    /// yet published. The same order again gets the number that it has. Nothing if there is no such
    /// host.
    virtual std::optional<Number> give(const std::string& host, const std::string& order,
                                       const std::function<std::string(Number)>& seal) = 0;
    /// Keeps an order that was given before this database began to forget. One that is known
    /// without its number and bytes gets them. Nothing happens if there is no such host.
    virtual void adopt(const OrderRecord& order) = 0;

    virtual std::optional<OrderRecord> order(const std::string& host,
                                             const std::string& order) const = 0;
    virtual std::optional<OrderRecord> orderAt(const std::string& host, Number number) const = 0;
    /// Orders without an outcome that wait to be published, the lowest numbers first, but for hosts
    /// for which nothing is published. The first `skipped` of them are left out.
    virtual std::vector<OrderRecord> unpublished(std::size_t most, std::size_t skipped) const = 0;
    virtual void notePublished(const std::string& host, Number number) = 0;
    /// Orders without an outcome whose number is at least `from` and at most `upTo`, ascending.
    virtual std::vector<OpenOrder> open(const std::string& host, Number from, Number upTo,
                                        std::size_t most) const = 0;
    virtual void keepOutcome(const Outcome& outcome) = 0;

    /// Skips `count` numbers of every host, and all below `atLeast`; publishes for all of them
    /// again, and asks all of them what they have up to that time.
    virtual void skipNumbers(Number count, Number atLeast, Moment listUntil) = 0;
    /// Until when the hosts are asked what they have; 0 if no restore was ever done.
    virtual Moment listUntil() const = 0;
};

}  // namespace fleet
