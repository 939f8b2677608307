#include "ctl/command_line.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "ctl/client/failure.h"
#include "ctl/verbs/common_arguments.h"
#include "ctl/verbs/global_arguments.h"
#include "ctl/verbs/verb_table.h"

namespace {

using ctl::CommandLine;
using ctl::helpText;
using ctl::parseCommandLine;
using testing::HasSubstr;
using Words = std::vector<std::string>;

/// The words of an example behind "zavctl", as a shell would take them apart.
Words wordsOf(const std::string& example) {
    Words words(1);
    bool isQuoted = false;
    for (const char c : example.substr(example.find("zavctl ") + 7)) {
        if (c == '\'') {
            isQuoted = !isQuoted;
        } else if (c == ' ' && !isQuoted) {
            words.emplace_back();
        } else {
            words.back() += c;
        }
    }
    return words;
}

TEST(CommandLine, FindsTheVerbBehindAndBeforeGlobalOptions) {
    for (const Words& words : {Words{"--socket", "/a", "--json", "start", "ux"},
                               Words{"start", "ux", "--json", "--socket=/a"},
                               Words{"--socket=/a", "start", "--json", "ux"}}) {
        const CommandLine line = parseCommandLine(words);
        ASSERT_EQ(line.verb, &ctl::kStartVerb) << line.page.err;
        EXPECT_EQ(line.given.text(ctl::kProduct), "ux");
        EXPECT_EQ(line.given.text(ctl::kSocket), "/a");
        EXPECT_TRUE(line.given.flag(ctl::kJson));
        EXPECT_FALSE(line.given.flag(ctl::kNoWait));
    }
}

TEST(CommandLine, TakesTheValueOfAnOptionForNoVerb) {
    const CommandLine line = parseCommandLine({"--socket", "stop", "start", "stop"});
    ASSERT_EQ(line.verb, &ctl::kStartVerb) << line.page.err;
    EXPECT_EQ(line.given.text(ctl::kSocket), "stop");
    EXPECT_EQ(line.given.text(ctl::kProduct), "stop");
}

TEST(CommandLine, FindsAVerbOfAGroup) {
    const CommandLine line =
        parseCommandLine({"config", "--json", "get", "ux", "--target", "a:h:UX"});
    ASSERT_EQ(line.verb, &ctl::kConfigGetVerb) << line.page.err;
    EXPECT_EQ(line.given.text(ctl::kTarget), "a:h:UX");
    EXPECT_TRUE(line.given.flag(ctl::kJson));
}

TEST(CommandLine, KnowsWhatWasGiven) {
    const CommandLine line = parseCommandLine({"status", "--timeout", "2.5"});
    ASSERT_EQ(line.verb, &ctl::kStatusVerb);
    EXPECT_TRUE(line.given.has(ctl::kTimeout));
    EXPECT_EQ(line.given.seconds(ctl::kTimeout), 2.5);
    EXPECT_FALSE(parseCommandLine({"status"}).given.has(ctl::kTimeout));
    EXPECT_EQ(parseCommandLine({"status"}).given.seconds(ctl::kTimeout), 660);
}

TEST(CommandLine, TakesEveryExampleOfEveryVerb) {
    for (const ctl::Verb* const verb : ctl::kVerbs) {
        for (const char* const example : verb->examples) {
            const CommandLine line = parseCommandLine(wordsOf(example));
            EXPECT_EQ(line.verb, verb) << example << "\n" << line.page.err;
        }
    }
}

TEST(NamedVerb, IsSeenBetweenGlobalOptionsAndTheirValues) {
    EXPECT_EQ(ctl::namedVerb({"status"}), &ctl::kStatusVerb);
    EXPECT_EQ(ctl::namedVerb({"--json", "--socket", "stop", "start", "ux"}), &ctl::kStartVerb);
    EXPECT_EQ(ctl::namedVerb({"--socket=/a", "--timeout", "1", "agents"}), &ctl::kAgentsVerb);
    EXPECT_EQ(ctl::namedVerb({"config", "--json", "get", "ux"}), &ctl::kConfigGetVerb);
}

TEST(NamedVerb, IsNoneWithoutAVerbOrWithAnUnknownOne) {
    for (const Words& words :
         {Words{}, Words{""}, Words{"--json"}, Words{"--socket"}, Words{"--socket", "start"},
          Words{"config"}, Words{"config", "frobnicate"}, Words{"frobnicate", "start"}}) {
        EXPECT_EQ(ctl::namedVerb(words), nullptr);
    }
}

struct Mistake {
    Words words;
    const char* says;
};

TEST(CommandLine, SaysWhatIsWrong) {
    const Mistake mistakes[] = {
        {{}, "A subcommand is required"},
        {{"--json"}, "A subcommand is required"},
        {{"config"}, "A subcommand is required"},
        {{"frobnicate"}, "The following argument was not expected: frobnicate"},
        {{"config", "frobnicate"}, "The following argument was not expected: frobnicate"},
        {{"start"}, "PRODUCT is required"},
        {{""}, "The following argument was not expected: "},
        {{"start", "--frobnicate"}, "The following argument was not expected: --frobnicate"},
        {{"status", "start", "ux"}, "The following arguments were not expected: ux start"},
        {{"start", "ux", "--target"}, "--target: 1 required TEXT missing"},
        {{"start", "ux", "--target", "a", "--instance", "b"}, "--target excludes --instance"},
        {{"install", "ux", "7", "--complete", "--", "x"}, "--complete requires --restart"},
        {{"install", "ux", "7", "--restart", "--optional", "a", "--", "x"},
         "--optional excludes --restart"},
        {{"ua-config", "--port", "0"}, "--port: Value 0 not in range 1 to 65535"},
        {{"ua-config", "--port", "65536"}, "--port: Value 65536 not in range 1 to 65535"},
        {{"events", "--count", "x"}, "Could not convert: --count = x"},
        {{"--timeout", "-1", "status"},
         "--timeout: Value -1 not in range 0.000000 to 1000000000.000000"},
        {{"--socket"}, "--socket: 1 required PATH missing"},
    };
    for (const Mistake& mistake : mistakes) {
        const CommandLine line = parseCommandLine(mistake.words);
        EXPECT_EQ(line.verb, nullptr);
        EXPECT_EQ(line.page.out, "");
        EXPECT_EQ(line.page.err,
                  std::string(mistake.says) + "\nRun with --help for more information.\n");
        EXPECT_EQ(line.page.status, ctl::kWrongUsage);
    }
}

TEST(CommandLine, AnswersWhatNeedsNoVerb) {
    const CommandLine version = parseCommandLine({"--version"});
    EXPECT_EQ(version.verb, nullptr);
    EXPECT_THAT(version.page.out, testing::MatchesRegex("zavctl [0-9]+[.][0-9]+[.][0-9]+\n"));
    EXPECT_EQ(version.page.status, ctl::kSuccess);
    const CommandLine help = parseCommandLine({"start", "ux", "--help"});
    EXPECT_EQ(help.verb, nullptr);
    EXPECT_EQ(help.page.out, helpText({"start"}));
    EXPECT_EQ(help.page.status, ctl::kSuccess);
}

TEST(Help, ListsEveryVerbAndGroup) {
    const std::string text = helpText({});
    for (const ctl::Verb* const verb : ctl::kVerbs) {
        const std::string name = verb->name;
        EXPECT_THAT(text, HasSubstr("\n  " + name.substr(0, name.find(' ')) + " "));
    }
    EXPECT_THAT(text, HasSubstr("660 if not given"));
}

TEST(Help, OfAVerbHasItsArgumentsAndTwoExamples) {
    for (const ctl::Verb* const verb : ctl::kVerbs) {
        const std::string name = verb->name;
        const std::size_t blank = name.find(' ');
        const std::string text = blank == std::string::npos
                                     ? helpText({name})
                                     : helpText({name.substr(0, blank), name.substr(blank + 1)});
        EXPECT_THAT(text, HasSubstr(verb->help));
        EXPECT_THAT(text, HasSubstr("Usage: zavctl " + name + " [OPTIONS]"));
        for (const ctl::Argument& argument : verb->arguments) {
            const bool isShown =
                text.find(std::string("\n  ") + argument.name) != std::string::npos;
            EXPECT_EQ(isShown, !argument.isHidden) << name << " " << argument.name;
        }
        for (const char* const example : verb->examples)
            EXPECT_THAT(text, HasSubstr(std::string("\n  ") + example + "\n"));
    }
}

TEST(Help, OfAGroupListsItsVerbs) {
    const std::string text = helpText({"config"});
    for (const char* name : {"get", "set", "edit"})
        EXPECT_THAT(text, HasSubstr(std::string("\n  ") + name + " "));
}

TEST(Help, OfAnUnknownVerbIsWrongUsage) {
    for (const Words& words : {Words{"frobnicate"}, Words{"config", "frobnicate"},
                               Words{"start", "ux"}, Words{"--json"}}) {
        EXPECT_THROW(helpText(words), ctl::Failure);
    }
}

}  // namespace
