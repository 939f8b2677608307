// Agents are configured: what the host answers, what the translator and the universal agent's
// console get to see, and what real agents make of it.
// ctest-label: threaded

#include <gmock/gmock.h>
#include <sys/stat.h>

#include <filesystem>
#include <nlohmann/json.hpp>

#include "support/host/managed_host.h"
#include "support/host/script_home.h"
#include "support/host/starter_home.h"
#include "support/host/task_batch.h"

namespace fs = std::filesystem;

namespace {

using nlohmann::json;

/// How a task ended, as a text that a failing comparison shows whole.
std::string endOf(const json& row) {
    return std::to_string(row["RETVAL"].get<int>()) + " " + row["RETMSGID"].get<std::string>() +
           " " + row["RETMSGPARM"].get<std::string>();
}

const std::string kDone = "0  ";

TEST(Configuration, WhatIsSetIsGotFromEverySource) {
    StarterHome home("ux");
    ManagedHost host(home.path());
    const std::string argument = "INSTANCE=\nINTERVAL=7\n";
    EXPECT_EQ(host.zavctl({"config", "set", "ux", argument}).status, 0);
    EXPECT_EQ(host.zavctl({"config", "get", "ux"}).out, argument);
    const std::string input = "INSTANCE=\n# from standard input\nINTERVAL=8\n";
    EXPECT_EQ(host.zavctl({"config", "set", "ux", "-"}, input).status, 0);
    EXPECT_EQ(host.zavctl({"config", "get", "ux"}).out, input);
    const std::string text = "INSTANCE=inst1\nINTERVAL=9\n";
    const std::string file = home.files().write("new.cfg", text);
    EXPECT_EQ(
        host.zavctl({"config", "set", "ux", "--target", "inst1:host:UX", "--file", file}).status,
        0);
    EXPECT_EQ(host.zavctl({"config", "get", "ux", "--target", "inst1:host:UX"}).out, text);
    EXPECT_EQ(host.zavctl({"config", "get", "ux"}).out, input) << "another instance's";
    const json row = json::parse(host.zavctl({"--json", "config", "get", "ux"}).out);
    EXPECT_EQ(endOf(row), kDone);
    EXPECT_EQ(row["COMMAND"], "GETCONFIG");
    EXPECT_EQ(row["CONTEXT"].get<std::string>() + (row["CONTEXT"] == input ? "" : "\n"), input);
    EXPECT_EQ(host.children(), 0);
}

TEST(Configuration, TheEditorsChangeIsSetAndNoChangeIsNone) {
    StarterHome home("ux");
    ManagedHost host(home.path());
    const std::string change =
        home.files().script("change", "sed -i s/INTERVAL=5/INTERVAL=6/ \"$1\"");
    const ProgramResult changed =
        host.zavctl({"config", "edit", "ux"}, "", {{"EDITOR", "/bin/sh " + change}});
    EXPECT_EQ(changed.status, 0) << changed.out << changed.err;
    EXPECT_NE(host.zavctl({"config", "get", "ux"}).out.find("\nINTERVAL=6\n"), std::string::npos);
    const std::string stored = home.files().read("home/config/ux.cfg");
    const ProgramResult same = host.zavctl({"config", "edit", "ux"}, "", {{"EDITOR", "true"}});
    EXPECT_EQ(same.status, 0);
    EXPECT_EQ(same.out, "config edit ux: nothing changed\n");
    const ProgramResult failed = host.zavctl({"config", "edit", "ux"}, "", {{"EDITOR", "false"}});
    EXPECT_EQ(failed.status, 2);
    EXPECT_EQ(home.files().read("home/config/ux.cfg"), stored);
    const ProgramResult absent = host.zavctl({"config", "edit", "ux", "--target", "no:host:UX"}, "",
                                             {{"EDITOR", "/bin/sh " + change}});
    EXPECT_EQ(absent.status, 1);
    EXPECT_NE(absent.err.find("ZAV1008E"), std::string::npos) << absent.err;
}

TEST(Configuration, TheTranslatorGetsTheWholeTextAlsoBeyondTheColumn) {
    ScriptHome home;
    home.products({"ux"}, "cat >'" + home.files().path("set.") + "'$2");
    ManagedHost host(home.path());
    for (const std::size_t length : {3072U, 3073U}) {
        const std::string name = std::to_string(length);
        const std::string text = "INSTANCE=" + std::string(length - 10, 'x') + "e";
        ASSERT_EQ(text.size(), length);
        const ProgramResult result =
            host.zavctl({"--json", "config", "set", "ux", text, "--target", name});
        EXPECT_EQ(result.status, 0) << result.out << result.err;
        EXPECT_EQ(home.files().read("set." + name), text);
    }
}

struct Expected {
    std::string task;  ///< its name in the batch
    std::string end;
};

/// Tasks with the ends that they should have.
class ExpectedBatch {
public:
    explicit ExpectedBatch(const ManagedHost& host) : batch_(host) {}

