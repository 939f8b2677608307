// What oxa.h promises of table managers and their live objects.

#include <algorithm>
#include <atomic>
#include <cstring>
#include <memory>
#include <string>
#include <thread>
#include <vector>

#include "conformance/rule.h"
#include "conformance/sample_requests.h"

namespace conformance {
namespace {

using Names = std::vector<std::string>;
using Numbers = std::vector<unsigned>;

std::unique_ptr<Subscription> subscribe(Bench& bench) {
    auto live = bench.driver().subscribe("SAMPLE", {}, [](const Rows&) { return int{OXA_OK}; });
    require(live != nullptr, "there is no subscription");
    return live;
}

void knowsItsNames(Bench&) {
    const SampleManager manager("NAMES");
    requireEqual(manager.ApplicationName(), std::string("TST"), "ApplicationName()");
    requireEqual(manager.TableName(), std::string("NAMES"), "TableName()");
}

void takesTheTableBack(Bench& bench) {
    {
        SampleManager manager("BRIEF");
        manager.RegisterWithManager();
        requireEqual(bench.driver().query("BRIEF", {}).status, int{OXA_OK}, "the status before");
    }
    require(bench.driver().query("BRIEF", {}).status != OXA_OK, "the table is still served");
}

void isAskedOncePerQuery(Bench& bench) {
    SampleManager manager;
    manager.sample = {sampleRow("alpha", 1), sampleRow("beta", 2)};
    manager.RegisterWithManager();
    Numbers live{99};
    manager.onSample = [&] { live = manager.liveNumbers(); };
    const Answer answer = bench.driver().query("SAMPLE", {});
    requireEqual(namesOf(answer.rows), Names{"alpha", "beta"}, "the rows");
    requireEqual(manager.samples.load(), 1, "the number of samples");
    requireEqual(manager.objects.load(), 0, "the number of objects afterwards");
    requireEqual(live, Numbers{}, "the live objects while it is sampled");
}

void isNotSampledForASubscription(Bench& bench) {
    LiveRequest live(bench);
    requireEqual(live.manager.objects.load(), 1, "the number of objects");
    requireEqual(live.manager.samples.load(), 0, "the number of samples");
    live.end();
    requireEqual(live.manager.objects.load(), 0, "the number of objects afterwards");
}

/// A table that never has the memory for an object.
class PoorManager : public SampleManager {
public:
    PoorManager() : SampleManager("POOR") {}
    rtoxa* CreateRtoxa(RequestDetail*, ContextInfo*) override { return nullptr; }
};

void mayBeShortOfMemory(Bench& bench) {
    PoorManager manager;
    manager.RegisterWithManager();
    require(bench.driver().query("POOR", {}).status != OXA_OK, "a query succeeded all the same");
}

void offersTheTable(Bench& bench) {
    SampleManager manager;
    require(bench.driver().query("SAMPLE", {}).status != OXA_OK, "it is served before");
    requireEqual(manager.RegisterWithManager(), int{OXA_OK}, "the result");
    requireEqual(bench.driver().query("SAMPLE", {}).status, int{OXA_OK}, "a query's status");
}

void replacesTheManagerBefore(Bench& bench) {
    LiveRequest before(bench);
    SampleManager successor;
    successor.sample = {sampleRow("new", 1)};
    requireEqual(successor.RegisterWithManager(), int{OXA_OK}, "the result");
    requireEqual(namesOf(bench.driver().query("SAMPLE", {}).rows), Names{"new"}, "the rows");
    requireEqual(successor.publish(sampleRow("event", 1)), int{OXA_OK}, "the result of an event");
    requireEqual(before.names(), Names{"event"}, "what the earlier subscription has got");
    before.end();
}

void isToldThatItWasReplaced(Bench&) {
    SampleManager manager, successor;
    manager.RegisterWithManager();
    manager.RegisterWithManager();
    requireEqual(manager.shutdowns.load(), 0, "the number of calls after registering twice");
    successor.RegisterWithManager();
    requireEqual(manager.shutdowns.load(), 1, "the number of calls once it was replaced");
}

void keepsOthersOut(Bench&) {
    SampleManager manager;
    std::atomic<int> inside{0};
    std::atomic<bool> crowded{false};
    std::vector<std::thread> threads;
    for (int t = 0; t < 4; ++t) {
        threads.emplace_back([&] {
            for (int i = 0; i < 500; ++i) {
                manager.lock();
                if (++inside != 1) crowded = true;
                std::this_thread::yield();
                --inside;
                manager.unlock();
            }
        });
    }
    for (std::thread& thread : threads)
        thread.join();
    require(!crowded, "two threads held it at a time");
}

void sharesItAmongNamesakes(Bench&) {
    SampleManager first, second;
    std::atomic<bool> passed{false};
    first.lock();
    std::thread other([&] {
        second.lock();
        passed = true;
        second.unlock();
    });
    std::this_thread::sleep_for(std::chrono::milliseconds(50));
    const bool early = passed;
    first.unlock();
    other.join();
    require(!early, "the lock of another manager of these names was free");
}

void endsAtOnceWithoutSubscriptions(Bench&) {
    SampleManager manager("EMPTY");
    requireEqual(manager.liveNumbers(), Numbers{}, "the live objects");
}

void walksInOrder(Bench& bench) {
    SampleManager manager;
    manager.RegisterWithManager();
    std::vector<std::unique_ptr<Subscription>> live;
    Numbers expected;
    for (int i = 0; i < 5; ++i) {
        live.push_back(subscribe(bench));
        const Numbers numbers = manager.liveNumbers();
        requireEqual(numbers.size(), expected.size() + 1, "the number of live objects");
        expected.push_back(numbers.back());
        requireEqual(numbers, expected, "the live objects");
    }
    for (const std::size_t gone : {2U, 0U, 2U}) {
        live.erase(live.begin() + static_cast<std::ptrdiff_t>(gone));
        expected.erase(expected.begin() + static_cast<std::ptrdiff_t>(gone));
        requireEqual(manager.liveNumbers(), expected, "what is left of them");
    }
}

void staysAtItsEnd(Bench& bench) {
    LiveRequest live(bench);
    live.manager.lock();
    RtoxaListIter objects(&live.manager);
    const bool hasOne = objects.Next() != nullptr;
    const bool hasMore = objects.Next() != nullptr || objects.Next() != nullptr;
    live.manager.unlock();
    require(hasOne, "did not find the live object");
    require(!hasMore, "found more than there are");
}

void namesTheNode(Bench&) {
    const char* const node = OXA_GetOriginnode(nullptr);
    require(node != nullptr, "is null");
    require(*node != '\0', "is empty");
    require(std::strlen(node) <= 64, "has more than 64 bytes");
}

}  // namespace

std::vector<Operation> oxaManagerOperations() {
    return {
        {"TableManager::TableManager", {{"keeps the names", knowsItsNames}}},
        {"TableManager::~TableManager", {{"takes the table back", takesTheTableBack}}},
        {"TableManager::CreateRtoxa",
         {{"is called once for a query, whose object is sampled once", isAskedOncePerQuery},
          {"makes a live object, which is not sampled, for a subscription",
           isNotSampledForASubscription},
          {"may give null", mayBeShortOfMemory}}},
        {"TableManager::RegisterWithManager",
         {{"offers the table", offersTheTable},
          {"replaces the manager before and keeps its live objects", replacesTheManagerBefore}}},
        {"TableManager::Shutdown", {{"tells of the replacement", isToldThatItWasReplaced}}},
        {"TableManager::lock",
         {{"keeps other threads out", keepsOthersOut},
          {"is shared by managers of the same names", sharesItAmongNamesakes}}},
        {"RtoxaListIter::Next",
         {{"is null without subscriptions", endsAtOnceWithoutSubscriptions},
          {"walks in the order in which the objects came", walksInOrder},
          {"stays null after the last object", staysAtItsEnd}}},
        {"OXA_GetOriginnode", {{"names the node in 1 to 64 bytes", namesTheNode}}},
    };
}

}  // namespace conformance
