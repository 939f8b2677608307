#include "host/home/instances.h"

#include <gtest/gtest.h>

#include "support/scratch_dir.h"

namespace {

using State = host::AgentInstance::State;

TEST(Instances, AreWhatTheHomesProgramLists) {
    ScratchDir home;
    home.script("bin/instances",
                "[ \"$*\" = list ] || exit 1\n"
                "printf 'ux\\t\\troot\\trunning\\t17\\n'\n"
                "printf 'ux\\tdb1\\tmonitor\\tmissing\\t\\n'\n"
                "printf 'um\\t\\t\\tstopped\\t\\n'\n");
    const host::InstanceList list = host::readInstances(home.path());
    EXPECT_TRUE(list.isOffered);
    EXPECT_TRUE(list.result.succeeded()) << list.result.err;
    ASSERT_EQ(list.instances.size(), 3U);
    EXPECT_EQ(list.instances[0].product, "ux");
    EXPECT_EQ(list.instances[0].instance, "");
    EXPECT_EQ(list.instances[0].user, "root");
    EXPECT_EQ(list.instances[0].state, State::Running);
    EXPECT_EQ(list.instances[0].pid, 17);
    EXPECT_EQ(list.instances[1].instance, "db1");
    EXPECT_EQ(list.instances[1].state, State::Missing);
    EXPECT_EQ(list.instances[1].pid, 0);
    EXPECT_EQ(list.instances[2].state, State::Stopped);
}

TEST(Instances, OfAHomeWithoutThatProgramAreNotOffered) {
    const ScratchDir home;
    EXPECT_FALSE(host::readInstances(home.path()).isOffered);
}

TEST(Instances, OfAProgramThatFailsAreNone) {
    ScratchDir home;
    home.script("bin/instances", "printf 'ux\\t\\troot\\trunning\\t17\\n'; exit 2");
    const host::InstanceList list = host::readInstances(home.path());
    EXPECT_TRUE(list.isOffered);
    EXPECT_EQ(list.result.number, 2);
    EXPECT_TRUE(list.instances.empty());
}

TEST(Instances, LeaveOutLinesThatMakeNoSense) {
    EXPECT_TRUE(host::instancesIn("").empty());
    EXPECT_TRUE(host::instancesIn("ux\nux\t\t\trunning\n").empty());
    EXPECT_TRUE(host::instancesIn("ux\t\t\tasleep\t1\n").empty());
    EXPECT_TRUE(host::instancesIn("\t\t\trunning\t1\n").empty());
    EXPECT_TRUE(host::instancesIn("ux\t\t\trunning\t1\tmore\n").empty());
    const auto odd = host::instancesIn("ux\t\tu\trunning\tseventeen");
    ASSERT_EQ(odd.size(), 1U);
    EXPECT_EQ(odd[0].pid, 0);
}

}  // namespace
