#include "tasks/return_codes.h"

#include <gtest/gtest.h>

#include <string>

namespace {

TEST(ReturnCodes, SuccessHasNoMessage) {
    EXPECT_STREQ(rcToMsgId(TASK_OK), "");
    EXPECT_EQ(0, TASK_OK);
}

TEST(ReturnCodes, EveryFailureHasItsOwnMessage) {
    for (int code = 1001; code <= 1034; ++code) {
        EXPECT_EQ(rcToMsgId(static_cast<TASK_RC>(code)), "ZAV" + std::to_string(code) + "E");
    }
}

TEST(ReturnCodes, TheLastOneIsInformational) {
    EXPECT_STREQ(rcToMsgId(static_cast<TASK_RC>(1035)), "ZAV1035I");
    EXPECT_EQ(1035, TASK_INFORMATION);
}

TEST(ReturnCodes, TableIsIndexedByTheCodesLastDigits) {
    EXPECT_EQ(sizeof rc2MsgId / sizeof rc2MsgId[0], 36u);
    EXPECT_STREQ(rc2MsgId[0], "");
    EXPECT_STREQ(rc2MsgId[6], "ZAV1006E");
    EXPECT_STREQ(rc2MsgId[35], "ZAV1035I");
}

TEST(ReturnCodes, NamesStandForTheCodesOfTheWire) {
    EXPECT_EQ(1001, TASK_NO_COMMAND);
    EXPECT_EQ(1002, TASK_NO_TRANSID);
    EXPECT_EQ(1003, TASK_NO_PRODUCT);
    EXPECT_EQ(1004, TASK_NO_CONTEXT);
    EXPECT_EQ(1005, TASK_NO_TARGETMSN);
    EXPECT_EQ(1006, TASK_NOT_SUPPORTED);
    EXPECT_EQ(1009, TASK_TRANSLATOR_NOT_STARTED);
    EXPECT_EQ(1010, TASK_NO_DEPOT);
    EXPECT_EQ(1024, TASK_START_STOP_FAILED);
    EXPECT_EQ(1025, TASK_START_STOP_NOT_STARTED);
    EXPECT_EQ(1029, TASK_NO_VERSION);
    EXPECT_EQ(1030, TASK_INSTALL_NOT_STARTED);
    EXPECT_EQ(1031, TASK_INSTALL_FAILED);
    EXPECT_EQ(1033, TASK_UNINSTALL_NOT_STARTED);
    EXPECT_EQ(1034, TASK_NO_ARCHITECTURE);
}

}  // namespace
