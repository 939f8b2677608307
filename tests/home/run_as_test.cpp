// Agents of other users: what these may do, and that it leads to nothing of the home's owner.
#include <gmock/gmock.h>

#include <map>
#include <memory>

#include "home/home_fixture.h"

using ::testing::HasSubstr;

namespace {

constexpr uid_t kMember = 64001, kOther = 64002;
constexpr gid_t kGroup = 64100;

/// A home with a run-as group, made by root, in which "tt" is an agent that waits.
class RunAs : public HomeTest {
protected:
    void SetUp() override {
        if (::getuid() != 0) GTEST_SKIP() << "only root can become another user";
        ASSERT_EQ(::chmod(scratch.path().c_str(), 0755), 0);
        const Outcome made =
            prepare({"--arch", "lx8266", "--run-as-group", std::to_string(kGroup)});
        ASSERT_EQ(made.status, 0) << made.err;
        addProduct();
        // The owner's first start makes the lock.
        ASSERT_EQ(agent({"start", "tt"}).status, 0);
        ASSERT_EQ(agent({"stop", "tt"}).status, 0);
    }
    void addProduct() const {
        addAgent("tt", "exec sleep 600\n");
        write("registry/ttlx8266.ver",
              "ProdCode=tt\nDescription=t\nPlatform=lx8266\nVersion=010000000\nRelease=1\n");
    }
    using HomeTest::agent;
    /// Runs the words as that user, a member of the home's group and of no other.
    Outcome run(std::vector<std::string> words, uid_t user, gid_t group = kGroup) const {
        const std::vector<std::string> before{"/usr/bin/setpriv", "--reuid=" + std::to_string(user),
                                              "--regid=" + std::to_string(user),
                                              "--groups=" + std::to_string(group)};
        words.insert(words.begin(), before.begin(), before.end());
        return ::run(words);
    }
    Outcome agentAs(uid_t user, std::vector<std::string> words, gid_t group = kGroup) const {
        words.insert(words.begin(), {inHome("bin/TovrinAgent"), "-h", home()});
        return run(words, user, group);
    }
    std::string folderOf(uid_t user) const { return "users/" + std::to_string(user); }
    pid_t pidOf(const std::string& key, uid_t user) const {
        return pidIn(inHome(folderOf(user) + "/run/" + key + ".pid"));
    }
    static uid_t ownerOf(const std::string& path) {
        struct stat info {};
        return ::stat(path.c_str(), &info) == 0 ? info.st_uid : static_cast<uid_t>(-1);
    }
    Outcome uninstall() const { return ::run({inHome("bin/uninstall.sh"), "-i", "tt", "lx8266"}); }
};

TEST_F(RunAs, MemberStartsAndStopsAnAgentInFoldersOfItsOwn) {
    const Outcome started = agentAs(kMember, {"start", "tt"});
    ASSERT_EQ(started.status, 0) << started.err;
    const pid_t pid = pidOf("tt", kMember);
    EXPECT_EQ(ownerOf("/proc/" + std::to_string(pid)), kMember);
    for (const char* own : {"", "/run", "/logs", "/data"}) {
        struct stat info {};
        ASSERT_EQ(::stat(inHome(folderOf(kMember) + own).c_str(), &info), 0) << own;
        EXPECT_EQ(info.st_uid, kMember);
        EXPECT_EQ(info.st_mode & 0777U, 0700U) << own;
    }
    EXPECT_EQ(agentAs(kMember, {"start", "tt"}).status, 4);
    EXPECT_EQ(agentAs(kMember, {"-c", "stop", "tt"}).status, 0);
    EXPECT_FALSE(lives(pid));
    EXPECT_EQ(agentAs(kMember, {"-c", "stop", "tt"}).status, 5);
}

TEST_F(RunAs, UserWhoIsNoMemberStartsNothing) {
    EXPECT_EQ(agentAs(kMember, {"start", "tt"}, kMember).status, 8);
    EXPECT_FALSE(exists(folderOf(kMember)));
}

TEST_F(RunAs, RootStopsWhatAMemberHasStartedAndDoesNotStartItTwice) {
    ASSERT_EQ(agentAs(kMember, {"start", "tt"}).status, 0);
    const pid_t pid = pidOf("tt", kMember);
    EXPECT_EQ(agent({"start", "tt"}).status, 4);
    const Outcome stopped = agent({"stop", "tt"});
    EXPECT_EQ(stopped.status, 0);
    EXPECT_THAT(stopped.err, HasSubstr(std::to_string(kMember)));
    EXPECT_FALSE(lives(pid));
}

TEST_F(RunAs, MemberNeitherStopsNorDoublesWhatRootHasStarted) {
    ASSERT_EQ(agent({"start", "tt"}).status, 0);
    const pid_t pid = HomeTest::pidOf("tt");
    EXPECT_EQ(agentAs(kMember, {"stop", "tt"}).status, 7);
    EXPECT_EQ(agentAs(kMember, {"start", "tt"}).status, 4);
    EXPECT_TRUE(lives(pid));
    EXPECT_EQ(agent({"stop", "tt"}).status, 0);
}

TEST_F(RunAs, RemovingAnInstanceOrAProductReachesTheMembersFilesToo) {
    ASSERT_EQ(agentAs(kMember, {"start", "-o", "a", "tt"}).status, 0);
    const pid_t first = pidOf("tt_a", kMember);
    EXPECT_EQ(translate({"-r", "a:h:TT", "-pc", "tt"}).status, 0);
    EXPECT_FALSE(lives(first));
    EXPECT_FALSE(exists(folderOf(kMember) + "/logs/tt_a.log"));
    EXPECT_FALSE(exists(folderOf(kMember) + "/data/tt_a"));

    ASSERT_EQ(agentAs(kMember, {"start", "tt"}).status, 0);
    const pid_t second = pidOf("tt", kMember);
    const Outcome removed = uninstall();
    EXPECT_EQ(removed.status, 0) << removed.err;
    EXPECT_FALSE(lives(second));
    EXPECT_FALSE(exists(folderOf(kMember) + "/logs/tt.log"));
    EXPECT_FALSE(exists(folderOf(kMember) + "/data/tt"));
}

TEST_F(RunAs, MemberReadsTheConfigurationButNeverWritesIt) {
    ASSERT_EQ(translate({"-p", "-pc", "tt"}, "START_SECONDS=0\nA=secret\n").status, 0);
    const std::string translator = inHome("agtqvs6/lx8266/bin/zav_xa");
    EXPECT_THAT(run({translator, "-g", "-pc", "tt"}, kMember).out, HasSubstr("A=secret"));
    EXPECT_EQ(run({translator, "-r", "-pc", "tt"}, kMember).status, 8);
    EXPECT_EQ(run({"/bin/sh", "-c", "cat " + inHome("config/tt.cfg")}, kOther, kOther).out, "");
    EXPECT_THAT(read("config/tt.cfg"), HasSubstr("A=secret"));
}

TEST_F(RunAs, UniversalAgentOfAMemberCollectsAndItsListIsNotedByTheConsole) {
    write("config/um.config", "INSTANCE=\nKUM_WORK_PATH='" + inHome("universal/work") +
                                  "'\nKUMP_RB_PATH='" + inHome("universal/rb") +
                                  "'\nKUMA_STARTUP_DP='FILE'\nINTERVAL=1\nSTART_SECONDS=0\n");
    write("config/.ConfigData/kumenv", "|DATAPROVIDER|FILE,SCRP|\n");
    write("universal/scripts/disk.sh", "#!/bin/sh\necho row\n", 0755);
    write("universal/metafiles/d.mdl", "APPL=D\nDPTYPE=SCRP\nSOURCE=disk.sh\n");
    const Outcome started = agentAs(kMember, {"start", "um"});
    ASSERT_EQ(started.status, 0) << started.err;
    EXPECT_THAT(read("config/um.config"), HasSubstr("KUMA_STARTUP_DP='FILE'\n"));
    const Outcome imported = ::run({inHome("bin/um_console"), "-h", home(), "-c",
                                    "IMPORT " + inHome("universal/metafiles/d.mdl")});
    ASSERT_EQ(imported.status, 0) << imported.err;
    EXPECT_THAT(read("config/um.config"), HasSubstr("KUMA_STARTUP_DP='FILE,SCRP'\n"));
    EXPECT_TRUE(eventually([&] {
        return read(folderOf(kMember) + "/data/um/D.csv").find("Z,row\n") != std::string::npos;
    })) << read(folderOf(kMember) + "/logs/um.log");
    EXPECT_EQ(agentAs(kMember, {"stop", "um"}).status, 0);
}

// ---- What a member could try --------------------------------------------------------------------

/// What the member does, in sh. $home is the home, $own the member's folder in it, $other that of
/// another member, $canary a file and $folder a folder of root, $root and $theirs the pid file's
/// lines of processes of root and of the other member.
struct Try {
    const char* name;
    const char* script;
};

const Try kTries[] = {
    {"LinkForTheLog", "ln -sfn $canary $home/logs/tt.log"},
    {"LinkForThePidFile", "ln -sfn $canary $home/run/tt.pid"},
    {"LinkForTheLock", "rm -f $home/run/.tt.lock; ln -sn $folder/new $home/run/.tt.lock"},
    {"LinkForTheData", "ln -sfn $folder $home/data/tt"},
    {"LinkForTheConfiguration", "ln -sfn $canary $home/config/tt.cfg"},
    {"FolderOfLogsReplaced", "mv $home/logs $home/old; ln -sn $folder $home/logs"},
    {"PidFileOfARootProcess", "echo \"$root\" >$home/run/tt.pid"},
    {"PidFileMoved", "mv $home/run/ux.pid $home/run/tt.pid"},
    {"RunAsListReplaced",
     "echo '<runas/>' >$home/config/new; mv $home/config/new $home/config/*_zavrunas.cfg"},
    {"ScriptForTheUniversalAgent", "echo x >$home/universal/scripts/evil.sh"},
    {"ImportForTheUniversalAgent", "echo x >$home/universal/work/imported/evil.mdl"},
    {"ProgramReplaced", "echo x >$home/agtqvs6/lx8266/tt/bin/agent; echo x >$home/lib/common.sh"},
    {"OwnPidFileOfARootProcess", "echo \"$root\" >$own/run/tt.pid"},
    {"OwnPidFileOfAnotherMember", "echo \"$theirs\" >$own/run/tt.pid"},
    {"OwnPidFileIsALink", "ln -sfn $home/run/ux.pid $own/run/tt.pid"},
    {"OwnPidFileIsAFifo", "mkfifo $own/run/tt.pid"},
    {"OwnRunIsALink", "rm -rf $own/run; ln -sn $home/run $own/run"},
    {"OwnRunIsThatOfAnotherMember", "rm -rf $own/run; ln -sn $other/run $own/run"},
    {"OwnLogsAreALink", "rm -rf $own/logs; ln -sn $folder $own/logs"},
    {"OwnLogIsALink", "ln -sfn $canary $own/logs/tt.log; ln -sfn $canary $own/logs/tt.log.1"},
    {"OwnLogIsAHardLink", "ln $canary $own/logs/tt.log"},
    {"OwnDataIsALink", "rm -rf $own/data; ln -sn $folder $own/data"},
    {"OwnDataOfTheInstanceIsALink", "mkdir -p $own/data; ln -sn $folder $own/data/tt"},
    {"OwnFolderIsALink", "rm -rf $own; ln -sn $folder $own"},
    {"FolderOfAnotherMemberReplaced", "mv $other $home/users/x; ln -sn $folder $other"},
    {"FolderOfRootMade", "mkdir -p $home/users/0/run; echo \"$root\" >$home/users/0/run/tt.pid"},
    {"FolderWithAnOddName",
     "mkdir -p \"$home/users/-rf\" \"$home/users/1;id\" $home/users/..x/run"},
};

std::ostream& operator<<(std::ostream& out, const Try& one) {
    return out << one.name;
}

class RunAsAttack : public RunAs, public ::testing::WithParamInterface<Try> {
protected:
    void SetUp() override {
        RunAs::SetUp();
        if (IsSkipped() || HasFatalFailure()) return;
        scratch.write("canary", "safe\n");
        scratch.write("folder/tt", "safe\n");
        ASSERT_EQ(agent({"start", "ux"}).status, 0);
        ASSERT_EQ(agentAs(kOther, {"start", "-o", "theirs", "tt"}).status, 0);
        // A folder with everything in it, so that each try finds what it replaces.
        ASSERT_EQ(agentAs(kMember, {"start", "tt"}).status, 0);
        ASSERT_EQ(agentAs(kMember, {"stop", "tt"}).status, 0);
        rootLine_ = read("run/ux.pid");
        theirLine_ = read(folderOf(kOther) + "/run/tt_theirs.pid");
        rootPid_ = HomeTest::pidOf("ux");
        theirPid_ = pidOf("tt_theirs", kOther);
        lists_ = everythingOfRoot();
    }
    /// What root has put into the home, apart from what the product tt writes there.
    std::string everythingOfRoot() const {
        return ::run(
                   {"/bin/sh", "-c",
                    "cd " + home() +
                        " && find bin lib registry agtqvs6 config universal -type f -exec sha256sum"
                        " {} + | grep -v /tt | sort"})
            .out;
    }
    void attack() const {
        const std::string script = "home=" + home() + " own=$home/" + folderOf(kMember) +
                                   " other=$home/" + folderOf(kOther) +
                                   " canary=" + scratch.path("canary") +
                                   " folder=" + scratch.path("folder") + "\nroot='" + rootLine_ +
                                   "'\ntheirs='" + theirLine_ + "'\n" + GetParam().script + "\n";
        run({"/bin/sh", "-c", script}, kMember);
    }
    void expectNothingOfOthersWasTouched() const {
        EXPECT_EQ(scratch.read("canary"), "safe\n");
        EXPECT_EQ(scratch.read("folder/tt"), "safe\n");
        EXPECT_EQ(::run({"/bin/ls", "-A", scratch.path("folder")}).out, "tt\n");
        EXPECT_TRUE(lives(rootPid_));
        EXPECT_TRUE(lives(theirPid_));
        EXPECT_EQ(everythingOfRoot(), lists_);
    }

