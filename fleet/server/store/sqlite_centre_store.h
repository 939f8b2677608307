/// The centre's records in SQLite.
#pragma once

#include "fleet/server/core/centre_store.h"
#include "sqlite/database.h"

namespace fleet {

/// Works on a connection of a CentreDatabase, which outlives it; everything throws
/// sqlite::DatabaseError, and then nothing was changed.
class SqliteCentreStore : public CentreStore {
public:
    explicit SqliteCentreStore(sqlite::Database& database) : database_(database) {}

    std::optional<HostRecord> host(const std::string& host) const override;
    void keepHost(const HostRecord& record) override;
    /// What `seal` throws comes through; then no number was given.
    std::optional<Number> give(const std::string& host, const std::string& order,
                               const std::function<std::string(Number)>& seal) override;
    /// Fails if another order has the number.
    void adopt(const OrderRecord& order) override;
    std::optional<OrderRecord> order(const std::string& host,
                                     const std::string& order) const override;
    std::optional<OrderRecord> orderAt(const std::string& host, Number number) const override;
    std::vector<OrderRecord> unpublished(std::size_t most, std::size_t skipped) const override;
    void notePublished(const std::string& host, Number number) override;
    std::vector<OpenOrder> open(const std::string& host, Number from, Number upTo,
                                std::size_t most) const override;
    void keepOutcome(const Outcome& outcome) override;
    void skipNumbers(Number count, Number atLeast, Moment listUntil) override;
    Moment listUntil() const override;

    /// Whether this is a copy that was put back, and has not been completed since.
    bool isPutBack() const;
    void noteCompleted();

private:
    struct HostRow {
        std::int64_t id;
        Number last;
        bool isHeld;  ///< nothing is published for it
    };
    std::optional<HostRow> row(const std::string& host) const;
    void insert(const OrderRecord& order, const HostRow& host);
    void holdOrders(const HostRow& before, bool isHeld);

    sqlite::Database& database_;
};

}  // namespace fleet
