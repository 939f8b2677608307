/// A centre that is killed between any two of its transactions, or in the middle of one.
#include <functional>

#include "tests/fleet/server/rollouts/rollout_fixture.h"

namespace {

using namespace rollout_test;

struct Killed {};

/// Counts the moments at which a centre may be killed, and kills it at one of them.
class Fate {
public:
    explicit Fate(int moment) : left_(moment) {}
    void pass() {
        if (left_-- == 0) throw Killed{};
    }
    bool isOver() const { return left_ < 0; }

private:
    int left_;
};

/// May be killed before and after each transaction.
class MortalStore : public fleet::SqliteRolloutStore {
public:
    MortalStore(sqlite::Database& database, Fate& fate)
        : SqliteRolloutStore(database), fate_(fate) {}
    void atomically(const std::function<void()>& act) override {
        fate_.pass();
        SqliteRolloutStore::atomically(act);
        fate_.pass();
    }

private:
    Fate& fate_;
};

class RolloutsKilled : public RolloutTest {
protected:
    /// What an operator and the hosts do until nothing is left to be done. Each turn begins with
    /// what is known then, as someone does who has lost an answer.
    bool act(fleet::Rollouts& rollouts) {
        if (!store_.rollout(id_)) {
            rollouts.create(read(first_), now_);
            return true;
        }
        now_ += kSecond;
        const bool isMore = rollouts.tick(now_);
        const RolloutState state = view().rollout.state;
        if (state == RolloutState::Paused) {
            rollouts.resume(id_, by(), {}, now_);
        } else if (state == RolloutState::Finished) {
            const Names failed = hostsOf(rollouts.toTryAgain(id_, false));
            if (!failed.empty()) rollouts.retryFailed(id_, by(), read(orders(failed)), false, now_);
            return !failed.empty();
        }
        tellEnds();
        return isMore || state != RolloutState::Finished;
    }
    /// Hosts whose orders are released fail at the first try, but for h00, which is done.
    void tellEnds() {
        for (const std::string& host : hostsThatAre("released")) {
            const Part known = part(host);
            end(host, host == "h00" || known.tries > 1 ? "done" : "failed");
        }
    }
    /// The same, with an abort as soon as the second wave is released.
    bool actAndAbort(fleet::Rollouts& rollouts) {
        if (!store_.rollout(id_)) {
            rollouts.create(read(first_), now_);
            return true;
        }
        now_ += kSecond;
        const bool isMore = rollouts.tick(now_);
        if (view().rollout.wave == 1) {
            endAll(hostsThatAre("released"), "done");
            return true;
        }
        const Names open = cancels();
        if (!open.empty()) rollouts.abort(id_, by(), read(open), now_);
        return isMore || !open.empty();
    }

    void prepare() {
        plan_.waves = "1,3";
        first_ = wanted(enrol(5));
        first_.id = id_ = fleet::makeOrderId();
    }
    /// Acts until nothing is left, with another centre after each kill. Returns whether it was
    /// killed at all.
    bool liveThrough(Fate& fate, const std::function<bool(fleet::Rollouts&)>& act) {
        MortalStore store(database_, fate);
        for (int turn = 0; turn < 1'000; ++turn) {
            fleet::Rollouts rollouts(store, mortalGiver(fate));
            try {
                while (act(rollouts)) {
                    if (++turn > 1'000) break;
                }
                return fate.isOver();
            } catch (const Killed&) {
            }
        }
        ADD_FAILURE() << "it does not end";
        return false;
    }
    fleet::GiveNumber mortalGiver(Fate& fate) {
        return [this, &fate](const std::string& host, const std::string& order,
                             const std::string& bytes) {
            const auto number = giver()(host, order, bytes);
            fate.pass();
            return number;
        };
    }
    /// All hosts and roll-outs that the database has are forgotten.
    void startAnew() {
        for (const char* const table : {"rollouts", "rollout_parts", "rollout_orders",
                                        "rollout_cancels", "rollout_news", "orders", "hosts"})
            database_.run((std::string("DELETE FROM ") + table).c_str());
    }

    Wanted first_;
};

TEST_F(RolloutsKilled, GiveEachHostItsOrdersOnce) {
    int moment = 0;
    for (bool wasKilled = true; wasKilled; ++moment) {
        startAnew();
        prepare();
        Fate fate(moment);
        wasKilled = liveThrough(fate, [&](fleet::Rollouts& rollouts) { return act(rollouts); });
        EXPECT_EQ(hostsThatAre("done").size(), 5U) << "killed at " << moment;
        EXPECT_EQ(given("h00").size(), 1U) << "killed at " << moment;
        for (const char* const host : {"h01", "h02", "h03", "h04"})
            EXPECT_EQ(given(host).size(), 2U) << host << ", killed at " << moment;
        EXPECT_EQ(database_.number("SELECT COUNT(*) FROM rollout_orders"), 0);
        EXPECT_EQ(database_.number("SELECT COUNT(*) FROM rollout_news"), 0);
    }
    EXPECT_GT(moment, 20);
}

TEST_F(RolloutsKilled, CancelEachReleasedOrderOnce) {
    int moment = 0;
    for (bool wasKilled = true; wasKilled; ++moment) {
        startAnew();
        prepare();
        Fate fate(moment);
        wasKilled =
            liveThrough(fate, [&](fleet::Rollouts& rollouts) { return actAndAbort(rollouts); });
        EXPECT_EQ(state(), RolloutState::Aborted) << "killed at " << moment;
        EXPECT_EQ(hostsThatAre("cancelled"), (Names{"h03", "h04"})) << "killed at " << moment;
        for (const char* const host : {"h01", "h02"})
            EXPECT_EQ(given(host), (Names{part(host).order, part(host).cancel}));
        for (const char* const host : {"h03", "h04"})
            EXPECT_TRUE(given(host).empty());
        EXPECT_EQ(database_.number("SELECT COUNT(*) FROM rollout_cancels"), 0);
    }
    EXPECT_GT(moment, 10);
}

}  // namespace
