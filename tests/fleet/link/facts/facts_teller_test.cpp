#include "fleet/link/facts/facts_teller.h"

#include <gtest/gtest.h>

#include <optional>
#include <string>

namespace {

using fleet::Facts;
using fleet::FactsTeller;
using fleet::HostLook;
using fleet::Moment;
using std::chrono::minutes;
using std::chrono::seconds;

class FactsOfALink : public testing::Test {
protected:
    FactsOfALink() : teller_(own()) { teller_.connected(); }

    static Facts own() {
        Facts facts;
        facts.host = "UHOST";
        facts.labels = {{"env", "test"}};
        return facts;
    }
    /// What is told, once the bus has it.
    std::optional<Facts> told() {
        std::optional<Facts> facts = teller_.next(now_);
        if (facts) teller_.stored(true);
        return facts;
    }
    /// A host that has answered with this inventory, all of which the bus has.
    void settle(const std::string& inventory) {
        teller_.hostIs("j1", now_);
        ASSERT_TRUE(teller_.wantsLook(now_));
        teller_.found(HostLook{"1.0", inventory}, now_);
        ASSERT_TRUE(told().has_value());
    }
    void look(const std::string& inventory) {
        ASSERT_TRUE(teller_.wantsLook(now_));
        teller_.found(HostLook{"1.0", inventory}, now_);
    }

    Moment now_{1'700'000'000'000};
    FactsTeller teller_;
};

TEST_F(FactsOfALink, AreToldWithoutAHost) {
    const auto facts = told();
    ASSERT_TRUE(facts.has_value());
    EXPECT_EQ(facts->labels, own().labels);
    EXPECT_EQ(facts->time, now_);
    EXPECT_EQ(facts->journal, "");
    EXPECT_FALSE(facts->inventory.has_value());
    EXPECT_FALSE(teller_.wantsLook(now_));
}

TEST_F(FactsOfALink, HaveTheInventoryOfAHostThatIsThere) {
    teller_.hostIs("j1", now_);
    EXPECT_FALSE(told().has_value());
    ASSERT_TRUE(teller_.wantsLook(now_));
    EXPECT_FALSE(teller_.wantsLook(now_)) << "one look at a time";
    EXPECT_FALSE(told().has_value());
    const Moment asked = now_;
    now_ += seconds(4);
    teller_.found(HostLook{"1.0", "{}"}, now_);
    const auto facts = told();
    ASSERT_TRUE(facts.has_value());
    EXPECT_EQ(facts->journal, "j1");
    EXPECT_EQ(facts->version, "1.0");
    EXPECT_EQ(facts->inventory->time, asked);
}

TEST_F(FactsOfALink, AreToldWhenTheyChangeAndOnceAMinuteAtMost) {
    settle("{}");
    now_ += minutes(10);
    EXPECT_FALSE(told().has_value());
    teller_.blockedIs("no host answers");
    ASSERT_TRUE(told().has_value());
    teller_.blockedIs("");
    now_ += seconds(59);
    EXPECT_FALSE(told().has_value());
    now_ += seconds(1);
    const auto facts = told();
    ASSERT_TRUE(facts.has_value());
    EXPECT_EQ(facts->blocked, "");
}

TEST_F(FactsOfALink, LookAtTheHostAfterItsTasks) {
    settle("{}");
    now_ += minutes(5);
    teller_.tasksChanged(now_);
    EXPECT_FALSE(teller_.wantsLook(now_ + seconds(2)));
    now_ += seconds(3);
    look(R"({"products":[1]})");
    EXPECT_EQ(told()->inventory->document, R"({"products":[1]})");
    // However many there are.
    for (int i = 0; i < 20; ++i)
        teller_.tasksChanged(now_ + seconds(i));
    EXPECT_FALSE(teller_.wantsLook(now_ + seconds(59)));
    EXPECT_TRUE(teller_.wantsLook(now_ + seconds(60)));
}

TEST_F(FactsOfALink, AreToldOnceAnHourWhenNothingChanges) {
    settle("{}");
    now_ += minutes(59);
    EXPECT_FALSE(teller_.wantsLook(now_));
    EXPECT_FALSE(told().has_value());
    now_ += minutes(1);
    look("{}");
    const auto facts = told();
    ASSERT_TRUE(facts.has_value());
    EXPECT_EQ(facts->inventory->time, now_);
}

TEST_F(FactsOfALink, OfTheSameInventorySoonAfterAreNotToldAgain) {
    settle("{}");
    now_ += minutes(5);
    teller_.tasksChanged(now_);
    now_ += seconds(3);
    look("{}");
    EXPECT_FALSE(told().has_value());
}

TEST_F(FactsOfALink, ThatTheBusHasNotKeptAreToldAgain) {
    ASSERT_TRUE(teller_.next(now_).has_value());
    EXPECT_FALSE(teller_.next(now_ + minutes(5)).has_value()) << "one message at a time";
    teller_.stored(false);
    EXPECT_FALSE(teller_.next(now_ + seconds(59)).has_value());
    EXPECT_TRUE(teller_.next(now_ + seconds(60)).has_value());
}

TEST_F(FactsOfALink, WaitForTheBus) {
    teller_.disconnected();
    EXPECT_FALSE(teller_.next(now_).has_value());
    teller_.connected();
    EXPECT_TRUE(teller_.next(now_).has_value());
}

TEST_F(FactsOfALink, KeepTheLastInventoryOfAHostThatIsAway) {
    settle("{}");
    now_ += minutes(2);
    teller_.hostIsAway();
    const auto facts = told();
    ASSERT_TRUE(facts.has_value());
    EXPECT_EQ(facts->journal, "");
    EXPECT_TRUE(facts->inventory.has_value());
    now_ += minutes(2);
    teller_.hostIs("j1", now_);
    EXPECT_TRUE(teller_.wantsLook(now_));
}

TEST_F(FactsOfALink, AskAHostThatHasNotAnsweredAMinuteLater) {
    teller_.hostIs("j1", now_);
    ASSERT_TRUE(teller_.wantsLook(now_));
    teller_.found(std::nullopt, now_);
    EXPECT_TRUE(told().has_value()) << "what is known is told meanwhile";
    EXPECT_FALSE(teller_.wantsLook(now_ + seconds(59)));
    EXPECT_TRUE(teller_.wantsLook(now_ + seconds(60)));
}

}  // namespace
