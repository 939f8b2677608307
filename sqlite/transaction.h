/// A transaction that is taken back unless it was committed.
#pragma once

#include "sqlite/database.h"

namespace sqlite {

/// Inside another one it is a part of that: it can be taken back alone, and is durable with the
/// outermost. The connection outlives it.
class Transaction {
public:
    /// Begins to write. Throws DatabaseError.
    explicit Transaction(Database& database)
        : database_(database), isPart_(database.inTransaction()) {
        database_.run(isPart_ ? "SAVEPOINT part" : "BEGIN IMMEDIATE");
    }
    ~Transaction() {
        if (isCommitted_) return;
        try {
            // A failure may have ended it before.
            if (!database_.inTransaction()) return;
            database_.run(isPart_ ? "ROLLBACK TO part; RELEASE part" : "ROLLBACK");
        } catch (const DatabaseError&) {
            // The connection's end takes it back.
        }
    }
    Transaction(const Transaction&) = delete;
    Transaction& operator=(const Transaction&) = delete;

    /// Throws DatabaseError; then nothing of the transaction happened.
    void commit() {
        database_.run(isPart_ ? "RELEASE part" : "COMMIT");
        isCommitted_ = true;
    }

private:
    Database& database_;
    const bool isPart_;
    bool isCommitted_ = false;
};

}  // namespace sqlite
