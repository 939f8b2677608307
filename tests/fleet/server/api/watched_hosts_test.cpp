#include "fleet/server/api/events/watched_hosts.h"

#include <gtest/gtest.h>

#include <string>

#include "fleet/server/rollouts/rollout_records.h"

namespace {

using fleet::HostFace;
using fleet::kAwayAfter;
using fleet::Members;
using fleet::Moment;
using fleet::WatchedHosts;

constexpr Moment kNow{1'000'000};

HostFace faceHeard(Moment heard) {
    return {"web-1", {{"env", "test"}}, heard, "", ""};
}

TEST(HostsThatAreWatched, AreToldOfWhenTheyAreNew) {
    WatchedHosts hosts;
    const auto change = hosts.note("key", faceHeard({}), false, kNow);
    ASSERT_TRUE(change);
    EXPECT_EQ(change->state, "unknown");
    EXPECT_EQ(change->since, kNow);
    EXPECT_FALSE(hosts.note("key", faceHeard({}), false, kNow + Moment(1)));
}

TEST(HostsThatAreWatched, AreToldOfWhenTheyAreHeardFirstAndNotWithEachHello) {
    WatchedHosts hosts;
    hosts.note("key", faceHeard({}), false, kNow);
    const auto change = hosts.note("key", faceHeard(kNow), false, kNow);
    ASSERT_TRUE(change);
    EXPECT_EQ(change->state, "here");
    EXPECT_FALSE(hosts.note("key", faceHeard(kNow + Moment(30'000)), false, kNow + Moment(30'000)));
}

TEST(HostsThatAreWatched, GoAwayWithoutAWordAndComeBack) {
    WatchedHosts hosts;
    hosts.note("key", faceHeard(kNow), false, kNow);
    EXPECT_TRUE(hosts.goneAway(kNow + kAwayAfter - Moment(1)).empty());
    const auto gone = hosts.goneAway(kNow + kAwayAfter);
    ASSERT_EQ(gone.size(), 1U);
    EXPECT_EQ(gone[0].state, "away");
    EXPECT_EQ(gone[0].since, kNow) << "when it was last heard";
    EXPECT_TRUE(hosts.goneAway(kNow + 2 * kAwayAfter).empty()) << "once";
    const Moment later = kNow + 3 * kAwayAfter;
    const auto back = hosts.note("key", faceHeard(later), false, later);
    ASSERT_TRUE(back);
    EXPECT_EQ(back->state, "here");
    EXPECT_EQ(back->since, later);
}

TEST(HostsThatAreWatched, AreToldOfWhenSomethingAboutThemChanges) {
    WatchedHosts hosts;
    HostFace face = faceHeard(kNow);
    hosts.note("key", face, false, kNow);
    const auto isTold = [&] { return hosts.note("key", face, false, kNow).has_value(); };
    face.blocked = "no room";
    EXPECT_TRUE(isTold());
    EXPECT_FALSE(isTold());
    face.labels["env"] = "prod";
    EXPECT_TRUE(isTold());
    face.name = "web-2";
    EXPECT_TRUE(isTold());
    face.stopped = "two machines";
    EXPECT_TRUE(isTold());
    EXPECT_FALSE(isTold());
    EXPECT_TRUE(hosts.note("key", face, true, kNow)) << "it has told something about itself";
}

TEST(HostsThatAreWatched, AreForgottenWhenTheyAreRetired) {
    WatchedHosts hosts;
    hosts.note("key", faceHeard(kNow), false, kNow);
    EXPECT_TRUE(hosts.retired({{"key", {"web-1", "", {}, {}}}}, kNow).empty());
    const auto gone = hosts.retired({}, kNow);
    ASSERT_EQ(gone.size(), 1U);
    EXPECT_EQ(gone[0].state, "retired");
    EXPECT_EQ(gone[0].face.name, "web-1");
    EXPECT_TRUE(hosts.retired({}, kNow).empty());
}

TEST(HostsThatAreWatched, AreComparedWithTheMembers) {
    WatchedHosts hosts;
    hosts.note("a", faceHeard(kNow), false, kNow);
    hosts.note("b", faceHeard(kNow), false, kNow);
    const Members members = {{"a", {"web-1", "", {{"env", "test"}}, {}}},
                             {"b", {"web-1", "", {{"env", "prod"}}, {}}},
                             {"c", {"web-3", "", {}, {}}}};
    EXPECT_EQ(hosts.changedMembers(members), (std::vector<std::string>{"b", "c"}));
}

}  // namespace
