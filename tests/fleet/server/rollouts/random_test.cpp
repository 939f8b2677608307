/// Roll-outs in which operators, hosts and kills come in any order.
#include <numeric>

#include "tests/fleet/server/rollouts/rollout_fixture.h"

namespace {

using namespace rollout_test;

constexpr unsigned kLives = 12;  // of each of the seeds below

class RandomRollouts : public RolloutTest, public testing::WithParamInterface<unsigned> {
protected:
    static const char* oneOf(std::initializer_list<const char*> texts, model::Dice& dice) {
        return texts.begin()[dice.below(texts.size())];
    }

    void begin(model::Dice& dice) {
        plan_ = {};
        plan_.waves = oneOf({"100%", "1", "1,50%", "2,3,4", "10%,20%,90%"}, dice);
        plan_.maxFailures = oneOf({"0", "1", "20%", "100%"}, dice);
        plan_.pause = dice.below(2) * kMinute;
        if (dice.below(2) == 0) plan_.wait = 2 * kMinute;
        if (dice.below(2) == 0) plan_.parallel = 1 + dice.below(3);
        create(1 + dice.below(12));
    }

    /// Does something; what is refused is part of it.
    void act(model::Dice& dice) {
        try {
            switch (dice.below(12)) {
                case 0:
                    return rollouts_->pause(id_, by(), now_);
                case 1:
                case 2:
                    return resume(dice.below(2) == 0);
                case 3:
                    return retry(dice.below(2) == 0);
                case 4:
                    return abortSometimes(dice);
                case 5:
                    now_ += kHour * static_cast<int>(dice.below(13));
                    return;
                case 6:
                    rollouts_ = std::make_unique<fleet::Rollouts>(store_, giver());
                    return;
                case 7:
                case 8:
                    return tell(dice);
                default:
                    now_ += kSecond * static_cast<int>(dice.below(100));
                    rollouts_->tick(now_);
            }
        } catch (const RolloutError&) {
        }
    }
    void resume(bool areSignedAnew) {
        Names fresh;
        if (areSignedAnew) fresh = orders(hostsOf(rollouts_->toSignAnew(id_, now_)));
        rollouts_->resume(id_, by(), read(fresh), now_);
    }
    void retry(bool isForced) {
        const Names fresh = orders(hostsOf(rollouts_->toTryAgain(id_, isForced)));
        rollouts_->retryFailed(id_, by(), read(fresh), isForced, now_);
    }
    void abortSometimes(model::Dice& dice) {
        if (dice.below(5) == 0) rollouts_->abort(id_, by(), read(cancels()), now_);
    }
    /// A host tells an end. One of which nobody knew may be told later.
    void tell(model::Dice& dice) {
        const Names open = hostsThatAre(dice.below(4) == 0 ? "unknown" : "released");
        if (open.empty()) return;
        end(open[dice.below(open.size())],
            oneOf({"done", "done", "failed", "expired", "interrupted", "unknown", "cancelled"},
                  dice));
    }

    std::map<std::string, std::size_t> givenToAll() const {
        std::map<std::string, std::size_t> counts;
        for (const fleet::PartView& one : rollouts_->parts(id_, 0, 100, now_))
            counts[one.sight.part.host] = ordersGiven(one.sight.part.host);
        return counts;
    }
    /// Without those that cancel others.
    std::size_t ordersGiven(const std::string& host) const {
        std::size_t count = 0;
        for (const std::string& name : given(host)) {
            const std::string bytes = centreStore_.order(host, name)->bytes;
            const std::size_t begin = bytes.find('=') + 1;
            const auto read = fleet::readOrder(std::string_view(bytes).substr(begin));
            if (read.order.kind != fleet::kCancel) ++count;
        }
        return count;
    }

    void check(const std::map<std::string, std::size_t>& before, RolloutState was) {
        const fleet::RolloutView seen = view();
        const bool isHeldBack = was != RolloutState::Running;
        std::size_t inWave = 0;
        for (const fleet::PartView& one : rollouts_->parts(id_, 0, 100, now_)) {
            const Part& part = one.sight.part;
            const std::size_t count = ordersGiven(part.host);
            ASSERT_LE(count, isHeldBack ? before.at(part.host) : part.tries) << part.host;
            if (part.state == PartState::Released) {
                ASSERT_EQ(given(part.host).at(part.number - 1), part.order);
                ASSERT_LE(part.wave, seen.rollout.wave);
                if (part.wave == seen.rollout.wave) ++inWave;
            }
            if (part.state == PartState::Waiting) {
                ASSERT_NE(seen.rollout.state, RolloutState::Aborted);
                ASSERT_NE(seen.rollout.state, RolloutState::Finished);
            }
        }
        ASSERT_LE(inWave, plan_.parallel.value_or(seen.rollout.hosts));
        const fleet::RolloutCounts& all = seen.progress.all;
        const auto add = [](std::size_t sum, const auto& one) { return sum + one.second; };
        ASSERT_EQ(
            std::accumulate(all.over.begin(), all.over.end(), all.waiting + all.released, add),
            seen.rollout.hosts);
    }

    /// Everybody does what helps: it must come to its end.
    void finish() {
        for (int turn = 0; turn < 1'000; ++turn) {
            tickAfter(kMinute);
            endAll(hostsThatAre("released"), "done");
            const RolloutState now = state();
            if (now == RolloutState::Paused) resume(true);
            if (hostsThatAre("released").empty() &&
                (now == RolloutState::Finished || now == RolloutState::Aborted))
                return;
        }
        FAIL() << "it does not end";
    }
};

TEST_P(RandomRollouts, KeepTheirRules) {
    for (unsigned life = 0; life < kLives; ++life) {
        const unsigned seed = GetParam() * kLives + life;
        SCOPED_TRACE("seed " + std::to_string(seed));
        model::Dice dice(seed);
        begin(dice);
        for (int turn = 0; turn < 60; ++turn) {
            const auto before = givenToAll();
            const RolloutState was = state();
            act(dice);
            check(before, was);
            if (HasFatalFailure()) return;
        }
        finish();
        if (HasFatalFailure()) return;
        for (const char* const table : {"rollouts", "rollout_parts", "rollout_orders",
                                        "rollout_cancels", "rollout_news", "orders", "hosts"})
            database_.run((std::string("DELETE FROM ") + table).c_str());
    }
}

INSTANTIATE_TEST_SUITE_P(Seeds, RandomRollouts, testing::Range(0U, 5U));

}  // namespace
