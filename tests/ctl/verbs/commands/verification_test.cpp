// ctest-label: threaded
#include "ctl/verbs/commands/verification.h"

#include <gtest/gtest.h>

#include "ctl/client/canned_host.h"

namespace {

using ctl::TaskRequest;
using ctl::TaskResult;
using ctl_test::CannedHost;
using ctl_test::Peer;
using nlohmann::json;

TaskRequest requestFor(const std::string& command) {
    TaskRequest request;
    request.command = command;
    request.product = "ux";
    request.version = "6.3";
    return request;
}

const json kRow = {{"PRODUCT", "ux"}, {"VERSION", "063000000"}};

TEST(Verification, KnowsAVersionInAllItsForms) {
    for (const char* asked : {"6.3", "06.30", "06.3", "063", "063000000"})
        EXPECT_TRUE(ctl::isSameVersion(asked, "063000000")) << asked;
    EXPECT_TRUE(ctl::isSameVersion("10", "100000000"));
    EXPECT_TRUE(ctl::isSameVersion("7", "070000000"));
    for (const char* asked : {"6.4", "63", "0.63", "60.3", "6.03"})
        EXPECT_FALSE(ctl::isSameVersion(asked, "063000000")) << asked;
    for (const char* asked : {"10", "0.1", "1.0.1"})
        EXPECT_FALSE(ctl::isSameVersion(asked, "010000000")) << asked;
    EXPECT_FALSE(ctl::isSameVersion("", "063000000"));
    EXPECT_TRUE(ctl::isSameVersion("latest", "063000000"));
}

TEST(Verification, DoubtsAnInstallThatTheInventoryDoesNotShow) {
    const TaskRequest request = requestFor("INSTALL");
    EXPECT_EQ(ctl::doubtAboutInstall(request, json::array({kRow})), "");
    EXPECT_EQ(ctl::doubtAboutInstall(request, json::array()),
              "the host reported success, but ux 6.3 is not in the inventory");
    EXPECT_EQ(ctl::doubtAboutInstall(request, {{{"VERSION", "070000000"}}}),
              "the host reported success, but ux 6.3 is not in the inventory, which lists "
              "070000000");
}

TEST(Verification, DoubtsAnUninstallAfterWhichNoPlatformIsGone) {
    const TaskRequest request = requestFor("UNINSTALL");
    EXPECT_EQ(ctl::doubtAboutUninstall(request, 1, json::array()), "");
    EXPECT_EQ(ctl::doubtAboutUninstall(request, 2, json::array({kRow})), "");
    EXPECT_EQ(ctl::doubtAboutUninstall(request, 1, json::array({kRow})),
              "the host reported success, but ux is still in the inventory");
}

/// The result of a command that reports this RETVAL, looked at on a host that gives these answers,
/// one to each connection.
TaskResult checked(const std::string& command, int returnCode,
                   const std::vector<std::string>& answers) {
    CannedHost host([&answers](const CannedHost& self) {
        for (const std::string& answer : answers) {
            const Peer peer = self.accept();
            peer.request();
            peer.answer(200, answer);
        }
    });
    TaskResult result;
    result.end = TaskResult::End::Outcome;
    result.events = {{{"RETVAL", returnCode}}};
    const ctl::HostAddress address = {host.path(), "", std::chrono::seconds(20)};
    ctl::Verification(address, requestFor(command), true).check(result);
    host.join();
    return result;
}

constexpr const char* kGuarded = R"({"guarded": true})";
constexpr const char* kNothing = R"({"rows": []})";
constexpr const char* kListed = R"({"rows": [{"PRODUCT": "ux", "VERSION": "063000000"}]})";

TEST(Verification, LooksAtTheInventoryAfterAnInstall) {
    EXPECT_EQ(checked("INSTALL", 0, {kGuarded, kListed}).doubt, "");
    EXPECT_NE(checked("INSTALL", 0, {kGuarded, kNothing}).doubt, "");
}

TEST(Verification, LooksAtTheInventoryBeforeAndAfterAnUninstall) {
    EXPECT_EQ(checked("UNINSTALL", 0, {kGuarded, kListed, kNothing}).doubt, "");
    EXPECT_NE(checked("UNINSTALL", 0, {kGuarded, kListed, kListed}).doubt, "");
}

TEST(Verification, LeavesAFailureAndAnUnguardedHostAlone) {
    EXPECT_EQ(checked("INSTALL", 1031, {kGuarded}).doubt, "");
    EXPECT_EQ(checked("INSTALL", 0, {R"({"guarded": false})"}).doubt, "");
}

TEST(Verification, ThatIsNotPossibleIsANote) {
    const TaskResult unknown =
        checked("INSTALL", 0, {kGuarded, R"({"rows": [], "warnings": [{"exit": 3}]})"});
    EXPECT_EQ(unknown.doubt, "");
    EXPECT_EQ(unknown.note, "not verified: the inventory could not be taken");
    EXPECT_EQ(checked("START", 0, {kGuarded}).note,
              "not verified: the home has no way to ask whether ux runs");
}

}  // namespace
