/// A transaction that is taken back unless it was committed.
#pragma once

#include "sqlite/database.h"

namespace sqlite {

/// Its connection outlives it. One that begins while another is open belongs to that: it can be
/// taken back alone, and what it commits counts when the outer one commits. They end in the reverse
/// order of their beginnings.
class Transaction {
public:
    /// Begins to write. Throws DatabaseError.
    explicit Transaction(Database& database)
        : database_(database), isInner_(database.inTransaction()) {
        database_.run(isInner_ ? "SAVEPOINT inner" : "BEGIN IMMEDIATE");
    }
    ~Transaction() {
        if (isCommitted_) return;
        try {
            // A failure may have ended it before.
            if (!database_.inTransaction()) return;
            database_.run(isInner_ ? "ROLLBACK TO inner; RELEASE inner" : "ROLLBACK");
        } catch (const DatabaseError&) {
            // The connection's end takes it back.
        }
    }
    Transaction(const Transaction&) = delete;
    Transaction& operator=(const Transaction&) = delete;

    /// Throws DatabaseError; then nothing of the transaction happened.
    void commit() {
        database_.run(isInner_ ? "RELEASE inner" : "COMMIT");
        isCommitted_ = true;
    }

private:
    Database& database_;
    const bool isInner_;
    bool isCommitted_ = false;
};

}  // namespace sqlite
