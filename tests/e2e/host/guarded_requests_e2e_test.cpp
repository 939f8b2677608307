// Guards on requests: what they keep from happening, on real homes, and what happens without them.
// ctest-label: threaded

#include <gtest/gtest.h>
#include <sys/stat.h>
#include <sys/utsname.h>

#include <filesystem>
#include <nlohmann/json.hpp>

#include "support/host/managed_host.h"
#include "support/host/script_home.h"
#include "support/host/starter_home.h"

namespace fs = std::filesystem;

namespace {

using nlohmann::json;
using Guards = ManagedHost::Guards;
using Values = std::vector<std::pair<std::string, std::string>>;

json conditions(const Values& values) {
    json where = json::array();
    for (const auto& [column, value] : values)
        where.push_back({{"column", column}, {"op", "="}, {"value", value}});
    return where;
}

/// What the host answers to a query on the request table.
struct Reply {
    int status = 0;
    json body;

    std::string guard() const { return body.value("guard", ""); }
    /// Whether the plug-in accepted the command.
    bool accepted() const {
        return status == 200 && body["rows"].size() == 1 && body["rows"][0]["RETVAL"] == 0;
    }
};

Reply send(const ManagedHost& host, const json& where, bool force = false) {
    const std::string body = json{{"table", "KAGREQT"}, {"where", where}, {"force", force}}.dump();
    const std::string answer = host.exchange(
        "POST /v1/query HTTP/1.1\r\nHost: x\r\nConnection: close\r\nContent-Length: " +
            std::to_string(body.size()) + "\r\n\r\n" + body,
        std::chrono::seconds(60));
    const std::size_t head = answer.find("\r\n\r\n");
    if (head == std::string::npos) return {};
    return {std::atoi(answer.c_str() + 9), json::parse(answer.substr(head + 4), nullptr, false)};
}

Reply command(const ManagedHost& host, const std::string& name, const std::string& product,
              const Values& more = {}, bool force = false) {
    Values values = {{"COMMAND", name}, {"TRANSID", "t-" + name}, {"PRODUCT", product}};
    values.insert(values.end(), more.begin(), more.end());
    return send(host, conditions(values), force);
}

/// A home of scripts that has all the programs that a guarded host asks for.
class CompleteHome : public ScriptHome {
public:
    /// The translator does what the body says.
    explicit CompleteHome(const std::string& translatorBody) {
        products({"ux", "um"}, translatorBody);
        files().script("home/bin/uninstall.sh", "exit 0");
        files().script("home/bin/um_console", "exit 0");
        files().makeDir("home/tmp");
    }
    Environment environment() const { return {{"QVSDEPLOY_AGENTDEPOT", files().path("depot")}}; }
};

/// One whose translator knows the instance "inst1".
class TranslatorHome : public CompleteHome {
public:
    TranslatorHome()
        : CompleteHome("case \"$1 $2\" in '-i inst1:'*) echo inst1 ;; '-i '*) exit 21 ;; esac") {}

