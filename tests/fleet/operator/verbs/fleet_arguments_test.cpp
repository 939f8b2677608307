#include "fleet/operator/verbs/fleet_arguments.h"

#include <gtest/gtest.h>

#include <set>
#include <string>
#include <vector>

#include "ctl/command_line.h"
#include "ctl/verbs/verb_table.h"
#include "fleet/operator/verbs/fleet_verbs.h"
#include "tests/fleet/operator/certified.h"

namespace {

using fleet::fleetVocabulary;
using fleet::Moment;
using operator_test::failureOf;
using Words = std::vector<std::string>;

ctl::CommandLine parsed(const Words& words) {
    return ctl::parseCommandLine(words, fleetVocabulary());
}

/// The words of an example behind "zavctl".
Words wordsOf(const std::string& example) {
    Words words(1);
    for (const char c : example.substr(example.find(' ') + 1)) {
        if (c == ' ')
            words.emplace_back();
        else
            words.back() += c;
    }
    return words;
}

Moment expiryOf(const std::string& text) {
    const ctl::CommandLine line = parsed({"--expires", text, "--on", "*", "start", "ux"});
    return fleet::timeOf(line.given, fleet::kExpires);
}

TEST(FleetArguments, GiveTimesWithTheirUnits) {
    EXPECT_EQ(expiryOf("90"), Moment{90'000});
    EXPECT_EQ(expiryOf("60s"), Moment{60'000});
    EXPECT_EQ(expiryOf("10m"), Moment{600'000});
    EXPECT_EQ(expiryOf("24h"), Moment{86'400'000});
    EXPECT_EQ(expiryOf("7d"), Moment{7 * 86'400'000LL});
    EXPECT_EQ(fleet::timeOf(parsed({"--on", "*", "start", "ux"}).given, fleet::kExpires),
              Moment{86'400'000});
    for (const char* const text : {"", "s", "1.5h", "-5s", "+5s", "5x", "5 m", "366d", "999999999"})
        EXPECT_EQ(failureOf([&] { expiryOf(text); }).status(), ctl::kWrongUsage) << text;
}

TEST(FleetArguments, StandBeforeAndBehindTheVerb) {
    for (const Words& words : {Words{"--fleet", "https://a", "--on", "env=test", "start", "ux"},
                               Words{"start", "ux", "--on=env=test", "--fleet=https://a"}}) {
        const ctl::CommandLine line = parsed(words);
        ASSERT_EQ(line.verb, &ctl::kStartVerb) << line.page.err;
        EXPECT_EQ(line.given.text(fleet::kOn), "env=test");
        EXPECT_EQ(line.given.text(fleet::kFleet), "https://a");
    }
}

TEST(FleetArguments, MeanSomethingToTheVerbOrAreMistakes) {
    const auto mistakeIn = [](const Words& words) {
        const ctl::CommandLine line = parsed(words);
        if (line.verb == nullptr) return std::string("not parsed: " + line.page.err);
        return std::string(
            failureOf([&] { fleet::insistOnMeaning(*line.verb, line.given); }).what());
    };
    const std::string none = "nothing was thrown";
    EXPECT_EQ(mistakeIn({"--on", "*", "--waves", "1", "--expires", "1h", "start", "ux"}), none);
    EXPECT_EQ(mistakeIn({"start", "ux"}), "--on is missing: it says which hosts are meant");
    EXPECT_EQ(mistakeIn({"--on", "", "start", "ux"}),
              "--on is missing: it says which hosts are meant");
    EXPECT_EQ(mistakeIn({"--on", "*", "start", "ux", "--transid", "a"}),
              "start does not go with --transid");
    EXPECT_EQ(mistakeIn({"--on", "*", "start", "ux", "--once", "a"}),
              "start does not go with --once");
    EXPECT_EQ(mistakeIn({"--on", "*", "hosts"}), "hosts does not go with --on");
    EXPECT_EQ(mistakeIn({"--on", "*", "agents"}), none);
    EXPECT_EQ(mistakeIn({"agents"}), "--on is missing: it says which hosts are meant");
    EXPECT_EQ(mistakeIn({"doctor"}), "--on is missing: it says which hosts are meant");
    EXPECT_EQ(mistakeIn({"--on", "web-1", "task", "output", "-f", "deploy-7"}), none);
    EXPECT_EQ(mistakeIn({"task", "output", "deploy-7"}), none);
    EXPECT_EQ(mistakeIn({"--on", "*", "--waves", "1", "agents"}),
              "agents does not go with --waves");
    EXPECT_EQ(mistakeIn({"--dry-run", "rollout", "ls"}), "rollout ls does not go with --dry-run");
    EXPECT_EQ(mistakeIn({"--expires", "1h", "hosts"}), "hosts does not go with --expires");
    EXPECT_EQ(mistakeIn({"--expires", "1h", "rollout", "resume", "ID"}), none);
}

TEST(FleetVocabulary, TakesASelectorForNoVerb) {
    const ctl::CommandLine all = parsed({"hosts"});
    ASSERT_EQ(all.verb, &fleet::kHostsVerb) << all.page.err;
    const ctl::CommandLine some = parsed({"hosts", "env=test"});
    ASSERT_EQ(some.verb, &fleet::kHostsVerb) << some.page.err;
    const ctl::CommandLine one = parsed({"hosts", "show", "web-1"});
    ASSERT_EQ(one.verb, &fleet::kHostsShowVerb) << one.page.err;
    EXPECT_EQ(parsed({"hosts", "a", "b"}).verb, nullptr);
}

TEST(FleetVocabulary, HasExamplesThatCanBeParsed) {
    for (const ctl::Verb* const verb : fleetVocabulary().verbs) {
        if (ctl::findVerb(verb->name) == verb) continue;  // those are one host's
        for (const char* const example : verb->examples) {
            const ctl::CommandLine line = parsed(wordsOf(example));
            EXPECT_EQ(line.verb, verb) << example << "\n" << line.page.err;
            if (line.verb != nullptr) {
                EXPECT_NO_THROW(fleet::insistOnMeaning(*line.verb, line.given)) << example;
            }
        }
    }
}

TEST(FleetVocabulary, HasNoOptionTwice) {
    for (const ctl::Verb* const verb : fleetVocabulary().verbs) {
        std::set<std::string> names;
        for (const ctl::Argument& argument : fleet::kFleetArguments)
            names.insert(argument.name);
        for (const ctl::Argument& argument : verb->arguments)
            EXPECT_TRUE(names.insert(argument.name).second) << verb->name << " " << argument.name;
    }
}

TEST(FleetVocabulary, HasNoVerbOfOneHostThatCannotSayWhatItAsks) {
    for (const ctl::Verb* const verb : fleetVocabulary().verbs) {
        const bool isOfOneHost = ctl::findVerb(verb->name) == verb;
        const bool isForMany = isOfOneHost || verb == &fleet::kFleetPushVerb;
        EXPECT_EQ(verb->requestOf != nullptr, isForMany) << verb->name;
    }
}

}  // namespace