    void expect(const std::vector<std::string>& task, const std::string& end) {
        expected_.push_back({batch_.add(task), end});
    }
    /// A step between two tasks, which changes the home.
    void then(const std::string& command) {
        expected_.push_back({batch_.addCommand(command), kDone});
    }
    void check() {
        const json outcomes = batch_.run();
        for (const Expected& each : expected_)
            EXPECT_EQ(endOf(outcomes[each.task]), each.end);
    }

private:
    TaskBatch batch_;
    std::vector<Expected> expected_;
};

std::string getConfiguration(const ManagedHost& host, const std::string& target) {
    return endOf(
        json::parse(host.zavctl({"--json", "config", "get", "ux", "--target", target}).out));
}

TEST(ConfigurationFailures, OfTheTranslatorAndTheAgentScript) {
    ScriptHome home;
    const std::string translator =
        home.products({"ux"}, "case $2 in bad) printf oops >&2; exit 7 ;; esac");
    home.agentScript("exit 3");
    ManagedHost host(home.path());
    const std::string agent = home.path() + "/bin/TovrinAgent";
    const std::string calls = "  -h " + home.path() + " ";

    ExpectedBatch running(host);
    const std::string set = translator + " -p bad -pc ux";
    running.expect({"config", "set", "ux", "INSTANCE=", "--target", "bad"},
                   "1008 ZAV1008E SETCONFIG,ux,7," + set + ",oops");
    running.expect({"config", "set", "ux", "INSTANCE=", "--target", "good"}, kDone);
    running.expect({"start", "ux"}, "1024 ZAV1024E " + agent + calls + "start ux");
    running.expect({"stop", "ux"}, "1024 ZAV1024E " + agent + calls + "-c stop ux");
    running.check();
    const std::string get = translator + " -g bad -pc ux";
    EXPECT_EQ(getConfiguration(host, "bad"), "1008 ZAV1008E GETCONFIG,ux,7," + get);
    EXPECT_EQ(getConfiguration(host, "good"), kDone);

    ASSERT_EQ(::chmod(translator.c_str(), 0644), 0);
    ASSERT_EQ(::chmod(agent.c_str(), 0644), 0);
    ExpectedBatch notRunning(host);
    notRunning.expect({"config", "set", "ux", "INSTANCE=", "--target", "bad"},
                      "1009 ZAV1009E SETCONFIG,ux," + set);
    notRunning.expect({"start", "ux"}, "1025 ZAV1025E " + agent + calls + "start ux");
    notRunning.expect({"stop", "ux"}, "1025 ZAV1025E " + agent + calls + "-c stop ux");
    notRunning.check();
    EXPECT_EQ(getConfiguration(host, "bad"), "1009 ZAV1009E GETCONFIG,ux," + get);

    fs::remove(translator);
    ExpectedBatch without(host);
    without.expect({"config", "set", "ux", "INSTANCE="}, "1007 ZAV1007E SETCONFIG,ux");
    without.check();
    EXPECT_EQ(getConfiguration(host, "bad"), "1007 ZAV1007E GETCONFIG,ux");
}

/// A home of scripts with a universal agent whose console does what the metafile's name says.
class ConsoleHome : public ScriptHome {
public:
    ConsoleHome() {
        products({"um"}, "exit 0");
        files().makeDir("ua/meta");
        files().makeDir("ua/scripts");
        files().write("home/config/.ConfigData/kumenv", "|DATAPROVIDER|FILE|\n");
        files().script("home/bin/um_console",
                       "echo \"$4\" >>'" + files().path("console") +
                           "'\n"
                           "case $4 in\n"
                           "*no-type.mdl) [ \"${4%% *}\" != getdptype ] || exit 4 ;;\n"
                           "*no-import.mdl) [ \"${4%% *}\" != IMPORT ] || exit 5 ;;\n"
                           "*goes-before-delete.mdl) [ \"${4%% *}\" != getdptype ] || "
                           "mv \"$0\" \"$0.away\" ;;\n"
                           "*goes-before-import.mdl) mv \"$0\" \"$0.away\" ;;\n"
                           "esac\n"
                           "[ \"${4%% *}\" != getdptype ] || echo scrp\n");
        for (const char* name : {"good.mdl", "no-type.mdl", "no-import.mdl",
                                 "goes-before-delete.mdl", "goes-before-import.mdl", "a.sh"}) {
            files().write(std::string("depot/") + name, "APPL=X\n", 0644);
        }
    }

