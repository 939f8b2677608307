#include "tasks/ua_config.h"

#include <dlfcn.h>
#include <gmock/gmock.h>
#include <sys/stat.h>

#include <cerrno>
#include <map>

#include "support/trace_capture.h"
#include "tasks/task_home.h"

using testing::ElementsAre;
using testing::IsEmpty;
using testing::IsSupersetOf;
using ZAV::String;

// This definition replaces the C library's, so that changing a mode can fail.
namespace {
bool changingModesFails = false;
}  // namespace

extern "C" int chmod(const char* path, mode_t mode) noexcept {
    static const auto next =
        reinterpret_cast<int (*)(const char*, mode_t)>(::dlsym(RTLD_NEXT, "chmod"));
    if (!changingModesFails) return next(path, mode);
    errno = EPERM;
    return -1;
}

namespace {

constexpr const char* kConsole = "bin/um_console";
constexpr const char* kAgent = "bin/TovrinAgent";

/// The values of a request.
struct Request {
    std::string metafile = "app.mdl";
    std::string scripts = "";
    std::string context = "";
    std::string target = "";
    std::string product = "um";
};

class UaConfig : public testing::Test {
protected:
    UaConfig() {
        home_.inventory("", "Platform codes:\nli6263 Product (um)\n");
        home_.dir().makeDir("home/metafiles");
        home_.dir().makeDir("home/work/scripts");
        home_.dir().write("depot/app.mdl", "//APPL\n");
        home_.dir().write("depot/one.sh", "one\n");
        home_.dir().write("depot/two.sh", "two\n");
        configure({});
        startupParameters("*kumenv\n|DATAPROVIDER|SNMP|\n");
        console("");
        home_.program(kAgent, "true");
    }

    /// Writes an instance's configuration file with the four keys, or the given values in their
    /// place; an empty value leaves the key out.
    void configure(const std::map<std::string, std::string>& changes,
                   const std::string& name = "um.config") const {
        std::map<std::string, std::string> values{
            {"KUMP_META_PATH", "'" + home_.home() + "/metafiles'"},
            {"KUM_WORK_PATH", "'" + workPath() + "'"},
            {"KUMP_RB_PATH", home_.home() + "/rb"},
            {"KUMA_STARTUP_DP", "'SNMP'"}};
        for (const auto& [key, value] : changes)
            values[key] = value;
        std::string content = "* The universal agent\r\n\r\n*KUMP_META_PATH=none\r\n";
        for (const auto& [key, value] : values) {
            if (!value.empty()) content += key + "=" + value + "\r\n";
        }
        home_.dir().write("home/config/" + name, content + "LAST=1");
    }
    void startupParameters(const std::string& content) const {
        home_.dir().write("home/config/.ConfigData/kumenv", content);
    }
    /// Creates a console that runs `body` with its verb in "$verb".
    void console(const std::string& body) const {
        home_.program(kConsole, "verb=${4%% *}\n" + body);
    }
    /// Creates a console for which all metafiles are of one type.
    void consoleWithType(const std::string& type) const {
        console("[ $verb != getdptype ] || printf '" + type + "'");
    }

    Outcome run(const Request& request) {
        TaskQueueElem task;
        task.setCommand("SETCONFIG");
        task.setProduct(request.product.c_str());
        task.setUaconfig(request.metafile.c_str());
        task.setUascript(request.scripts.c_str());
        task.setContext(request.context.c_str());
        task.setTargetmsn(request.target.c_str());
        return outcomeOf(task, setUaconfig(task));
    }
    Outcome runWithRestart() {
        Request request;
        request.context = "RESTART=Y";
        return run(request);
    }

    std::string workPath() const { return home_.home() + "/work/um"; }
    std::string configFile(const std::string& name = "um.config") const {
        return home_.home() + "/config/" + name;
    }
    std::string kumenv() const { return home_.home() + "/config/.ConfigData/kumenv"; }
    std::string kumenvText() const { return home_.dir().read("home/config/.ConfigData/kumenv"); }
    std::string consoleCommand(const std::string& verb, const std::string& name = "app.mdl") const {
        return home_.home() + "/bin/um_console -h " + home_.home() + " -c \"" + verb + " " +
               home_.home() + "/metafiles/" + name + "\"";
    }
    std::string consoleCall(const std::string& verb, const std::string& name = "app.mdl") const {
        return "[-h][" + home_.home() + "][-c][" + verb + " " + home_.home() + "/metafiles/" +
               name + "]";
    }
    std::vector<std::string> agentCalls() const { return home_.calls(kAgent); }

