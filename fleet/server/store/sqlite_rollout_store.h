/// The records of roll-outs in SQLite.
#pragma once

#include "fleet/server/rollouts/rollout_store.h"
#include "sqlite/database.h"

namespace fleet {

/// Works on the connection that the centre's store works on, which outlives it; everything throws
/// sqlite::DatabaseError, and then nothing was changed. Functions that change something durably
/// are called within atomically().
class SqliteRolloutStore : public RolloutStore {
public:
    explicit SqliteRolloutStore(sqlite::Database& database) : database_(database) {}

    void atomically(const std::function<void()>& act) override;
    bool hasHost(const std::string& host) const override;
    bool hasOrder(const std::string& host, const std::string& order) const override;

    void add(Rollout& rollout) override;
    void addPart(const Part& part, const std::string& bytes) override;
    std::optional<Rollout> rollout(const std::string& id) const override;
    std::vector<Rollout> rollouts(std::int64_t before, std::size_t most) const override;
    std::vector<Rollout> running() const override;
    void keep(const Rollout& rollout) override;

    std::optional<Part> part(std::int64_t row, const std::string& host) const override;
    void keepPart(const Part& part) override;
    std::string bytesOf(const Part& part) const override;
    void keepBytes(const Part& part, const std::string& bytes) override;
    void release(const Part& part) override;

    std::vector<Part> waiting(std::int64_t row, std::size_t wave, std::size_t most) const override;
    bool hasWaiting(std::int64_t row) const override;
    std::size_t countReleased(std::int64_t row, std::size_t wave) const override;
    bool hasUnfinished(std::int64_t row, std::size_t wave) const override;
    bool hasReleased(std::int64_t row) const override;
    void postponeWaiting(std::int64_t row, std::size_t wave) override;
    void cancelWaiting(std::int64_t row, const std::string& reason) override;

    bool hasMoreFailures(std::int64_t row, std::size_t than) const override;
    void forgiveFailures(std::int64_t row) override;

    std::vector<ToldPart> told(std::size_t most) const override;
    void forgetTold(const Part& part) override;

    void addCancel(const Part& part, const std::string& bytes) override;
    std::vector<Part> cancelsToRelease(std::size_t most) const override;
    std::string cancelBytesOf(const Part& part) const override;
    void forgetCancel(const Part& part) override;

    std::vector<Part> expiringBy(std::int64_t row, Moment when, std::size_t most) const override;
    std::vector<Part> uncancelled(std::int64_t row, std::size_t most) const override;
    std::vector<Part> over(std::int64_t row) const override;
    std::vector<PartTally> tallies(std::int64_t row) const override;
    std::size_t countAway(std::int64_t row, Moment since) const override;
    std::size_t countUnconfirmed(std::int64_t row, Moment now) const override;
    std::size_t countExpired(std::int64_t row, Moment now) const override;
    std::vector<Part> failures(std::int64_t row, std::size_t most) const override;
    std::vector<PartSight> parts(std::int64_t row, std::size_t from,
                                 std::size_t most) const override;

private:
    sqlite::Database& database_;
};

}  // namespace fleet
