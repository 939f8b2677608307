// Products are installed and removed: what the host answers, and what is on the disk afterwards.
// ctest-label: threaded

#include <gtest/gtest.h>
#include <signal.h>
#include <unistd.h>

#include <filesystem>
#include <fstream>
#include <nlohmann/json.hpp>
#include <sstream>

#include "support/host/managed_host.h"
#include "support/host/script_home.h"
#include "support/host/starter_home.h"
#include "support/host/task_batch.h"
#include "support/small_filesystem.h"

namespace fs = std::filesystem;

namespace {

using nlohmann::json;

constexpr std::chrono::minutes kPatience(2);

/// How a task ended, as a text that a failing comparison shows whole.
std::string endOf(const json& row) {
    return std::to_string(row["RETVAL"].get<int>()) + " " + row["RETMSGID"].get<std::string>() +
           " " + row["RETMSGPARM"].get<std::string>();
}

Environment depotOf(const ScriptHome& home, const Environment& more = {}) {
    Environment all = {{"QVSDEPLOY_AGENTDEPOT", home.files().path("depot")}};
    all.insert(all.end(), more.begin(), more.end());
    return all;
}

/// Whether any process has the text in its command line.
bool isNamedByAProcess(const std::string& text) {
    for (const auto& entry : fs::directory_iterator("/proc")) {
        std::ifstream in(entry.path() / "cmdline", std::ios::binary);
        // A process may end while its file is read, which is an error of the stream only.
        std::ostringstream line;
        line << in.rdbuf();
        if (line.str().find(text) != std::string::npos) return true;
    }
    return false;
}

TEST(Deploy, APushedBundleBecomesAProductAndGoesAwayAgain) {
    StarterHome home("");
    const std::string version = home.makeBundle("ux", home.files().path("bundle"));
    ManagedHost host(home.path(), home.environment());
    const int descriptors = host.openDescriptors();
    const ProgramResult pushed =
        host.zavctl({"push", home.files().path("bundle"), "ux/" + version});
    ASSERT_EQ(pushed.status, 0) << pushed.out << pushed.err;
    const ProgramResult installed = host.zavctl({"install", "ux", version, "--", "/bin/sh",
                                                 "|DEPLOYDIR|/install.sh", "-h", "|TOVRINHOME|"});
    EXPECT_EQ(installed.status, 0) << installed.out << installed.err;
    EXPECT_NE(host.zavctl({"agents"}).out.find("\nux "), std::string::npos);
    EXPECT_EQ(host.zavctl({"start", "ux"}).status, 0);
    EXPECT_TRUE(home.runs("ux"));
    EXPECT_EQ(host.zavctl({"stop", "ux"}).status, 0);
    const ProgramResult removed = host.zavctl({"uninstall", "ux"});
    EXPECT_EQ(removed.status, 0) << removed.out << removed.err;
    EXPECT_EQ(host.zavctl({"agents"}).out.find("\nux "), std::string::npos);
    EXPECT_FALSE(fs::exists(home.path("agtqvs6/" + home.platform() + "/ux")));
    EXPECT_EQ(host.children(), 0);
    EXPECT_TRUE(eventually([&] { return host.openDescriptors() <= descriptors; }));
    host.stop();
    EXPECT_FALSE(isNamedByAProcess(home.path()));
}

TEST(Deploy, AnIncompleteBundleLeavesNothingBehind) {
    StarterHome home("");
    const std::string version = home.makeBundle("ux", home.path("depot/ux/bundle"));
    fs::remove(home.path("depot/ux/bundle/files/agent.cfg"));
    ManagedHost host(home.path(), home.environment());
    const ProgramResult result = host.zavctl({"--json", "install", "ux", "bundle", "--", "/bin/sh",
                                              "|DEPLOYDIR|/install.sh", "-h", "|TOVRINHOME|"});
    EXPECT_EQ(result.status, 1);
    EXPECT_EQ(
        endOf(json::parse(result.out)["events"][0]),
        "1031 ZAV1031E /bin/sh " + home.depot() + "ux/bundle/install.sh -h " + home.path() + ",28");
    EXPECT_FALSE(fs::exists(home.path("agtqvs6/" + home.platform() + "/ux")));
    EXPECT_EQ(host.zavctl({"agents"}).out.find("\nux "), std::string::npos);
}

struct Expected {
    std::string task;  ///< its name in the batch
    std::string end;
};

TEST(Deploy, EveryFailureHasItsCodeAndItsParameter) {
    ScriptHome home;
    const std::string translator =
        home.products({"ux", "e0", "e1", "e65", "e255"},
                      "case $1 in -setCMS) exit ${2#e} ;; -r) cat >>'" +
                          home.files().path("input") + "'; exit 0 ;; esac; exit 9");
    const std::string uninstaller =
        home.files().script("home/bin/uninstall.sh", "exit ${2#e}") + " -i ";
    home.files().script("depot/ux/7/install.sh", "exit $1");
    ManagedHost host(home.path(), depotOf(home, {{"LC_ALL", "C.UTF-8"}}));
    TaskBatch batch(host);
    std::vector<Expected> expected;
    const auto expect = [&](const std::vector<std::string>& task, const std::string& end) {
        expected.push_back({batch.add(task), end});
    };

    const std::string installer = home.depot() + "ux/7/install.sh";
    for (const std::string code : {"1", "65", "255"}) {
        expect({"install", "ux", "7", "--", "/bin/sh", "|DEPLOYDIR|/install.sh", code},
               "1031 ZAV1031E /bin/sh " + installer + " " + code + "," + code);
    }
    expect({"install", "ux", "7", "--", "|DEPLOYDIR|/absent.sh", "-q"},
           "1030 ZAV1030E " + home.depot() + "ux/7/absent.sh -q");
    expect({"install", "e0", "7", "--optional", "SETCMS", "--", "/bin/true"}, "0  ");
    const std::pair<std::string, std::string> characters[] = {
        {"1", "\x01"}, {"65", "A"}, {"255", "\xC3\xBF"}};
    for (const auto& [code, character] : characters) {
        expect({"install", "e" + code, "7", "--optional", "SETCMS", "--", "/bin/true"},
               "1008 ZAV1008E INSTALL,e" + code + "," + character + "," + translator +
                   " -setCMS e" + code);
        expect({"uninstall", "e" + code},
               "1032 ZAV1032E " + uninstaller + "e" + code + " li6263," + character);
    }
    expect({"uninstall", "e0"}, "0  ");
    expect({"uninstall", "zz"}, "1034 ZAV1034E zz");
    expect({"remove-instance", "ux", "i:h:UX", "--context", "text of the request"}, "0  ");
    batch.addCommand("/bin/chmod 644 " + home.path() + "/bin/uninstall.sh " + translator);
    expect({"uninstall", "e0"}, "1033 ZAV1033E " + uninstaller + "e0 li6263");
    expect({"install", "ux", "7", "--optional", "SETCMS", "--", "/bin/true"},
           "1009 ZAV1009E INSTALL,ux," + translator + " -setCMS ux");
    expect({"remove-instance", "ux", "i:h:UX"},
           "1009 ZAV1009E REMOVEINSTANCE,ux," + translator + " -r i:h:UX -pc ux");
    batch.addCommand("/bin/rm " + translator);
    expect({"remove-instance", "ux", "i:h:UX"}, "1007 ZAV1007E REMOVEINSTANCE,ux");
    expect({"install", "ux", "7", "--optional", "SETCMS", "--", "/bin/true"}, "1031  ");
    // Without a translator nothing is begun, so there is one outcome only.
    expect({"install", "ux", "7", "--restart", "--", "/bin/sh", "|DEPLOYDIR|/install.sh"},
           "1031 ZAV1030E /bin/sh " + installer);

    const json outcomes = batch.run();
    for (const Expected& each : expected)
        EXPECT_EQ(endOf(outcomes[each.task]), each.end);
    EXPECT_EQ(home.files().read("input"), "text of the request");
    EXPECT_FALSE(home.files().exists("depot/runcmd.sh"));
    EXPECT_EQ(host.children(), 0);
}

TEST(Deploy, AnInstanceIsRemovedOnceAndOnlyWhereThereIsOne) {
    StarterHome home;
    ManagedHost host(home.path());
    TaskBatch batch(host);
    const std::string made = batch.add({"config", "set", "ux", "INSTANCE=inst1\nINTERVAL=9\n"});
    const std::string first = batch.add({"remove-instance", "ux", "inst1:host:UX"});
    const std::string second = batch.add({"remove-instance", "ux", "inst1:host:UX"});
    const json outcomes = batch.run();
    EXPECT_EQ(endOf(outcomes[made]), "0  ");
    EXPECT_EQ(endOf(outcomes[first]), "0  ");
    EXPECT_EQ(endOf(outcomes[second]), "1008 ZAV1008E REMOVEINSTANCE,ux,22," + home.translator() +
                                           " -r inst1:host:UX -pc ux");
    EXPECT_FALSE(fs::exists(home.path("config/ux_inst1.cfg")));
    const ProgramResult refused = host.zavctl({"--json", "remove-instance", "um", "a:host:UA"});
    EXPECT_EQ(refused.status, 1);
    EXPECT_EQ(endOf(json::parse(refused.out)["reply"]), "1006 ZAV1006E REMOVEINSTANCE");
}

TEST(Deploy, AnInstallerMayPrintEightMegabytes) {
    ScriptHome home;
    home.files().script(
        "depot/ux/7/install.sh",
        "head -c 8388608 /dev/zero | tr '\\0' x; echo end >'" + home.files().path("end") + "'");
    ManagedHost host(home.path(), depotOf(home));
    const ProgramResult result =
        host.zavctl({"install", "ux", "7", "--", "/bin/sh", "|DEPLOYDIR|/install.sh"});
    EXPECT_EQ(result.status, 0) << result.out << result.err;
    EXPECT_EQ(home.files().read("end"), "end\n");
    EXPECT_EQ(host.children(), 0);
}

TEST(Deploy, AnInstallerThatHangsIsKilledAtTheTimeout) {
    ScriptHome home;
    home.files().script("depot/ux/7/hang.sh",
                        "echo $$ >'" + home.files().path("pid") + "'; exec sleep 60");
    ManagedHost host(home.path(), depotOf(home, {{"TIMEOUT", "10"}}));
    const std::string command = "/bin/sh " + home.depot() + "ux/7/hang.sh";
    const ProgramResult result =
        host.zavctl({"--json", "install", "ux", "7", "--", "/bin/sh", "|DEPLOYDIR|/hang.sh"});
    EXPECT_EQ(result.status, 1);
    EXPECT_EQ(endOf(json::parse(result.out)["events"][0]), "1030 ZAV1030E " + command);
    EXPECT_EQ(::kill(std::stoi(home.files().read("pid")), 0), -1);
    EXPECT_EQ(host.children(), 0);
}

/// A host that was killed, started again, as a service manager does it.
void startAgainWhenItEnds(ManagedHost& host) {
    ASSERT_TRUE(eventually([&] { return !host.program().running(); }, kPatience));
    host.start();
}

TEST(Deploy, AnInstallThatRestartsTheHostIsCompletedByTheNextOne) {
    StarterHome home("");
    const std::string bundle = home.path("depot/ux/");
    const std::string version = home.makeBundle("ux", home.files().path("bundle"));
    fs::create_directories(bundle);
    fs::rename(home.files().path("bundle"), bundle + version);
    home.files().script("home/depot/ux/" + version + "/restart.sh",
                        "kill -KILL $(cat '" + home.files().path("host.pid") +
                            "')\n"
                            "exec /bin/sh '" +
                            bundle + version + "/install.sh' -h '" + home.path() + "'");
    ManagedHost host(home.path(), home.environment());
    home.files().write("host.pid", std::to_string(host.pid()));
    const auto install = host.startZavctl({"install", "ux", version, "--restart", "--complete",
                                           "--", "/bin/sh", "|DEPLOYDIR|/restart.sh"});
    startAgainWhenItEnds(host);
    const ProgramResult result = install->wait(kPatience);
    EXPECT_EQ(result.status, 0) << result.out << result.err;
    const json document = json::parse(result.out);
    EXPECT_EQ(document["reply"]["RETVAL"], 0);
    ASSERT_EQ(document["events"].size(), 1U);
    EXPECT_EQ(endOf(document["events"][0]), "0  ");
    EXPECT_EQ(endOf(document["completion"]), "0  ");
    EXPECT_EQ(home.files().read("home/depot/rc.txt"), "0\n");
    EXPECT_NE(home.files().read("home/depot/stdout.txt").find("ux " + version + " installed for"),
              std::string::npos);
    EXPECT_FALSE(fs::exists(bundle)) << "the wrapper script cleans the depot";
    EXPECT_NE(host.zavctl({"agents"}).out.find("\nux "), std::string::npos);
    EXPECT_NE(home.files().read("home/config/ux.cfg").find("\nCMS=HUB_"), std::string::npos);
    host.stop();
    EXPECT_FALSE(isNamedByAProcess(home.path()));
}

TEST(Deploy, AHostKilledInTheMiddleOfAnInstallTellsTheTruthAboutItAfterwards) {
    ScriptHome home;
    home.products({"ux"}, "echo translated >'" + home.files().path("translated") + "'");
    const std::string go = home.files().path("go");
    home.files().script("depot/ux/7/install.sh",
                        "touch '" + home.files().path("begun") +
                            "'\n"
                            "tries=0\n"
                            "until [ -e '" +
                            go +
                            "' ]; do tries=$((tries + 1)); [ $tries -le 1200 ] || exit 9; "
                            "sleep 0.05; done\n"
                            "echo failing >&2\n"
                            "exit 65");
    home.files().write("depot/rc.txt", "0\n");
    ManagedHost host(home.path(), depotOf(home));
    const ProgramResult begun =
        host.zavctl({"--json", "install", "ux", "7", "--restart", "--transid", "T", "--", "/bin/sh",
                     "|DEPLOYDIR|/install.sh"});
    EXPECT_EQ(begun.status, 0);
    EXPECT_EQ(endOf(json::parse(begun.out)["events"][0]), "0  ");
    ASSERT_TRUE(eventually([&] { return home.files().exists("begun"); }));
    EXPECT_FALSE(home.files().exists("depot/rc.txt")) << "that of an earlier install";
    host.program().signal(SIGKILL);
    startAgainWhenItEnds(host);
    EXPECT_FALSE(home.files().exists("depot/rc.txt"));
    home.files().write("go", "");
    ASSERT_TRUE(eventually([&] { return home.files().read("depot/rc.txt") == "65\n"; }));
    const ProgramResult completed = host.zavctl({"--json", "complete-install"});
    EXPECT_EQ(completed.status, 1);
    EXPECT_EQ(endOf(json::parse(completed.out)), "1031 ZAV1031E " + home.depot() + "rc.txt,65");
    EXPECT_EQ(home.files().read("depot/stderr.txt"), "failing\n");
    EXPECT_FALSE(home.files().exists("translated"));
    EXPECT_FALSE(home.files().exists("depot/ux"));
    host.stop();
    EXPECT_FALSE(isNamedByAProcess(home.files().path()));
}

TEST(Deploy, ADepotThatIsFullOrReadOnlyIsAFailureAndNotTheEnd) {
    ScriptHome home;
    home.products({"ux"}, "exit 0");
    const SmallFilesystem depot(home.files().path("depot"), 64);
    if (!depot.mounted()) {
        GTEST_SKIP() << "no filesystem can be mounted here: " << depot.reason();
    }
    home.files().script("depot/ux/7/install.sh", "exit 3");
    const std::string bundle = home.files().write("large", std::string(1 << 20, 'x'));
    ManagedHost host(home.path(), depotOf(home));
    const ProgramResult pushed = host.zavctl({"push", bundle, "ux/7/large"});
    EXPECT_EQ(pushed.status, 1) << pushed.out << pushed.err;
    EXPECT_NE((pushed.out + pushed.err).find("the host could not write the file"),
              std::string::npos)
        << pushed.out << pushed.err;
    const std::string installer = "/bin/sh " + home.depot() + "ux/7/install.sh";
    ASSERT_TRUE(depot.makeReadOnly());
    const ProgramResult refused = host.zavctl({"push", bundle, "ux/7/other"});
    EXPECT_EQ(refused.status, 1);
    EXPECT_NE((refused.out + refused.err).find("the host could not open the file"),
              std::string::npos)
        << refused.out << refused.err;

    const auto events = host.startZavctl({"events", "--count", "2"});
    ASSERT_TRUE(eventually([&] {
        return json::parse(host.zavctl({"--json", "status"}).out)["subscriptions"] == 1;
    }));
    host.zavctl({"install", "ux", "7", "--restart", "--no-wait", "--", "/bin/sh",
                 "|DEPLOYDIR|/install.sh"});
    const json rows = json::parse(events->wait().out)["events"];
    ASSERT_EQ(rows.size(), 2U);
    EXPECT_EQ(endOf(rows[0]), "0  ") << "the outcome that is sent before the install has run";
    // The wrapper script is not there, which the shell reports with a code of its own.
    const int noScript = runProgram({"/bin/sh", home.depot() + "runcmd.sh"}).status;
    EXPECT_EQ(endOf(rows[1]), "1031 ZAV1031E /bin/sh " + home.depot() + "runcmd.sh " + installer +
                                  "," + std::to_string(noScript));
    EXPECT_EQ(host.zavctl({"status"}).status, 0);
}

}  // namespace
