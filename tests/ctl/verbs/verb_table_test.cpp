#include "ctl/verbs/verb_table.h"

#include <gtest/gtest.h>

#include <set>
#include <string>

#include "ctl/verbs/arguments/global_arguments.h"

namespace {

using ctl::Argument;
using ctl::Verb;

bool declares(const Verb& verb, const std::string& name) {
    for (const Argument& argument : verb.arguments) {
        if (name == argument.name) return true;
    }
    return false;
}

TEST(VerbTable, FindsAVerbByItsWholeName) {
    for (const Verb* const verb : ctl::kVerbs)
        EXPECT_EQ(ctl::findVerb(verb->name), verb);
    for (const char* name : {"", "config", "get", "config frobnicate", "start "})
        EXPECT_EQ(ctl::findVerb(name), nullptr) << name;
}

TEST(VerbTable, HasAGroupForEveryNameOfTwoWords) {
    for (const Verb* const verb : ctl::kVerbs) {
        const std::string name = verb->name;
        const std::size_t blank = name.find(' ');
        if (blank == std::string::npos) continue;
        EXPECT_NE(ctl::findVerbGroup(name.substr(0, blank)), nullptr) << name;
    }
    EXPECT_EQ(ctl::findVerbGroup("start"), nullptr);
}

TEST(VerbTable, DeclaresEachArgumentOnceAndExplainsIt) {
    for (const Verb* const verb : ctl::kVerbs) {
        std::set<std::string> names;
        for (const Argument& argument : verb->arguments) {
            EXPECT_TRUE(names.insert(argument.name).second) << verb->name << " " << argument.name;
            EXPECT_STRNE(argument.help, "") << verb->name << " " << argument.name;
            const bool isPositional = argument.kind == Argument::Kind::Positional;
            EXPECT_EQ(argument.name[0] != '-', isPositional) << verb->name << " " << argument.name;
        }
        for (const Argument& argument : ctl::kGlobalArguments)
            EXPECT_EQ(names.count(argument.name), 0U) << verb->name << " " << argument.name;
    }
}

TEST(VerbTable, SetsArgumentsInRelationToThoseOfTheSameVerbOnly) {
    for (const Verb* const verb : ctl::kVerbs) {
        for (const Argument& argument : verb->arguments) {
            for (const char* const other : {argument.excludes, argument.needs}) {
                if (other == nullptr) continue;
                EXPECT_TRUE(declares(*verb, other)) << verb->name << " " << argument.name;
                EXPECT_STRNE(other, argument.name) << verb->name;
            }
        }
    }
}

TEST(VerbTable, HasManyWordsOnlyInTheLastPositionalAndRequiredOnesFirst) {
    for (const Verb* const verb : ctl::kVerbs) {
        bool isLast = false;
        bool wasOptional = false;
        for (const Argument& argument : verb->arguments) {
            if (argument.kind != Argument::Kind::Positional) continue;
            EXPECT_FALSE(isLast) << verb->name << " " << argument.name;
            EXPECT_FALSE(wasOptional && argument.isRequired) << verb->name << " " << argument.name;
            isLast = argument.type == Argument::Type::Texts;
            wasOptional = wasOptional || !argument.isRequired;
        }
    }
}

}  // namespace
