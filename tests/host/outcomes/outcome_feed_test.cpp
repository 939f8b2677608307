// ctest-label: threaded
#include "host/outcomes/outcome_feed.h"

#include <gtest/gtest.h>

#include <atomic>
#include <future>
#include <optional>
#include <stdexcept>
#include <thread>

#include "host/made_up_table.h"
#include "support/host/program.h"

namespace {

using host::OutcomeFeed;

class Feed : public testing::Test {
protected:
    Feed() {
        outcomes.RegisterWithManager();
        tables.emplace(oxa::tables());
        feed.emplace(*tables);
    }

    /// A sink that appends the names of its rows and answers `status`.
    static oxa::Sink into(std::string& seen, int status = OXA_OK) {
        return [&seen, status](const oxa::Rows& rows) {
            for (std::size_t i = 0; i < rows.count(); ++i)
                seen += rows.row(i)[0];
            return status;
        };
    }
    int publish(const std::string& name, int number = 0) {
        return outcomes.publish(plainRow(name, number, ""));
    }

    MadeUpTable outcomes{"KAGDYST", plainColumns()};
    std::optional<host::TableSet> tables;
    std::optional<OutcomeFeed> feed;
};

TEST_F(Feed, HandsEveryRowToEverySubscriberInOrder) {
    std::string first, second;
    const auto one = feed->subscribe({}, into(first));
    publish("a");
    const auto two = feed->subscribe({}, into(second));
    publish("b");
    publish("c");
    EXPECT_EQ(first, "abc");
    EXPECT_EQ(second, "bc");
    EXPECT_EQ(outcomes.liveObjects(), 1U);
}

TEST_F(Feed, CallsSubscribersInTheOrderInWhichTheyCame) {
    std::string calls;
    std::vector<std::unique_ptr<OutcomeFeed::Subscription>> all;
    for (const char name : {'1', '2', '3', '4'}) {
        all.push_back(feed->subscribe({}, [&calls, name](const oxa::Rows&) {
            calls += name;
            return static_cast<int>(OXA_OK);
        }));
    }
    publish("a");
    all[1].reset();
    publish("b");
    EXPECT_EQ(calls, "1234134");
}

TEST_F(Feed, JudgesRowsAsTheTableDoes) {
    std::string padded, less, pattern, unknown, both;
    const auto a = feed->subscribe({{"NAME", OPER_EQ, "b  "}}, into(padded));
    const auto b = feed->subscribe({{"NUMBER", OPER_LT, "2"}}, into(less));
    const auto c = feed->subscribe({{"NAME", OPER_LIKE, "*x"}}, into(pattern));
    const auto d = feed->subscribe({{"NOPE", OPER_EQ, "1"}}, into(unknown));
    const auto e = feed->subscribe({{"NAME", OPER_NE, "a"}, {"NUMBER", OPER_GE, "2"}}, into(both));
    publish("a", 1);
    publish("b", 1);
    publish("cx", 2);
    EXPECT_EQ(padded, "b");
    EXPECT_EQ(less, "ab");
    EXPECT_EQ(pattern, "c");
    EXPECT_EQ(unknown, "abc") << "a condition on an unknown column restricts nothing";
    EXPECT_EQ(both, "c");
}

TEST_F(Feed, SubscribersThatFailDisturbNobodyElse) {
    std::string seen;
    const auto thrower =
        feed->subscribe({}, [](const oxa::Rows&) -> int { throw std::runtime_error("no memory"); });
    const auto other = feed->subscribe({}, into(seen));
    EXPECT_EQ(publish("a"), OXA_OK);
    EXPECT_EQ(publish("b"), OXA_OK);
    EXPECT_EQ(seen, "ab");
}

TEST_F(Feed, HoldsNoLockOfTheTableWhileASubscriberTakesItsTime) {
    std::promise<void> entered, leave;
    const auto slow = feed->subscribe({}, [&](const oxa::Rows&) {
        entered.set_value();
        leave.get_future().wait();
        return static_cast<int>(OXA_OK);
    });
    std::atomic<bool> next{false};
    std::thread executor([&] {
        publish("a");
        next = true;
    });
    entered.get_future().wait();
    EXPECT_EQ(outcomes.liveObjects(), 1U) << "which takes the table's lock";
    EXPECT_NE(oxa::subscribe("KAGDYST", {}, [](const oxa::Rows&) { return 0; }), nullptr);
    EXPECT_FALSE(next) << "the executor waits all the same";
    leave.set_value();
    executor.join();
}

TEST_F(Feed, RowsOfSeveralPublishersKeepTheirOrderForEverybody) {
    std::string first, second;
    const auto one = feed->subscribe({}, into(first));
    const auto two = feed->subscribe({}, into(second));
    std::vector<std::thread> publishers;
    for (const char* name : {"a", "b", "c"}) {
        publishers.emplace_back([&, name] {
            for (int i = 0; i < 50; ++i)
                publish(name);
        });
    }
    for (std::thread& publisher : publishers)
        publisher.join();
    EXPECT_EQ(first.size(), 150U);
    EXPECT_EQ(first, second);
}

TEST_F(Feed, WaitsForACallInProgressBeforeASubscriptionEnds) {
    std::promise<void> entered, leave;
    std::atomic<bool> left{false};
    auto subscription = feed->subscribe({}, [&](const oxa::Rows&) {
        entered.set_value();
        leave.get_future().wait();
        left = true;
        return static_cast<int>(OXA_OK);
    });
    std::thread publisher([&] { publish("a"); });
    entered.get_future().wait();
    std::thread remover([&] {
        subscription.reset();
        EXPECT_TRUE(left);
    });
    leave.set_value();
    remover.join();
    publisher.join();
    EXPECT_EQ(publish("b"), OXA_OK) << "nobody is called any more";
}

TEST_F(Feed, TakesSubscribersWhileOneIsBeingCalled) {
    std::promise<void> entered, leave;
    const auto slow = feed->subscribe({}, [&](const oxa::Rows& rows) {
        if (rows.row(0)[0] != 'a') return static_cast<int>(OXA_OK);
        entered.set_value();
        leave.get_future().wait();
        return static_cast<int>(OXA_OK);
    });
    std::string seen;
    std::thread publisher([&] { publish("a"); });
    entered.get_future().wait();
    auto gone = feed->subscribe({}, into(seen));
    const auto late = feed->subscribe({}, into(seen));
    gone.reset();
    leave.set_value();
    publisher.join();
    EXPECT_EQ(seen, "") << "the row was on its way before";
    publish("b");
    EXPECT_EQ(seen, "b");
}

TEST_F(Feed, SurvivesSubscribersThatComeAndGoWhileRowsArePublished) {
    std::atomic<bool> done{false};
    std::thread publisher([&] {
        while (!done)
            publish("a");
    });
    std::vector<std::thread> clients;
    for (int t = 0; t < 3; ++t) {
        clients.emplace_back([&] {
            for (int i = 0; i < 200; ++i) {
                std::atomic<bool> alive{true};
                auto subscription = feed->subscribe({{"NAME", OPER_EQ, "a"}}, [&](const auto&) {
                    EXPECT_TRUE(alive);
                    return static_cast<int>(OXA_OK);
                });
                ASSERT_NE(subscription, nullptr);
                subscription.reset();
                alive = false;
            }
        });
    }
    for (std::thread& client : clients)
        client.join();
    done = true;
    publisher.join();
}

TEST_F(Feed, HoldsTheExecutorWhenAllOthersHaveTheOutcome) {
    std::string seen;
    const auto subscription = feed->subscribe({}, into(seen));
    publish("a");
    feed->holdAfterOutcome();
    EXPECT_FALSE(feed->holding());
    std::atomic<bool> next{false};
    std::thread executor([&] {
        publish("b");
        next = true;
        publish("c");
    });
    EXPECT_TRUE(eventually([&] { return feed->holding(); }));
    EXPECT_EQ(seen, "ab");
    EXPECT_FALSE(next) << "the second task would have begun";
    auto late = feed->subscribe({}, into(seen));
    EXPECT_NE(late, nullptr) << "subscriptions open and close while the executor is held";
    late.reset();
    feed->release();
    executor.join();
    EXPECT_EQ(seen, "abc");
    EXPECT_FALSE(feed->holding());
}

TEST_F(Feed, HoldsAfterTheOutcomeThatIsOnItsWay) {
    const auto subscription = feed->subscribe({}, [&](const oxa::Rows&) {
        feed->holdAfterOutcome();
        return static_cast<int>(OXA_OK);
    });
    std::thread executor([&] { publish("a"); });
    EXPECT_TRUE(eventually([&] { return feed->holding(); }));
    feed->release();
    executor.join();
}

TEST_F(Feed, LetsAHeldExecutorGoWhenItEnds) {
    feed->holdAfterOutcome();
    std::thread executor([&] { publish("a"); });
    EXPECT_TRUE(eventually([&] { return feed->holding(); }));
    feed.reset();
    executor.join();
    EXPECT_EQ(outcomes.liveObjects(), 0U);
}

TEST(FeedWithoutATable, TakesNoSubscription) {
    const host::TableSet none({});
    OutcomeFeed feed(none);
    EXPECT_EQ(feed.subscribe({}, [](const oxa::Rows&) { return 0; }), nullptr);
    feed.holdAfterOutcome();
    EXPECT_FALSE(feed.holding());
}

}  // namespace
