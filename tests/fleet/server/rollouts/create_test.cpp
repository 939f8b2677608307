/// Which roll-outs are made, and from what.
#include "fleet/bus/messages/numbered_order.h"
#include "fleet/bus/trust/signed.h"
#include "tests/fleet/server/rollouts/rollout_fixture.h"

namespace {

using namespace rollout_test;

class NewRolloutTest : public RolloutTest {
protected:
    void expectInvalid(const Wanted& made, const std::string& words) {
        expectRefusal(RolloutError::Kind::Invalid, words, [&] { make(made); });
    }
    /// Insists that one such order among others spoils the roll-out.
    void expectInvalid(const fleet::Order& bad, const std::string& words) {
        Wanted made = wanted({"h00"});
        made.orders.push_back(sign(bad));
        expectInvalid(made, words);
    }
};

TEST_F(NewRolloutTest, KeepsWhatItsOrdersSayAndReleasesNothing) {
    plan_.waves = "1,50%";
    plan_.maxFailures = "20%";
    plan_.pause = kMinute;
    plan_.wait = 10 * kMinute;
    plan_.parallel = 7;
    create(10);
    const fleet::Rollout made = view().rollout;
    EXPECT_TRUE(fleet::isOrderId(made.id));
    EXPECT_EQ(made.by.name, "anna");
    EXPECT_EQ(made.by.key, key_.publicKey());
    EXPECT_EQ(made.kind, "START");
    EXPECT_EQ(made.product, "ux");
    EXPECT_EQ(made.selector, "env=test");
    EXPECT_EQ(made.created, now_);
    EXPECT_EQ(made.since, now_);
    EXPECT_EQ(made.plan.waves, "1,50%");
    EXPECT_EQ(made.plan.maxFailures, "20%");
    EXPECT_EQ(made.plan.pause, kMinute);
    EXPECT_EQ(made.plan.wait, 10 * kMinute);
    EXPECT_EQ(made.plan.parallel, 7U);
    EXPECT_EQ(made.hosts, 10U);
    EXPECT_EQ(made.mostFailures, 2U);
    EXPECT_EQ(made.waves, 3U);
    EXPECT_EQ(made.wave, 0U);
    EXPECT_EQ(made.state, RolloutState::Running);
    EXPECT_EQ(hostsThatAre("waiting").size(), 10U);
    EXPECT_TRUE(given("h00").empty());
    std::vector<std::size_t> waves;
    for (const fleet::PartView& one : rollouts_->parts(id_, 0, 100, now_))
        waves.push_back(one.sight.part.wave);
    EXPECT_EQ(waves, (std::vector<std::size_t>{1, 2, 2, 2, 2, 3, 3, 3, 3, 3}));
}

TEST_F(NewRolloutTest, MayBringItsIdentifier) {
    Wanted made = wanted(enrol(1));
    made.id = "0123456789abcdef0123456789abcdef";
    EXPECT_EQ(make(made), made.id);
    Wanted again = wanted({"h00"});
    again.id = made.id;
    expectRefusal(RolloutError::Kind::Conflict, "already", [&] { make(again); });
    again.id = "0123456789ABCDEF0123456789ABCDEF";
    expectInvalid(again, "identifier");
}

TEST_F(NewRolloutTest, NeedsAnOrder) {
    expectInvalid(wanted({}), "there is no order");
}

TEST_F(NewRolloutTest, NeedsAnOperator) {
    Wanted made = wanted(enrol(1));
    made.by.name.clear();
    expectInvalid(made, "name");
    made.by = {"anna", ""};
    made.orders.clear();
    expectInvalid(made, "key");
}

TEST_F(NewRolloutTest, HasOneOrderForEachHost) {
    enrol(2);
    expectInvalid(order("h00"), "order 2 of 2: there is another one for the same host");
}

TEST_F(NewRolloutTest, HasOrdersForHostsOfTheFleetOnly) {
    enrol(2);
    expectInvalid(order("nobody"), "there is no host nobody");
    fleet::Order foreign = order("h01");
    foreign.fleet = "other";
    expectInvalid(foreign, "another fleet");
}

TEST_F(NewRolloutTest, HasOrdersOfWhichListsCanTell) {
    enrol(2);
    fleet::Order longKind = order("h01");
    longKind.kind = std::string(129, 'K');
    expectInvalid(longKind, "its kind or its product is too long");
    fleet::Order longProduct = order("h01");
    longProduct.body = R"({"product":")" + std::string(129, 'p') + "\"}";
    expectInvalid(longProduct, "its kind or its product is too long");
    fleet::Order longSelector = order("h01");
    longSelector.selector = std::string((64 << 10) + 1, 's');
    expectInvalid(longSelector, "its selector is too long");
}

TEST_F(NewRolloutTest, HasOrdersThatItsOperatorHasSigned) {
    enrol(2);
    Wanted made = wanted({"h00"});
    const fleet::KeyPair other = fleet::KeyPair::make(fleet::KeyKind::User);
    made.orders.push_back(fleet::signOrder(order("h01"), other, "certificate"));
    expectInvalid(made, "has not signed it");
    made.orders.back() = sign(order("h01"));
    made.orders.back().back() ^= 1;
    expectInvalid(made, "has not signed it");
    for (const char* const bytes : {"", "no order", "\xFF"}) {
        made.orders.back() = bytes;
        expectInvalid(made, "order 2 of 2");
    }
}

