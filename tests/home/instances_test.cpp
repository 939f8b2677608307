// Which instances run, which should, and their start after a boot.
#include <gmock/gmock.h>
#include <unistd.h>

#include <map>

#include "home/home_fixture.h"

using ::testing::HasSubstr;

namespace {

constexpr const char* kWaits = "exec sleep 600\n";

/// A line of the list, of which the product and the instance are the key.
struct Listed {
    std::string user, state, pid;
};
using States = std::map<std::string, Listed>;

States statesIn(const std::string& list) {
    States states;
    std::istringstream lines(list);
    for (std::string line; std::getline(lines, line);) {
        std::istringstream pieces(line);
        std::string product, instance;
        Listed listed;
        std::getline(pieces, product, '\t');
        std::getline(pieces, instance, '\t');
        std::getline(pieces, listed.user, '\t');
        std::getline(pieces, listed.state, '\t');
        std::getline(pieces, listed.pid, '\t');
        states[product + (instance.empty() ? "" : "_" + instance)] = listed;
    }
    return states;
}

class InstancesTest : public PreparedHomeTest {
protected:
    Outcome instances(const std::string& action) const {
        return run({inHome("bin/instances"), action});
    }
    States states() const {
        const Outcome listed = instances("list");
        EXPECT_EQ(listed.status, 0) << listed.err;
        return statesIn(listed.out);
    }
    /// What a boot leaves: nothing runs, and all pid files are there.
    void bootAnew(const std::vector<std::string>& keys) const {
        for (const std::string& key : keys) {
            const pid_t pid = pidOf(key);
            ASSERT_GT(pid, 1) << key;
            ::kill(-pid, SIGKILL);
            while (lives(pid))
                ::usleep(1'000);
        }
    }
};

TEST_F(InstancesTest, RunAreMissingOrStopped) {
    addAgent("tt", kWaits);
    write("config/tt_two.cfg", "INSTANCE=two\n");
    write("config/tt_three.cfg", "INSTANCE=three\n");
    write("config/gone_one.cfg", "INSTANCE=one\n");  // of a product that is not installed
    ASSERT_EQ(agent({"start", "tt"}).status, 0);
    ASSERT_EQ(agent({"-o", "two", "start", "tt"}).status, 0);
    bootAnew({"tt_two"});
    const States found = states();
    const std::string me = run({"/usr/bin/id", "-un"}).out;
    ASSERT_EQ(found.count("tt") + found.count("tt_two") + found.count("tt_three"), 3U);
    EXPECT_EQ(found.at("tt").state, "running");
    EXPECT_EQ(found.at("tt").user + "\n", me);
    EXPECT_EQ(found.at("tt").pid, std::to_string(pidOf("tt")));
    EXPECT_EQ(found.at("tt_two").state, "missing");
    EXPECT_EQ(found.at("tt_two").pid, "");
    EXPECT_EQ(found.at("tt_three").state, "stopped");
    EXPECT_EQ(found.at("ux").state, "stopped");
    EXPECT_EQ(found.at("ux").user, "");
    EXPECT_EQ(found.count("gone_one"), 0U);
    EXPECT_EQ(found.count("ax"), 0U) << "the shared component is no agent";
}

TEST_F(InstancesTest, ThatWereStoppedOnRequestAreNotMissing) {
    addAgent("tt", kWaits);
    ASSERT_EQ(agent({"start", "tt"}).status, 0);
    ASSERT_EQ(agent({"stop", "tt"}).status, 0);
    EXPECT_EQ(states().at("tt").state, "stopped");
    // Also when there was nothing left to stop.
    ASSERT_EQ(agent({"start", "tt"}).status, 0);
    bootAnew({"tt"});
    EXPECT_EQ(states().at("tt").state, "missing");
    EXPECT_EQ(agent({"stop", "tt"}).status, 5);
    EXPECT_EQ(states().at("tt").state, "stopped");
}

TEST_F(InstancesTest, ThatAreMissingAreStartedInTheOrderOfTheirLastStarts) {
    addAgent("tt", "echo \"$AGENT_INSTANCE\" >>\"$TOVRINHOME/order\"\n" + std::string(kWaits));
    for (const char* name : {"b", "c", "a"})
        ASSERT_EQ(agent({"-o", name, "start", "tt"}).status, 0);
    bootAnew({"tt_a", "tt_b"});
    write("order", "");
    const Outcome started = instances("start");
    EXPECT_EQ(started.status, 0) << started.err;
    EXPECT_EQ(started.out, "");
    for (const char* key : {"tt_a", "tt_b", "tt_c"})
        EXPECT_EQ(states().at(key).state, "running") << key;
    EXPECT_EQ(read("order"), "b\na\n") << "what runs is left alone";
    EXPECT_EQ(states().at("tt").state, "stopped");
}

TEST_F(InstancesTest, WhoseStartFailsStayMissingAndKeepNobodyElseFromStarting) {
    addAgent("bad", "[ ! -e \"$TOVRINHOME/broken\" ] || exit 9\n" + std::string(kWaits),
             "START_SECONDS=1\n");
    addAgent("tt", kWaits);
    ASSERT_EQ(agent({"start", "bad"}).status, 0);
    ASSERT_EQ(agent({"start", "tt"}).status, 0);
    bootAnew({"bad", "tt"});
    write("broken", "");
    const Outcome started = instances("start");
    EXPECT_EQ(started.status, 6);
    EXPECT_THAT(started.err, HasSubstr("bad ended right after its start with status 9"));
    EXPECT_EQ(states().at("bad").state, "missing");
    EXPECT_EQ(states().at("tt").state, "running");
    // One that never ran is not missing after such a start.
    addAgent("new", "exit 9\n", "START_SECONDS=1\n");
    EXPECT_EQ(agent({"start", "new"}).status, 6);
    EXPECT_EQ(states().at("new").state, "stopped");
}

TEST_F(InstancesTest, OfNamesThatAreNoneAreLeftOut) {
    write("run/.pid", "1 1 x y\n");
    write("run/tt_.pid", "1 1 x y\n");
    write("run/tt_-x.pid", "1 1 x y\n");
    write("run/t;t.pid", "1 1 x y\n");
    const std::size_t before = states().size();
    EXPECT_EQ(before, 2U) << "ux and um";
    EXPECT_EQ(instances("start").status, 0);
}

TEST_F(InstancesTest, WrongUsageIsSaid) {
    for (const std::vector<std::string>& words : std::vector<std::vector<std::string>>{
             {}, {"list", "start"}, {"-h"}, {"stop"}, {"list", "ux"}}) {
        std::vector<std::string> line{inHome("bin/instances")};
        line.insert(line.end(), words.begin(), words.end());
        const Outcome outcome = run(line);
        EXPECT_EQ(outcome.status, 1);
        EXPECT_THAT(outcome.err, HasSubstr("usage: instances"));
    }
    EXPECT_EQ(run({inHome("bin/instances"), "-h", "/nowhere", "list"}).status, 2);
}

/// Agents of another user, who has a name in this test only.
class InstancesOfOthers : public HomeTest {
protected:
    static constexpr uid_t kMember = 64001;
    static constexpr gid_t kGroup = 64100;

