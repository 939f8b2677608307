#include "ctl/verbs/arguments/condition_text.h"

#include <gtest/gtest.h>

#include "ctl/client/failure.h"

namespace {

using ctl::parseCondition;

struct Case {
    const char* text;
    const char* column;
    const char* op;
    const char* value;
};

TEST(ConditionText, TakesEveryOperator) {
    const Case cases[] = {
        {"PRODUCT=ux", "PRODUCT", "=", "ux"},    {"PRODUCT!=ux", "PRODUCT", "!=", "ux"},
        {"RETVAL<3", "RETVAL", "<", "3"},        {"RETVAL<=3", "RETVAL", "<=", "3"},
        {"RETVAL>3", "RETVAL", ">", "3"},        {"RETVAL>=3", "RETVAL", ">=", "3"},
        {"PRODUCT~u*", "PRODUCT", "like", "u*"}, {"CONTEXT=A=B", "CONTEXT", "=", "A=B"},
        {"CONTEXT==x", "CONTEXT", "=", "=x"},    {"PRODUCT=", "PRODUCT", "=", ""},
    };
    for (const Case& c : cases) {
        const ctl::Condition condition = parseCondition(c.text);
        EXPECT_EQ(condition.column, c.column) << c.text;
        EXPECT_EQ(condition.op, c.op) << c.text;
        EXPECT_EQ(condition.value, c.value) << c.text;
    }
}

TEST(ConditionText, RefusesWhatIsNoConditionAsWrongUsage) {
    for (const char* text : {"PRODUCT", "=ux", "", "PRODUCT!ux"}) {
        try {
            parseCondition(text);
            ADD_FAILURE() << text;
        } catch (const ctl::Failure& failure) {
            EXPECT_EQ(failure.status(), ctl::kWrongUsage) << text;
        }
    }
}

}  // namespace
