#include "ctl/verbs/arguments/values.h"

#include <gtest/gtest.h>

#include <stdexcept>

namespace {

using ctl::Argument;
using ctl::Values;

constexpr Argument kName = ctl::textOption("--name", "A name");
constexpr Argument kCount = ctl::numberOption("--count", "A count").otherwise("7");
constexpr Argument kWait = ctl::secondsOption("--wait", "A time").otherwise("1.5");
constexpr Argument kFlag = ctl::flag("--flag", "A flag");

TEST(Values, OfArgumentsThatAreNotGivenAreTheirFallbacks) {
    Values given;
    for (const Argument& argument : {kName, kCount, kWait, kFlag})
        given.add(argument);
    EXPECT_FALSE(given.has(kName));
    EXPECT_EQ(given.text(kName), "");
    EXPECT_EQ(given.number(kCount), 7U);
    EXPECT_EQ(given.seconds(kWait), 1.5);
    EXPECT_FALSE(given.flag(kFlag));
}

TEST(Values, AreFoundByTheNameOfTheirArgument) {
    Values given;
    given.add(kName).text = "x";
    given.add(kCount).number = 3;
    EXPECT_EQ(given.text(kName.required()), "x");
    EXPECT_EQ(given.number(kCount), 3U);
}

TEST(Values, OfTwoListsCanBeJoined) {
    Values given;
    given.add(kName).text = "x";
    Values others;
    others.add(kFlag).flag = true;
    given.append(others);
    EXPECT_EQ(given.text(kName), "x");
    EXPECT_TRUE(given.flag(kFlag));
}

TEST(Values, OfAnArgumentThatIsNotDeclaredAreAMistakeOfTheProgram) {
    EXPECT_THROW(Values().text(kName), std::logic_error);
}

}  // namespace
