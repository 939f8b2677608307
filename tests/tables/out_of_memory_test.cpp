// Tables when out of memory: what they return, and that no exception reaches the framework.
#include <gtest/gtest.h>

#include <cstdlib>
#include <cstring>
#include <memory>
#include <utility>
#include <vector>

#include "embedded/oxa_host.h"
#include "support/process/own_new.h"
#include "support/request_lender.h"
#include "tables/zav01agt.h"
#include "tables/zav02agt.h"
#include "tables/zav03agt.h"

namespace {

/// How many allocations of this thread succeed before one fails. While negative, none fails.
thread_local long allocationsLeft = -1;

bool mayAllocate() {
    if (allocationsLeft < 0) return true;
    return allocationsLeft-- > 0;
}

}  // namespace

void* memoryForNew(std::size_t size) noexcept {
    return mayAllocate() ? std::malloc(size) : nullptr;
}

namespace {

/// Runs `body` again and again, letting its first allocation fail, then its second, and so on until
/// none fails. Checks each result. Returns the number of runs with a failure.
template <typename Body, typename Check>
int withEveryFailure(const Body& body, const Check& check) {
    for (long count = 0; count < 10000; ++count) {
        allocationsLeft = count;
        const auto result = body();
        const bool failed = allocationsLeft < 0;
        allocationsLeft = -1;
        if (!failed) return static_cast<int>(count);
        check(result);
    }
    return -1;
}

template <typename Manager>
void expectInitFails(int (*init)(), Manager*& staticManager) {
    Manager* const former = staticManager;
    allocationsLeft = 0;
    const int status = init();
    allocationsLeft = -1;
    EXPECT_EQ(status, 0x21060002);
    EXPECT_EQ(staticManager, former);
}

TEST(OutOfMemory, WithoutAManagerNothingIsRegistered) {
    expectInitFails(zav_kagreqt_init, zav_kagreqt_static_manager);
    expectInitFails(zav_kinagt_init, zav_kinagt_static_manager);
    expectInitFails(zav_kagdyst_init, zav_kagdyst_static_manager);
}

const std::vector<oxa::Predicate> startRequest = {{"COMMAND", OPER_EQ, "START"},
                                                  {"TRANSID", OPER_EQ, "tx"}};

TEST(OutOfMemory, ARequestThatCannotBeMadeIsNone) {
    ASSERT_EQ(zav_kagreqt_init(), 0);
    int failures = 0;
    lendQuery(startRequest, [&](RequestDetail* detail, ContextInfo* context) {
        const auto make = [&] {
            std::unique_ptr<rtoxa> made(zav_kagreqt_static_manager->CreateRtoxa(detail, context));
            return made != nullptr;
        };
        ASSERT_TRUE(make());  // creates what all requests share
        failures = withEveryFailure(make, [](bool made) { EXPECT_FALSE(made); });
    });
    EXPECT_GT(failures, 10);
}

TEST(OutOfMemory, ASampleThatRunsOutOfMemorySaysSo) {
    ASSERT_EQ(zav_kagreqt_init(), 0);
    int failures = 0;
    lendQuery(startRequest, [&](RequestDetail* detail, ContextInfo* context) {
        std::unique_ptr<rtoxa> request;
        const auto remake = [&] {
            const long kept = std::exchange(allocationsLeft, -1);
            request.reset(zav_kagreqt_static_manager->CreateRtoxa(detail, context));
            allocationsLeft = kept;
        };
        remake();
        ASSERT_EQ(request->TakeSample(), 0);
        failures = withEveryFailure(
            [&] {
                remake();
                return request->TakeSample();
            },
            [](int status) { EXPECT_TRUE(status == 0 || status == OXA_NO_MEMORY) << status; });
    });
    EXPECT_GT(failures, 10);
}

TEST(OutOfMemory, AnEventIsNotThrownBack) {
    ASSERT_EQ(zav_kagdyst_init(), 0);
    std::size_t delivered = 0;
    const auto subscription = oxa::subscribe("KAGDYST", {}, [&](const oxa::Rows& rows) {
        delivered += rows.count();
        return 0;
    });
    zav_kagdyst_data_t row;
    std::memset(&row, ' ', sizeof row);
    withEveryFailure([&] { return publishDeployStatus(&row, 1); }, [](int) {});
    delivered = 0;
    EXPECT_EQ(publishDeployStatus(&row, 1), 0);
    EXPECT_EQ(delivered, 1u);
}

}  // namespace
