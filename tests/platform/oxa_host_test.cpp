// ctest-label: threaded
#include "embedded/oxa_host.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <chrono>
#include <memory>
#include <mutex>
#include <new>
#include <stdexcept>
#include <string>
#include <thread>

#include "conformance/sample_table.h"

namespace {

using testing::ElementsAre;
using testing::IsEmpty;

std::string nameOf(const oxa::Rows& rows, std::size_t index) {
    const std::string name(rows.row(index), 8);
    return name.substr(0, name.find_last_not_of(' ') + 1);
}

std::vector<std::string> names(const oxa::Rows& rows) {
    std::vector<std::string> found;
    for (std::size_t i = 0; i < rows.count(); ++i)
        found.push_back(nameOf(rows, i));
    return found;
}

/// Collects the names of the rows that a sink gets.
struct Collector {
    std::mutex lock;
    std::vector<std::string> seen;

    oxa::Sink sink() {
        return [this](const oxa::Rows& rows) {
            const std::lock_guard<std::mutex> guard(lock);
            for (std::size_t i = 0; i < rows.count(); ++i)
                seen.push_back(nameOf(rows, i));
            return OXA_OK;
        };
    }
    std::vector<std::string> get() {
        const std::lock_guard<std::mutex> guard(lock);
        return seen;
    }
};

class Host : public testing::Test {
protected:
    Host() {
        manager.sample = {sampleRow("alpha", 1, "one"), sampleRow("beta", 2, "two"),
                          sampleRow("gamma", 3, "three")};
        EXPECT_EQ(manager.RegisterWithManager(), OXA_OK);
    }
    std::vector<std::string> ask(const std::vector<oxa::Predicate>& where) {
        oxa::Rows rows;
        EXPECT_EQ(oxa::query("SAMPLE", where, rows), OXA_OK);
        return names(rows);
    }

