// The guard of conditions that act differently from how they read.
#include "host/guard/guard_fixture.h"

namespace {

class ConditionsGuard : public GuardTest {};

TEST_F(ConditionsGuard, LetsValuesPassAsTheyAre) {
    const Conditions conditions = command("GETCONFIG", "ux", {{"TARGETMSN", "a:b:UX"}});
    const host::CommandRequest request = admitted(conditions);
    ASSERT_EQ(request.conditions().size(), conditions.size());
    for (std::size_t i = 0; i < conditions.size(); ++i) {
        EXPECT_EQ(request.conditions()[i].column, conditions[i].column);
        EXPECT_EQ(request.conditions()[i].value, conditions[i].value);
    }
    EXPECT_EQ(refusalOf({}), "") << "the plug-in says itself what is missing";
}

TEST_F(ConditionsGuard, RefusesEveryOperatorButEquals) {
    for (const _IntfOper op : {OPER_NE, OPER_LT, OPER_LE, OPER_GT, OPER_GE, OPER_LIKE}) {
        Conditions conditions = command("GETCONFIG", "ux");
        conditions.back().op = op;
        EXPECT_EQ(refusalOf(conditions),
                  "conditions 400: a request gives values; PRODUCT has an operator other than "
                  "\"=\", which would be taken for \"=\"; give every column with \"=\"");
    }
}

TEST_F(ConditionsGuard, RefusesAColumnThatIsGivenTwice) {
    EXPECT_EQ(refusalOf(command("GETCONFIG", "ux", {{"PRODUCT", "um"}})),
              "conditions 400: the column PRODUCT is given twice; send one request for each value");
    EXPECT_EQ(refuser(command("GETCONFIG", "ux", {{"PRODUCT", "ux"}})), "conditions");
}

TEST_F(ConditionsGuard, RefusesTheColumnsOfTheAnswer) {
    for (const char* column : {"RETVAL", "RETMSGID", "RETMSGPARM"})
        EXPECT_EQ(refuser(command("GETCONFIG", "ux", {{column, "0"}})), "conditions") << column;
}

TEST_F(ConditionsGuard, RefusesRequestsForAnotherNode) {
    const std::string here = oxa::originNode();
    EXPECT_EQ(refusalOf(command("GETCONFIG", "ux", {{"ORIGINNODE", here}})), "");
    EXPECT_EQ(refusalOf(command("GETCONFIG", "ux", {{"ORIGINNODE", "other"}})),
              "conditions 400: this is the node " + here +
                  ", not \"other\"; the request would be carried out all the same; leave "
                  "ORIGINNODE out, or send the request to the other node");
}

TEST_F(ConditionsGuard, NamesTheColumnThatWasMeant) {
    const auto refusal = [this](const char* name) -> std::string {
        try {
            host::Guards::refuseUnknownColumn(*tables->find("KAGREQT"), name);
        } catch (const host::Refusal& refused) {
            return refused.guard() + " " + std::to_string(refused.httpStatus()) + ": " +
                   refused.what() + "; " + refused.hint();
        }
    };
    EXPECT_EQ(refusal("PRODCUT"),
              "columns 400: table KAGREQT has no column \"PRODCUT\"; did you mean PRODUCT?");
    EXPECT_EQ(refusal("product"),
              "columns 400: table KAGREQT has no column \"product\"; did you mean PRODUCT?");
    EXPECT_EQ(refusal("NOSUCH"),
              "columns 400: table KAGREQT has no column \"NOSUCH\"; GET /v1/tables lists the "
              "columns");
}

}  // namespace