    void SetUp() override {
        if (::getuid() != 0) GTEST_SKIP() << "only root can become another user";
        ASSERT_EQ(::chmod(scratch.path().c_str(), 0755), 0);
        scratch.write("passwd", "root:*:0:0::/:/bin/sh\nmember:*:64001:64100::/:/bin/sh\n");
        if (named({"/bin/true"}).status != 0) GTEST_SKIP() << "nothing can be mounted here";
        ASSERT_EQ(prepare({"--arch", "lx8266", "--run-as-group", std::to_string(kGroup)}).status,
                  0);
        addAgent("tt", kWaits);
        // The owner's first start makes the lock.
        ASSERT_EQ(agent({"start", "tt"}).status, 0);
        ASSERT_EQ(agent({"stop", "tt"}).status, 0);
        ASSERT_EQ(asMember({inHome("bin/TovrinAgent"), "start", "tt"}).status, 0);
    }
    Outcome asMember(std::vector<std::string> words) const {
        const std::vector<std::string> before{"/usr/bin/setpriv", "--reuid=64001", "--regid=64100",
                                              "--clear-groups"};
        words.insert(words.begin(), before.begin(), before.end());
        return run(words);
    }
    /// Runs the words where that user has the name "member".
    Outcome named(std::vector<std::string> words) const {
        const std::vector<std::string> before{"/usr/bin/unshare",
                                              "--mount",
                                              "/bin/sh",
                                              "-c",
                                              "mount --bind \"$0\" /etc/passwd && exec \"$@\"",
                                              scratch.path("passwd")};
        words.insert(words.begin(), before.begin(), before.end());
        return run(words);
    }
    std::string pidFile() const { return inHome("users/64001/run/tt.pid"); }
    States states() const {
        const Outcome listed = named({inHome("bin/instances"), "list"});
        EXPECT_EQ(listed.status, 0) << listed.err;
        return statesIn(listed.out);
    }
};

TEST_F(InstancesOfOthers, AreListedWithTheirUser) {
    EXPECT_EQ(states().at("tt").state, "running");
    EXPECT_EQ(states().at("tt").user, "member");
    EXPECT_EQ(states().at("tt").pid, std::to_string(pidIn(pidFile())));
    ASSERT_EQ(::kill(-pidIn(pidFile()), SIGKILL), 0);
    while (lives(pidIn(pidFile())))
        ::usleep(1'000);
    EXPECT_EQ(states().at("tt").state, "missing");
    EXPECT_EQ(states().at("tt").user, "member");
}

TEST_F(InstancesOfOthers, AreStartedAsThatUser) {
    const pid_t before = pidIn(pidFile());
    ASSERT_EQ(::kill(-before, SIGKILL), 0);
    while (lives(before))
        ::usleep(1'000);
    const Outcome started = named({inHome("bin/instances"), "start"});
    EXPECT_EQ(started.status, 0) << started.err;
    EXPECT_THAT(started.err, HasSubstr("tt started as user member"));
    const pid_t now = pidIn(pidFile());
    ASSERT_TRUE(lives(now));
    struct stat info {};
    ASSERT_EQ(::stat(("/proc/" + std::to_string(now)).c_str(), &info), 0);
    EXPECT_EQ(info.st_uid, kMember);
    EXPECT_EQ(states().at("tt").state, "running");
}

TEST_F(InstancesOfOthers, WhoAreGoneAreNamed) {
    ASSERT_EQ(::kill(-pidIn(pidFile()), SIGKILL), 0);
    while (lives(pidIn(pidFile())))
        ::usleep(1'000);
    const Outcome started = run({inHome("bin/instances"), "start"});  // without the name
    EXPECT_EQ(started.status, 6);
    EXPECT_THAT(started.err, HasSubstr("user 64001, who ran tt, is gone"));
}

TEST_F(InstancesOfOthers, CannotMakeUpInstancesOfAnybodyElse) {
    // The user may write any file there, and be slow.
    const std::string folder = inHome("users/64001/run");
    ASSERT_EQ(asMember({"/bin/sh", "-c",
                        "cd '" + folder +
                            "' && printf '1 1 x y\\n' >ux_made-up.pid && "
                            "mkfifo um.pid && ln -s /etc/passwd other.pid"})
                  .status,
              0);
    const States found = states();
    EXPECT_EQ(found.at("ux_made-up").user, "member");
    EXPECT_EQ(found.at("ux_made-up").state, "missing");
    EXPECT_EQ(found.at("um").state, "stopped");
    EXPECT_EQ(found.at("tt").state, "running");
}

}  // namespace