    /// Writes an instance's configuration without the line of `leftOut`; returns the file.
    std::string instance(const std::string& name, const std::string& leftOut = "",
                         const std::string& work = "", const std::string& providers = "FILE") {
        std::string text = "* a comment\n";
        const std::pair<std::string, std::string> lines[] = {
            {"KUMP_META_PATH", "'" + meta() + "'"},
            {"KUM_WORK_PATH", "'" + (work.empty() ? files().path("ua/work") : work) + "'"},
            {"KUMP_RB_PATH", "'" + files().path("ua/rb") + "'"},
            {"KUMA_STARTUP_DP", "'" + providers + "'"}};
        for (const auto& [key, value] : lines) {
            if (key != leftOut) text += key + "=" + value + "\n";
        }
        const std::string relative = "config/um" + (name.empty() ? "" : "_" + name) + ".config";
        return files().write("home/" + relative, text);
    }

    std::string meta() const { return files().path("ua/meta"); }
    std::string console() const { return path() + "/bin/um_console"; }
    std::string call(const std::string& verb, const std::string& metafile) const {
        return console() + " -h " + path() + " -c \"" + verb + " " + meta() + "/" + metafile + "\"";
    }
    std::string bringConsoleBack() const { return "/bin/mv " + console() + ".away " + console(); }
    Environment environment() const { return {{"QVSDEPLOY_AGENTDEPOT", files().path("depot")}}; }
};

std::vector<std::string> import(const std::string& metafile, const std::string& instance = "",
                                bool restart = false) {
    std::vector<std::string> task = {"ua-config", "--metafile", metafile};
    if (!instance.empty()) task.insert(task.end(), {"--target", instance + ":host:UA"});
    if (restart) task.emplace_back("--restart");
    return task;
}

TEST(ConfigurationFailures, OfTheUniversalAgentsFiles) {
    ConsoleHome home;
    home.instance("");
    const std::string noMeta = home.instance("m", "KUMP_META_PATH");
    const std::string noWork = home.instance("w", "KUM_WORK_PATH");
    const std::string noResources = home.instance("r", "KUMP_RB_PATH");
    const std::string flat = home.instance("flat", "", "work");
    ManagedHost host(home.path(), home.environment());
    ExpectedBatch batch(host);
    batch.expect(import("good.mdl", "m"), "1011 ZAV1011E KUMP_META_PATH," + noMeta);
    batch.expect(import("good.mdl", "w"), "1012 ZAV1012E KUM_WORK_PATH," + noWork);
    batch.expect(import("good.mdl", "r"), "1013 ZAV1013E KUMP_RB_PATH," + noResources);
    batch.expect(import("good.mdl", "flat"), "1021 ZAV1021E KUM_WORK_PATH,work," + flat);
    batch.expect(import("good.mdl", "NONE"),
                 "1020 ZAV1020E " + home.path() + "/config/um_none.config,none");
    batch.expect(import("absent.mdl"),
                 "1014 ZAV1014E " + home.depot() + "absent.mdl," + home.meta());
    batch.expect({"ua-config", "--metafile", "good.mdl", "--scripts", "a.sh,absent.sh"},
                 "1015 ZAV1015E " + home.depot() + "absent.sh," + home.files().path("ua/scripts"));
    batch.then("/bin/touch " + home.path() + "/unreported");
    batch.expect(import("good.mdl"), "1019 ZAV1019E um");
    batch.check();
    EXPECT_FALSE(home.files().exists("console")) << "none of them gets that far";
    EXPECT_TRUE(home.files().exists("ua/meta/good.mdl")) << "a copied file stays";
    struct stat script {};
    ASSERT_EQ(::stat(home.files().path("ua/scripts/a.sh").c_str(), &script), 0);
    EXPECT_EQ(script.st_mode & 07777, 0755U);
}

TEST(ConfigurationFailures, OfTheUniversalAgentsConsole) {
    ConsoleHome home;
    home.instance("");
    ManagedHost host(home.path(), home.environment());
    ExpectedBatch batch(host);
    batch.expect(import("no-import.mdl"), "1016 ZAV1016E no-import.mdl");
    batch.expect(import("no-type.mdl", "", true), "1023 ZAV1023E no-type.mdl");
    batch.expect(import("goes-before-delete.mdl", "", true),
                 "1017 ZAV1017E " + home.call("DELETE", "goes-before-delete.mdl"));
    batch.expect(import("good.mdl", "", true),
                 "1022 ZAV1022E " + home.call("getdptype", "good.mdl"));
    batch.then(home.bringConsoleBack());
    batch.expect(import("goes-before-import.mdl"),
                 "1018 ZAV1018E " + home.call("IMPORT", "goes-before-import.mdl"));
    batch.then(home.bringConsoleBack());
    batch.expect(import("good.mdl"), kDone);
    batch.check();
    EXPECT_EQ(home.files().read("home/config/.ConfigData/kumenv"), "|DATAPROVIDER|FILE,SCRP|\n");
    EXPECT_EQ(host.children(), 0);
}

TEST(ConfigurationFailures, OfTheRestartOfTheUniversalAgent) {
    ConsoleHome home;
    for (const char* name : {"nostop", "nostart", "fine"})
        home.instance(name);
    home.instance("all", "", "", "asfs");
    home.agentScript("case \"$*\" in *nostop*stop* | *nostart*start*um) exit 3 ;; esac");
    const std::string parameters = home.path() + "/config/.ConfigData/kumenv";
    ManagedHost host(home.path(), home.environment());
    ExpectedBatch batch(host);
    batch.expect(import("good.mdl", "nostop", true), "1027 ZAV1027E nostop");
    batch.expect(import("good.mdl", "nostart", true), "1026 ZAV1026E nostart");
    batch.expect(import("good.mdl", "all", true), kDone);
    batch.then("/bin/rm " + parameters);
    batch.expect(import("good.mdl", "fine", true), "1028 ZAV1028E " + parameters + ",FILE,SCRP");
    batch.check();
    const std::string before = "-h " + home.path() + " ";
    EXPECT_THAT(
        home.agentCalls(),
        testing::ElementsAre(before + "-c -o nostop stop um", before + "-c -o nostart stop um",
                             before + "-o nostart start um", before + "-c -o fine stop um"));
}

TEST(UniversalAgent, ImportsAMetafileWithItsScriptAndCollectsWhatItSays) {
    StarterHome home("um");
    home.files().write("home/depot/disks.mdl",
                       "APPL=DISKS\nDPTYPE=SCRP\nSOURCE=disks.sh\nFIELDS=NAME,USED\n");
    home.files().write("home/depot/disks.sh", "#!/bin/sh\necho rootdisk,42\n");
    ManagedHost host(home.path(), home.environment());
    ASSERT_EQ(host.zavctl({"start", "um"}).status, 0);
    const std::string before = home.files().read("home/run/um.pid");
    const ProgramResult result =
        host.zavctl({"ua-config", "--metafile", "disks.mdl", "--scripts", "disks.sh", "--restart"});
    EXPECT_EQ(result.status, 0) << result.out << result.err;
    EXPECT_NE(home.files().read("home/run/um.pid"), before) << "it has been restarted";
    EXPECT_NE(home.files().read("home/config/.ConfigData/kumenv").find("|DATAPROVIDER|FILE,SCRP|"),
              std::string::npos);
    EXPECT_TRUE(eventually([&] {
        return home.files().read("home/data/um/DISKS.csv").find("rootdisk,42") != std::string::npos;
    }));
    EXPECT_NE(home.files().read("home/config/um.config").find("KUMA_STARTUP_DP='FILE,SCRP'"),
              std::string::npos);
    EXPECT_EQ(host.zavctl({"stop", "um"}).status, 0);
    EXPECT_FALSE(home.runs("um"));
    EXPECT_EQ(host.children(), 0);
}

}  // namespace
