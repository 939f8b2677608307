// The guards of the universal agent's import.
#include <sys/stat.h>

#include <filesystem>

#include "host/guard/guard_fixture.h"
#include "host/guard/machine/import_options.h"

namespace fs = std::filesystem;

namespace {

class ImportGuard : public GuardTest {
protected:
    ImportGuard() {
        files.script("home/bin/um_console", "exit 0");
        files.write("depot/good.mdl", "APPL=X\n");
        files.write("depot/a.sh", "");
        files.write("depot/dir/b.sh", "");
        files.write("private", "secret");
    }

    Conditions import(const std::string& metafile, const std::string& scripts = "",
                      const std::string& context = "", const std::string& target = "") {
        return command("SETCONFIG", "um",
                       {{"UACONFIG", metafile},
                        {"UASCRIPT", scripts},
                        {"CONTEXT", context},
                        {"TARGETMSN", target}});
    }
    std::string of(const std::string& metafile, const std::string& scripts = "",
                   const std::string& context = "") {
        return refuser(import(metafile, scripts, context));
    }
    void link(const std::string& target, const std::string& name) {
        fs::create_symlink(target, files.path("depot/" + name));
    }
};

TEST_F(ImportGuard, LetsFilesOfTheDepotPass) {
    EXPECT_EQ(of("good.mdl"), "");
    EXPECT_EQ(of("good.mdl", "a.sh,dir/b.sh", "PORT=7701,RESTART=Y"), "");
    EXPECT_EQ(of("good.mdl", ",a.sh,,"), "") << "the plug-in takes a run of commas for one";
    link("dir/b.sh", "inside.sh");
    EXPECT_EQ(of("good.mdl", "inside.sh"), "");
}

TEST_F(ImportGuard, RefusesFilesThatTheDepotDoesNotHold) {
    EXPECT_EQ(
        refusalOf(import("absent.mdl")),
        "import 409: the depot holds no metafile \"absent.mdl\"; it holds a.sh, good.mdl; push "
        "it first");
    EXPECT_EQ(
        refusalOf(import("good.mdl", "a.sh,absent.sh")),
        "import 409: the depot holds no script \"absent.sh\"; it holds a.sh, good.mdl; push it "
        "first");
    EXPECT_EQ(of("good.mdl", "dir"), "import") << "a folder is no file";
    ASSERT_EQ(::mkfifo(files.path("depot/fifo").c_str(), 0600), 0);
    EXPECT_EQ(of("good.mdl", "fifo"), "import");
    EXPECT_EQ(
        refusalOf(import("dir/b.sh")),
        "import 409: the metafile \"dir/b.sh\" is in a folder of the depot, where the console "
        "does not find it; push it into the depot itself");
}

TEST_F(ImportGuard, RefusesNamesThatLeadOutOfTheDepot) {
    EXPECT_EQ(
        refusalOf(import("good.mdl", "a.sh,../private")),
        "import-names 400: the name \"../private\" leads out of the depot; name a file of the "
        "depot");
    for (const char* name : {"../private", "dir/../../private", "..", "dir/.."})
        EXPECT_EQ(of(name), "import-names") << name;
}

TEST_F(ImportGuard, RefusesLinksThatLeadOutOfTheDepotEvenBehindAnotherTask) {
    link("../private", "out");
    link(files.path("private"), "absolute");
    link("..", "up");
    accept("SETCONFIG", "um");
    EXPECT_EQ(
        refusalOf(import("good.mdl", "out")),
        "import-names 409: a link in \"out\" leads out of the depot; push the file itself into "
        "the depot");
    for (const char* name : {"absolute", "up/private"})
        EXPECT_EQ(of("good.mdl", name), "import-names") << name;
    EXPECT_EQ(of("absent.mdl"), "") << "the task in hand may still make it";
}

TEST_F(ImportGuard, RefusesNamesThatBreakTheConsolesCommandLine) {
    for (const char* name : {"a\"b", "a'b", "a\\", "a\nb", "a\x7F"}) {
        EXPECT_EQ(of(name), "import-names") << name;
        EXPECT_EQ(of("good.mdl", name), "import-names") << name;
    }
}

TEST_F(ImportGuard, RefusesAnImportOfNothing) {
    EXPECT_EQ(refusalOf(import("", "a.sh")),
              "import-names 400: without a metafile the universal agent is not configured; name a "
              "metafile of the depot in UACONFIG (zavctl: ua-config --metafile)");
    EXPECT_EQ(refuser(command("SETCONFIG", "UM", {{"CONTEXT", "X=1"}})), "import-names");
}

TEST_F(ImportGuard, RefusesPortsThatAreNone) {
    EXPECT_EQ(refusalOf(import("good.mdl", "", "PORT=0")),
              "import-names 400: the port \"0\" is no port; a port is a number from 1 to 65535");
    for (const char* port : {"65536", "x", "-1", "7700x", "99999999999999999999", " 7700"})
        EXPECT_EQ(of("good.mdl", "", std::string("restart=y,port=") + port), "import-names")
            << port;
}

TEST_F(ImportGuard, RefusesThePortOfAnotherInstance) {
    files.write("home/config/.ConfigData/kumenv",
                "|CONSOLEPORT|7700|\nother|CONSOLEPORT|7701|\n|DATAPROVIDER|7702|\n");
    EXPECT_EQ(of("good.mdl", "", "PORT=7700"), "") << "its own";
    EXPECT_EQ(of("good.mdl", "", "PORT=7702"), "") << "no port";
    EXPECT_EQ(refusalOf(import("good.mdl", "", "PORT=7701")),
              "import 409: port 7701 is the one of instance other; name the port of the instance "
              "itself, or none");
    EXPECT_EQ(refusalOf(import("good.mdl", "", "PORT=7700", "OTHER:host:UA")),
              "import 409: port 7700 is the one of the default instance; name the port of the "
              "instance itself, or none");
    EXPECT_EQ(refusalOf(import("good.mdl", "", "PORT=7701", "OTHER:host:UA")), "");
}

TEST_F(ImportGuard, RefusesWithoutAConsole) {
    const std::string console = files.path("home/bin/um_console");
    ASSERT_EQ(::chmod(console.c_str(), 0644), 0);
    const std::string refusal =
        "import 409: the home has no console that can be run, bin/um_console; install the "
        "universal "
        "agent";
    EXPECT_EQ(refusalOf(import("good.mdl")), refusal);
    fs::remove(console);
    EXPECT_EQ(refusalOf(import("good.mdl")), refusal);
}

TEST_F(ImportGuard, LooksAtNoOtherProduct) {
    EXPECT_EQ(refusalOf(command("SETCONFIG", "ux", {{"CONTEXT", "PORT=0"}})), "");
    EXPECT_EQ(refusalOf(command("GETCONFIG", "um")), "");
}

TEST(ImportOptions, AreReadAsThePluginReadsThem) {
    using Ports = std::vector<std::string>;
    EXPECT_EQ(host::portsIn(" port=7700,restart=y \n"), (Ports{"7700"}));
    EXPECT_EQ(host::portsIn("port=7700\f\v"), (Ports{"7700"}));
    EXPECT_EQ(host::portsIn("PORT=,RESTART=Y,"), Ports{});
    EXPECT_EQ(host::portsIn("PORT=1,XPORT=2=3"), (Ports{"1", "2=3"}));
    EXPECT_EQ(host::portsIn(""), Ports{});
    EXPECT_EQ(host::portNumber("65535"), 65535);
    EXPECT_EQ(host::portNumber("007"), 7);
    for (const char* text : {"", "0", "65536", "1 ", "+1"})
        EXPECT_EQ(host::portNumber(text), 0) << text;
}

}  // namespace
