#include "ctl/command_line.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "ctl/verbs/arguments/common_arguments.h"
#include "ctl/verbs/arguments/global_arguments.h"
#include "ctl/verbs/help/help_page.h"
#include "ctl/verbs/verb_table.h"

namespace {

using ctl::CommandLine;
using ctl::parseCommandLine;
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
    const char* hint;
};

TEST(CommandLine, SaysWhatIsWrong) {
    const char* const list = "zavctl help lists the commands";
    const char* const config = "zavctl help config lists the commands";
    const char* const start = "zavctl help start shows how it is used";
    const char* const install = "zavctl help install shows how it is used";
    const char* const ua = "zavctl help ua-config shows how it is used";
    const char* const status = "zavctl help status shows how it is used";
    const Mistake mistakes[] = {
        {{}, "a command is missing", list},
        {{""}, "a command is missing", list},
        {{"--bogus"}, "there is no option \"--bogus\"", list},
        {{"--jsno"}, "there is no option \"--jsno\"; did you mean \"--json\"?", list},
        {{"--sokcet", "x", "status"},
         "there is no option \"--sokcet\"; did you mean \"--socket\"?",
         list},
        {{"--jsno", "agnets"}, "there is no option \"--jsno\"; did you mean \"--json\"?", list},
        {{"agnets", "--jsno"}, "there is no command \"agnets\"; did you mean \"agents\"?", list},
        {{"frobnicate"}, "there is no command \"frobnicate\"", list},
        {{"agnets"}, "there is no command \"agnets\"; did you mean \"agents\"?", list},
        {{"a\x1b[2J"}, "there is no command \"a\\x1B[2J\"", list},
        {{"config"}, "config needs a command behind it", config},
        {{"config", "gte"},
         "there is no command \"config gte\"; did you mean \"config get\"?",
         config},
        {{"config", "frobnicate"}, "there is no command \"config frobnicate\"", config},
        {{"start"}, "PRODUCT is missing", start},
        {{"start", "--frobnicate"}, "start has no option \"--frobnicate\"", start},
        {{"start", "ux", "--intsance", "x"},
         "start has no option \"--intsance\"; did you mean \"--instance\"?",
         start},
        {{"start", "ux", "y", "z"}, "start does not know what to do with \"y\"", start},
        {{"status", "start", "ux"}, "status does not know what to do with \"start\"", status},
        {{"start", "ux", "--target"}, "--target needs a value", start},
        {{"start", "ux", "--target", "a", "--instance", "b"},
         "--target does not go with --instance",
         start},
        {{"install", "ux", "7", "--complete", "--", "x"},
         "--complete goes only with --restart",
         install},
        {{"install", "ux", "7", "--restart", "--optional", "a", "--", "x"},
         "--optional does not go with --restart",
         install},
        {{"ua-config", "--port", "0"}, "--port: \"0\" is not a whole number from 1 to 65535", ua},
        {{"ua-config", "--port", "65536"},
         "--port: \"65536\" is not a whole number from 1 to 65535",
         ua},
        {{"events", "--count", "x"},
         "--count: \"x\" is not a whole number from 1 to 1000000000",
         "zavctl help events shows how it is used"},
        {{"--timeout", "-1", "status"},
         "--timeout: \"-1\" is not a number of seconds from 0 to 1000000000",
         status},
        {{"--timeout", "nan", "status"},
         "--timeout: \"nan\" is not a number of seconds from 0 to 1000000000",
         status},
        {{"--socket"}, "--socket needs a value", list},
    };
    for (const Mistake& mistake : mistakes) {
        const CommandLine line = parseCommandLine(mistake.words);
        EXPECT_EQ(line.verb, nullptr);
        EXPECT_EQ(line.page.out, "");
        EXPECT_EQ(line.page.err,
                  "zavctl: " + std::string(mistake.says) + "\n" + mistake.hint + "\n");
        EXPECT_EQ(line.page.status, ctl::kWrongUsage);
    }
}