    SampleManager manager;
};

TEST_F(Host, AQueryOnAnUnknownTableSaysSo) {
    oxa::Rows rows;
    rows.bytes = "left over";
    EXPECT_EQ(oxa::query("NOSUCH", {}, rows), OXA_GONE);
    EXPECT_EQ(rows.count(), 0U);
    EXPECT_EQ(oxa::subscribe("NOSUCH", {}, [](const oxa::Rows&) { return 0; }), nullptr);
}

TEST_F(Host, WhatATableThrowsBecomesAStatus) {
    oxa::Rows rows;
    manager.onSample = [] { throw std::runtime_error("sample"); };
    EXPECT_EQ(oxa::query("SAMPLE", {}, rows), OXA_FAILED);
    manager.onSample = [] { throw 1; };
    EXPECT_EQ(oxa::query("SAMPLE", {}, rows), OXA_FAILED);
    manager.onSample = [] { throw std::bad_alloc(); };
    EXPECT_EQ(oxa::query("SAMPLE", {}, rows), OXA_NO_MEMORY);
    manager.onCreate = [] { throw std::runtime_error("create"); };
    EXPECT_EQ(oxa::query("SAMPLE", {}, rows), OXA_FAILED);
    EXPECT_EQ(oxa::subscribe("SAMPLE", {}, [](const oxa::Rows&) { return 0; }), nullptr);
    EXPECT_EQ(manager.objects, 0);
}

TEST_F(Host, TablesAreListedWithTheirColumnsAndNeverSampled) {
    const std::vector<oxa::Table> tables = oxa::tables();
    ASSERT_EQ(tables.size(), 1U);
    EXPECT_EQ(tables[0].application, "TST");
    EXPECT_EQ(tables[0].name, "SAMPLE");
    ASSERT_EQ(tables[0].columns.size(), 3U);
    ASSERT_NE(tables[0].find("VALUE"), nullptr);
    EXPECT_EQ(tables[0].find("VALUE")->offset, 8);
    EXPECT_EQ(tables[0].find("VALUE")->length, 4);
    EXPECT_EQ(tables[0].find("VALUE")->type, OXA_TYPE_INTEGER);
    EXPECT_EQ(tables[0].find("value"), nullptr);
    EXPECT_EQ(manager.samples, 0);
    EXPECT_EQ(manager.objects, 0);
}

TEST_F(Host, ATableThatCannotBeAskedIsListedAndAskedAgain) {
    manager.onCreate = [] { throw std::runtime_error("not now"); };
    ASSERT_EQ(oxa::tables().size(), 1U);
    EXPECT_THAT(oxa::tables()[0].columns, IsEmpty());
    manager.onCreate = nullptr;
    EXPECT_EQ(oxa::tables()[0].columns.size(), 3U);
}

TEST_F(Host, TablesKeepTheOrderOfTheirRegistration) {
    SampleManager second("AAA");
    second.RegisterWithManager();
    SampleManager again;
    again.RegisterWithManager();
    const std::vector<oxa::Table> tables = oxa::tables();
    ASSERT_EQ(tables.size(), 2U);
    EXPECT_EQ(tables[0].name, "SAMPLE");
    EXPECT_EQ(tables[1].name, "AAA");
}

TEST(Registration, EndsWithTheManager) {
    {
        SampleManager manager("BRIEF");
        manager.RegisterWithManager();
        oxa::Rows rows;
        EXPECT_EQ(oxa::query("BRIEF", {}, rows), OXA_OK);
    }
    oxa::Rows rows;
    EXPECT_EQ(oxa::query("BRIEF", {}, rows), OXA_GONE);
    EXPECT_THAT(oxa::tables(), IsEmpty());
}

TEST_F(Host, ASinkThatThrowsLosesItsRowsAndDisturbsNobody) {
    Collector other;
    bool failing = true;
    int calls = 0;
    const auto bad = oxa::subscribe("SAMPLE", {}, [&](const oxa::Rows&) -> int {
        ++calls;
        if (failing) throw std::runtime_error("sink");
        return OXA_OK;
    });
    const auto good = oxa::subscribe("SAMPLE", {}, other.sink());
    EXPECT_EQ(manager.publish(sampleRow("a", 1)), OXA_OVERFLOW);
    failing = false;
    EXPECT_EQ(manager.publish(sampleRow("b", 1)), OXA_OK);
    EXPECT_EQ(calls, 2);
    EXPECT_THAT(other.get(), ElementsAre("a", "b"));
}

TEST_F(Host, WhatASinkLeavesForLaterRunsWithoutTheTablesLock) {
    std::vector<std::string> order;
    const auto live = oxa::subscribe("SAMPLE", {}, [&](const oxa::Rows&) {
        for (const char* name : {"first", "second"}) {
            oxa::whenUnlocked([&, name] {
                // Were the lock held, this would wait for ever.
                EXPECT_EQ(manager.liveNumbers().size(), 1U);
                order.emplace_back(name);
            });
        }
        order.emplace_back("sink");
        return static_cast<int>(OXA_OK);
    });
    EXPECT_EQ(manager.publish(sampleRow("a", 1)), OXA_OK);
    EXPECT_THAT(order, ElementsAre("sink", "first", "second"));
}

TEST_F(Host, WhatIsLeftForLaterWithoutALockRunsAtOnce) {
    bool ran = false;
    oxa::whenUnlocked([&ran] { ran = true; });
    EXPECT_TRUE(ran);
}

TEST_F(Host, WithLocksOfSeveralTablesTheLastOneCounts) {
    SampleManager other("OTHER");
    bool ran = false;
    manager.lock();
    other.lock();
    oxa::whenUnlocked([&ran] { ran = true; });
    manager.unlock();
    EXPECT_FALSE(ran);
    other.unlock();
    EXPECT_TRUE(ran);
}

TEST_F(Host, ASubscriptionWithoutASinkHasNoRequester) {
    const auto live = oxa::subscribe("SAMPLE", {}, nullptr);
    ASSERT_NE(live, nullptr);
    EXPECT_EQ(manager.publish(sampleRow("a", 1)), OXA_GONE);
}

TEST_F(Host, AFilterJudgesRowsAsTheTableDoesAndIsNoLiveObject) {
    const std::unique_ptr<oxa::Filter> filter =
        oxa::makeFilter("SAMPLE", {{"NAME", OPER_EQ, "beta "}, {"VALUE", OPER_GT, "1"}});
    ASSERT_NE(filter, nullptr);
    EXPECT_THAT(manager.liveNumbers(), IsEmpty());
    for (int turn = 0; turn < 2; ++turn) {
        for (const SampleRow& row : manager.sample) {
            const char* const bytes = reinterpret_cast<const char*>(&row);
            EXPECT_EQ(filter->takes(bytes), row.value == 2) << row.value;
        }
    }
    EXPECT_EQ(manager.samples, 0);
}

TEST_F(Host, AFilterOfAnUnknownTableOrOneThatFailsIsNone) {
    EXPECT_EQ(oxa::makeFilter("NOPE", {}), nullptr);
    manager.onCreate = [] { throw std::bad_alloc(); };
    EXPECT_EQ(oxa::makeFilter("SAMPLE", {}), nullptr);
}

TEST_F(Host, ADroppedSubscriptionTakesItsObjectAndItsSinkAlong) {
    const auto token = std::make_shared<int>(0);
    auto live = oxa::subscribe("SAMPLE", {}, [token](const oxa::Rows&) { return 0; });
    EXPECT_EQ(token.use_count(), 2);
    EXPECT_EQ(manager.objects, 1);
    live.reset();
    EXPECT_EQ(token.use_count(), 1);
    EXPECT_EQ(manager.objects, 0);
    EXPECT_EQ(manager.publish(sampleRow("a", 1)), OXA_OK);
}

TEST_F(Host, RegisteringTwiceShutsNobodyDown) {
    EXPECT_EQ(manager.RegisterWithManager(), OXA_OK);
    EXPECT_EQ(manager.shutdowns, 0);
    EXPECT_EQ(oxa::tables().size(), 1U);
}

TEST_F(Host, AThousandSubscriptionsComeAndGoWithoutATrace) {
    std::vector<std::unique_ptr<oxa::Subscription>> live;
    int calls = 0;
    for (int i = 0; i < 1000; ++i) {
        live.push_back(oxa::subscribe("SAMPLE", {}, [&](const oxa::Rows&) { return ++calls, 0; }));
    }
    EXPECT_EQ(manager.publish(sampleRow("a", 1)), OXA_OK);
    EXPECT_EQ(calls, 1000);
    live.clear();
    EXPECT_EQ(manager.objects, 0);
    EXPECT_THAT(manager.liveNumbers(), IsEmpty());
}

TEST_F(Host, NoSinkIsCalledOnceItsSubscriptionIsGone) {
    std::atomic<bool> publishing{true};
    std::thread publisher([&] {
        while (publishing)
            manager.publish(sampleRow("a", 1));
    });
    std::vector<std::thread> subscribers;
    for (int t = 0; t < 4; ++t) {
        subscribers.emplace_back([&] {
            for (int i = 0; i < 200; ++i) {
                auto alive = std::make_unique<bool>(true);
                bool* const flag = alive.get();
                auto live = oxa::subscribe(
                    "SAMPLE", {}, [flag](const oxa::Rows&) { return *flag ? OXA_OK : OXA_GONE; });
                std::this_thread::yield();
                live.reset();
                alive.reset();  // the sanitizers see a sink that comes too late
            }
        });
    }
    for (std::thread& thread : subscribers)
        thread.join();
    publishing = false;
    publisher.join();
    EXPECT_EQ(manager.objects, 0);
}

TEST_F(Host, QueriesAndReRegistrationsRunSideBySide) {
    SampleManager other;
    other.sample = manager.sample;
    std::atomic<bool> running{true};
    std::thread registrar([&] {
        while (running) {
            other.RegisterWithManager();
            manager.RegisterWithManager();
            oxa::tables();
        }
    });
    std::vector<std::thread> askers;
    for (int t = 0; t < 4; ++t) {
        askers.emplace_back([&] {
            for (int i = 0; i < 200; ++i) {
                EXPECT_EQ(ask({{"VALUE", OPER_EQ, "2"}}).size(), 1U);
            }
        });
    }
    for (std::thread& thread : askers)
        thread.join();
    running = false;
    registrar.join();
}

TEST_F(Host, AHandleInUseMayDispatchWhileTheSubscriptionEnds) {
    for (int i = 0; i < 200; ++i) {
        auto alive = std::make_unique<bool>(true);
        auto live = oxa::subscribe("SAMPLE", {}, [flag = alive.get()](const oxa::Rows&) {
            return *flag ? OXA_OK : OXA_GONE;
        });
        manager.lock();
        SampleRequest& object = *static_cast<SampleRequest*>(RtoxaListIter(&manager).Next());
        object.UseHandle(object.Handle());
        manager.unlock();
        std::thread user([&object] {
            object.add(sampleRow("a", 1));
            object.Dispatch();
            object.Drop();
        });
        live.reset();
        alive.reset();
        user.join();
    }
    EXPECT_EQ(manager.objects, 0);
}

}  // namespace
