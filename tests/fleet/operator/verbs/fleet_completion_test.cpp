/// What shells offer on command lines for a fleet.
#include <gmock/gmock.h>

#include <string>
#include <vector>

#include "ctl/completion/completion.h"
#include "fleet/operator/verbs/fleet_verbs.h"

namespace {

using testing::Contains;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::IsSupersetOf;
using testing::Not;
using Words = std::vector<std::string>;

Words offered(const Words& words) {
    Words found;
    for (const ctl::Candidate& candidate : ctl::wantedBy(words, fleet::fleetVocabulary()).words)
        found.push_back(candidate.word);
    return found;
}

TEST(CompletionForFleets, OffersItsVerbs) {
    EXPECT_THAT(offered({"--fleet", "https://a", "ro"}), ElementsAre("rollout"));
    EXPECT_THAT(offered({"rollout", "re"}), ElementsAre("resume", "retry-failed"));
    EXPECT_THAT(offered({"task", ""}), ElementsAre("output"));
    EXPECT_THAT(offered({"quer"}), IsEmpty()) << "that is for one host";
}

TEST(CompletionForFleets, OffersWhatFollowsAVerbThatIsAGroupToo) {
    EXPECT_THAT(offered({"host"}), ElementsAre("hosts"));
    EXPECT_THAT(offered({"hosts", ""}), IsSupersetOf({"show", "label", "retire"}));
    EXPECT_THAT(offered({"hosts", "env=test", ""}), IsEmpty());
    EXPECT_THAT(offered({"hosts", "label", "--"}), Contains("--json"));
}

TEST(CompletionForFleets, OffersOptions) {
    EXPECT_THAT(offered({"start", "ux", "--wa"}), ElementsAre("--waves", "--wait"));
    EXPECT_THAT(offered({"rollout", "retry-failed", "--f"}), ElementsAre("--force", "--fleet"));
    EXPECT_THAT(offered({"--on", "*", "start", "ux", "--o"}), Not(Contains("--on")));
    EXPECT_THAT(offered({"--on", ""}), IsEmpty()) << "a selector is for people to think of";
}

TEST(CompletionForFleets, AsksForFilesWhereThereIsOne) {
    EXPECT_EQ(ctl::completionBy(fleet::fleetVocabulary(), {"push", ""}), "files\n");
    EXPECT_EQ(ctl::completionBy(fleet::fleetVocabulary(), {"rollout", "abo"}),
              "words\nabort\tEnd a roll-out, and cancel what hosts have not done yet\n");
}

}  // namespace