TEST(CommandLine, TakesDashesBehindTheEndOfTheOptionsForWords) {
    const CommandLine line =
        parseCommandLine({"install", "ux", "7", "--", "./install.sh", "-q", "--json"});
    EXPECT_EQ(line.verb, &ctl::kInstallVerb) << line.page.err;
    EXPECT_FALSE(line.given.flag(ctl::kJson));
}

TEST(CommandLine, TakesTheVersionOptionForTheVerb) {
    for (const Words& words : {Words{"--json", "--version", "--socket", "/a"},
                               Words{"start", "ux", "--version", "--socket", "/a", "--json"}}) {
        const CommandLine line = parseCommandLine(words);
        ASSERT_EQ(line.verb, &ctl::kVersionVerb) << line.page.err;
        EXPECT_EQ(line.given.text(ctl::kSocket), "/a");
        EXPECT_TRUE(line.given.flag(ctl::kJson));
    }
}

TEST(CommandLine, IsADocumentTooWhenItIsWrongAndAskedForJson) {
    const CommandLine wrong = parseCommandLine({"--json", "start"});
    EXPECT_EQ(wrong.page.out, "{\n  \"error\": \"PRODUCT is missing\"\n}\n");
    EXPECT_EQ(wrong.page.status, ctl::kWrongUsage);
    EXPECT_EQ(parseCommandLine({"start"}).page.out, "");
    EXPECT_EQ(parseCommandLine({"install", "--", "--json"}).page.out, "");
}

TEST(CommandLine, OfAnInstallCommandWithOptionsNeedsTheDashes) {
    const CommandLine line = parseCommandLine(
        {"install", "ux", "--transid", "T 1", "6.3", "./install.sh", "-q", "it's"});
    EXPECT_EQ(line.verb, nullptr);
    EXPECT_EQ(line.page.status, ctl::kWrongUsage);
    EXPECT_EQ(line.page.out, "");
    EXPECT_EQ(line.page.err,
              "zavctl: put the install command behind --\n"
              "  zavctl install ux --transid 'T 1' 6.3 -- ./install.sh -q 'it'\\''s'\n");
    for (const Words& right : {Words{"install", "ux", "6.3", "./install.sh", "q"},
                               Words{"install", "ux", "6.3", "--restart", "./install.sh"},
                               Words{"install", "ux", "6.3", "--", "./install.sh", "-q"}}) {
        EXPECT_EQ(parseCommandLine(right).verb, &ctl::kInstallVerb);
    }
    EXPECT_EQ(parseCommandLine({"install", "ux", "6.3", "--help"}).page.out,
              ctl::verbHelp(ctl::kInstallVerb));
}

TEST(CommandLine, AnswersWhatNeedsNoVerb) {
    const CommandLine help = parseCommandLine({"start", "ux", "--help"});
    EXPECT_EQ(help.verb, nullptr);
    EXPECT_EQ(help.page.out, ctl::verbHelp(ctl::kStartVerb));
    EXPECT_EQ(help.page.status, ctl::kSuccess);
    EXPECT_EQ(parseCommandLine({"--help"}).page.out, ctl::programHelp());
    EXPECT_EQ(parseCommandLine({"config", "-h"}).page.out,
              ctl::groupHelp(*ctl::findVerbGroup("config")));
}

TEST(CommandLine, TakesNoCountOfNoEventsAtAll) {
    const CommandLine line = parseCommandLine({"events", "--count", "0"});
    EXPECT_EQ(line.verb, nullptr);
    EXPECT_EQ(line.page.status, ctl::kWrongUsage);
    EXPECT_NE(line.page.err.find("\"0\" is not a whole number from 1"), std::string::npos)
        << line.page.err;
    EXPECT_EQ(parseCommandLine({"events", "--count", "1"}).verb, &ctl::kEventsVerb);
}

TEST(CommandLine, ForcesNoQueryThatDoesNotAct) {
    const CommandLine line = parseCommandLine({"query", "KAGREQT", "COMMAND=STOP", "--force"});
    EXPECT_EQ(line.verb, nullptr);
    EXPECT_NE(line.page.err.find("--force goes only with --yes"), std::string::npos)
        << line.page.err;
}

}  // namespace
