// Installs that stop the process that runs them: the early outcome, the host's return, and the real
// outcome fetched afterwards.
// ctest-label: threaded

#include <gtest/gtest.h>
#include <signal.h>
#include <unistd.h>

#include <nlohmann/json.hpp>

#include "support/host/managed_host.h"
#include "support/host/script_home.h"

namespace {

using nlohmann::json;

/// A home with a depot of its own and a translator that notes its calls.
class RestartInstallTest : public testing::Test {
protected:
    RestartInstallTest() {
        files().script("home/bin/cinfo",
                       "echo '\"ProdCode\",\"Description\",\"Platform\",\"Version\",\"Release\"'\n"
                       "echo '\"ax\",\"Shared\",\"lx8266\",\"010000000\",\"100\"'\n");
        files().script("home/agtqvs6/lx8266/bin/zav_xa",
                       "echo \"$@\" >>'" + files().path("translator") + "'\n");
        files().makeDir("home/depot");
    }

    const ScratchDir& files() const { return home_.files(); }
    std::string depot() const { return home_.path() + "/depot/"; }

    std::unique_ptr<ManagedHost> startHost() const {
        return std::make_unique<ManagedHost>(
            home_.path(), Environment{{"QVSDEPLOY_AGENTDEPOT", home_.path() + "/depot"}});
    }

    /// An installer that waits for letItRun(), kills the host then and ends with `code`.
    std::string installer(const std::string& name, const ManagedHost& host, int code) const {
        return files().script(name, "until [ -e '" + files().path("go") +
                                        "' ]; do sleep 0.05; done\nkill -9 " +
                                        std::to_string(host.pid()) +
                                        "\nsleep 1\necho installed\necho trouble >&2\nexit " +
                                        std::to_string(code) + "\n");
    }

    /// The host is to be killed when it has told of the first outcome, not before.
    void letItRun() const { files().write("go", ""); }

    /// Sends the install, waits for its first outcome and for the host to be killed by it.
    void installAndAwaitDeath(ManagedHost& host, const std::string& command) const {
        const ProgramResult result = host.zavctl(
            {"--json", "install", "UX", "010000000", "--restart", "--", "/bin/sh", command});
        ASSERT_EQ(result.status, 0) << result.out << result.err;
        const json document = json::parse(result.out);
        EXPECT_EQ(document["reply"]["RETVAL"], 0);
        ASSERT_EQ(document["events"].size(), 1U);
        EXPECT_EQ(document["events"][0]["RETVAL"], 0) << "success is reported before it has run";
        letItRun();
        EXPECT_EQ(host.program().wait(std::chrono::seconds(30)).status, 128 + SIGKILL);
    }

    ScriptHome home_;
};

TEST_F(RestartInstallTest, TheRealOutcomeIsFetchedFromTheHostThatCameBack) {
    const auto host = startHost();
    files().write("home/depot/ux/left", "");
    installAndAwaitDeath(*host, installer("installer", *host, 0));
    host->start();
    const ProgramResult result = host->zavctl({"--json", "complete-install"});
    EXPECT_EQ(result.status, 0) << result.out << result.err;
    const json row = json::parse(result.out);
    EXPECT_EQ(row["RETVAL"], 0);
    EXPECT_EQ(row["RETMSGID"], "");
    EXPECT_EQ(files().read("home/depot/rc.txt"), "0\n");
    EXPECT_EQ(files().read("home/depot/stdout.txt"), "installed\n");
    EXPECT_EQ(files().read("home/depot/stderr.txt"), "trouble\n");
    EXPECT_EQ(files().read("translator"), "-setCMS UX\n");
    EXPECT_FALSE(files().exists("home/depot/ux")) << "the product's folder is cleaned away";
}

TEST_F(RestartInstallTest, CompleteFollowsAFailingInstallToItsEndByItself) {
    const auto host = startHost();
    const std::string command = installer("installer", *host, 65);
    const auto watching = host->startZavctl({"events", "--transid", "it", "--count", "1"});
    ASSERT_TRUE(eventually([&host] {
        return json::parse(host->zavctl({"--json", "status"}).out)["subscriptions"] == 1;
    }));
    const auto waiting = host->startZavctl({"install", "ux", "010000000", "--restart", "--complete",
                                            "--transid", "it", "--", "/bin/sh", command});
    EXPECT_EQ(watching->wait(std::chrono::seconds(40)).status, 0);
    letItRun();  // both have been told of the outcome by the same turn of the host's loop
    EXPECT_EQ(host->program().wait(std::chrono::seconds(40)).status, 128 + SIGKILL);
    host->start();
    const ProgramResult result = waiting->wait(std::chrono::seconds(60));
    EXPECT_EQ(result.status, 1) << result.err;
    const json document = json::parse(result.out);
    EXPECT_EQ(document["events"][0]["RETVAL"], 0);
    const json& row = document["completion"];
    EXPECT_EQ(row["RETVAL"], 1031);
    EXPECT_EQ(row["RETMSGID"], "ZAV1031E");
    EXPECT_EQ(row["RETMSGPARM"], depot() + "rc.txt,65");
    EXPECT_FALSE(files().exists("translator"));
}

TEST_F(RestartInstallTest, WithoutATranslatorNothingIsRun) {
    const auto host = startHost();
    ASSERT_EQ(::unlink((home_.path() + "/agtqvs6/lx8266/bin/zav_xa").c_str()), 0);
    const ProgramResult result = host->zavctl({"--json", "install", "ux", "010000000", "--restart",
                                               "--", "/bin/touch", files().path("ran")});
    EXPECT_EQ(result.status, 1);
    const json event = json::parse(result.out)["events"][0];
    EXPECT_EQ(event["RETVAL"], 1031);
    EXPECT_EQ(event["RETMSGID"], "ZAV1030E");
    EXPECT_EQ(event["RETMSGPARM"], "/bin/touch " + files().path("ran"));
    EXPECT_FALSE(files().exists("ran"));
    EXPECT_FALSE(files().exists("home/depot/runcmd.sh"));
}

}  // namespace