TEST_F(NewRolloutTest, HasOrdersThatStillHaveTimeButNotForEver) {
    enrol(2);
    fleet::Order made = order("h01");
    made.expires = now_;
    expectInvalid(made, "has expired");
    made.expires = now_ + fleet::kLongestOrder + Moment{1};
    expectInvalid(made, "more than 7 days");
}

TEST_F(NewRolloutTest, HasOrdersThatTheirNumbersFitAround) {
    enrol(2);
    Wanted made = wanted({"h00"});
    const auto longOrder = [&](std::size_t bytes) {
        fleet::Order sized = order("h00");
        const std::size_t others = sign(sized).size();
        sized.body = R"({"product":"ux","text":")" + std::string(bytes - others - 10, 'x') + "\"}";
        return sign(sized);
    };
    const std::size_t most = fleet::kMostSignedBytes - 4'096;
    made.orders = {longOrder(most + 1)};
    ASSERT_EQ(made.orders[0].size(), most + 1);
    expectInvalid(made, "too long");
    made.orders = {longOrder(most)};
    id_ = make(made);
    EXPECT_LE(
        fleet::signNumber("h00", fleet::kHighestNumber, part("h00").order, made.orders[0], key_)
            .size(),
        fleet::kMostSignedBytes);
}

TEST_F(NewRolloutTest, HasOrdersThatDoTheSame) {
    enrol(2);
    fleet::Order made = order("h01");
    made.kind = "STOP";
    expectInvalid(made, "another kind");
    made = order("h01");
    made.body = R"({"product":"lz"})";
    expectInvalid(made, "another product");
    made.body = R"({"product":7})";
    expectInvalid(made, "product");
    made = order("h01");
    made.selector = "*";
    expectInvalid(made, "another selector");
}

TEST_F(NewRolloutTest, CancelsNothing) {
    enrol(1);
    Wanted made = wanted({"h00"});
    fleet::Order cancel = order("h00");
    cancel.kind = fleet::kCancel;
    cancel.body = R"({"order":"0123456789abcdef0123456789abcdef"})";
    made.orders = {sign(cancel)};
    expectInvalid(made, "abort does that");
}

TEST_F(NewRolloutTest, TakesNoOrderTwice) {
    enrol(2);
    const Wanted first = wanted({"h00"});
    id_ = make(first);
    expectInvalid(first, "was handed over before");
    tick();
    expectInvalid(first, "was handed over before");
    Wanted single = wanted({"h01"});
    const std::string name = fleet::readOrder(single.orders[0]).order.id;
    giver()("h01", name, single.orders[0]);
    expectInvalid(single, "was handed over before");
}

TEST_F(NewRolloutTest, HasAPlanThatCanBeCarriedOut) {
    enrol(1);
    const auto expectBadPlan = [&](const std::string& words) {
        expectInvalid(wanted({"h00"}), words);
        plan_ = {};
    };
    plan_.waves = "2,1";
    expectBadPlan("must reach more hosts");
    plan_.waves = "";
    expectBadPlan("neither a number of hosts nor a percentage");
    plan_.maxFailures = "-1";
    expectBadPlan("neither a number of hosts nor a percentage");
    plan_.maxFailures = "101%";
    expectBadPlan("more than all hosts");
    plan_.pause = Moment{-1};
    expectBadPlan("pause");
    plan_.pause = fleet::kLongestOrder + Moment{1};
    expectBadPlan("pause");
    plan_.wait = Moment{};
    expectBadPlan("a wave may take");
    plan_.wait = fleet::kLongestOrder + Moment{1};
    expectBadPlan("a wave may take");
    plan_.parallel = 0;
    expectBadPlan("at least one order");
}

TEST_F(NewRolloutTest, StandsInTheListTheNewestFirst) {
    const Names hosts = enrol(1);
    Names made;
    for (int i = 0; i < 3; ++i)
        made.push_back(make(wanted(hosts)));
    const auto idsOf = [&](const std::string& before, std::size_t most) {
        Names ids;
        for (const fleet::RolloutView& one : rollouts_->list(before, most, now_))
            ids.push_back(one.rollout.id);
        return ids;
    };
    EXPECT_EQ(idsOf("", 2), (Names{made[2], made[1]}));
    EXPECT_EQ(idsOf(made[1], 2), (Names{made[0]}));
    EXPECT_EQ(idsOf(made[0], 2), Names{});
    EXPECT_THROW(idsOf("nothing", 2), RolloutError);
}

TEST_F(NewRolloutTest, IsFoundByItsIdentifierOnly) {
    create(1);
    const auto expectMissing = [&](auto call) {
        expectRefusal(RolloutError::Kind::NotFound, "there is no such roll-out", call);
    };
    expectMissing([&] { rollouts_->show("x", now_); });
    expectMissing([&] { rollouts_->pause("x", by(), now_); });
    expectMissing([&] { rollouts_->resume("x", by(), {}, now_); });
    expectMissing([&] { rollouts_->abort("x", by(), {}, now_); });
    expectMissing([&] { rollouts_->retryFailed("x", by(), read(orders({"h00"})), false, now_); });
    expectMissing([&] { rollouts_->toCancel("x"); });
}

}  // namespace
