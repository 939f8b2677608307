// The universal agent and its console.
#include <gmock/gmock.h>

#include <algorithm>

#include "home/home_fixture.h"

using ::testing::HasSubstr;
using ::testing::Not;

namespace {

class Console : public PreparedHomeTest {
protected:
    std::string metafile(const std::string& name = "disk.mdl",
                         const std::string& text =
                             "APPL=DISK\nDPTYPE=SCRP\nSOURCE=disk.sh\n"
                             "FIELDS=mount,used\n") const {
        write("universal/metafiles/" + name, text);
        return inHome("universal/metafiles/" + name);
    }
    /// The command and environment that a configuration request uses.
    Outcome console(const std::string& command, std::vector<std::string> more = {},
                    const std::string& input = "") const {
        more.push_back("KUM_PRODSPEC_PATH=" + inHome("universal/work") + "/");
        more.push_back("KUMP_RB_PATH=" + inHome("universal/rb"));
        return run({inHome("bin/um_console"), "-h", home(), "-c", command}, input, more);
    }
    Outcome confirmed(const std::string& command) const {
        return console(command, {"KUMP_DPCONSOLE_NOCONFIRM=Y"});
    }
};

TEST_F(Console, PrintsTheDataProviderType) {
    const Outcome type = confirmed("getdptype " + metafile());
    EXPECT_EQ(type.status, 0);
    EXPECT_EQ(type.out, "SCRP\n");
    EXPECT_EQ(confirmed("getdptype " + metafile("s.mdl", "* x\r\nAPPL=S\r\nDPTYPE=sock\r\n")).out,
              "SOCK\n");
}

TEST_F(Console, ImportsAndDeletes) {
    const std::string file = metafile();
    EXPECT_EQ(confirmed("DELETE " + file).status, 26);
    EXPECT_EQ(confirmed("IMPORT " + file).status, 0);
    EXPECT_EQ(read("universal/work/imported/disk.mdl"), read("universal/metafiles/disk.mdl"));
    EXPECT_EQ(read("universal/rb/DISK.properties"),
              "application=DISK\ntype=SCRP\nfields=mount,used\nmetafile=disk.mdl\n");
    EXPECT_EQ(confirmed("DELETE " + file).status, 0);
    EXPECT_FALSE(exists("universal/work/imported/disk.mdl"));
    EXPECT_FALSE(exists("universal/rb/DISK.properties"));
    EXPECT_TRUE(exists("universal/metafiles/disk.mdl"));
}

TEST_F(Console, WithoutEnvironmentTheConfiguredDirectoriesServe) {
    EXPECT_EQ(run({inHome("bin/um_console"), "-h", home(), "-c", "IMPORT " + metafile()}).status,
              0);
    EXPECT_TRUE(exists("universal/work/imported/disk.mdl"));
    EXPECT_TRUE(exists("universal/rb/DISK.properties"));
}

TEST_F(Console, AsksBeforeItChangesAnImport) {
    const std::string file = metafile();
    ASSERT_EQ(console("IMPORT " + file).status, 0) << "nothing is there to be replaced";
    EXPECT_EQ(console("IMPORT " + file).status, 27);
    EXPECT_EQ(console("DELETE " + file, {}, "n\n").status, 27);
    EXPECT_EQ(console("DELETE " + file, {"KUMP_DPCONSOLE_NOCONFIRM=N"}).status, 27);
    EXPECT_TRUE(exists("universal/work/imported/disk.mdl"));
    EXPECT_EQ(console("IMPORT " + file, {}, "y\n").status, 0);
    EXPECT_EQ(console("DELETE " + file, {}, "y").status, 0);
    EXPECT_FALSE(exists("universal/work/imported/disk.mdl"));
}

TEST_F(Console, MetafileThatIsNotThereIsNamed) {
    for (const char* verb : {"getdptype", "IMPORT"}) {
        const Outcome missing = confirmed(std::string(verb) + " " + inHome("none.mdl"));
        EXPECT_EQ(missing.status, 25);
        EXPECT_EQ(missing.out, "");
        EXPECT_THAT(missing.err, HasSubstr("none.mdl"));
    }
    EXPECT_EQ(confirmed("DELETE " + inHome("none.mdl")).status, 26);
    EXPECT_EQ(confirmed("IMPORT " + inHome("universal")).status, 25);
}

TEST_F(Console, InvalidMetafilesAreRefused) {
    for (const char* text :
         {"", "APPL=A\n", "DPTYPE=SOCK\n", "APPL=A\nDPTYPE=HTTP\n", "APPL=../A\nDPTYPE=SOCK\n",
          "APPL=A\nDPTYPE=SCRP\n", "APPL=A\nDPTYPE=FILE\nSOURCE=\n", "\x7f\x45LF\x01"}) {
        const std::string file = metafile("bad.mdl", text);
        EXPECT_EQ(confirmed("getdptype " + file).status, 23) << text;
        EXPECT_EQ(confirmed("IMPORT " + file).status, 23) << text;
    }
    EXPECT_FALSE(exists("universal/work/imported/bad.mdl"));
}

TEST_F(Console, PortHasToBeOne) {
    const std::string command = "getdptype " + metafile();
    EXPECT_EQ(console(command, {"KUMP_DPCONSOLE_PORT=7700"}).status, 0);
    for (const char* port : {"", "0", "65536", "abc", "-1", "1000000"}) {
        EXPECT_EQ(console(command, {"KUMP_DPCONSOLE_PORT=" + std::string(port)}).status, 1) << port;
    }
}

TEST_F(Console, WrongUsage) {
    const std::string program = inHome("bin/um_console");
    for (const std::vector<std::string>& words :
         std::vector<std::vector<std::string>>{{program},
                                               {program, "-h", home()},
                                               {program, "-h", home(), "-c"},
                                               {program, "-h", home(), "-c", ""},
                                               {program, "-h", home(), "-c", "IMPORT"},
                                               {program, "-h", home(), "-c", "IMPORT "},
                                               {program, "-h", home(), "-c", "import x"},
                                               {program, "-h", home(), "-c", "IMPORT ../.."}}) {
        EXPECT_EQ(run(words).status, 1) << ::testing::PrintToString(words);
    }
    EXPECT_EQ(run({program, "-h", "/nonexistent", "-c", "IMPORT x"}).status, 2);
}

TEST_F(Console, WorkDirectoryThatCannotBeWrittenIsNamed) {
    const Outcome failed =
        run({inHome("bin/um_console"), "-h", home(), "-c", "IMPORT " + metafile()}, "",
            {"KUM_PRODSPEC_PATH=/proc/nowhere/", "KUMP_RB_PATH=" + inHome("universal/rb")});
    EXPECT_EQ(failed.status, 8);
    EXPECT_THAT(failed.err, HasSubstr("/proc/nowhere/imported"));
}

class UniversalAgent : public Console {
protected:
    void SetUp() override {
        Console::SetUp();
        configure("FILE");
    }
    void configure(const std::string& providers, const std::string& more = "") const {
        write("config/um.config", "INSTANCE=\nKUM_WORK_PATH='" + inHome("universal/work") +
                                      "'\nKUMA_STARTUP_DP='" + providers +
                                      "'\nINTERVAL=1\nSTART_SECONDS=0\n" + more);
        std::filesystem::remove(inHome("config/.ConfigData/kumenv"));
    }
    void start() const {
        const Outcome started = agent({"start", "um"});
        ASSERT_EQ(started.status, 0) << started.err;
    }
    void stop() const { EXPECT_EQ(agent({"stop", "um"}).status, 0); }
    bool logged(const std::string& text) const {
        return eventually([&] { return read("logs/um.log").find(text) != std::string::npos; });
    }
    bool collected(const std::string& application, const std::string& text) const {
        return eventually([&] {
            return read("data/um/" + application + ".csv").find(text) != std::string::npos;
        });
    }
};

TEST_F(UniversalAgent, CollectsTheOutputOfScripts) {
    configure("SCRP");
    write("universal/scripts/disk.sh", "#!/bin/sh\necho /,17\necho /home,3\n", 0755);
    ASSERT_EQ(confirmed("IMPORT " + metafile()).status, 0);
    start();
    EXPECT_TRUE(collected("DISK", "Z,/,17\n"));
    EXPECT_TRUE(collected("DISK", "Z,/home,3\n"));
    EXPECT_EQ(read("data/um/DISK.csv").find("time,mount,used\n"), 0U);
    stop();
}

TEST_F(UniversalAgent, CollectsTheCompleteNewLinesOfFiles) {
    scratch.write("watched", "one\ntwo\nhal");
    ASSERT_EQ(confirmed("IMPORT " + metafile("f.mdl", "APPL=F\nDPTYPE=FILE\nSOURCE=" +
                                                          scratch.path("watched") + "\n"))
                  .status,
              0);
    start();
    EXPECT_TRUE(collected("F", "Z,two\n"));
    std::ofstream(scratch.path("watched"), std::ios::app) << "f\n";
    EXPECT_TRUE(collected("F", "Z,half\n"));
    scratch.write("watched", "new\n");
    EXPECT_TRUE(collected("F", "Z,new\n"));
    stop();
    const std::string rows = read("data/um/F.csv");
    EXPECT_EQ(std::count(rows.begin(), rows.end(), '\n'), 5) << rows;

    // What was read is not read again by the next start.
    start();
    std::ofstream(scratch.path("watched"), std::ios::app) << "last\n";
    EXPECT_TRUE(collected("F", "Z,last\n"));
    stop();
    const std::string more = read("data/um/F.csv");
    EXPECT_EQ(std::count(more.begin(), more.end(), '\n'), 6) << more;
}

TEST_F(UniversalAgent, NotesWhatItHasStoredBeforeItEnds) {
    // The whole process group is told to end while rows are being stored, or while that is being
    // noted.
    for (const char* ending :
         {"store_rows() { sed 's/^/stored /'; kill -TERM 0; }; replace_file() { cat >\"$1\"; }\n",
          "store_rows() { sed 's/^/stored /'; }; replace_file() { kill -TERM 0; cat >\"$1\"; "
          "}\n"}) {
        scratch.makeDir("offsets");
        const std::string watched = scratch.write("watched", "one\ntwo\nhal");
        const Outcome collected =
            run({"/usr/bin/setsid", "-w", "/bin/sh", "-c",
                 "set -u; . \"$1\"\n"
                 "end_agent() { echo ended; exit 0; }\n"
                 "config_value() { :; }\n" +
                     std::string(ending) +
                     "work=$2 notes=$2 import=f application=F data_source=$2/watched rows=$2/rows\n"
                     "collect_file; echo went on",
                 "sh", ZAV_SOURCE_DIR "/home/bundles/um/files/bin/collect.sh",
                 std::filesystem::path(watched).parent_path().string()});
        EXPECT_EQ(collected.out, "stored one\nstored two\nended\n") << ending << collected.err;
        EXPECT_EQ(scratch.read("offsets/f"), "8\n") << ending;
        std::filesystem::remove_all(scratch.path("offsets"));
    }
}

TEST_F(UniversalAgent, TypeThatWasNotStartedIsNotCollected) {
    write("universal/scripts/disk.sh", "#!/bin/sh\necho x\n", 0755);
    ASSERT_EQ(confirmed("IMPORT " + metafile()).status, 0);
    start();
    EXPECT_TRUE(logged("DISK: data provider SCRP is not started"));
    stop();
    EXPECT_FALSE(exists("data/um/DISK.csv"));
}

TEST_F(UniversalAgent, CombinedTypeStartsItsMembers) {
    configure("ASFS");
    write("universal/scripts/disk.sh", "#!/bin/sh\necho x\n", 0755);
    ASSERT_EQ(confirmed("IMPORT " + metafile()).status, 0);
    ASSERT_EQ(confirmed("IMPORT " + metafile("s.mdl", "APPL=S\nDPTYPE=SOCK\n")).status, 0);
    start();
    EXPECT_TRUE(collected("DISK", "Z,x\n"));
    EXPECT_TRUE(logged("S: no collector for SOCK"));
    stop();
}

TEST_F(UniversalAgent, ImportsAndDeletionsTakeEffectWhileItRuns) {
    configure("SCRP");
    write("universal/scripts/disk.sh", "#!/bin/sh\necho x\n", 0755);
    start();
    const std::string file = metafile();
    ASSERT_EQ(confirmed("IMPORT " + file).status, 0);
    EXPECT_TRUE(collected("DISK", "Z,x\n"));
    ASSERT_EQ(confirmed("DELETE " + file).status, 0);
    stop();
}

TEST_F(UniversalAgent, FollowsTheListOfDataProvidersThatItIsGiven) {
    write("config/.ConfigData/kumenv",
          "|PORT|1|\nother|DATAPROVIDER|APIS|\n|DATAPROVIDER|FILE,SCRP|\n");
    start();
    EXPECT_TRUE(logged("data providers FILE,SCRP"));
    EXPECT_TRUE(eventually([&] {
        return read("config/um.config").find("\nKUMA_STARTUP_DP='FILE,SCRP'\n") !=
               std::string::npos;
    }));
    EXPECT_THAT(read("config/um.config"), HasSubstr("INTERVAL=1\n"));
    stop();
}

TEST_F(UniversalAgent, InstanceHasItsOwnListAndConfiguration) {
    write("config/.ConfigData/kumenv", "|DATAPROVIDER|FILE|\nX|DATAPROVIDER|SOCK|\n");
    write("config/um_X.config",
          "INSTANCE=X\nKUM_WORK_PATH='" + inHome("universal/x/work") + "'\nSTART_SECONDS=0\n");
    ASSERT_EQ(agent({"start", "-o", "X", "um"}).status, 0);
    EXPECT_TRUE(eventually(
        [&] { return read("logs/um_X.log").find("data providers SOCK") != std::string::npos; }));
    EXPECT_TRUE(eventually([&] {
        return read("config/um_X.config").find("KUMA_STARTUP_DP='SOCK'\n") != std::string::npos;
    }));
    EXPECT_EQ(agent({"-c", "-o", "X", "stop", "um"}).status, 0);
    EXPECT_THAT(read("config/um.config"), HasSubstr("KUMA_STARTUP_DP='FILE'"));
}

TEST_F(UniversalAgent, InstanceWithoutAConfigurationDoesNotStart) {
    const Outcome started = agent({"start", "-o", "Y", "um"});
    EXPECT_EQ(started.status, 6);
    EXPECT_THAT(started.err, HasSubstr("no KUM_WORK_PATH"));
}

TEST_F(UniversalAgent, ScriptThatHangsIsEndedAndHoldsUpNoStop) {
    configure("SCRP", "SCRIPT_SECONDS=1\n");
    write("universal/scripts/disk.sh",
          "#!/bin/sh\necho $$ >>" + inHome("tmp/pid") + "\nexec sleep 600\n", 0755);
    ASSERT_EQ(confirmed("IMPORT " + metafile()).status, 0);
    start();
    EXPECT_TRUE(logged("ended with status 124"));
    stop();
    EXPECT_TRUE(eventually([&] {
        std::istringstream pids(read("tmp/pid"));
        for (pid_t pid; pids >> pid;) {
            if (lives(pid)) return false;
        }
        return true;
    }));
}

TEST_F(UniversalAgent, ScriptOutsideItsDirectoryIsNotRun) {
    configure("SCRP");
    scratch.script("evil.sh", "touch " + scratch.path("hacked") + "\n");
    ASSERT_EQ(confirmed("IMPORT " + metafile("e.mdl", "APPL=E\nDPTYPE=SCRP\nSOURCE=" +
                                                          scratch.path("evil.sh") + "\n"))
                  .status,
              0);
    start();
    EXPECT_TRUE(logged("E: no script " + inHome("universal/scripts/evil.sh")));
    stop();
    EXPECT_FALSE(scratch.exists("hacked"));
}

}  // namespace
