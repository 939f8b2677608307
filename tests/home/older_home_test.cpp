// What a home gets that an older starter home was.
#include <gmock/gmock.h>
#include <sys/stat.h>
#include <unistd.h>

#include <filesystem>

#include "home/home_fixture.h"

using ::testing::HasSubstr;

namespace {

class OlderHomeTest : public PreparedHomeTest {
protected:
    /// As before there was a list of instances, neither the program nor its parts.
    void SetUp() override {
        PreparedHomeTest::SetUp();
        std::filesystem::remove(inHome("bin/instances"));
        for (const char* const part : {"lib/process.sh", "lib/users.sh"}) {
            std::string text = read(part);
            for (const std::string name : {"own_states()", "list_as_user()"}) {
                const std::size_t at = text.find(name);
                if (at != std::string::npos) text.replace(at, name.size(), "not_there()");
            }
            write(part, text);
        }
    }
    Outcome complete() const { return run({source("bin/prepare-home"), "--complete", home()}); }
    /// The files of a folder of the home, hidden ones too.
    std::size_t filesIn(const std::string& folder) const {
        const std::filesystem::directory_iterator begin(inHome(folder));
        return static_cast<std::size_t>(std::distance(begin, {}));
    }
};

TEST_F(OlderHomeTest, GetsAListOfItsInstances) {
    const std::size_t before = filesIn("bin");
    const Outcome completed = complete();
    EXPECT_EQ(completed.status, 0) << completed.err;
    EXPECT_EQ(filesIn("bin"), before + 1);
    struct stat found {};
    ASSERT_EQ(::stat(inHome("bin/instances").c_str(), &found), 0);
    EXPECT_EQ(found.st_mode & 07777U, 0755U);
    addAgent("qq", "exec sleep 600\n");
    ASSERT_EQ(agent({"start", "qq"}).status, 0);
    const Outcome listed = run({inHome("bin/instances"), "list"});
    EXPECT_EQ(listed.status, 0) << listed.err;
    EXPECT_THAT(listed.out, HasSubstr("\trunning\t" + std::to_string(pidOf("qq")) + "\n"));
    EXPECT_THAT(listed.out, HasSubstr("ux\t\t\tstopped\t\n"));
    EXPECT_EQ(agent({"stop", "qq"}).status, 0);
}

TEST_F(OlderHomeTest, StartsWhatIsMissingAfterABoot) {
    ASSERT_EQ(complete().status, 0);
    addAgent("qq", "exec sleep 600\n");
    ASSERT_EQ(agent({"start", "qq"}).status, 0);
    const pid_t pid = pidOf("qq");
    ::kill(-pid, SIGKILL);
    while (lives(pid))
        ::usleep(1'000);
    const Outcome started = run({inHome("bin/instances"), "start"});
    EXPECT_EQ(started.status, 0) << started.err;
    EXPECT_NE(pidOf("qq"), pid);
    EXPECT_TRUE(lives(pidOf("qq")));
    EXPECT_EQ(agent({"stop", "qq"}).status, 0);
}

TEST_F(OlderHomeTest, KeepsWhatSomebodyHasPutThere) {
    write("bin/instances", "#!/bin/sh\nexit 7\n", 0700);
    EXPECT_EQ(complete().status, 0);
    EXPECT_EQ(read("bin/instances"), "#!/bin/sh\nexit 7\n");
    std::filesystem::remove(inHome("bin/instances"));
    ASSERT_EQ(::symlink("/nowhere", inHome("bin/instances").c_str()), 0);
    EXPECT_EQ(complete().status, 0);
    EXPECT_EQ(std::filesystem::read_symlink(inHome("bin/instances")), "/nowhere");
}

TEST_F(OlderHomeTest, GetsNothingWhereOthersMayWrite) {
    ASSERT_EQ(::chmod(inHome("bin").c_str(), 0777), 0);
    const std::size_t before = filesIn("bin");
    const Outcome refused = complete();
    EXPECT_EQ(refused.status, 8);
    EXPECT_THAT(refused.err, HasSubstr("others may write there"));
    EXPECT_EQ(filesIn("bin"), before);
}

TEST_F(OlderHomeTest, MustBeAHome) {
    std::filesystem::remove_all(inHome("registry"));
    const Outcome refused = complete();
    EXPECT_EQ(refused.status, 2);
    EXPECT_FALSE(exists("bin/instances"));
    EXPECT_EQ(run({source("bin/prepare-home"), "--complete"}).status, 1);
}

}  // namespace
