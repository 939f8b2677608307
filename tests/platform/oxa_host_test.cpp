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
        EXPECT_EQ(OXA_OK, manager.RegisterWithManager());
    }
    std::vector<std::string> ask(const std::vector<oxa::Predicate>& where) {
        oxa::Rows rows;
        EXPECT_EQ(OXA_OK, oxa::query("SAMPLE", where, rows));
        return names(rows);
    }

    SampleManager manager;
};

TEST_F(Host, AQueryOnAnUnknownTableSaysSo) {
    oxa::Rows rows;
    rows.bytes = "left over";
    EXPECT_EQ(OXA_GONE, oxa::query("NOSUCH", {}, rows));
    EXPECT_EQ(0U, rows.count());
    EXPECT_EQ(nullptr, oxa::subscribe("NOSUCH", {}, [](const oxa::Rows&) { return 0; }));
}

TEST_F(Host, WhatATableThrowsBecomesAStatus) {
    oxa::Rows rows;
    manager.onSample = [] { throw std::runtime_error("sample"); };
    EXPECT_EQ(OXA_FAILED, oxa::query("SAMPLE", {}, rows));
    manager.onSample = [] { throw 1; };
    EXPECT_EQ(OXA_FAILED, oxa::query("SAMPLE", {}, rows));
    manager.onSample = [] { throw std::bad_alloc(); };
    EXPECT_EQ(OXA_NO_MEMORY, oxa::query("SAMPLE", {}, rows));
    manager.onCreate = [] { throw std::runtime_error("create"); };
    EXPECT_EQ(OXA_FAILED, oxa::query("SAMPLE", {}, rows));
    EXPECT_EQ(nullptr, oxa::subscribe("SAMPLE", {}, [](const oxa::Rows&) { return 0; }));
    EXPECT_EQ(0, manager.objects);
}

TEST_F(Host, TablesAreListedWithTheirColumnsAndNeverSampled) {
    const std::vector<oxa::Table> tables = oxa::tables();
    ASSERT_EQ(1U, tables.size());
    EXPECT_EQ("TST", tables[0].application);
    EXPECT_EQ("SAMPLE", tables[0].name);
    ASSERT_EQ(3U, tables[0].columns.size());
    ASSERT_NE(nullptr, tables[0].find("VALUE"));
    EXPECT_EQ(8, tables[0].find("VALUE")->offset);
    EXPECT_EQ(4, tables[0].find("VALUE")->length);
    EXPECT_EQ(OXA_TYPE_INTEGER, tables[0].find("VALUE")->type);
    EXPECT_EQ(nullptr, tables[0].find("value"));
    EXPECT_EQ(0, manager.samples);
    EXPECT_EQ(0, manager.objects);
}

TEST_F(Host, ATableThatCannotBeAskedIsListedAndAskedAgain) {
    manager.onCreate = [] { throw std::runtime_error("not now"); };
    ASSERT_EQ(1U, oxa::tables().size());
    EXPECT_THAT(oxa::tables()[0].columns, IsEmpty());
    manager.onCreate = nullptr;
    EXPECT_EQ(3U, oxa::tables()[0].columns.size());
}

TEST_F(Host, TablesKeepTheOrderOfTheirRegistration) {
    SampleManager second("AAA");
    second.RegisterWithManager();
    SampleManager again;
    again.RegisterWithManager();
    const std::vector<oxa::Table> tables = oxa::tables();
    ASSERT_EQ(2U, tables.size());
    EXPECT_EQ("SAMPLE", tables[0].name);
    EXPECT_EQ("AAA", tables[1].name);
}

TEST(Registration, EndsWithTheManager) {
    {
        SampleManager manager("BRIEF");
        manager.RegisterWithManager();
        oxa::Rows rows;
        EXPECT_EQ(OXA_OK, oxa::query("BRIEF", {}, rows));
    }
    oxa::Rows rows;
    EXPECT_EQ(OXA_GONE, oxa::query("BRIEF", {}, rows));
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
    EXPECT_EQ(OXA_OVERFLOW, manager.publish(sampleRow("a", 1)));
    failing = false;
    EXPECT_EQ(OXA_OK, manager.publish(sampleRow("b", 1)));
    EXPECT_EQ(2, calls);
    EXPECT_THAT(other.get(), ElementsAre("a", "b"));
}

TEST_F(Host, ASubscriptionWithoutASinkHasNoRequester) {
    const auto live = oxa::subscribe("SAMPLE", {}, nullptr);
    ASSERT_NE(nullptr, live);
    EXPECT_EQ(OXA_GONE, manager.publish(sampleRow("a", 1)));
}

TEST_F(Host, AFilterJudgesRowsAsTheTableDoesAndIsNoLiveObject) {
    const std::unique_ptr<oxa::Filter> filter =
        oxa::makeFilter("SAMPLE", {{"NAME", OPER_EQ, "beta "}, {"VALUE", OPER_GT, "1"}});
    ASSERT_NE(nullptr, filter);
    EXPECT_THAT(manager.liveNumbers(), IsEmpty());
    for (int turn = 0; turn < 2; ++turn) {
        for (const SampleRow& row : manager.sample) {
            const char* const bytes = reinterpret_cast<const char*>(&row);
            EXPECT_EQ(row.value == 2, filter->takes(bytes)) << row.value;
        }
    }
    EXPECT_EQ(0, manager.samples);
}

TEST_F(Host, AFilterOfAnUnknownTableOrOneThatFailsIsNone) {
    EXPECT_EQ(nullptr, oxa::makeFilter("NOPE", {}));
    manager.onCreate = [] { throw std::bad_alloc(); };
    EXPECT_EQ(nullptr, oxa::makeFilter("SAMPLE", {}));
}

TEST_F(Host, ADroppedSubscriptionTakesItsObjectAndItsSinkAlong) {
    const auto token = std::make_shared<int>(0);
    auto live = oxa::subscribe("SAMPLE", {}, [token](const oxa::Rows&) { return 0; });
    EXPECT_EQ(2, token.use_count());
    EXPECT_EQ(1, manager.objects);
    live.reset();
    EXPECT_EQ(1, token.use_count());
    EXPECT_EQ(0, manager.objects);
    EXPECT_EQ(OXA_OK, manager.publish(sampleRow("a", 1)));
}

TEST_F(Host, RegisteringTwiceShutsNobodyDown) {
    EXPECT_EQ(OXA_OK, manager.RegisterWithManager());
    EXPECT_EQ(0, manager.shutdowns);
    EXPECT_EQ(1U, oxa::tables().size());
}

TEST_F(Host, AThousandSubscriptionsComeAndGoWithoutATrace) {
    std::vector<std::unique_ptr<oxa::Subscription>> live;
    int calls = 0;
    for (int i = 0; i < 1000; ++i) {
        live.push_back(oxa::subscribe("SAMPLE", {}, [&](const oxa::Rows&) { return ++calls, 0; }));
    }
    EXPECT_EQ(OXA_OK, manager.publish(sampleRow("a", 1)));
    EXPECT_EQ(1000, calls);
    live.clear();
    EXPECT_EQ(0, manager.objects);
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
    EXPECT_EQ(0, manager.objects);
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
                EXPECT_EQ(1U, ask({{"VALUE", OPER_EQ, "2"}}).size());
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
    EXPECT_EQ(0, manager.objects);
}

}  // namespace