    /// Waits until the agent script has been called so often.
    bool awaitCalls(std::size_t count) const {
        return eventually([&] { return agentCalls().size() >= count; });
    }
};

// ---- Requests that act differently from how they read -------------------------------------------

TEST(GuardedRequests, ActAsTheyRead) {
    TranslatorHome home;
    json unequal = conditions({{"COMMAND", "STOP"}, {"TRANSID", "t"}, {"PRODUCT", "um"}});
    unequal[2]["op"] = "!=";
    const json twice =
        conditions({{"COMMAND", "STOP"}, {"TRANSID", "t"}, {"PRODUCT", "um"}, {"PRODUCT", "ux"}});
    const json result = conditions(
        {{"COMMAND", "STOP"}, {"TRANSID", "t"}, {"PRODUCT", "ux"}, {"RETMSGID", "ZAV1003E"}});
    {
        ManagedHost host(home.path(), home.environment(), {}, Guards::On);
        for (const json& where : {unequal, twice, result}) {
            const Reply reply = send(host, where);
            EXPECT_EQ(reply.status, 400) << where;
            EXPECT_EQ(reply.guard(), "conditions") << where;
            EXPECT_NE(reply.body.value("hint", ""), "") << where;
        }
        EXPECT_EQ(send(host, conditions({{"PRODCUT", "ux"}})).body.value("hint", ""),
                  "did you mean PRODUCT?");
    }
    EXPECT_EQ(home.agentCalls().size(), 0U);
    ManagedHost unguarded(home.path(), home.environment());
    std::size_t calls = 0;
    for (const json& where : {unequal, twice, result}) {
        EXPECT_EQ(send(unguarded, where).status, 200) << where;
        EXPECT_TRUE(home.awaitCalls(++calls)) << "it acts: " << where;
    }
    const Reply unknown = send(unguarded, conditions({{"PRODCUT", "ux"}}));
    EXPECT_EQ(unknown.status, 400);
    EXPECT_FALSE(unknown.body.contains("hint")) << unknown.body;
}

// ---- Text outside ASCII -------------------------------------------------------------------------

std::string repeated(const std::string& letter, int count) {
    std::string text;
    for (int i = 0; i < count; ++i)
        text += letter;
    return text;
}

/// Sets the configuration of the target `name`; what the translator got as its input.
std::string configured(const ManagedHost& host, const ScratchDir& inputs, const std::string& name,
                       const std::string& text) {
    const Reply reply = command(host, "SETCONFIG", "ux", {{"CONTEXT", text}, {"TARGETMSN", name}});
    EXPECT_EQ(reply.status, 200) << reply.body;
    const std::string file = "set." + name;
    EXPECT_TRUE(eventually([&] { return inputs.exists(file); })) << name;
    return inputs.read(file);
}

TEST(GuardedRequests, ConfigurationsOutsideAsciiArriveWhole) {
    const std::vector<std::string> texts = {"N=\u00e4", "N=" + repeated("\u00e4", 50),
                                            "N=" + repeated("\u20ac", 300),
                                            "N=\u00e4\U0001F600\u20ac end\nM=gr\u00fcn"};
    const ScratchDir inputs;
    const std::string input = inputs.path("set.") + "'$2";
    CompleteHome home("cat >'" + input + ".part && mv '" + input + ".part '" + input);
    {
        ManagedHost host(home.path(), home.environment(), {}, Guards::On);
        for (std::size_t i = 0; i < texts.size(); ++i)
            EXPECT_EQ(configured(host, inputs, "whole" + std::to_string(i), texts[i]), texts[i]);
        const ProgramResult set = host.zavctl({"config", "set", "ux", texts[1], "--target", "ctl"});
        EXPECT_EQ(set.status, 0) << set.out << set.err;
        EXPECT_EQ(inputs.read("set.ctl"), texts[1]);
        EXPECT_EQ(command(host, "STOP", "ux", {{"OPTIONAL", "gr\u00fcn"}}).guard(), "text");
    }
    ManagedHost unguarded(home.path(), home.environment());
    EXPECT_EQ(configured(unguarded, inputs, "one", texts[0]), texts[0]);
    EXPECT_EQ(configured(unguarded, inputs, "cut", texts[1]), "N=" + repeated("\u00e4", 25))
        << "room for one byte a letter and one more";
}

TEST(GuardedRequests, FilesWithNamesOutsideAsciiAreImported) {
    StarterHome home("um");
    const std::string metafile = "gr\u00fc\u00dfe \u20ac.mdl";
    const std::string script = "z\u00e4hl\u20ac.sh";
    home.files().write("home/depot/" + metafile,
                       "APPL=DISKS\nDPTYPE=SCRP\nSOURCE=" + script + "\nFIELDS=NAME,USED\n");
    home.files().write("home/depot/" + script, "#!/bin/sh\necho rootdisk,42\n");
    home.files().write("home/depot/plain.sh", "#!/bin/sh\n");
    const std::vector<std::string> import = {"ua-config", "--metafile", metafile, "--scripts",
                                             script + ",plain.sh," + script};
    {
        ManagedHost host(home.path(), home.environment(), {}, Guards::On);
        const ProgramResult result = host.zavctl(import);
        EXPECT_EQ(result.status, 0) << result.out << result.err;
    }
    EXPECT_TRUE(home.files().exists("home/universal/work/imported/" + metafile));
    struct stat status {};
    ASSERT_EQ(::stat(home.path("universal/scripts/" + script).c_str(), &status), 0);
    EXPECT_EQ(status.st_mode & 07777, 0755U);
    ManagedHost unguarded(home.path(), home.environment());
    EXPECT_EQ(unguarded.zavctl(import).status, 1);
}

// ---- Values -------------------------------------------------------------------------------------

TEST(GuardedRequests, ValuesStayOneWord) {
    TranslatorHome home;
    {
        ManagedHost host(home.path(), home.environment(), {}, Guards::On);
        EXPECT_EQ(command(host, "START", "ux -h /elsewhere").guard(), "values");
        EXPECT_EQ(command(host, "STOP", "ux", {{"TARGETMSN", "a\" -c \"id:host:UX"}}).guard(),
                  "values");
        EXPECT_EQ(
            command(host, "START", "ux", {{"TARGETMSN", "x -h /else"}, {"OPTIONAL", "INSTANCE"}})
                .status,
            400);
    }
    EXPECT_EQ(home.agentCalls().size(), 0U);
    ManagedHost unguarded(home.path(), home.environment());
    EXPECT_TRUE(command(unguarded, "START", "ux -h /elsewhere").accepted());
    ASSERT_TRUE(home.awaitCalls(1));
    EXPECT_EQ(home.agentCalls()[0], "-h " + home.path() + " start ux -h /elsewhere");
}

// ---- Products -----------------------------------------------------------------------------------

TEST(GuardedRequests, CommandsForAbsentProductsAreRefusedUnlessForced) {
    TranslatorHome home;
    const std::vector<std::string> names = {"START", "STOP", "RESTART", "UNINSTALL", "SETCONFIG"};
    {
        ManagedHost host(home.path(), home.environment(), {}, Guards::On);
        for (const std::string& name : names) {
            const Reply reply = command(host, name, "uz", {{"CONTEXT", "N=1"}});
            EXPECT_EQ(reply.status, 409) << name;
            EXPECT_EQ(reply.guard(), "product") << name;
            EXPECT_EQ(reply.body["error"],
                      "there is no product \"uz\" here; installed are lz, um, ux");
        }
        EXPECT_EQ(home.agentCalls().size(), 0U);
        EXPECT_TRUE(command(host, "STOP", "uz", {}, true).accepted());
        EXPECT_TRUE(home.awaitCalls(1)) << "forced";
        EXPECT_TRUE(command(host, "STOP", "ux").accepted());
        EXPECT_TRUE(home.awaitCalls(2)) << "it is there";
    }
    ManagedHost unguarded(home.path(), home.environment());
    EXPECT_TRUE(command(unguarded, "STOP", "uz").accepted());
    EXPECT_TRUE(home.awaitCalls(3));
}

TEST(GuardedRequests, AnInstallNeedsItsFolderOfTheDepot) {
    TranslatorHome home;
    home.files().makeDir("depot/ux/6.2");
    const auto install = [](const std::string& version) {
        return Values{{"VERSION", version}, {"CONTEXT", "/bin/touch |DEPLOYDIR|/done"}};
    };
    {
        ManagedHost host(home.path(), home.environment(), {}, Guards::On);
        const Reply reply = command(host, "INSTALL", "ux", install("6.3"));
        EXPECT_EQ(reply.status, 409);
        EXPECT_EQ(reply.guard(), "deploy-folder");
        EXPECT_EQ(reply.body["error"], "the depot has no folder ux/6.3; it has ux/6.2");
        EXPECT_TRUE(command(host, "INSTALL", "ux", install("6.2")).accepted());
        EXPECT_TRUE(eventually([&] { return home.files().exists("depot/ux/6.2/done"); }));
    }
    ManagedHost unguarded(home.path(), home.environment());
    EXPECT_TRUE(command(unguarded, "INSTALL", "ux", install("6.3")).accepted());
}

// ---- Targets ------------------------------------------------------------------------------------

/// The name of this machine as managed system names have it.
std::string thisMachine() {
    utsname names{};
    if (::uname(&names) != 0) return "";
    const std::string name = names.nodename;
    return name.substr(0, name.find('.'));
}

TEST(GuardedRequests, ATypingSlipStopsNoOtherInstance) {
    StarterHome home("ux");
    {
        ManagedHost host(home.path(), home.environment(), {}, Guards::On);
        ASSERT_EQ(host.zavctl({"start", "ux"}).status, 0);
        const Reply reply = command(host, "STOP", "ux", {{"TARGETMSN", "typo:UX"}});
        EXPECT_EQ(reply.status, 409);
        EXPECT_EQ(reply.guard(), "target");
        EXPECT_NE(reply.body.value("hint", "").find(":UX"), std::string::npos);
        EXPECT_EQ(command(host, "REMOVEINSTANCE", "ux", {{"TARGETMSN", "typo:UX"}}).guard(),
                  "target");
        const std::string here = thisMachine();
        for (const std::string& target :
             {"db1:" + here + ":UY", here + ":UM", "a:b:" + here + ":UX"})
            EXPECT_EQ(command(host, "STOP", "ux", {{"TARGETMSN", target}}).guard(), "target")
                << target;
        EXPECT_TRUE(home.runs("ux"));
    }
    ManagedHost unguarded(home.path(), home.environment());
    for (const char* const target : {"typo:UX", "db1:elsewhere:UY"}) {
        if (!home.runs("ux")) {
            ASSERT_EQ(unguarded.zavctl({"start", "ux"}).status, 0);
        }
        EXPECT_TRUE(command(unguarded, "STOP", "ux", {{"TARGETMSN", target}}).accepted());
        EXPECT_TRUE(eventually([&] { return !home.runs("ux"); })) << "the default instance";
    }
}

TEST(GuardedRequests, TargetsThatAreKnownPass) {
    StarterHome home("ux");
    Environment environment = home.environment();
    ManagedHost host(home.path(), environment, {"--origin-node", "node7"}, Guards::On);
    EXPECT_EQ(host.zavctl({"config", "set", "ux", "INTERVAL=9", "--target", "new:node7:UX"}).status,
              0)
        << "a new instance";
    EXPECT_EQ(host.zavctl({"start", "ux", "--target", "new:node7:UX"}).status, 0);
    EXPECT_TRUE(home.runs("ux_new"));
    EXPECT_EQ(host.zavctl({"start", "ux", "--target", "node7:UX"}).status, 0);
    EXPECT_TRUE(home.runs("ux"));
    EXPECT_EQ(host.zavctl({"start", "ux", "--instance", "third"}).status, 0);
    EXPECT_TRUE(home.runs("ux_third"));
}

// ---- The list of run-as users -------------------------------------------------------------------

/// Where the list is in a home.
std::string runAsList() {
    struct utsname names {};
    ::uname(&names);
    const std::string node = names.nodename;
    return "home/config/" + node.substr(0, node.find('.')) + "_zavrunas.cfg";
}

TEST(GuardedRequests, StartNothingWhileTheListOfRunAsUsersIsDamaged) {
    TranslatorHome home;
    const std::string list = runAsList();
    {
        ManagedHost host(home.path(), home.environment(), {}, Guards::On);
        home.files().write(list, "<runas><agent>");  // a whole one is a condition of the start
        for (const char* name : {"START", "RESTART"}) {
            const Reply reply = command(host, name, "ux");
            EXPECT_EQ(reply.status, 409) << name;
            EXPECT_EQ(reply.guard(), "run-as") << name;
            EXPECT_NE(reply.body.value("error", "").find(list), std::string::npos) << name;
        }
        EXPECT_TRUE(command(host, "STOP", "ux").accepted());
        EXPECT_TRUE(home.awaitCalls(1));
        home.files().write(list, "<runas></runas>");
        EXPECT_TRUE(command(host, "START", "ux").accepted());
        EXPECT_TRUE(home.awaitCalls(2));
    }
    home.files().write(list, "<runas><agent>");
    ManagedHost unguarded(home.path(), home.environment());
    EXPECT_TRUE(command(unguarded, "START", "ux").accepted());
    EXPECT_TRUE(home.awaitCalls(3)) << "as the host's user";
}

// ---- When a guard is asked ----------------------------------------------------------------------

TEST(GuardedRequests, AnInstallAndAStartOfTheSameProductCanBeSentTogether) {
    StarterHome home("um");
    const std::string version = home.makeBundle("ux", home.files().path("bundle"));
    home.files().makeDir("home/depot/ux");
    fs::rename(home.files().path("bundle"), home.path("depot/ux/" + version));
    ManagedHost host(home.path(), home.environment(), {}, Guards::On);
    EXPECT_EQ(command(host, "START", "ux").guard(), "product") << "it is not there yet";
    EXPECT_TRUE(command(host, "INSTALL", "ux",
                        {{"VERSION", version},
                         {"CONTEXT", "/bin/sh |DEPLOYDIR|/install.sh -h |TOVRINHOME|"}})
                    .accepted());
    EXPECT_TRUE(command(host, "START", "ux").accepted());
    EXPECT_EQ(command(host, "START", "uz").guard(), "product") << "nothing waits for this one";
    EXPECT_TRUE(eventually([&] { return home.runs("ux"); }));
}

// ---- Imports ------------------------------------------------------------------------------------

/// A home with a universal agent whose console writes down how it was called.
class ImportHome : public TranslatorHome {
public:
    ImportHome() {
        files().makeDir("ua/meta");
        files().makeDir("ua/scripts");
        files().write("home/config/um.config", "KUMP_META_PATH=" + files().path("ua/meta") +
                                                   "\nKUM_WORK_PATH=" + files().path("ua/work") +
                                                   "\nKUMP_RB_PATH=" + files().path("ua/rb") +
                                                   "\nKUMA_STARTUP_DP=FILE\n");
        files().write("home/config/.ConfigData/kumenv",
                      "|DATAPROVIDER|FILE|\nother|CONSOLEPORT|7701|\n");
        files().script("home/bin/um_console",
                       "echo \"$4\" >>'" + files().path("console") +
                           "'\n[ \"${4%% *}\" != getdptype ] || echo scrp\n");
        files().write("depot/good.mdl", "APPL=X\n");
        files().write("private", "secret", 0600);
    }
};

Reply import(const ManagedHost& host, const std::string& metafile, const std::string& scripts,
             const std::string& context = "RESTART=Y") {
    return command(host, "SETCONFIG", "um",
                   {{"UACONFIG", metafile}, {"UASCRIPT", scripts}, {"CONTEXT", context}});
}

TEST(GuardedRequests, ImportsTakeFilesOfTheDepot) {
    ImportHome home;
    fs::create_symlink("../private", home.files().path("depot/link"));
    {
        ManagedHost host(home.path(), home.environment(), {}, Guards::On);
        EXPECT_EQ(import(host, "good.mdl", "../private").guard(), "import-names");
        EXPECT_EQ(import(host, "good.mdl", "link").guard(), "import-names");
        EXPECT_EQ(import(host, "go\"od.mdl", "").guard(), "import-names");
        EXPECT_EQ(import(host, "good.mdl", "", "PORT=70000").guard(), "import-names");
        EXPECT_EQ(import(host, "", "").guard(), "import-names");
    }
    EXPECT_FALSE(home.files().exists("ua/scripts/private"));
    ManagedHost unguarded(home.path(), home.environment());
    EXPECT_TRUE(import(unguarded, "good.mdl", "../private").accepted());
    ASSERT_TRUE(eventually([&] { return home.files().exists("console"); }));
    struct stat status {};
    ASSERT_EQ(::stat(home.files().path("ua/scripts/private").c_str(), &status), 0);
    EXPECT_EQ(status.st_mode & 07777, 0755U);
}

TEST(GuardedRequests, AnImportThatWouldFailStopsNothing) {
    ImportHome home;
    const std::string console = home.path() + "/bin/um_console";
    {
        ManagedHost host(home.path(), home.environment(), {}, Guards::On);
        EXPECT_EQ(import(host, "absent.mdl", "").guard(), "import");
        EXPECT_EQ(import(host, "good.mdl", "absent.sh").guard(), "import");
        EXPECT_EQ(import(host, "good.mdl", "", "PORT=7701,RESTART=Y").guard(), "import");
        ASSERT_EQ(::chmod(console.c_str(), 0644), 0);
        EXPECT_EQ(import(host, "good.mdl", "").guard(), "import");
        ASSERT_EQ(::chmod(console.c_str(), 0755), 0);
    }
    EXPECT_FALSE(home.files().exists("console"));
    EXPECT_EQ(home.agentCalls().size(), 0U);
    ManagedHost unguarded(home.path(), home.environment());
    EXPECT_TRUE(import(unguarded, "good.mdl", "", "PORT=7701,RESTART=Y").accepted());
    EXPECT_TRUE(home.awaitCalls(2)) << "the agent is stopped and started";
}

}  // namespace
