#include "ctl/verbs/help/help_page.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <set>
#include <sstream>

#include "ctl/client/tasks/task_list.h"
#include "ctl/verbs/verb_table.h"

namespace {

using testing::HasSubstr;
using testing::Not;

void expectToFit(const std::string& text) {
    std::istringstream lines(text);
    for (std::string line; std::getline(lines, line);)
        EXPECT_LE(line.size(), 80U) << line;
}

TEST(Help, ListsEveryVerbAndGroup) {
    const std::string text = ctl::programHelp();
    for (const ctl::Verb* const verb : ctl::kVerbs) {
        const std::string name = verb->name;
        EXPECT_THAT(text, HasSubstr("\n  " + name.substr(0, name.find(' ')) + " "));
    }
    EXPECT_THAT(text, HasSubstr("660 if not"));
    EXPECT_THAT(text, HasSubstr("  --json "));
    expectToFit(text);
}

TEST(Help, OfAVerbHasItsArgumentsThoseOfAllAndTwoExamples) {
    for (const ctl::Verb* const verb : ctl::kVerbs) {
        const std::string name = verb->name;
        const std::string text = ctl::verbHelp(*verb);
        EXPECT_THAT(text, HasSubstr(verb->help));
        EXPECT_THAT(text, HasSubstr("Usage: zavctl " + name + " [OPTIONS]"));
        EXPECT_THAT(text, HasSubstr("\n  --socket PATH"));
        for (const ctl::Argument& argument : verb->arguments) {
            const bool isShown =
                text.find(std::string("\n  ") + argument.name) != std::string::npos;
            EXPECT_EQ(isShown, !argument.isHidden) << name << " " << argument.name;
        }
        for (const char* const example : verb->examples)
            EXPECT_THAT(text, HasSubstr(std::string("\n  ") + example + "\n"));
        EXPECT_THAT(text, Not(HasSubstr("FLOAT")));
        expectToFit(text);
    }
}

TEST(Help, SaysWhichArgumentsMayBeLeftOutAndWhichDoNotGoTogether) {
    EXPECT_THAT(ctl::verbHelp(ctl::kStartVerb),
                HasSubstr("Usage: zavctl start [OPTIONS] PRODUCT\n"));
    EXPECT_THAT(ctl::verbHelp(ctl::kConfigSetVerb), HasSubstr(" [OPTIONS] PRODUCT [TEXT]\n"));
    EXPECT_THAT(ctl::verbHelp(ctl::kHelpVerb), HasSubstr(" [OPTIONS] [VERB...]\n"));
    EXPECT_THAT(ctl::verbHelp(ctl::kStartVerb), HasSubstr("; not with --target\n"));
    EXPECT_THAT(ctl::verbHelp(ctl::kInstallVerb), HasSubstr("only with --restart"));
}

TEST(Help, NamesEveryStateThatATaskMayBeIn) {
    const std::string text = ctl::verbHelp(ctl::kTasksVerb);
    const std::size_t begin = text.find("Only those in this state: ");
    ASSERT_NE(begin, std::string::npos);
    std::istringstream ofTheOption(text.substr(begin, text.find("\n  --", begin) - begin));
    std::set<std::string> words;
    for (std::string word; ofTheOption >> word;)
        words.insert(word.substr(0, word.find(',')));
    for (const char* const state : ctl::kTaskStates)
        EXPECT_EQ(words.count(state), 1U) << state;
}

TEST(Help, OfAGroupListsItsVerbsWithAnExampleOfEach) {
    const std::string config = ctl::groupHelp(*ctl::findVerbGroup("config"));
    for (const char* name : {"get", "set", "edit"})
        EXPECT_THAT(config, HasSubstr(std::string("\n  config ") + name + " "));
    for (const ctl::VerbGroup& group : ctl::kVerbGroups) {
        const std::string text = ctl::groupHelp(group);
        for (const ctl::Verb* const verb : ctl::kVerbs) {
            if (std::string(verb->name).rfind(std::string(group.name) + " ", 0) != 0) continue;
            EXPECT_THAT(text, HasSubstr(std::string("\n  ") + verb->examples[0] + "\n"));
        }
        expectToFit(text);
    }
}

TEST(Help, NamesEveryExitStatus) {
    const std::string text = ctl::programHelp();
    for (const char* const status :
         {" 0 done;", " 1 failed, ", " 2 wrong\n", " 3 no host", " 4 no outcome", " 130 ended"})
        EXPECT_THAT(text, HasSubstr(status));
    for (const char* const reason : {"cancelled", "interrupted", "expired", "guard", "doctor"})
        EXPECT_THAT(text, HasSubstr(reason));
}

}  // namespace
