#include "ctl/client/tasks/install_outcome.h"

#include <gtest/gtest.h>

#include <nlohmann/json.hpp>

namespace {

using nlohmann::json;

TEST(InstallOutcome, IsNotThereYetWhileTheHostFindsNoResult) {
    EXPECT_TRUE(ctl::isNotThereYet(json{{"RETMSGPARM", "COMPLETE_INSTALL,NOTFOUND"}}));
    EXPECT_FALSE(ctl::isNotThereYet(json{{"RETMSGPARM", "COMPLETE_INSTALL,3"}}));
    EXPECT_FALSE(ctl::isNotThereYet(json{{"RETMSGPARM", "NOTFOUND"}}));
    EXPECT_FALSE(ctl::isNotThereYet(json{{"RETMSGPARM", ""}}));
    EXPECT_FALSE(ctl::isNotThereYet(json::object()));
}

TEST(InstallOutcome, IsThatOfAnInstallThatRestartsTheHost) {
    ctl::TaskRequest request;
    request.command = "INSTALL";
    EXPECT_FALSE(ctl::restartsHost(request));
    request.optional = "REQUIRES_RESTART";
    EXPECT_TRUE(ctl::restartsHost(request));
    request.command = "START";
    EXPECT_FALSE(ctl::restartsHost(request));
}

TEST(InstallOutcome, IsAskedForWithoutAProduct) {
    const ctl::TaskRequest request = ctl::completeInstallRequest("T");
    EXPECT_EQ(request.command, "COMPLETE_INSTALL");
    EXPECT_EQ(request.transid, "T");
    EXPECT_EQ(request.conditions().size(), 2U);
}

}  // namespace
