/// A transaction of the centre's database that is counted.
#pragma once

#include <chrono>
#include <cstdint>

#include "fleet/server/core/centre_counts.h"
#include "sqlite/transaction.h"

namespace fleet {

/// Only those that have changed something are measured: the others write nothing. Database and
/// counts outlive it.
class CountedTransaction {
public:
    /// Begins to write. Throws sqlite::DatabaseError.
    CountedTransaction(sqlite::Database& database, CentreCounts& counts)
        : database_(database),
          counts_(counts),
          changesBefore_(database.totalChanges()),
          transaction_(database) {}

    /// Throws sqlite::DatabaseError; then nothing of the transaction happened.
    void commit() {
        const auto began = std::chrono::steady_clock::now();
        try {
            transaction_.commit();
        } catch (const sqlite::DatabaseError&) {
            counts_.failedCommits.add();
            throw;
        }
        if (database_.totalChanges() == changesBefore_) return;
        counts_.commits.observe(std::chrono::steady_clock::now() - began);
    }

private:
    sqlite::Database& database_;
    CentreCounts& counts_;
    const std::int64_t changesBefore_;
    sqlite::Transaction transaction_;
};

}  // namespace fleet
