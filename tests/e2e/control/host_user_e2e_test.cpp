// zavctl talks to nobody's host but its own user's and root's, and to that of a user it is told of.
// ctest-label: threaded

#include <gmock/gmock.h>
#include <pwd.h>
#include <unistd.h>

#include <filesystem>
#include <optional>

#include "ctl/client/lying_host.h"
#include "support/host/managed_host.h"

namespace {

using ctl_test::LyingHost;
using ctl_test::Victim;
using testing::HasSubstr;
using Words = std::vector<std::string>;

/// Two users that every machine has; neither has any rights.
constexpr const char* kStranger = "nobody";
constexpr const char* kUser = "daemon";

uid_t idOf(const char* user) {
    const passwd* const entry = ::getpwnam(user);
    return entry != nullptr ? entry->pw_uid : static_cast<uid_t>(-1);
}

/// A host that this user runs, as far as the kernel can tell: it is the one that began to listen.
class HostOf {
public:
    explicit HostOf(const char* user) {
        EXPECT_EQ(::seteuid(idOf(user)), 0);
        host_.emplace([](const Victim& victim) {
            victim.hear();
            victim.send("HTTP/1.1 200 OK\r\nContent-Length: 19\r\n\r\n{\"version\": \"fake\"}");
        });
        EXPECT_EQ(::seteuid(0), 0);
        // The directory was made for its owner alone.
        std::filesystem::permissions(std::filesystem::path(path()).parent_path(),
                                     std::filesystem::perms::all);
        std::filesystem::permissions(path(), std::filesystem::perms::all);
    }
    std::string path() const { return host_->path(); }

private:
    std::optional<LyingHost> host_;
};

class HostUser : public testing::Test {
protected:
    void SetUp() override {
        if (::geteuid() != 0) GTEST_SKIP() << "only root can become another user";
        // The program, where everybody may run it.
        std::filesystem::copy_file(zavctlPath(), program_.path("zavctl"));
        std::filesystem::permissions(program_.path(""), std::filesystem::perms(0755));
    }
    /// zavctl as a user that is not root.
    ProgramResult as(const char* user, const Words& words) const {
        Words line = {"/usr/bin/setpriv", "--reuid", user, "--clear-groups",
                      program_.path("zavctl")};
        line.insert(line.end(), words.begin(), words.end());
        return runProgram(line);
    }

    ScratchDir program_;
};

TEST_F(HostUser, OfAStrangerIsRefusedBeforeAnythingIsSent) {
    const HostOf host(kStranger);
    const ProgramResult result = as(kUser, {"--socket", host.path(), "status"});
    EXPECT_EQ(result.status, 3);
    EXPECT_EQ(result.out, "");
    EXPECT_EQ(result.err, "zavctl: the host at " + host.path() +
                              " is run by nobody, not by you or root\n"
                              "  If that is meant to be so, add --host-user nobody\n");
    const ProgramResult stream = as(kUser, {"--socket", host.path(), "events", "--count", "1"});
    EXPECT_EQ(stream.status, 3);
    EXPECT_THAT(stream.err, HasSubstr(" is run by nobody, "));
}

TEST_F(HostUser, OfAStrangerGetsNoFiles) {
    const HostOf host(kStranger);
    const std::string file = program_.write("file", "secret");
    const ProgramResult result =
        as(kUser, {"--socket", program_.path("none"), "--rpc-socket", host.path(), "push", file});
    EXPECT_EQ(result.status, 3);
    EXPECT_THAT(result.err, HasSubstr("the host at " + host.path() + " is run by nobody, "));
}

TEST_F(HostUser, ThatIsNamedIsTrusted) {
    const HostOf host(kStranger);
    const Words line = {"--socket", host.path(), "status", "--host-user"};
    for (const std::string& name : {std::string(kStranger), std::to_string(idOf(kStranger))}) {
        Words named = line;
        named.push_back(name);
        const ProgramResult result = as(kUser, named);
        EXPECT_EQ(result.status, 0) << result.err;
        EXPECT_THAT(result.out, HasSubstr("fake"));
    }
    Words other = line;
    other.emplace_back("bin");
    EXPECT_EQ(as(kUser, other).status, 3);
    other.back() = "nobody-is-called-so";
    EXPECT_EQ(as(kUser, other).status, 2);
}

TEST_F(HostUser, ThatIsOneselfOrRootIsTrustedAndAnybodyIsByRoot) {
    const HostOf own(kUser);
    EXPECT_EQ(as(kUser, {"--socket", own.path(), "status"}).status, 0);
    const HostOf roots("root");
    EXPECT_EQ(as(kUser, {"--socket", roots.path(), "status"}).status, 0);
    const HostOf strangers(kStranger);
    EXPECT_EQ(runProgram({zavctlPath(), "--socket", strangers.path(), "status"}).status, 0);
}

}  // namespace
