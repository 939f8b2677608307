/// Which order a host gets, and when.
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "tests/fleet/link/core/link_driver.h"

namespace {

using fleet::CancelTask;
using fleet::Directive;
using fleet::EnterEnd;
using fleet::HandOver;
using fleet::Keep;
using fleet::Link;
using fleet::Moment;
using fleet::Number;
using fleet::PrepareFiles;
using fleet::SayHello;
using fleet_test::directive;
using fleet_test::kept;
using fleet_test::kNow;
using fleet_test::LinkDriver;
using fleet_test::outcome;

constexpr Moment kSecond{1'000};

/// A link that has taken nothing, greeted, with these orders on the bus.
LinkDriver linkWith(const std::vector<Directive>& orders) {
    LinkDriver driver(kept(0));
    driver.greet(0);
    driver.bring(orders);
    return driver;
}

void expectEnd(LinkDriver& driver, const std::string& state, const std::string& reason) {
    const EnterEnd* const end = driver.last<EnterEnd>();
    ASSERT_NE(end, nullptr);
    EXPECT_EQ(end->state, state);
    EXPECT_NE(end->reason.find(reason), std::string::npos) << end->reason;
    EXPECT_EQ(driver.count<HandOver>(), 0U);
}

TEST(HandingOver, WaitsForTheEndOfTheScan) {
    LinkDriver driver(kept(0));
    driver.greet(0);
    driver.note(driver.link().read(1, directive(1), kNow));
    EXPECT_EQ(driver.count<HandOver>(), 0U);
    driver.note(driver.link().missing(2, kNow));
    ASSERT_NE(driver.last<HandOver>(), nullptr);
    EXPECT_EQ(driver.last<HandOver>()->directive.number, Number{1});
    EXPECT_EQ(driver.last<HandOver>()->journal, "journal");
}

TEST(HandingOver, WaitsForTheFirstReplyOnEachConnection) {
    LinkDriver driver(kept(0));
    driver.note(driver.link().hostIs("journal", {}, kNow));
    driver.note(driver.link().connected(kNow));
    EXPECT_EQ(driver.count<fleet::ReadOrder>(), 0U) << "a cancel might be a revoked operator's";
    fleet::Reply reply;
    reply.nonce = driver.nonce();
    reply.last = 1;
    driver.note(driver.link().replied(reply, kNow));
    driver.bring({directive(1)});
    EXPECT_EQ(driver.count<HandOver>(), 1U);
}

TEST(HandingOver, IsStrictlyInTurn) {
    LinkDriver driver = linkWith({directive(1), directive(2)});
    EXPECT_EQ(driver.count<HandOver>(), 1U);
    driver.note(driver.link().recorded(1, fleet::Recorded{true}, kNow));
    EXPECT_EQ(driver.link().kept().taken, Number{1});
    ASSERT_EQ(driver.count<HandOver>(), 2U);
    EXPECT_EQ(driver.last<HandOver>()->directive.number, Number{2});
}

TEST(HandingOver, NeverPassesANumberThatIsMissing) {
    LinkDriver driver(kept(0));
    driver.greet(0);
    driver.note(driver.link().missing(1, kNow));
    driver.note(driver.link().seen(2, kNow));
    driver.note(driver.link().missing(1, kNow));
    driver.wait(Moment(31'000));
    driver.note(driver.link().missing(1, driver.now));
    EXPECT_EQ(driver.count<HandOver>(), 0U);
    EXPECT_EQ(driver.link().kept().taken, Number{0});
}

TEST(HandingOver, KeepsTheNumberBeforeAHelloTellsIt) {
    LinkDriver driver = linkWith({directive(1)});
    driver.forget();
    driver.now += Moment(40'000);
    driver.note(driver.link().recorded(1, fleet::Recorded{true}, driver.now));
    ASSERT_EQ(driver.count<Keep>(), 1U);
    ASSERT_EQ(driver.count<SayHello>(), 1U);
    EXPECT_EQ(driver.last<SayHello>()->hello.taken, Number{1});
    EXPECT_TRUE(std::holds_alternative<Keep>(driver.done.front()));
    EXPECT_EQ(driver.last<Keep>()->kept.taken, Number{1});
}

TEST(HandingOver, LeavesAtMostEightUnfinished) {
    std::vector<Directive> orders;
    for (Number number = 1; number <= Link::kMostUnfinished + 1; ++number) {
        orders.push_back(directive(number));
    }
    LinkDriver driver = linkWith(orders);
    for (Number number = 1; number <= Link::kMostUnfinished; ++number) {
        driver.note(driver.link().recorded(number, fleet::Recorded{false}, kNow));
    }
    EXPECT_EQ(driver.count<HandOver>(), Link::kMostUnfinished);
    EXPECT_NE(driver.link().blocked(), "");
    driver.note(driver.link().ended(outcome("order-3", "done"), kNow));
    EXPECT_EQ(driver.count<HandOver>(), Link::kMostUnfinished + 1);
}

TEST(HandingOver, ATaskThatIsOverBeforeItsRecordIsKnownIsNotUnfinished) {
    Directive withFiles = directive(2);
    withFiles.hasFiles = true;
    LinkDriver driver = linkWith({directive(1), withFiles});
    driver.note(driver.link().ended(outcome("order-1", "done"), kNow));
    driver.note(driver.link().recorded(1, fleet::Recorded{false}, kNow));
    EXPECT_EQ(driver.count<PrepareFiles>(), 1U);
}

TEST(HandingOver, PlacesFilesOnlyWhenAllBeforeAreOver) {
    Directive withFiles = directive(2);
    withFiles.hasFiles = true;
    LinkDriver driver = linkWith({directive(1), withFiles});
    driver.note(driver.link().recorded(1, fleet::Recorded{false}, kNow));
    EXPECT_EQ(driver.count<PrepareFiles>(), 0U);
    driver.note(driver.link().ended(outcome("order-1", "done"), kNow));
    ASSERT_EQ(driver.count<PrepareFiles>(), 1U);
    EXPECT_EQ(driver.count<HandOver>(), 1U);
    driver.note(driver.link().prepared(2, fleet::FilesPlaced{}, kNow));
    EXPECT_EQ(driver.count<HandOver>(), 2U);
}

TEST(HandingOver, AnOrderThatOnlyBringsFilesIsDoneWhenTheyAreThere) {
    Directive push = directive(1);
    push.hasFiles = push.onlyBringsFiles = true;
    push.files = {{"ux.tar", std::string(64, 'a'), 7}};
    LinkDriver driver = linkWith({push});
    ASSERT_EQ(driver.count<PrepareFiles>(), 1U);
    EXPECT_EQ(driver.count<EnterEnd>(), 0U);
    driver.note(driver.link().prepared(1, fleet::FilesPlaced{}, kNow));
    EXPECT_EQ(driver.count<HandOver>(), 0U);
    expectEnd(driver, "done", "1 file is in the depot");
}

TEST(HandingOver, FilesThatNeverComeEndTheOrder) {
    Directive withFiles = directive(1);
    withFiles.hasFiles = true;
    LinkDriver driver = linkWith({withFiles});
    driver.note(driver.link().prepared(1, fleet::Unacceptable{"the sum is another one"}, kNow));
    expectEnd(driver, "refused", "the sum is another one");
}

TEST(HandingOver, WhatTheHostWillNeverTakeIsRecordedAsRefusedWithItsWords) {
    LinkDriver driver = linkWith({directive(1)});
    driver.note(driver.link().recorded(1, fleet::Unacceptable{"there is no command \"X\""}, kNow));
    ASSERT_NE(driver.last<EnterEnd>(), nullptr);
    EXPECT_EQ(driver.last<EnterEnd>()->state, "refused");
    EXPECT_EQ(driver.last<EnterEnd>()->reason, "there is no command \"X\"");
    EXPECT_EQ(driver.link().kept().taken, Number{0});
    driver.note(driver.link().recorded(1, fleet::Recorded{true}, kNow));
    EXPECT_EQ(driver.link().kept().taken, Number{1});
}

TEST(HandingOver, AHostThatDoesNotRecordARefusalIsAskedAgainLater) {
    LinkDriver driver = linkWith({directive(1)});
    driver.note(driver.link().recorded(1, fleet::Unacceptable{"no such command"}, kNow));
    driver.forget();
    driver.note(driver.link().recorded(1, fleet::Unacceptable{"no such member"}, kNow));
    EXPECT_EQ(driver.count<EnterEnd>(), 0U);
    EXPECT_NE(driver.link().blocked().find("no such member"), std::string::npos);
    driver.wait(Moment(2'000));
    EXPECT_EQ(driver.count<HandOver>(), 1U);
    EXPECT_EQ(driver.link().kept().taken, Number{0});
}

TEST(HandingOver, WhatIsListedAnewIsLookedUpBecauseTheListMayBeOlder) {
    LinkDriver driver = linkWith({directive(1)});
    driver.note(driver.link().recorded(1, fleet::Recorded{false}, kNow));
    driver.forget();
    driver.note(driver.link().hostIs("journal", {"order-7"}, kNow));
    EXPECT_EQ(driver.count<fleet::LookUp>(), 2U)
        << "the one that is listed, and the one that is not";
}

TEST(HandingOver, AHostThatIsBusyGetsTheSameOrderLaterAndMoreSeldom) {
    LinkDriver driver = linkWith({directive(1)});
    std::vector<Moment> pauses;
    while (pauses.size() < 6) {
        driver.forget();
        driver.note(driver.link().recorded(1, fleet::NotNow{"the queue is full"}, driver.now));
        EXPECT_EQ(driver.link().blocked(), "the queue is full");
        const Moment asked = driver.now;
        while (driver.count<HandOver>() == 0)
            driver.wait(kSecond);
        EXPECT_EQ(driver.last<HandOver>()->directive.number, Number{1});
        pauses.push_back(driver.now - asked);
    }
    const std::vector<Moment> expected = {2 * kSecond,  4 * kSecond,  8 * kSecond,
                                          16 * kSecond, 30 * kSecond, 30 * kSecond};
    EXPECT_EQ(pauses, expected);
}

TEST(HandingOver, WhyItIsBlockedIsToldInTheHello) {
    LinkDriver driver = linkWith({directive(1)});
    driver.note(driver.link().recorded(1, fleet::NotNow{"the disk is full"}, kNow));
    driver.wait(Moment(31'000));
    EXPECT_EQ(driver.hello().blocked, "the disk is full");
}

TEST(HandingOver, NoHostGetsNothing) {
    LinkDriver driver = linkWith({});
    driver.note(driver.link().hostIsAway(kNow));
    driver.note(driver.link().seen(1, kNow));
    driver.bring({directive(1)});
    EXPECT_EQ(driver.count<HandOver>(), 0U);
    driver.note(driver.link().hostIs("journal", {}, kNow));
    EXPECT_EQ(driver.count<HandOver>(), 1U);
}

TEST(Refusing, WhatSignatureRoleOrSelectorForbid) {
    Directive forbidden = directive(1);
    forbidden.refusal = "the operator may not start \"ux\"";
    LinkDriver driver = linkWith({forbidden});
    expectEnd(driver, "refused", "may not start");
}

TEST(Refusing, AnOrderFromTheFuture) {
    Directive early = directive(1);
    early.issued = kNow + Link::kMostAhead;
    LinkDriver allowed = linkWith({early});
    EXPECT_EQ(allowed.count<HandOver>(), 1U);
    early.issued += Moment(1);
    LinkDriver driver = linkWith({early});
    expectEnd(driver, "refused", "in the future");
}

TEST(Refusing, AnOrderWhoseTurnComesTooLate) {
    Directive late = directive(1);
    late.expires = kNow;
    LinkDriver driver = linkWith({late});
    expectEnd(driver, "expired", "too late");
}

TEST(Refusing, AClockThatIsPutBackMakesNoOrderGoodAgain) {
    Directive late = directive(1);
    late.expires = kNow + Moment(10'000);
    LinkDriver driver = linkWith({});
    driver.note(driver.link().tick(kNow + Moment(20'000)));
    driver.note(driver.link().seen(1, kNow));
    driver.bring({late});
    expectEnd(driver, "expired", "too late");
}

TEST(Refusing, AClockThatWasPutBackBeforeTheStartMakesNoOrderGoodAgain) {
    Directive late = directive(1);
    late.expires = kNow + Moment(10'000);
    fleet::Kept memory = kept(0);
    memory.latest = kNow + Moment(20'000);
    LinkDriver driver(memory);
    driver.greet(0);
    driver.bring({late});
    expectEnd(driver, "expired", "too late");
}

TEST(Refusing, ACertificateThatHasEnded) {
    Directive order = directive(1);
    order.allowedUntil = kNow;
    LinkDriver driver = linkWith({order});
    expectEnd(driver, "refused", "certificate");
}

TEST(Refusing, AnOperatorWhoseKeyIsRevoked) {
    LinkDriver driver(kept(0));
    driver.note(driver.link().hostIs("journal", {}, kNow));
    driver.note(driver.link().connected(kNow));
    fleet::Reply reply;
    reply.nonce = driver.nonce();
    reply.last = 1;
    reply.revoked = {"operator"};
    driver.note(driver.link().replied(reply, kNow));
    driver.bring({directive(1)});
    expectEnd(driver, "refused", "revoked");
}

TEST(Refusing, NobodyKnowsWhoseKeyIsRevokedBeforeTheFirstReply) {
    LinkDriver driver(kept(0));
    driver.note(driver.link().hostIs("journal", {}, kNow));
    driver.note(driver.link().connected(kNow));
    fleet::Reply reply;
    reply.nonce = "of another hello";
    reply.revoked = {"operator"};
    driver.note(driver.link().replied(reply, kNow));
    EXPECT_FALSE(driver.link().knowsRevoked());
    reply.nonce = driver.nonce();
    driver.note(driver.link().replied(reply, kNow));
    EXPECT_TRUE(driver.link().knowsRevoked());
    EXPECT_TRUE(driver.link().isRevoked("operator"));
    driver.link().disconnected();
    EXPECT_TRUE(driver.link().knowsRevoked()) << "it does not forget that while it runs";
}

TEST(Refusing, AnOrderOlderThanTheJournalThatTookAnothersPlace) {
    fleet::Kept memory = kept(0);
    memory.adopted = kNow;
    LinkDriver driver(memory);
    driver.greet(0);
    driver.bring({directive(1)});
    expectEnd(driver, "refused", "before the host's journal began");
}

Directive cancelOf(const std::string& order, Number number) {
    Directive cancel = directive(number);
    cancel.cancels = order;
    return cancel;
}

TEST(Cancelling, WhatWaitsOnTheBusNeverRuns) {
    LinkDriver driver = linkWith({directive(1), cancelOf("order-1", 2)});
    expectEnd(driver, "cancelled", "before its turn");
    EXPECT_EQ(driver.last<EnterEnd>()->directive.number, Number{1});
}

TEST(Cancelling, WhatTheHostHasIsCancelledAtOnceEvenWhileAnotherOrderIsInTheWay) {
    LinkDriver driver = linkWith({directive(1)});
    driver.note(driver.link().recorded(1, fleet::Recorded{false}, kNow));
    driver.note(driver.link().seen(2, kNow));
    driver.note(driver.link().read(2, directive(2), kNow));
    driver.note(driver.link().read(3, cancelOf("order-1", 3), kNow));
    ASSERT_NE(driver.last<CancelTask>(), nullptr);
    EXPECT_EQ(driver.last<CancelTask>()->order, "order-1");
}

TEST(Cancelling, IsRecordedInItsTurnWithWhatBecameOfIt) {
    LinkDriver driver = linkWith({cancelOf("order-x", 1)});
    driver.forget();
    driver.note(driver.link().cancelled(1, fleet::WasCancelled{}, kNow));
    ASSERT_NE(driver.last<EnterEnd>(), nullptr);
    EXPECT_EQ(driver.last<EnterEnd>()->state, "done");
    LinkDriver late = linkWith({cancelOf("order-x", 1)});
    late.note(late.link().cancelled(1, fleet::NotCancelled{"it is over: done"}, kNow));
    expectEnd(late, "refused", "it is over: done");
}

TEST(Cancelling, ThatIsForbiddenChangesNothing) {
    Directive cancel = cancelOf("order-1", 2);
    cancel.refusal = "the operator may not cancel";
    LinkDriver driver = linkWith({directive(1), cancel});
    EXPECT_EQ(driver.count<HandOver>(), 1U);
    EXPECT_EQ(driver.count<CancelTask>(), 0U);
}

TEST(Cancelling, GoesOnWhenTheHostIsBack) {
    LinkDriver driver = linkWith({cancelOf("order-x", 1)});
    driver.note(driver.link().cancelled(1, fleet::NotNow{"no host answers"}, kNow));
    driver.forget();
    while (driver.count<CancelTask>() == 0)
        driver.wait(kSecond);
    EXPECT_EQ(driver.link().kept().taken, Number{0});
}

}  // namespace
