#include "ctl/completion/wanted.h"

#include <gmock/gmock.h>

namespace {

using ctl::Completion;
using ctl::Wanted;
using ctl::wantedBy;
using testing::Contains;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::Not;
using testing::UnorderedElementsAre;

std::vector<std::string> words(const Wanted& wanted) {
    std::vector<std::string> words;
    for (const ctl::Candidate& candidate : wanted.words)
        words.push_back(candidate.word);
    return words;
}

TEST(Wanted, FirstIsAVerbOrAGroup) {
    EXPECT_THAT(words(wantedBy({"sta"})), ElementsAre("start", "status"));
    EXPECT_THAT(words(wantedBy({"con"})), UnorderedElementsAre("config", "console"));
    EXPECT_THAT(words(wantedBy({""})), Contains("install"));
    EXPECT_THAT(words(wantedBy({})), Contains("depot"));
    EXPECT_THAT(words(wantedBy({"nothing"})), IsEmpty());
    EXPECT_NE(wantedBy({"agents"}).words.front().help, "");
}

TEST(Wanted, BehindAGroupAreItsVerbs) {
    EXPECT_THAT(words(wantedBy({"config", ""})), ElementsAre("get", "set", "edit"));
    EXPECT_THAT(words(wantedBy({"task", "ca"})), ElementsAre("cancel"));
    EXPECT_THAT(words(wantedBy({"--json", "task", "w"})), ElementsAre("wait"));
    EXPECT_THAT(words(wantedBy({"task", "nothing", ""})), IsEmpty());
}

TEST(Wanted, PositionalsAreWhatTheirPlaceSays) {
    EXPECT_EQ(wantedBy({"start", ""}).source, Completion::Product);
    EXPECT_EQ(wantedBy({"start", "ux", ""}).source, Completion::Nothing);
    EXPECT_EQ(wantedBy({"install", ""}).source, Completion::DepotProduct);
    EXPECT_EQ(wantedBy({"install", "ux", "7"}).source, Completion::DepotVersion);
    EXPECT_EQ(wantedBy({"install", "ux", "7"}).product, "ux");
    EXPECT_EQ(wantedBy({"install", "ux", "7", "--", ""}).source, Completion::Nothing);
    EXPECT_EQ(wantedBy({"remove-instance", "ux", ""}).source, Completion::Instance);
    EXPECT_EQ(wantedBy({"query", "K"}).source, Completion::Table);
    EXPECT_EQ(wantedBy({"task", "show", ""}).source, Completion::Transaction);
    EXPECT_EQ(wantedBy({"push", "fi"}).source, Completion::LocalFile);
}

TEST(Wanted, TheLastOfSeveralPositionalsRepeats) {
    EXPECT_EQ(wantedBy({"depot", "sum", "a", "b", "c/"}).source, Completion::DepotFile);
    EXPECT_EQ(wantedBy({"depot", "sum", "a", "b", "c/"}).typed, "c/");
}

TEST(Wanted, ValuesOfOptionsAreWhatTheOptionSays) {
    const Wanted wanted = wantedBy({"start", "ux", "--target", "db"});
    EXPECT_EQ(wanted.source, Completion::Instance);
    EXPECT_EQ(wanted.product, "ux");
    EXPECT_EQ(wanted.typed, "db");
    EXPECT_EQ(wanted.lead, "");
    EXPECT_THAT(wanted.words, IsEmpty());
    const Wanted inOne = wantedBy({"start", "--target=db"});
    EXPECT_EQ(inOne.source, Completion::Instance);
    EXPECT_EQ(inOne.typed, "db");
    EXPECT_EQ(inOne.lead, "--target=");
    EXPECT_EQ(wantedBy({"--socket", "/r"}).source, Completion::LocalFile);
    EXPECT_EQ(wantedBy({"tasks", "--state", ""}).source, Completion::State);
    EXPECT_EQ(wantedBy({"--timeout", ""}).source, Completion::Nothing);
}

TEST(Wanted, OptionsAreThoseOfTheVerbAndOfAll) {
    const auto offered = words(wantedBy({"start", "ux", "--"}));
    EXPECT_THAT(offered, Contains("--target"));
    EXPECT_THAT(offered, Contains("--json"));
    EXPECT_THAT(offered, Contains("--help"));
    EXPECT_THAT(offered, Not(Contains("--restart")));
    EXPECT_THAT(words(wantedBy({"--ver"})), ElementsAre("--version"));
    EXPECT_THAT(words(wantedBy({"agents", "--wa"})), ElementsAre("--watch"));
}

TEST(Wanted, OptionsThatAreGivenOrOverAreNotOffered) {
    EXPECT_THAT(words(wantedBy({"--json", "start", "--js"})), IsEmpty());
    EXPECT_THAT(words(wantedBy({"start", "--target=x", "--tar"})), IsEmpty());
    EXPECT_THAT(words(wantedBy({"install", "ux", "7", "--", "--js"})), IsEmpty());
}

TEST(Wanted, HelpExplainsVerbs) {
    EXPECT_THAT(words(wantedBy({"help", "inst"})), ElementsAre("install"));
    EXPECT_THAT(words(wantedBy({"help", "config", "e"})), ElementsAre("edit"));
}

TEST(Wanted, TheHostIsTheOneThatTheLineNames) {
    EXPECT_EQ(wantedBy({"--socket", "/s", "start", ""}).host.socket, "/s");
    EXPECT_EQ(wantedBy({"start", "--socket=/s", ""}).host.socket, "/s");
    EXPECT_EQ(wantedBy({"--host-user", "joe", "start", ""}).hostUser, "joe");
}

TEST(Wanted, MakesSenseOfAnyWords) {
    const std::vector<std::string> odd = {"",       "-",    "--",   "=",        "--=",  "--socket=",
                                          "config", "task", "help", "--json=x", "\xff", "a b"};
    for (const std::string& first : odd) {
        for (const std::string& second : odd) {
            for (const std::string& third : odd)
                wantedBy({first, second, third});
        }
    }
}

}  // namespace
