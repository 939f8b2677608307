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
/// one to each connection; a null one is 404.
TaskResult checked(const TaskRequest& request, int returnCode,
                   const std::vector<const char*>& answers) {
    CannedHost host([&answers](const CannedHost& self) {
        for (const char* const answer : answers) {
            const Peer peer = self.accept();
            peer.request();
            peer.answer(answer == nullptr ? 404 : 200, answer == nullptr ? "{}" : answer);
        }
    });
    TaskResult result;
    result.end = TaskResult::End::Outcome;
    result.events = {{{"RETVAL", returnCode}}};
    const ctl::HostAddress address = {host.path(), "", std::chrono::seconds(20)};
    ctl::Verification(address, request, true).check(result);
    host.join();
    return result;
}
TaskResult checked(const std::string& command, int returnCode,
                   const std::vector<const char*>& answers) {
    return checked(requestFor(command), returnCode, answers);
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
}

/// The answer of a host that has one instance of "ux", in this state.
constexpr const char* kRuns = R"({"instances": [
    {"product": "ux", "instance": "", "target": "h:UX", "state": "running"}]})";
constexpr const char* kIsMissing = R"({"instances": [
    {"product": "um", "instance": "", "target": "h:UA", "state": "running"},
    {"product": "ux", "instance": "", "target": "h:UX", "state": "missing"},
    {"product": "ux", "instance": "db1", "target": "db1:h:UX", "state": "running"}]})";
constexpr const char* kHasNone = R"({"instances": []})";

TEST(Verification, LooksWhetherAStartedAgentRunsAndAStoppedOneDoesNot) {
    for (const char* command : {"START", "RESTART"}) {
        EXPECT_EQ(checked(command, 0, {kGuarded, kRuns}).doubt, "") << command;
        EXPECT_EQ(checked(command, 0, {kGuarded, kIsMissing}).doubt,
                  "the host reported success, but h:UX does not run")
            << command;
    }
    EXPECT_EQ(checked("STOP", 0, {kGuarded, kIsMissing}).doubt, "");
    EXPECT_EQ(checked("STOP", 0, {kGuarded, kRuns}).doubt,
              "the host reported success, but h:UX still runs");
}

TEST(Verification, KnowsAnInstanceByItsManagedSystemNameOrItsOwn) {
    TaskRequest request = requestFor("STOP");
    const char* const expected = "the host reported success, but db1:h:UX still runs";
    for (const char* target : {"db1:h:UX", "DB1:H:ux"}) {
        request.targetmsn = target;
        EXPECT_EQ(checked(request, 0, {kGuarded, kIsMissing}).doubt, expected) << target;
    }
    request.targetmsn = "db1";
    EXPECT_EQ(checked(request, 0, {kGuarded, kIsMissing}).doubt, "");
    request.optional = "INSTANCE";
    EXPECT_EQ(checked(request, 0, {kGuarded, kIsMissing}).doubt, expected);
}

TEST(Verification, OfAnAgentThatNobodyCanAskAboutIsANote) {
    EXPECT_EQ(checked("START", 0, {kGuarded, nullptr}).note,
              "not verified: the home has no way to ask whether ux runs");
    EXPECT_EQ(checked("START", 0, {kGuarded, kHasNone}).note,
              "not verified: the home lists no instance of ux");
    EXPECT_EQ(checked("STOP", 0, {kGuarded, kHasNone}).note, "");
}

}  // namespace
