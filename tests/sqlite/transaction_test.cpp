#include "sqlite/transaction.h"

#include <gtest/gtest.h>

namespace {

using sqlite::Database;
using sqlite::DatabaseError;
using sqlite::Transaction;

class SqliteTransaction : public testing::Test {
protected:
    SqliteTransaction() { database_.run("CREATE TABLE t (a UNIQUE)"); }
    void add(int value) { database_.change("INSERT INTO t VALUES (?)", value); }
    std::int64_t sum() { return database_.number("SELECT TOTAL(a) FROM t"); }

    Database database_{":memory:"};
};

TEST_F(SqliteTransaction, CountsWhenItIsCommitted) {
    Transaction transaction(database_);
    add(1);
    transaction.commit();
    EXPECT_EQ(sum(), 1);
    EXPECT_FALSE(database_.inTransaction());
}

TEST_F(SqliteTransaction, IsTakenBackOtherwise) {
    {
        const Transaction transaction(database_);
        add(1);
    }
    EXPECT_EQ(sum(), 0);
    EXPECT_FALSE(database_.inTransaction());
}

TEST_F(SqliteTransaction, WithinAnotherCountsWithThat) {
    {
        const Transaction outer(database_);
        Transaction inner(database_);
        add(1);
        inner.commit();
        EXPECT_EQ(sum(), 1);
        EXPECT_TRUE(database_.inTransaction());
    }
    EXPECT_EQ(sum(), 0);
}

TEST_F(SqliteTransaction, WithinAnotherIsTakenBackAlone) {
    Transaction outer(database_);
    add(1);
    {
        const Transaction inner(database_);
        add(2);
        {
            Transaction innermost(database_);
            add(4);
            innermost.commit();
        }
    }
    {
        Transaction inner(database_);
        add(8);
        inner.commit();
    }
    outer.commit();
    EXPECT_EQ(sum(), 9);
    EXPECT_FALSE(database_.inTransaction());
}

TEST_F(SqliteTransaction, WithinOneThatAFailureHasEndedDoesNotCount) {
    const Transaction outer(database_);
    Transaction inner(database_);
    add(1);
    database_.run("ROLLBACK");
    EXPECT_THROW(inner.commit(), DatabaseError);
    EXPECT_EQ(sum(), 0);
}

}  // namespace
