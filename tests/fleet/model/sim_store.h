/// The centre's database, in memory: each function is a transaction, before and after which the
/// centre may be killed.
#pragma once

#include <map>
#include <string>
#include <utility>
#include <vector>

#include "tests/fleet/model/dice.h"
#include "tests/fleet/model/model_store.h"

namespace model {

/// What a backup copies.
struct Tables {
    std::map<std::string, fleet::HostRecord> hosts;
    std::map<std::pair<std::string, std::string>, fleet::OrderRecord> orders;
    fleet::Moment listUntil{};
};

class SimStore : public ModelStore {
public:
    explicit SimStore(Dice& dice) : dice_(dice) {}

    std::optional<fleet::HostRecord> host(const std::string& host) const override;
    void keepHost(const fleet::HostRecord& record) override;
    std::optional<fleet::Number> give(
        const std::string& host, const std::string& order,
        const std::function<std::string(fleet::Number)>& seal) override;
    void adopt(const fleet::OrderRecord& order) override;
    std::optional<fleet::OrderRecord> order(const std::string& host,
                                            const std::string& order) const override;
    std::optional<fleet::OrderRecord> orderAt(const std::string& host,
                                              fleet::Number number) const override;
    std::vector<fleet::OrderRecord> unpublished(std::size_t most,
                                                std::size_t skipped) const override;
    void notePublished(const std::string& host, fleet::Number number) override;
    std::vector<fleet::OpenOrder> open(const std::string& host, fleet::Number from,
                                       fleet::Number upTo, std::size_t most) const override;
    void keepOutcome(const fleet::Outcome& outcome) override;
    void skipNumbers(fleet::Number count, fleet::Number atLeast, fleet::Moment listUntil) override;
    fleet::Moment listUntil() const override { return tables.listUntil; }

    std::vector<fleet::OrderRecord> orders() const override;
    bool isAllOver() const override;
    void keepBackup() override { backup_ = tables; }
    void putBack() override { tables = backup_; }

    Tables tables;

private:
    void mayDie() const;
    fleet::OrderRecord* at(const std::string& host, fleet::Number number);

    Dice& dice_;
    Tables backup_;
};

}  // namespace model
