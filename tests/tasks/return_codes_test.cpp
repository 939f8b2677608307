#include "tasks/return_codes.h"

#include <gtest/gtest.h>

#include <string>

namespace {

TEST(ReturnCodes, SuccessHasNoMessage) {
    EXPECT_STREQ(rcToMsgId(TASK_OK), "");
    EXPECT_EQ(TASK_OK, 0);
}

TEST(ReturnCodes, EveryFailureHasItsOwnMessage) {
    for (int code = 1001; code <= 1034; ++code) {
        EXPECT_EQ(rcToMsgId(static_cast<TASK_RC>(code)), "ZAV" + std::to_string(code) + "E");
    }
}

TEST(ReturnCodes, TheLastOneIsInformational) {
    EXPECT_STREQ(rcToMsgId(static_cast<TASK_RC>(1035)), "ZAV1035I");
    EXPECT_EQ(TASK_INFORMATION, 1035);
}

TEST(ReturnCodes, TableIsIndexedByTheCodesLastDigits) {
    EXPECT_EQ(sizeof rc2MsgId / sizeof rc2MsgId[0], 36u);
    EXPECT_STREQ(rc2MsgId[0], "");
    EXPECT_STREQ(rc2MsgId[6], "ZAV1006E");
    EXPECT_STREQ(rc2MsgId[35], "ZAV1035I");
}

TEST(ReturnCodes, NamesStandForTheCodesOfTheWire) {
    EXPECT_EQ(TASK_NO_COMMAND, 1001);
    EXPECT_EQ(TASK_NO_TRANSID, 1002);
    EXPECT_EQ(TASK_NO_PRODUCT, 1003);
    EXPECT_EQ(TASK_NO_CONTEXT, 1004);
    EXPECT_EQ(TASK_NO_TARGETMSN, 1005);
    EXPECT_EQ(TASK_NOT_SUPPORTED, 1006);
    EXPECT_EQ(TASK_TRANSLATOR_NOT_STARTED, 1009);
    EXPECT_EQ(TASK_NO_DEPOT, 1010);
    EXPECT_EQ(TASK_START_STOP_FAILED, 1024);
    EXPECT_EQ(TASK_START_STOP_NOT_STARTED, 1025);
    EXPECT_EQ(TASK_NO_VERSION, 1029);
    EXPECT_EQ(TASK_INSTALL_NOT_STARTED, 1030);
    EXPECT_EQ(TASK_INSTALL_FAILED, 1031);
    EXPECT_EQ(TASK_UNINSTALL_NOT_STARTED, 1033);
    EXPECT_EQ(TASK_NO_ARCHITECTURE, 1034);
}

}  // namespace
