/// A transaction that is taken back unless it was committed.
#pragma once

#include "sqlite/database.h"

namespace sqlite {

/// One at a time for each connection, which outlives it.
class Transaction {
public:
    /// Begins to write. Throws DatabaseError.
    explicit Transaction(Database& database) : database_(database) {
        database_.run("BEGIN IMMEDIATE");
    }
    ~Transaction() {
        if (isCommitted_) return;
        try {
            // A failure may have ended it before.
            if (database_.inTransaction()) database_.run("ROLLBACK");
        } catch (const DatabaseError&) {
            // The connection's end takes it back.
        }
    }
    Transaction(const Transaction&) = delete;
    Transaction& operator=(const Transaction&) = delete;

    /// Throws DatabaseError; then nothing of the transaction happened.
    void commit() {
        database_.run("COMMIT");
        isCommitted_ = true;
    }

private:
    Database& database_;
    bool isCommitted_ = false;
};

}  // namespace sqlite
