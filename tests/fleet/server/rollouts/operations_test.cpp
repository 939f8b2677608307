/// What operators do with roll-outs.
#include "tests/fleet/server/rollouts/rollout_fixture.h"

namespace {

using namespace rollout_test;

class RolloutOperations : public RolloutTest {
protected:
    void expectConflict(const std::string& words, const std::function<void()>& call) {
        expectRefusal(RolloutError::Kind::Conflict, words, call);
    }
    void expectInvalid(const std::string& words, const std::function<void()>& call) {
        expectRefusal(RolloutError::Kind::Invalid, words, call);
    }
    void pause() { rollouts_->pause(id_, by(), now_); }
    void resume(const Names& fresh = {}) { rollouts_->resume(id_, by(), read(fresh), now_); }
    void abort(const Names& cancels = {}) { rollouts_->abort(id_, by(), read(cancels), now_); }
    void retry(const Names& fresh, bool isForced = false) {
        rollouts_->retryFailed(id_, by(), read(fresh), isForced, now_);
    }
    /// A roll-out to that many hosts that has finished; all are done.
    void finish(std::size_t hosts) {
        create(hosts);
        tick();
        endAll(hostsThatAre("released"), "done");
        tick();
        ASSERT_EQ(state(), RolloutState::Finished);
    }
};

using RolloutPause = RolloutOperations;

TEST_F(RolloutPause, HoldsBackWhatWasNotReleased) {
    plan_.parallel = 2;
    create(4);
    tick();
    pause();
    EXPECT_EQ(state(), RolloutState::Paused);
    EXPECT_EQ(cause(), PauseCause::Operator);
    EXPECT_EQ(view().rollout.reason, "paused by anna");
    end("h00", "done");
    tickAfter(kHour);
    EXPECT_EQ(view().rollout.since, now_ - kHour);
    EXPECT_EQ(hostsThatAre("done"), (Names{"h00"}));
    EXPECT_EQ(hostsThatAre("released"), (Names{"h01"}));
    EXPECT_EQ(hostsThatAre("waiting"), (Names{"h02", "h03"}));
    resume();
    EXPECT_EQ(view().rollout.reason, "");
    tick();
    EXPECT_EQ(hostsThatAre("released"), (Names{"h01", "h02"}));
}

TEST_F(RolloutPause, IsForOneThatRuns) {
    finish(1);
    expectConflict("finished, not running", [&] { pause(); });
    create(1);
    pause();
    expectConflict("paused, not running", [&] { pause(); });
    abort();
    expectConflict("aborted, not running", [&] { pause(); });
}

TEST_F(RolloutPause, ComesWhenTheKeyThatMadeItIsRevoked) {
    create(2);
    const std::string key = rollouts_->show(id_, now_).rollout.by.key;
    rollouts_->pauseThoseOf({"another key"}, now_);
    EXPECT_EQ(state(), RolloutState::Running);
    rollouts_->pauseThoseOf({"another key", key}, now_);
    EXPECT_EQ(state(), RolloutState::Paused);
}

TEST_F(RolloutPause, LastsOnceTheKeyThatMadeItIsRevoked) {
    plan_.maxFailures = "100%";
    create(2);
    const std::string key = view().rollout.by.key;
    tick();
    end("h00", "failed");
    tick();
    rollouts_->pauseThoseOf({key}, now_);
    expectConflict("was revoked; abort it", [&] { resume(); });
    expectConflict("was revoked; abort it", [&] { retry(orders({"h00"})); });
    EXPECT_EQ(state(), RolloutState::Paused);
    rollouts_->pauseThoseOf({}, now_);
    resume();
    EXPECT_EQ(state(), RolloutState::Running);
    rollouts_->pauseThoseOf({key}, now_);
    abort();
    EXPECT_EQ(state(), RolloutState::Aborted);
}

TEST_F(RolloutPause, ComesWithARestore) {
    const std::string first = create(1);
    pause();
    create(1);
    rollouts_->restored(now_);
    EXPECT_EQ(state(), RolloutState::Paused);
    EXPECT_EQ(cause(), PauseCause::Restore);
    tick();
    EXPECT_TRUE(given("h00").empty());
    id_ = first;
    EXPECT_EQ(cause(), PauseCause::Operator);
}

using RolloutResume = RolloutOperations;

TEST_F(RolloutResume, IsForOneThatIsPaused) {
    finish(1);
    expectConflict("finished, not paused", [&] { resume(); });
    create(1);
    expectConflict("running, not paused", [&] { resume(); });
    abort();
    expectConflict("aborted, not paused", [&] { resume(); });
}

TEST_F(RolloutResume, GivesTheWaveItsTimeAgain) {
    plan_.waves = "1";
    plan_.wait = 10 * kMinute;
    create(2);
    tick();
    pause();
    now_ += kHour;
    resume();
    tickAfter(10 * kMinute - Moment{1});
    EXPECT_EQ(hostsThatAre("waiting"), (Names{"h01"}));
    tickAfter(Moment{1});
    EXPECT_TRUE(hostsThatAre("waiting").empty());
}

TEST_F(RolloutResume, ForgivesFailuresThatHavePausedIt) {
    plan_.waves = "2,4";
    plan_.maxFailures = "1";
    create(6);
    tick();
    endAll({"h00", "h01"}, "failed");
    tick();
    ASSERT_EQ(cause(), PauseCause::Failures);
    resume();
    tick();
    EXPECT_EQ(hostsThatAre("released"), (Names{"h02", "h03"}));
    end("h02", "failed");
    tick();
    EXPECT_EQ(state(), RolloutState::Running);
    end("h03", "failed");
    tick();
    EXPECT_EQ(cause(), PauseCause::Failures);
    EXPECT_EQ(view().progress.failures, 4U);
    Names failed;
    for (const Part& one : rollouts_->failures(id_, 3))
        failed.push_back(one.host);
    EXPECT_EQ(failed, (Names{"h02", "h03", "h00"}));
}

TEST_F(RolloutResume, ForgivesNothingAfterAnOperatorsPause) {
    plan_.waves = "2";
    plan_.maxFailures = "1";
    create(3);
    tick();
    end("h00", "failed");
    tick();
    pause();
    resume();
    end("h01", "failed");
    tick();
    EXPECT_EQ(cause(), PauseCause::Failures);
}

TEST_F(RolloutResume, NeedsOtherOrdersForThoseThatHaveExpired) {
    plan_.waves = "1,2";
    create(4);
    tick();
    const std::string released = part("h00").order;
    now_ += 25 * kHour;
    end("h00", "done");
    tick();
    ASSERT_EQ(cause(), PauseCause::Expiry);
    expectConflict("the orders of 3 hosts have expired", [&] { resume(); });
    expectConflict("the orders of 1 hosts have expired", [&] { resume(orders({"h01", "h03"})); });
    resume(orders(hostsOf(rollouts_->toSignAnew(id_, now_))));
    tick();
    EXPECT_EQ(hostsThatAre("released"), (Names{"h01"}));
    EXPECT_EQ(given("h01"), (Names{part("h01").order}));
    EXPECT_EQ(given("h00"), (Names{released}));
    EXPECT_EQ(part("h01").tries, 2U) << "two orders were signed for it, one of which it gets";
}

TEST_F(RolloutResume, NamesThoseThatExpireSoonToo) {
    plan_.waves = "1";
    create(2);
    tick();
    pause();
    now_ += 24 * kHour - fleet::Rollouts::kSoon - Moment{1};
    EXPECT_TRUE(rollouts_->toSignAnew(id_, now_).empty());
    now_ += Moment{1};
    EXPECT_EQ(hostsOf(rollouts_->toSignAnew(id_, now_)), (Names{"h01"}));
    resume();
}

TEST_F(RolloutResume, TakesNoOrderThatItCannotUse) {
    plan_.waves = "1";
    create(2);
    tick();
    pause();
    enrol(3);
    expectInvalid("does not wait", [&] { resume(orders({"h01", "h00"})); });
    expectInvalid("no part", [&] { resume(orders({"h01", "h02"})); });
    expectInvalid("same host", [&] { resume(orders({"h01", "h01"})); });
    fleet::Order other = order("h01");
    other.kind = "STOP";
    expectInvalid("another kind", [&] { resume({sign(other)}); });
    const Names fresh = orders({"h01"});
    resume(fresh);
    pause();
    expectInvalid("was handed over before", [&] { resume(fresh); });
}

using RolloutAbort = RolloutOperations;

TEST_F(RolloutAbort, EndsWhatWasNotReleased) {
    plan_.waves = "1";
    create(3);
    tick();
    abort();
    EXPECT_EQ(state(), RolloutState::Aborted);
    EXPECT_EQ(view().rollout.reason, "aborted by anna");
    EXPECT_EQ(hostsThatAre("cancelled"), (Names{"h01", "h02"}));
    EXPECT_EQ(part("h01").reason, "the roll-out was aborted before its turn came");
    EXPECT_EQ(view().progress.failures, 0U);
    tickAfter(kHour);
    EXPECT_TRUE(given("h01").empty());
    EXPECT_EQ(database_.number("SELECT COUNT(*) FROM rollout_orders"), 0);
}

TEST_F(RolloutAbort, NeedsAnOrderForEachHostThatHasOne) {
    plan_.waves = "3";
    create(4);
    tick();
    end("h00", "done");
    tick();
    abort();
    EXPECT_EQ(hostsOf(rollouts_->toCancel(id_)), (Names{"h01", "h02"}));
    const Names all = cancels();
    abort({all[0]});
    EXPECT_EQ(hostsOf(rollouts_->toCancel(id_)), (Names{"h02"}));
    abort(all);
    EXPECT_TRUE(rollouts_->toCancel(id_).empty());
    tick();
    EXPECT_EQ(given("h01"), (Names{part("h01").order, part("h01").cancel}));
    EXPECT_EQ(given("h02"), (Names{part("h02").order, part("h02").cancel}));
    endAll({"h01", "h02"}, "cancelled");
    tick();
    EXPECT_EQ(hostsThatAre("cancelled").size(), 3U);
}

TEST_F(RolloutAbort, TakesTheCancelsAtOnceToo) {
    create(1);
    tick();
    abort(cancels());
    tick();
    EXPECT_EQ(given("h00").size(), 2U);
}

TEST_F(RolloutAbort, AsksAgainForACancelThatNeverRan) {
    create(2);
    tick();
    abort(cancels());
    tick();
    for (const char* const end : {"refused", "expired", "done"}) {
        fleet::Outcome outcome;
        outcome.host = "h00";
        outcome.order = part("h00").cancel;
        outcome.state = end;
        centre_.hear(outcome);
        const bool hasRun = std::string(end) == "done";
        EXPECT_EQ(hostsOf(rollouts_->toCancel(id_)), hasRun ? Names{} : Names{"h00"}) << end;
        EXPECT_EQ(rollouts_->parts(id_, 0, 1, now_).front().sight.cancelEnd, end);
        if (!hasRun) abort(cancels());
        tick();
    }
    EXPECT_EQ(given("h00").size(), 4U);
    EXPECT_EQ(given("h01").size(), 2U);
}

TEST_F(RolloutAbort, SendsNoCancelToAHostThatHasTold) {
    create(2);
    tick();
    const Names all = cancels();
    end("h00", "done");
    abort(all);
    end("h01", "done");
    tick();
    EXPECT_EQ(given("h00").size(), 1U);
    EXPECT_EQ(given("h01").size(), 1U);
    EXPECT_EQ(database_.number("SELECT COUNT(*) FROM rollout_cancels"), 0);
}

TEST_F(RolloutAbort, TakesNoOrderThatCancelsSomethingElse) {
    create(2);
    tick();
    expectInvalid("cancels nothing", [&] { abort(orders({"h00"})); });
    fleet::Order cancel = order("h00");
    cancel.kind = fleet::kCancel;
    cancel.body = R"({"order":")" + part("h01").order + R"("})";
    expectInvalid("cancels another one", [&] { abort({sign(cancel)}); });
    cancel.body = "{}";
    expectInvalid("\"order\"", [&] { abort({sign(cancel)}); });
    cancel.host = "nobody";
    cancel.body = R"({"order":")" + part("h00").order + R"("})";
    expectInvalid("no part", [&] { abort({sign(cancel)}); });
    EXPECT_EQ(state(), RolloutState::Running);
}

TEST_F(RolloutAbort, HappensOnce) {
    create(1);
    abort();
    expectConflict("has been aborted already", [&] { abort(); });
}

TEST_F(RolloutAbort, IsForAFinishedOneOnlyWhileHostsHaveItsOrders) {
    finish(1);
    expectConflict("has finished", [&] { abort(); });
    plan_.wait = kMinute;
    create(1);
    tick();
    tickAfter(kMinute);
    ASSERT_EQ(state(), RolloutState::Finished);
    abort(cancels());
    EXPECT_EQ(state(), RolloutState::Aborted);
}

TEST_F(RolloutAbort, EndsOneThatIsPaused) {
    create(1);
    pause();
    abort();
    EXPECT_EQ(hostsThatAre("cancelled"), (Names{"h00"}));
}

using RolloutRetry = RolloutOperations;

TEST_F(RolloutRetry, GivesHostsThatFailedAnotherOrder) {
    create(5);
    tick();
    end("h00", "done");
    end("h01", "failed", R"({"reason":"no room"})");
    endAll({"h02"}, "refused");
    endAll({"h03"}, "interrupted");
    endAll({"h04"}, "expired");
    tick();
    ASSERT_EQ(state(), RolloutState::Finished);
    const std::string first = part("h01").order;
    const Names failed = hostsOf(rollouts_->toTryAgain(id_, false));
    EXPECT_EQ(failed, (Names{"h01", "h02", "h03", "h04"}));
    retry(orders(failed));
    EXPECT_EQ(state(), RolloutState::Running);
    EXPECT_EQ(hostsThatAre("waiting"), failed);
    EXPECT_EQ(part("h01").reason, "");
    EXPECT_EQ(view().progress.failures, 0U);
    tick();
    EXPECT_EQ(given("h01"), (Names{first, part("h01").order}));
    EXPECT_EQ(part("h01").tries, 2U);
    endAll(failed, "done");
    tick();
    EXPECT_EQ(state(), RolloutState::Finished);
    EXPECT_EQ(hostsThatAre("done").size(), 5U);
}

TEST_F(RolloutRetry, TriesSomeOnlyIfNoMoreAreNamed) {
    create(2);
    tick();
    endAll({"h00", "h01"}, "failed");
    tick();
    retry(orders({"h01"}));
    tick();
    EXPECT_EQ(hostsThatAre("failed"), (Names{"h00"}));
    EXPECT_EQ(hostsThatAre("released"), (Names{"h01"}));
}

TEST_F(RolloutRetry, TriesWhatNobodyKnowsOnlyByForce) {
    create(1);
    tick();
    end("h00", "unknown");
    tick();
    EXPECT_TRUE(rollouts_->toTryAgain(id_, false).empty());
    expectInvalid("only by force", [&] { retry(orders({"h00"})); });
    EXPECT_EQ(hostsOf(rollouts_->toTryAgain(id_, true)), (Names{"h00"}));
    const std::string first = part("h00").order;
    retry(orders({"h00"}), true);
    tick();
    // What became of the first order counts no longer.
    fleet::Outcome late;
    late.host = "h00";
    late.order = first;
    late.state = "failed";
    centre_.hear(late);
    tick();
    EXPECT_EQ(hostsThatAre("released"), (Names{"h00"}));
}

TEST_F(RolloutRetry, IsForHostsThatFailedOnly) {
    plan_.waves = "3";
    create(4);
    tick();
    end("h00", "done");
    end("h01", "cancelled");
    tick();
    expectInvalid("nothing is tried again", [&] { retry({}); });
    for (const char* const host : {"h00", "h01", "h02", "h03"})
        expectInvalid("has not failed", [&] { retry(orders({host}), true); });
    expectInvalid("no part", [&] { retry(orders({"h09"})); });
    end("h02", "failed");
    fleet::Order other = order("h02");
    other.kind = "STOP";
    tick();
    expectInvalid("another kind", [&] { retry({sign(other)}); });
}

TEST_F(RolloutRetry, KnowsWhatWasToldJustNow) {
    create(1);
    tick();
    end("h00", "failed");
    retry(orders({"h00"}));
    EXPECT_EQ(hostsThatAre("waiting"), (Names{"h00"}));
    tick();
    EXPECT_EQ(hostsThatAre("released"), (Names{"h00"}));
}

TEST_F(RolloutRetry, DoesNotEndAPause) {
    plan_.waves = "1";
    create(2);
    tick();
    end("h00", "failed");
    tick();
    ASSERT_EQ(cause(), PauseCause::Failures);
    retry(orders({"h00"}));
    tickAfter(kHour);
    EXPECT_EQ(state(), RolloutState::Paused);
    EXPECT_EQ(hostsThatAre("waiting"), (Names{"h00", "h01"}));
    resume();
    tick();
    EXPECT_EQ(hostsThatAre("released"), (Names{"h00"}));
    end("h00", "done");
    tick();
    EXPECT_EQ(hostsThatAre("released"), (Names{"h01"}));
}

TEST_F(RolloutRetry, TakesTheLatestWaveUpAgain) {
    plan_.waves = "1,2";
    plan_.maxFailures = "1";
    plan_.pause = kMinute;
    create(3);
    tick();
    end("h00", "failed");
    tickAfter(kSecond);
    tickAfter(kMinute);
    end("h01", "done");
    tickAfter(kSecond);
    ASSERT_EQ(wave(), 2U);
    retry(orders({"h00"}));
    tickAfter(kMinute);
    EXPECT_EQ(hostsThatAre("released"), (Names{"h00"}));
    EXPECT_EQ(hostsThatAre("waiting"), (Names{"h02"}));
    EXPECT_EQ(part("h00").wave, 2U);
    end("h00", "done");
    tickAfter(kSecond);
    tickAfter(kMinute);
    EXPECT_EQ(hostsThatAre("released"), (Names{"h02"}));
}

TEST_F(RolloutRetry, IsNotForOneThatWasAborted) {
    create(1);
    tick();
    end("h00", "failed");
    tick();
    retry(orders({"h00"}));
    abort();
    expectConflict("has been aborted", [&] { retry(orders({"h00"})); });
}

}  // namespace
