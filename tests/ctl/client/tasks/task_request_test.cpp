#include "ctl/client/tasks/task_request.h"

#include <gtest/gtest.h>

#include <nlohmann/json.hpp>
#include <set>

namespace {

TEST(TaskRequest, AsksWithTheColumnsThatAreNotEmpty) {
    ctl::TaskRequest request;
    request.command = "START";
    request.targetmsn = "a:h:UX";
    const std::vector<ctl::Condition> where = request.conditions();
    ASSERT_EQ(where.size(), 2U);
    EXPECT_EQ(where[0].column, "COMMAND");
    EXPECT_EQ(where[0].op, "=");
    EXPECT_EQ(where[0].value, "START");
    EXPECT_EQ(where[1].column, "TARGETMSN");
    EXPECT_EQ(where[1].value, "a:h:UX");
}

TEST(TaskRequest, HasAColumnForEachOfItsValues) {
    const ctl::TaskRequest request{"1", "2", "3", "4", "5", "6", "7", "8", "9"};
    std::set<std::string> columns;
    std::set<std::string> values;
    for (const ctl::Condition& condition : request.conditions()) {
        columns.insert(condition.column);
        values.insert(condition.value);
    }
    EXPECT_EQ(columns,
              (std::set<std::string>{"COMMAND", "TRANSID", "PRODUCT", "CONTEXT", "OPTIONAL",
                                     "UACONFIG", "UASCRIPT", "VERSION", "TARGETMSN"}));
    EXPECT_EQ(values.size(), 9U);
}

TEST(TaskRequest, IsADocumentWithItsColumnsInLowerCase) {
    ctl::TaskRequest request;
    request.command = "START";
    request.targetmsn = "a:h:UX";
    EXPECT_EQ(request.document(), (nlohmann::json{{"command", "START"}, {"targetmsn", "a:h:UX"}}));
    request.isForced = true;
    request.isOnce = true;
    EXPECT_EQ(request.document(),
              (nlohmann::json{
                  {"command", "START"}, {"targetmsn", "a:h:UX"}, {"force", true}, {"once", true}}));
}

TEST(Transid, ThatWasMadeUpIsKnown) {
    EXPECT_TRUE(ctl::isMadeUp(ctl::makeTransid()));
    for (const char* chosen :
         {"", "deploy-7", "zavctl-", "zavctl-1-2", "zavctl-1-0123456789abcdeg"})
        EXPECT_FALSE(ctl::isMadeUp(chosen)) << chosen;
}

TEST(Transid, IsAnotherOneEachTimeAndShortEnoughForItsColumn) {
    std::set<std::string> made;
    for (int i = 0; i < 1000; ++i)
        made.insert(ctl::makeTransid());
    EXPECT_EQ(made.size(), 1000U);
    EXPECT_LE(made.begin()->size(), 32U);
}

}  // namespace
