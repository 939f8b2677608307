/// What a link makes of the centre's replies.
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "tests/fleet/link/core/link_driver.h"

namespace {

using fleet::HandOver;
using fleet::Keep;
using fleet::LookUp;
using fleet::Moment;
using fleet::Number;
using fleet::Reply;
using fleet::Report;
using fleet::SayHello;
using fleet_test::directive;
using fleet_test::kept;
using fleet_test::kNow;
using fleet_test::LinkDriver;
using fleet_test::outcome;

Reply replyTo(const LinkDriver& driver, Number over, Number last) {
    Reply reply;
    reply.nonce = driver.nonce();
    reply.over = over;
    reply.last = last;
    return reply;
}

LinkDriver connectedLink(fleet::Kept memory, const std::string& journal = "journal") {
    LinkDriver driver(std::move(memory));
    driver.note(driver.link().hostIs(journal, {}, kNow));
    driver.note(driver.link().connected(kNow));
    return driver;
}

TEST(Hello, IsSaidAtOnceAndThenAfterThePause) {
    LinkDriver driver = connectedLink(kept(3));
    EXPECT_EQ(driver.count<SayHello>(), 1U);
    EXPECT_EQ(driver.hello().taken, Number{3});
    EXPECT_EQ(driver.hello().session, "session");
    EXPECT_EQ(driver.hello().machine, "machine");
    EXPECT_EQ(driver.hello().time, kNow);
    EXPECT_EQ(driver.hello().journal, "journal");
    EXPECT_EQ(driver.hello().journalNow, "journal");
    driver.wait(Moment(29'000));
    EXPECT_EQ(driver.count<SayHello>(), 1U);
    driver.wait(Moment(1'000));
    EXPECT_EQ(driver.count<SayHello>(), 2U);
}

TEST(Hello, AGapIsToldAtMostEveryTwoSeconds) {
    LinkDriver driver(kept(0));
    driver.greet(2);
    driver.forget();
    for (int second = 0; second < 20; ++second) {
        driver.note(driver.link().missing(1, driver.now));
        driver.note(driver.link().seen(2, driver.now));
        driver.wait(Moment(1'000));
    }
    EXPECT_GE(driver.count<SayHello>(), 5U);
    EXPECT_LE(driver.count<SayHello>(), 10U);
}

/// How long it takes to the next hello after one that nobody has heard.
Moment pauseAfterUnheard(LinkDriver& driver) {
    driver.note(driver.link().unheard(driver.nonce(), driver.now));
    driver.forget();
    const Moment begin = driver.now;
    driver.waitFor<SayHello>();
    return driver.now - begin;
}

TEST(Hello, OneThatNobodyHearsIsSaidAgainEverLater) {
    LinkDriver driver = connectedLink(kept(0));
    for (const int seconds : {2, 4, 8, 16, 30, 30}) {
        EXPECT_EQ(pauseAfterUnheard(driver), Moment(1'000 * seconds));
    }
    driver.note(driver.link().replied(replyTo(driver, 0, 0), driver.now));
    driver.forget();
    driver.waitFor<SayHello>();
    EXPECT_EQ(pauseAfterUnheard(driver), Moment(2'000)) << "a reply ends the impatience";
}

TEST(Hello, AnOlderOneThatNobodyHasHeardChangesNothing) {
    LinkDriver driver = connectedLink(kept(0));
    driver.note(driver.link().unheard("another nonce", driver.now));
    driver.forget();
    driver.wait(Moment(29'000));
    EXPECT_EQ(driver.count<SayHello>(), 0U);
}

TEST(Hello, NumbersThatSomebodyMakesUpLeadToOneScanASecondAndNoHello) {
    LinkDriver driver(kept(0));
    driver.greet(0);
    driver.bring({});
    driver.forget();
    for (int i = 0; i < 10'000; ++i) {
        driver.now += Moment(1);
        driver.note(driver.link().seen(Number{1} << 52U, driver.now));
        driver.note(driver.link().missing(1, driver.now));
    }
    EXPECT_LE(driver.count<fleet::ReadOrder>(), 11U);
    EXPECT_EQ(driver.count<SayHello>(), 0U);
}

TEST(Hello, NothingIsSaidWithoutABus) {
    LinkDriver driver = connectedLink(kept(0));
    driver.link().disconnected();
    driver.wait(Moment(100'000));
    EXPECT_EQ(driver.count<SayHello>(), 1U);
}

TEST(Replying, MovesTheHostPastWhatIsOver) {
    LinkDriver driver = connectedLink(kept(3));
    driver.note(driver.link().replied(replyTo(driver, 7, 9), kNow));
    EXPECT_EQ(driver.link().kept().taken, Number{7});
    ASSERT_NE(driver.last<Keep>(), nullptr);
    EXPECT_EQ(driver.last<Keep>()->kept.taken, Number{7});
}

TEST(Replying, NeverMovesAHostBack) {
    LinkDriver driver = connectedLink(kept(3));
    driver.note(driver.link().replied(replyTo(driver, 1, 9), kNow));
    EXPECT_EQ(driver.link().kept().taken, Number{3});
}

TEST(Replying, ToAnotherHelloCountsNothing) {
    LinkDriver driver = connectedLink(kept(3));
    Reply reply = replyTo(driver, 7, 9);
    reply.nonce = "another";
    driver.note(driver.link().replied(reply, kNow));
    EXPECT_EQ(driver.link().kept().taken, Number{3});
    const Reply good = replyTo(driver, 7, 9);
    driver.note(driver.link().replied(good, kNow));
    EXPECT_EQ(driver.link().kept().taken, Number{7});
    Reply again = good;
    again.over = 8;
    driver.note(driver.link().replied(again, kNow));
    EXPECT_EQ(driver.link().kept().taken, Number{7});
}

TEST(Replying, WithNumbersThatCannotBeCountsNothing) {
    LinkDriver driver = connectedLink(kept(3));
    driver.note(driver.link().replied(replyTo(driver, 10, 9), kNow));
    driver.note(driver.link().replied(replyTo(driver, Number{1} << 62, Number{1} << 62), kNow));
    EXPECT_EQ(driver.link().kept().taken, Number{3});
}

TEST(Replying, AnOpenOrderThatIsOverIsReportedAgain) {
    LinkDriver driver = connectedLink(kept(3));
    Reply reply = replyTo(driver, 1, 3);
    reply.open = {"order-2", "order-3"};
    driver.note(driver.link().replied(reply, kNow));
    EXPECT_EQ(driver.count<LookUp>(), 2U);
    driver.note(driver.link().found("order-2", outcome("order-2", "failed"), kNow));
    driver.note(driver.link().found("order-3", fleet::StillOpen{}, kNow));
    ASSERT_EQ(driver.count<Report>(), 1U);
    EXPECT_EQ(driver.last<Report>()->outcome.order, "order-2");
    EXPECT_EQ(driver.last<Report>()->outcome.state, "failed");
    EXPECT_EQ(driver.last<Report>()->outcome.host, "host");
}

TEST(Replying, AnOpenOrderThatTheJournalDoesNotHaveIsUnknown) {
    LinkDriver driver = connectedLink(kept(3));
    Reply reply = replyTo(driver, 1, 3);
    reply.open = {"order-2"};
    driver.note(driver.link().replied(reply, kNow));
    driver.note(driver.link().found("order-2", fleet::Absent{}, kNow));
    ASSERT_NE(driver.last<Report>(), nullptr);
    EXPECT_EQ(driver.last<Report>()->outcome.state, fleet::kUnknown);
    EXPECT_EQ(driver.last<Report>()->outcome.journal, "journal");
}

TEST(Replying, AHostThatIsAwaySaysNothingOfOpenOrders) {
    LinkDriver driver = connectedLink(kept(3));
    Reply reply = replyTo(driver, 1, 3);
    reply.open = {"order-2"};
    driver.note(driver.link().hostIsAway(kNow));
    driver.note(driver.link().replied(reply, kNow));
    EXPECT_EQ(driver.count<LookUp>(), 0U);
}

TEST(Replying, AnotherJournalIsAdoptedAndNothingPublishedBeforeRuns) {
    LinkDriver driver = connectedLink(kept(3), "another");
    driver.bring({directive(4)});
    EXPECT_EQ(driver.count<HandOver>(), 0U);
    driver.note(driver.link().replied(replyTo(driver, 2, 9), kNow));
    EXPECT_EQ(driver.link().kept().journal, "another");
    EXPECT_EQ(driver.link().kept().taken, Number{9});
    EXPECT_EQ(driver.link().kept().adopted, kNow);
    driver.bring({});
    EXPECT_EQ(driver.count<HandOver>(), 0U);
}

TEST(Replying, TheFirstJournalIsAdoptedWithoutPassingAnythingOver) {
    LinkDriver driver = connectedLink(fleet::Kept{});
    driver.note(driver.link().replied(replyTo(driver, 0, 1), kNow));
    EXPECT_EQ(driver.link().kept().journal, "journal");
    EXPECT_EQ(driver.link().kept().taken, Number{0});
    driver.bring({directive(1)});
    EXPECT_EQ(driver.count<HandOver>(), 1U);
}

TEST(Replying, ALinkThatHasForgottenPassesAllOver) {
    LinkDriver driver = connectedLink(kept(3));
    Reply reply = replyTo(driver, 2, 9);
    reply.forget = true;
    driver.note(driver.link().replied(reply, kNow));
    EXPECT_EQ(driver.link().kept().taken, Number{9});
}

TEST(Replying, ALinkThatHasForgottenMovesOnOnlyWhenItMayAdopt) {
    LinkDriver driver(kept(3));
    driver.note(driver.link().connected(kNow));
    Reply reply = replyTo(driver, 5, 9);
    reply.forget = true;
    driver.note(driver.link().replied(reply, kNow));
    EXPECT_EQ(driver.link().kept().taken, Number{3});
}

TEST(Replying, NothingIsAdoptedWhileTheHostRecordsAnOrder) {
    LinkDriver driver(kept(0));
    driver.greet(1);
    driver.bring({directive(1)});
    ASSERT_EQ(driver.count<HandOver>(), 1U);
    driver.wait(Moment(31'000));
    Reply reply = replyTo(driver, 0, 5);
    reply.forget = true;
    driver.note(driver.link().replied(reply, driver.now));
    EXPECT_EQ(driver.link().kept().taken, Number{0});
    driver.note(driver.link().recorded(1, fleet::Recorded{true}, driver.now));
    EXPECT_EQ(driver.link().kept().taken, Number{1});
    driver.wait(Moment(3'000));
    reply.nonce = driver.nonce();
    driver.note(driver.link().replied(reply, driver.now));
    EXPECT_EQ(driver.link().kept().taken, Number{5});
}

TEST(Replying, AHostWithAnotherJournalThanTheOneThatWasMeantIsAskedAnew) {
    LinkDriver driver(kept(0));
    driver.greet(1);
    driver.bring({directive(1)});
    driver.note(driver.link().recorded(1, fleet::OtherJournal{}, kNow));
    EXPECT_EQ(driver.link().kept().taken, Number{0});
    driver.note(driver.link().hostIs("another", {}, kNow));
    driver.wait(Moment(3'000));
    EXPECT_EQ(driver.hello().journalNow, "another");
    driver.note(driver.link().replied(replyTo(driver, 0, 1), driver.now));
    EXPECT_EQ(driver.link().kept().taken, Number{1});
    EXPECT_EQ(driver.link().kept().journal, "another");
    EXPECT_EQ(driver.count<HandOver>(), 1U);
}

TEST(Replying, StopEndsTheLink) {
    LinkDriver driver = connectedLink(kept(3));
    Reply reply = replyTo(driver, 3, 3);
    reply.stop = "two machines claim to be this host";
    driver.note(driver.link().replied(reply, kNow));
    ASSERT_NE(driver.last<fleet::StopLink>(), nullptr);
    EXPECT_EQ(driver.last<fleet::StopLink>()->reason, "two machines claim to be this host");
}

TEST(Replying, TheCentreMayAskWhatTheJournalHas) {
    LinkDriver driver = connectedLink(kept(3));
    EXPECT_FALSE(driver.last<SayHello>()->listWanted);
    Reply reply = replyTo(driver, 3, 3);
    reply.list = true;
    driver.note(driver.link().replied(reply, kNow));
    driver.wait(Moment(31'000));
    EXPECT_TRUE(driver.last<SayHello>()->listWanted);
}

TEST(Reporting, TheEndOfATaskIsToldAtOnce) {
    LinkDriver driver = connectedLink(kept(3));
    driver.note(driver.link().ended(outcome("order-3", "done"), kNow));
    ASSERT_NE(driver.last<Report>(), nullptr);
    EXPECT_EQ(driver.last<Report>()->outcome.host, "host");
    EXPECT_EQ(driver.last<Report>()->outcome.state, "done");
}

}  // namespace