    /// Stops, changes and starts nothing.
    void expectNoRestart(const std::string& before) const {
        EXPECT_THAT(agentCalls(), IsEmpty());
        EXPECT_EQ(kumenvText(), before);
    }

    TaskHome home_;
    TraceCapture trace_{"ERROR (UNIT:zavtasks ALL)"};
};

// ---- Requests that succeed ----------------------------------------------------------------------

TEST_F(UaConfig, ImportsTheMetafile) {
    EXPECT_EQ(run({}), kSuccess);
    EXPECT_EQ(home_.dir().read("home/metafiles/app.mdl"), "//APPL\n");
    EXPECT_THAT(home_.calls(kConsole), ElementsAre(consoleCall("DELETE"), consoleCall("IMPORT")));
    EXPECT_EQ(home_.input(kConsole), "");
    expectNoRestart("*kumenv\n|DATAPROVIDER|SNMP|\n");
    EXPECT_EQ(trace_.count('D', "Context [] port (optional) [] restart (1=true) [0]"), 1);
    EXPECT_EQ(trace_.count('D', "Import of MDL file [app.mdl] successfull"), 1);
    EXPECT_EQ(trace_.count('D', "Return code is 0"), 1);
    EXPECT_THAT(trace_.errors(), IsEmpty());
}

TEST_F(UaConfig, SaysWhichDirectoriesItUses) {
    run({});
    const std::string base = home_.home() + "/agtqvs6/li6263/um";
    EXPECT_THAT(trace_.details("zavtasks"),
                IsSupersetOf({"UA Base Dir is [" + base + "/]", "UA Bin Dir is [" + base + "/bin/]",
                              "UA Work Dir is [" + workPath() + "]",
                              "UA Scripts Dir is [" + home_.home() + "/work/scripts]",
                              "UA RB Dir is [" + home_.home() + "/rb]"}));
}

TEST_F(UaConfig, MakesTheScriptsExecutable) {
    Request request;
    request.scripts = "one.sh,two.sh";
    EXPECT_EQ(run(request), kSuccess);
    for (const char* name : {"one", "two"}) {
        const std::string path = home_.home() + "/work/scripts/" + name + ".sh";
        struct stat status {};
        ASSERT_EQ(::stat(path.c_str(), &status), 0);
        EXPECT_EQ(status.st_mode & 07777u, 0755u);
        EXPECT_EQ(home_.dir().read("home/work/scripts/" + std::string(name) + ".sh"),
                  std::string(name) + "\n");
        EXPECT_EQ(trace_.count('D', "Settings permissions on script file [" + path + "] to [493]"),
                  1);
    }
}

TEST_F(UaConfig, AScriptsModeNeedNotChange) {
    Request request;
    request.scripts = "one.sh";
    changingModesFails = true;
    const Outcome outcome = run(request);
    changingModesFails = false;
    EXPECT_EQ(outcome, kSuccess);
    EXPECT_EQ(trace_.count('E', "Failed to set permissions on file [" + home_.home() +
                                    "/work/scripts/one.sh] to [493]"),
              1);
}

TEST_F(UaConfig, NamesMayHaveBlanks) {
    home_.dir().write("depot/my app.mdl", "");
    home_.dir().write("depot/my script.sh", "");
    Request request;
    request.metafile = "my app.mdl";
    request.scripts = "my script.sh";
    EXPECT_EQ(run(request), kSuccess);
    EXPECT_TRUE(home_.dir().exists("home/work/scripts/my script.sh"));
    EXPECT_THAT(home_.calls(kConsole), ElementsAre(consoleCall("DELETE", "my app.mdl"),
                                                   consoleCall("IMPORT", "my app.mdl")));
}

TEST_F(UaConfig, WithoutFilesThereIsNothingToDo) {
    Request request;
    request.metafile = "";
    EXPECT_EQ(run(request), kSuccess);
    EXPECT_EQ(trace_.count('E', "UA SetConfig called but no MDL or Script files specified"), 1);
    EXPECT_EQ(trace_.count('D', "Return code is 0"), 0);
    EXPECT_THAT(home_.calls("bin/cinfo"), IsEmpty());
}

TEST_F(UaConfig, ScriptsWithoutAMetafileAreNotCopied) {
    Request request;
    request.metafile = "";
    request.scripts = "one.sh";
    EXPECT_EQ(run(request), kSuccess);
    EXPECT_FALSE(home_.dir().exists("home/work/scripts/one.sh"));
    EXPECT_THAT(home_.calls(kConsole), IsEmpty());
    EXPECT_EQ(trace_.count('D', "Return code is 0"), 1);
}

TEST_F(UaConfig, WhatTheConsoleSaysToADeletionDoesNotMatter) {
    console("[ $verb != DELETE ] || exit 8");
    EXPECT_EQ(run({}), kSuccess);
    EXPECT_THAT(home_.calls(kConsole), ElementsAre(consoleCall("DELETE"), consoleCall("IMPORT")));
}

// ---- Options ------------------------------------------------------------------------------------

TEST_F(UaConfig, TheConsoleIsGivenItsSettings) {
    Request request;
    request.context = "PORT=7700";
    EXPECT_EQ(run(request), kSuccess);
    EXPECT_THAT(home_.environment(kConsole),
                testing::UnorderedElementsAre(
                    "KUM_PRODSPEC_PATH=" + workPath() + "/", "KUMP_RB_PATH=" + home_.home() + "/rb",
                    "KUMP_DPCONSOLE_NOCONFIRM=Y", "KUMP_DPCONSOLE_PORT=7700"));
    EXPECT_THAT(trace_.details("zavtasks"),
                IsSupersetOf({"Environment variable 1 - KUM_PRODSPEC_PATH=" + workPath() + "/",
                              "Environment variable 2 - KUMP_RB_PATH=" + home_.home() + "/rb",
                              std::string("Environment variable 3 - KUMP_DPCONSOLE_NOCONFIRM=Y"),
                              std::string("Environment variable 4 - KUMP_DPCONSOLE_PORT=7700")}));
}

TEST_F(UaConfig, WithoutAPortTheConsoleIsGivenNone) {
    EXPECT_EQ(run({}), kSuccess);
    EXPECT_THAT(home_.environment(kConsole), testing::SizeIs(3));
}

TEST_F(UaConfig, OptionsAreReadInAnyCase) {
    struct Case {
        const char* context;
        const char* options;
    };
    for (const Case& c :
         {Case{"port=7700,restart=y",
               "[PORT=7700,RESTART=Y] port (optional) [7700] restart (1=true) [1]"},
          Case{" RESTART=y ", "[RESTART=Y] port (optional) [] restart (1=true) [1]"},
          Case{"RESTART=N", "[RESTART=N] port (optional) [] restart (1=true) [0]"},
          Case{"RESTART=YES", "[RESTART=YES] port (optional) [] restart (1=true) [0]"},
          Case{"RESTART=,PORT=", "[RESTART=,PORT=] port (optional) [] restart (1=true) [0]"},
          Case{"PORT,RESTART", "[PORT,RESTART] port (optional) [] restart (1=true) [0]"},
          Case{"my port=1,the restart=y",
               "[MY PORT=1,THE RESTART=Y] port (optional) [1] restart (1=true) [1]"},
          Case{"PORT=1=2,PORT=3=4",
               "[PORT=1=2,PORT=3=4] port (optional) [3=4] restart (1=true) [0]"},
          Case{"X=PORT=5", "[X=PORT=5] port (optional) [PORT=5] restart (1=true) [0]"},
          Case{",,=,", "[,,=,] port (optional) [] restart (1=true) [0]"},
          Case{"  \n ", "[] port (optional) [] restart (1=true) [0]"}}) {
        trace_.clear();
        consoleWithType("SNMP");
        Request request;
        request.context = c.context;
        EXPECT_EQ(run(request), kSuccess) << c.context;
        EXPECT_EQ(trace_.count('D', std::string("Context ") + c.options), 1) << c.context;
    }
}

// ---- Restarting with another data provider ------------------------------------------------------

TEST_F(UaConfig, AddsTheDataProviderOfTheMetafile) {
    consoleWithType(" sock \\n");
    Request request;
    request.context = "restart=y,port=7700";
    EXPECT_EQ(run(request), kSuccess);
    EXPECT_THAT(home_.calls(kConsole), ElementsAre(consoleCall("getdptype"), consoleCall("DELETE"),
                                                   consoleCall("IMPORT")));
    EXPECT_THAT(agentCalls(), ElementsAre("[-h][" + home_.home() + "][-c][stop][um]",
                                          "[-h][" + home_.home() + "][start][um]"));
    EXPECT_EQ(kumenvText(), "*kumenv\n|DATAPROVIDER|SNMP,SOCK|\n");
    EXPECT_EQ(trace_.count('D', "DPTYPE for metafile [app.mdl] is [SOCK]"), 1);
    EXPECT_EQ(trace_.count('D', "Adding [SOCK] to startup parms of [SNMP]"), 1);
    EXPECT_THAT(trace_.errors("zavtasks"), IsEmpty());
}

TEST_F(UaConfig, AddsItForTheInstanceThatTheTargetNames) {
    configure({{"KUMA_STARTUP_DP", "asfs,snmp"}}, "um_inst1.config");
    startupParameters("|DATAPROVIDER|ASFS|\ninst1|DATAPROVIDER|ASFS|\n");
    consoleWithType("odbc");
    Request request;
    request.context = "RESTART=Y";
    request.target = "inst1:hostA:UA";
    EXPECT_EQ(run(request), kSuccess);
    EXPECT_EQ(kumenvText(), "|DATAPROVIDER|ASFS|\ninst1|DATAPROVIDER|ASFS,SNMP,ODBC|\n");
    EXPECT_THAT(agentCalls(), ElementsAre("[-h][" + home_.home() + "][-c][-o][inst1][stop][um]",
                                          "[-h][" + home_.home() + "][-o][inst1][start][um]"));
}

TEST_F(UaConfig, ReplacesEveryMarkedLine) {
    startupParameters("|DATAPROVIDER|1|\nx\n|DATAPROVIDER|2|");
    consoleWithType("ODBC");
    EXPECT_EQ(runWithRestart(), kSuccess);
    EXPECT_EQ(kumenvText(), "|DATAPROVIDER|SNMP,ODBC|\nx\n|DATAPROVIDER|SNMP,ODBC|\n");
}

TEST_F(UaConfig, StartsAgainWithoutAMarkedLine) {
    startupParameters("x\n");
    consoleWithType("ODBC");
    EXPECT_EQ(runWithRestart(), kSuccess);
    EXPECT_EQ(kumenvText(), "x\n");
    EXPECT_THAT(agentCalls(), testing::SizeIs(2));
}

TEST_F(UaConfig, FourTypesArePartOfTheCombinedOne) {
    configure({{"KUMA_STARTUP_DP", "'SNMP,asfs'"}});
    for (const char* type : {"APIS", "SOCK", "FILE", "SCRP"}) {
        trace_.clear();
        consoleWithType(type);
        EXPECT_EQ(runWithRestart(), kSuccess);
        EXPECT_EQ(trace_.count('D', std::string("DPtype [") + type + "] is part of dptype [ASFS]"),
                  1);
        EXPECT_EQ(trace_.count('D', "DPtype [ASFS] already in startup parms list [SNMP,ASFS]"), 1);
    }
    expectNoRestart("*kumenv\n|DATAPROVIDER|SNMP|\n");
}

TEST_F(UaConfig, OtherTypesAreNotPartOfTheCombinedOne) {
    configure({{"KUMA_STARTUP_DP", "ASFS"}});
    consoleWithType("ODBC");
    EXPECT_EQ(runWithRestart(), kSuccess);
    EXPECT_EQ(kumenvText(), "*kumenv\n|DATAPROVIDER|ASFS,ODBC|\n");
}

TEST_F(UaConfig, ATypeInTheListCausesNoRestart) {
    configure({{"KUMA_STARTUP_DP", "'xsocky'"}});
    consoleWithType("sock");
    EXPECT_EQ(runWithRestart(), kSuccess);
    expectNoRestart("*kumenv\n|DATAPROVIDER|SNMP|\n");
    EXPECT_EQ(trace_.count('D', "DPtype [SOCK] already in startup parms list [XSOCKY]"), 1);
    EXPECT_THAT(home_.calls(kConsole), testing::SizeIs(3));
}

TEST_F(UaConfig, TheListMayBeMissing) {
    for (const char* value : {"", "''"}) {
        configure({{"KUMA_STARTUP_DP", value}});
        consoleWithType("SOCK");
        EXPECT_EQ(runWithRestart(), kSuccess) << value;
        EXPECT_EQ(kumenvText(), "*kumenv\n|DATAPROVIDER|,SOCK|\n");
    }
    EXPECT_EQ(trace_.count('E', "No value found for KUMA_STARTUP_DP"), 1);
}

TEST_F(UaConfig, TheTypeMayBeNothing) {
    for (const char* printed : {"", "\\n", "\\n\\n \\n"}) {
        consoleWithType(printed);
        EXPECT_EQ(runWithRestart(), kSuccess) << printed;
        EXPECT_EQ(kumenvText(), "*kumenv\n|DATAPROVIDER|SNMP,|\n");
    }
}

TEST_F(UaConfig, TheConsoleMayPrintEightMegabytes) {
    console("head -c 8388608 /dev/zero | tr '\\0' x");
    const TraceCapture quiet("ERROR");
    EXPECT_EQ(runWithRestart(), kSuccess);
    EXPECT_THAT(agentCalls(), testing::SizeIs(2));
}

// ---- Configuration files ------------------------------------------------------------------------

TEST_F(UaConfig, TheInstanceInLowerCaseIsTriedToo) {
    configure({}, "um_inst1.config");
    startupParameters("inst1|DATAPROVIDER|SNMP|\n");
    consoleWithType("SOCK");
    Request request;
    request.context = "RESTART=Y";
    request.target = "INST1:hostA:UA";
    EXPECT_EQ(run(request), kSuccess);
    EXPECT_EQ(kumenvText(), "inst1|DATAPROVIDER|SNMP,SOCK|\n");
    EXPECT_THAT(agentCalls(),
                testing::Contains("[-h][" + home_.home() + "][-o][inst1][start][um]"));
}

TEST_F(UaConfig, TheInstanceAsItIsNamedComesFirst) {
    configure({}, "um_INST1.config");
    configure({{"KUMP_META_PATH", ""}}, "um_inst1.config");
    Request request;
    request.target = "INST1:hostA:UA";
    EXPECT_EQ(run(request), kSuccess);
}

TEST_F(UaConfig, TheInstanceInUpperCaseIsNotTried) {
    configure({}, "um_INST1.config");
    Request request;
    request.target = "Inst1:hostA:UA";
    EXPECT_EQ(run(request), (Outcome{1020, "ZAV1020E", configFile("um_inst1.config") + ",inst1"}));
    EXPECT_EQ(trace_.count('E', "ZAV1020E Configuration file [" + configFile("um_inst1.config") +
                                    "] for instance (optional) [inst1] does not exist"),
              1);
    EXPECT_EQ(trace_.count('D', "Return code is 1020"), 0);
}

TEST_F(UaConfig, TheDefaultInstanceNeedsItsFile) {
    std::filesystem::remove(configFile());
    EXPECT_EQ(run({}), (Outcome{1020, "ZAV1020E", configFile() + ","}));
}

TEST_F(UaConfig, ThreeKeysMustHaveValues) {
    struct Case {
        const char* key;
        Outcome outcome;
    };
    for (const Case& c :
         {Case{"KUMP_META_PATH", {1011, "ZAV1011E", "KUMP_META_PATH," + configFile()}},
          Case{"KUM_WORK_PATH", {1012, "ZAV1012E", "KUM_WORK_PATH," + configFile()}},
          Case{"KUMP_RB_PATH", {1013, "ZAV1013E", "KUMP_RB_PATH," + configFile()}}}) {
        configure({{c.key, ""}});
        EXPECT_EQ(run({}), c.outcome);
        EXPECT_EQ(trace_.count('E', c.outcome.messageId + " No value found for [" + c.key +
                                        "] in config file [" + configFile() + "]"),
                  1);
        EXPECT_EQ(trace_.count('D', "Return code is " + std::to_string(c.outcome.rc)), 0);
    }
    configure({{"KUMP_META_PATH", ""}, {"KUM_WORK_PATH", ""}, {"KUMP_RB_PATH", ""}});
    EXPECT_EQ(run({}).rc, 1011);
    EXPECT_THAT(home_.calls("bin/cinfo"), IsEmpty());
}

TEST_F(UaConfig, TheLastOfSeveralValuesCounts) {
    home_.dir().makeDir("home/other");
    configure({{"LATER", "1\r\nKUMP_META_PATH=" + home_.home() + "/other"}});
    EXPECT_EQ(run({}), kSuccess);
    EXPECT_TRUE(home_.dir().exists("home/other/app.mdl"));
}

TEST_F(UaConfig, TheWorkPathNeedsAParent) {
    for (const char* path : {"work", "/work", "''"}) {
        configure({{"KUM_WORK_PATH", path}});
        const std::string value = std::string(path) == "''" ? "" : path;
        EXPECT_EQ(run({}),
                  (Outcome{1021, "ZAV1021E", "KUM_WORK_PATH," + value + "," + configFile()}));
        EXPECT_EQ(trace_.count('E', "ZAV1021E Work directory [" + value +
                                        "] from tag [%] in config file [" + configFile() +
                                        "] cannot be parsed, no dir separator"),
                  1);
    }
    EXPECT_EQ(trace_.count('D', "Return code is 1021"), 0);
}

TEST_F(UaConfig, TheProductMustBeInstalled) {
    for (const char* report :
         {"", "\n", "Platform codes:", "Platform codes:\nli6263 Product (ux)\n"}) {
        trace_.clear();
        home_.inventory("", report);
        EXPECT_EQ(run({}), (Outcome{1019, "ZAV1019E", "um"})) << report;
        EXPECT_EQ(trace_.count('E', "ZAV1019E Supplied product code [um] is not installed"), 1);
        EXPECT_EQ(trace_.count('D', "Return code is 1019"), 0);
    }
    Request request;
    request.product = "UM";
    EXPECT_EQ(run(request), (Outcome{1019, "ZAV1019E", "UM"}));
}

// ---- Failures of copying ------------------------------------------------------------------------

TEST_F(UaConfig, AMetafileThatIsNotInTheDepotIsAFailure) {
    Request request;
    request.metafile = "none.mdl";
    request.scripts = "one.sh";
    EXPECT_EQ(run(request), (Outcome{1014, "ZAV1014E",
                                     home_.depot() + "none.mdl," + home_.home() + "/metafiles"}));
    EXPECT_EQ(trace_.count('E', "ZAV1014E Failed to copy MDL file " + home_.depot() +
                                    "none.mdl to MDL directory " + home_.home() + "/metafiles"),
              1);
    EXPECT_EQ(trace_.count('D', "Return code is 1014"), 1);
    EXPECT_TRUE(home_.dir().exists("home/work/scripts/one.sh"));
    EXPECT_THAT(home_.calls(kConsole), IsEmpty());
}

TEST_F(UaConfig, APipeInPlaceOfAMetafileOrAScriptIsAFailureAtOnce) {
    ASSERT_EQ(::mkfifo(home_.dir().path("depot/pipe").c_str(), 0600), 0);
    Request request;
    request.metafile = "pipe";
    EXPECT_EQ(run(request),
              (Outcome{1014, "ZAV1014E", home_.depot() + "pipe," + home_.home() + "/metafiles"}));
    request.metafile = "app.mdl";
    request.scripts = "pipe";
    EXPECT_EQ(run(request), (Outcome{1015, "ZAV1015E",
                                     home_.depot() + "pipe," + home_.home() + "/work/scripts"}));
    EXPECT_THAT(home_.calls(kConsole), IsEmpty());
}

TEST_F(UaConfig, AMetafileDirectoryThatIsMissingIsAFailure) {
    configure({{"KUMP_META_PATH", home_.home() + "/none"}});
    EXPECT_EQ(run({}),
              (Outcome{1014, "ZAV1014E", home_.depot() + "app.mdl," + home_.home() + "/none"}));
}

TEST_F(UaConfig, TheFirstScriptThatFailsEndsTheCopying) {
    Request request;
    request.scripts = "one.sh,none.sh,two.sh";
    EXPECT_EQ(run(request), (Outcome{1015, "ZAV1015E",
                                     home_.depot() + "none.sh," + home_.home() + "/work/scripts"}));
    EXPECT_EQ(
        trace_.count('E', "ZAV1015E Failed to copy Script file " + home_.depot() +
                              "none.sh to scripts directory " + home_.home() + "/work/scripts"),
        1);
    EXPECT_EQ(trace_.count('D', "Return code is 1015"), 1);
    EXPECT_TRUE(home_.dir().exists("home/metafiles/app.mdl"));
    EXPECT_TRUE(home_.dir().exists("home/work/scripts/one.sh"));
    EXPECT_FALSE(home_.dir().exists("home/work/scripts/two.sh"));
    EXPECT_THAT(home_.calls(kConsole), IsEmpty());
}

TEST_F(UaConfig, AScriptsFailureIsReportedBeforeTheMetafiles) {
    Request request;
    request.metafile = "none.mdl";
    request.scripts = "none.sh";
    EXPECT_EQ(run(request), (Outcome{1015, "ZAV1015E",
                                     home_.depot() + "none.sh," + home_.home() + "/work/scripts"}));
    EXPECT_THAT(trace_.errors("zavtasks"), testing::SizeIs(2));
}

// ---- Failures of the console --------------------------------------------------------------------

TEST_F(UaConfig, AConsoleThatCannotRunFailsAtTheFirstVerb) {
    home_.notExecutable(kConsole);
    EXPECT_EQ(run({}), (Outcome{1017, "ZAV1017E", consoleCommand("DELETE")}));
    EXPECT_EQ(trace_.count('E', "ZAV1017E Failed to start DELETE command [" +
                                    consoleCommand("DELETE") + "]"),
              1);
    EXPECT_EQ(trace_.count('D', "Return code is 1017"), 1);
    EXPECT_EQ(runWithRestart(), (Outcome{1022, "ZAV1022E", consoleCommand("getdptype")}));
    EXPECT_EQ(trace_.count('E', "ZAV1022E Failed to start GETDPTYPE command [" +
                                    consoleCommand("getdptype") + "]"),
              1);
    EXPECT_EQ(trace_.count('D', "Return code is 1022"), 0);
    EXPECT_TRUE(home_.dir().exists("home/metafiles/app.mdl"));
}

TEST_F(UaConfig, AConsoleThatIsMissingFailsAtTheFirstVerb) {
    std::filesystem::remove(home_.home() + "/" + kConsole);
    EXPECT_EQ(run({}), (Outcome{1017, "ZAV1017E", consoleCommand("DELETE")}));
    EXPECT_EQ(runWithRestart(), (Outcome{1022, "ZAV1022E", consoleCommand("getdptype")}));
}

TEST_F(UaConfig, AConsoleMayBeGoneWhenItIsToImport) {
    console("chmod 644 $0");
    EXPECT_EQ(run({}), (Outcome{1018, "ZAV1018E", consoleCommand("IMPORT")}));
    EXPECT_EQ(trace_.count('E', "ZAV1018E Failed to start IMPORT command [" +
                                    consoleCommand("IMPORT") + "]"),
              1);
    EXPECT_EQ(trace_.count('D', "Return code is 1018"), 1);
}

TEST_F(UaConfig, AConsoleThatKnowsNoTypeIsAFailure) {
    console("[ $verb != getdptype ] || { echo SOCK; exit 2; }");
    EXPECT_EQ(runWithRestart(), (Outcome{1023, "ZAV1023E", "app.mdl"}));
    EXPECT_EQ(trace_.count('E', "ZAV1023E Could not get DPTYPE from metafile [app.mdl]"), 1);
    EXPECT_EQ(trace_.count('D', "Return code is 1023"), 0);
    EXPECT_THAT(home_.calls(kConsole), ElementsAre(consoleCall("getdptype")));
    expectNoRestart("*kumenv\n|DATAPROVIDER|SNMP|\n");
}

TEST_F(UaConfig, AnImportThatFailsIsAFailure) {
    console("[ $verb != IMPORT ] || exit 1");
    EXPECT_EQ(run({}), (Outcome{1016, "ZAV1016E", "app.mdl"}));
    EXPECT_EQ(trace_.count('E', "ZAV1016E Import of MDL file [app.mdl] failed"), 1);
    EXPECT_EQ(trace_.count('D', "Return code is 1016"), 1);
}

TEST_F(UaConfig, AConsoleThatHangsIsAFailureOfItsVerb) {
    const ScopedEnv timeout("TIMEOUT", "1");
    const std::pair<const char*, int> verbs[] = {
        {"getdptype", 1022}, {"DELETE", 1017}, {"IMPORT", 1018}};
    for (const auto& [verb, code] : verbs) {
        console("[ $verb != " + std::string(verb) + " ] || exec sleep 20\necho SNMP");
        EXPECT_EQ(runWithRestart(),
                  (Outcome{code, "ZAV" + std::to_string(code) + "E", consoleCommand(verb)}));
    }
}

// ---- Failures of the restart --------------------------------------------------------------------

TEST_F(UaConfig, AnAgentThatDoesNotStopIsLeftAlone) {
    consoleWithType("SOCK");
    home_.program(kAgent, "exit 1");
    configure({}, "um_inst1.config");
    Request request;
    request.context = "RESTART=Y";
    request.target = "inst1:hostA:UA";
    EXPECT_EQ(run(request), (Outcome{1027, "ZAV1027E", "inst1"}));
    EXPECT_EQ(trace_.count('E', "ZAV1027E Failed to stop agent with instance (optional) [inst1]"),
              1);
    EXPECT_EQ(trace_.count('D', "Return code is 1027"), 0);
    EXPECT_THAT(agentCalls(), testing::SizeIs(1));
    EXPECT_EQ(kumenvText(), "*kumenv\n|DATAPROVIDER|SNMP|\n");
    EXPECT_THAT(home_.calls(kConsole), testing::SizeIs(1));

    std::filesystem::remove(home_.home() + "/" + kAgent);
    EXPECT_EQ(runWithRestart(), (Outcome{1027, "ZAV1027E", ""}));
}

TEST_F(UaConfig, StartupParametersThatCannotBeChangedLeaveTheAgentStopped) {
    consoleWithType("SOCK");
    startupParameters("");
    EXPECT_EQ(runWithRestart(), (Outcome{1028, "ZAV1028E", kumenv() + ",SNMP,SOCK"}));
    EXPECT_EQ(trace_.count('E', "ZAV1028E Failed to update the ua config file [" + kumenv() +
                                    "] to have new startup parms of [SNMP,SOCK]"),
              1);
    EXPECT_EQ(trace_.count('D', "Return code is 1028"), 0);
    EXPECT_THAT(agentCalls(), ElementsAre("[-h][" + home_.home() + "][-c][stop][um]"));

    std::filesystem::remove_all(home_.home() + "/config/.ConfigData");
    EXPECT_EQ(runWithRestart(), (Outcome{1028, "ZAV1028E", kumenv() + ",SNMP,SOCK"}));
}

TEST_F(UaConfig, ADirectoryInTheCopysPlaceIsAFailure) {
    consoleWithType("SOCK");
    std::filesystem::create_directory(kumenv() + ".copy");
    EXPECT_EQ(runWithRestart(), (Outcome{1028, "ZAV1028E", kumenv() + ",SNMP,SOCK"}));
    EXPECT_EQ(kumenvText(), "*kumenv\n|DATAPROVIDER|SNMP|\n");
}

TEST_F(UaConfig, AnAgentThatDoesNotStartIsAFailure) {
    consoleWithType("SOCK");
    home_.program(kAgent, "case \"$*\" in *start*) exit 1;; esac");
    EXPECT_EQ(runWithRestart(), (Outcome{1026, "ZAV1026E", ""}));
    EXPECT_EQ(trace_.count('E', "ZAV1026E Failed to start agent with instance (optional) []"), 1);
    EXPECT_EQ(trace_.count('D', "Return code is 1026"), 0);
    EXPECT_EQ(kumenvText(), "*kumenv\n|DATAPROVIDER|SNMP,SOCK|\n");
    EXPECT_THAT(home_.calls(kConsole), testing::SizeIs(1));
}

TEST_F(UaConfig, LeavesNothingOpenOrBehind) {
    consoleWithType("SOCK");
    EXPECT_EQ(runWithRestart(), kSuccess);
    const auto before = openDescriptors();
    EXPECT_EQ(runWithRestart(), kSuccess);
    startupParameters("");
    EXPECT_EQ(runWithRestart().rc, 1028);
    home_.notExecutable(kConsole);
    EXPECT_EQ(run({}).rc, 1017);
    EXPECT_EQ(openDescriptors(), before);
    EXPECT_FALSE(std::filesystem::exists(kumenv() + ".copy"));
}

}  // namespace
