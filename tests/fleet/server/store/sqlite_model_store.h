/// The centre's database in SQLite, for the model: in memory, with a backup beside it.
#pragma once

#include <string>
#include <vector>

#include "fleet/server/store/centre_schema.h"
#include "fleet/server/store/sqlite_centre_store.h"
#include "tests/fleet/model/model_store.h"

namespace model {

/// The centre may be killed before and after each transaction.
class SqliteModelStore : public ModelStore {
public:
    explicit SqliteModelStore(Dice& dice) : dice_(dice) {
        fleet::makeCentreTables(database_);
        database_.run("ATTACH ':memory:' AS kept");
        for (const char* const table : kTables)
            run("CREATE TABLE kept.", table, " AS SELECT * FROM main.", table);
    }

    std::optional<fleet::HostRecord> host(const std::string& host) const override {
        return store_.host(host);
    }
    void keepHost(const fleet::HostRecord& record) override {
        around([&] { store_.keepHost(record); });
    }
    std::optional<fleet::Number> give(
        const std::string& host, const std::string& order,
        const std::function<std::string(fleet::Number)>& seal) override {
        std::optional<fleet::Number> given;
        around([&] { given = store_.give(host, order, seal); });
        return given;
    }
    void adopt(const fleet::OrderRecord& order) override {
        around([&] { store_.adopt(order); });
    }
    std::optional<fleet::OrderRecord> order(const std::string& host,
                                            const std::string& order) const override {
        return store_.order(host, order);
    }
    std::optional<fleet::OrderRecord> orderAt(const std::string& host,
                                              fleet::Number number) const override {
        return store_.orderAt(host, number);
    }
    std::vector<fleet::OrderRecord> unpublished(std::size_t most,
                                                std::size_t skipped) const override {
        return store_.unpublished(most, skipped);
    }
    void notePublished(const std::string& host, fleet::Number number) override {
        around([&] { store_.notePublished(host, number); });
    }
    std::vector<fleet::OpenOrder> open(const std::string& host, fleet::Number from,
                                       fleet::Number upTo, std::size_t most) const override {
        return store_.open(host, from, upTo, most);
    }
    void keepOutcome(const fleet::Outcome& outcome) override {
        around([&] { store_.keepOutcome(outcome); });
    }
    void skipNumbers(fleet::Number count, fleet::Number atLeast, fleet::Moment listUntil) override {
        store_.skipNumbers(count, atLeast, listUntil);
    }
    fleet::Moment listUntil() const override { return store_.listUntil(); }

    std::vector<fleet::OrderRecord> orders() const override {
        sqlite::Statement rows = database_.ask(
            "SELECT h.host, o.name FROM orders o JOIN hosts h ON h.id = o.host ORDER BY 1, 2");
        std::vector<fleet::OrderRecord> orders;
        while (rows.step())
            orders.push_back(store_.order(rows.bytes(0), rows.bytes(1)).value());
        return orders;
    }
    bool isAllOver() const override {
        return database_.number("SELECT COUNT(*) FROM orders WHERE state IS NULL") == 0;
    }
    void keepBackup() override { copy("main.", "kept."); }
    void putBack() override { copy("kept.", "main."); }

private:
    static constexpr const char* kTables[] = {"facts", "hosts", "orders"};

    template <typename Function>
    void around(Function function) {
        mayDie();
        function();
        mayDie();
    }
    void mayDie() {
        if (dice_.fault(1)) throw Killed{};
    }
    void copy(const std::string& from, const std::string& to) {
        for (const char* const table : kTables) {
            run("DELETE FROM ", to, table);
            run("INSERT INTO ", to, table, " SELECT * FROM ", from, table);
        }
    }
    template <typename... Pieces>
    void run(const Pieces&... pieces) {
        database_.run((std::string() + ... + pieces).c_str());
    }

    Dice& dice_;
    mutable sqlite::Database database_{":memory:"};
    fleet::SqliteCentreStore store_{database_};
};

}  // namespace model