    std::string rootLine_, theirLine_, lists_;
    pid_t rootPid_ = 0, theirPid_ = 0;
};

TEST_P(RunAsAttack, LeadsToNoFileOrProcessOfAnybodyElse) {
    attack();
    EXPECT_EQ(agent({"start", "tt"}).status, 0);
    expectNothingOfOthersWasTouched();
    EXPECT_EQ(agent({"stop", "tt"}).status, 0);
    agent({"stop", "tt"});
    expectNothingOfOthersWasTouched();
    agentAs(kOther, {"start", "tt"});
    agentAs(kOther, {"stop", "tt"});
    expectNothingOfOthersWasTouched();
    translate({"-p", "-pc", "tt"}, "A=1\n");
    translate({"-r", "-pc", "tt"});
    expectNothingOfOthersWasTouched();
    // The uninstallation ends the other member's agent too, as it has to.
    theirPid_ = ::getpid();
    uninstall();
    expectNothingOfOthersWasTouched();
}

INSTANTIATE_TEST_SUITE_P(Tries, RunAsAttack, ::testing::ValuesIn(kTries),
                         [](const auto& tried) { return std::string(tried.param.name); });

TEST_F(RunAs, FoldersThatChangeWhileRootRemovesThemLeadNowhere) {
    scratch.write("folder/tt/file", "safe\n");
    ASSERT_EQ(agentAs(kMember, {"start", "tt"}).status, 0);
    ASSERT_EQ(agentAs(kMember, {"stop", "tt"}).status, 0);
    const std::string own = inHome(folderOf(kMember));
    Program changer({"/usr/bin/setpriv", "--reuid=" + std::to_string(kMember),
                     "--regid=" + std::to_string(kMember), "--groups=" + std::to_string(kGroup),
                     "/bin/sh", "-c",
                     "cd " + own + "/.. && while :; do mv " + own + " x; ln -sn " +
                         scratch.path("folder") + " " + own + "; rm -f " + own + "; mv x " + own +
                         "; mkdir -p " + own + "/data/tt; done 2>/dev/null"});
    for (int round = 0; round < 10; ++round) {
        translate({"-r", "-pc", "tt"});
    }
    changer.signal(SIGKILL);
    changer.wait();
    EXPECT_EQ(scratch.read("folder/tt/file"), "safe\n");
}

}  // namespace
