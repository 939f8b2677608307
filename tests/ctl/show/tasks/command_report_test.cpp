#include "ctl/show/tasks/command_report.h"

#include <gtest/gtest.h>

#include <nlohmann/json.hpp>

namespace {

using nlohmann::json;

TEST(CommandReport, SaysHowACommandEnded) {
    EXPECT_EQ(ctl::endText({{"exit", 3}}), "exit code 3");
    EXPECT_EQ(ctl::endText({{"signal", 9}}), "killed by signal 9");
    EXPECT_EQ(ctl::endText({{"error", "No such file\x1b"}}), "could not be run: No such file\\x1B");
    EXPECT_EQ(ctl::endText({{"exit", nullptr}}), "not known");
}

TEST(CommandReport, SaysThatNoCommandCanEndSo) {
    for (const char* code : {"256", "-1", "4294967296", "18446744073709551615", "1.5", "true"}) {
        const json command = {{"exit", json::parse(code)}};
        EXPECT_EQ(ctl::endText(command),
                  std::string("exit code ") + code + ", which makes no sense");
        EXPECT_TRUE(ctl::endedBadly(command)) << code;
    }
    EXPECT_EQ(ctl::endText({{"exit", "0\x1b"}}), "exit code 0\\x1B, which makes no sense");
    EXPECT_TRUE(ctl::endedBadly({{"exit", "0"}}));
    EXPECT_EQ(ctl::endText({{"exit", 255}}), "exit code 255");
    for (const char* number : {"0", "65", "-9", "4294967305"}) {
        EXPECT_EQ(ctl::endText({{"signal", json::parse(number)}}),
                  std::string("killed by signal ") + number + ", which makes no sense");
    }
    EXPECT_EQ(ctl::endText({{"signal", 64}}), "killed by signal 64");
}

TEST(CommandReport, KnowsBadEndsAndThoseThatNoExitCodeTells) {
    const json fine = {{"exit", 0}};
    const json failed = {{"exit", 3}};
    const json killed = {{"signal", 9}};
    const json absent = {{"error", "No such file"}};
    EXPECT_FALSE(ctl::endedBadly(fine));
    EXPECT_FALSE(ctl::endedBadly(json::object()));
    EXPECT_TRUE(ctl::endedBadly(failed));
    EXPECT_FALSE(ctl::diedUnnoticed(failed));
    for (const json& command : {killed, absent}) {
        EXPECT_TRUE(ctl::endedBadly(command));
        EXPECT_TRUE(ctl::diedUnnoticed(command));
    }
}

TEST(CommandReport, HasTheLastTenLinesOfEachOutput) {
    std::string lines;
    std::string last;
    for (int i = 1; i <= 12; ++i) {
        lines += std::to_string(i) + "\r\n";
        if (i > 2) last += "    " + std::to_string(i) + "\n";
    }
    EXPECT_EQ(ctl::commandReport(
                  {{"command", "run it"}, {"exit", 1}, {"stdout", lines}, {"stderr", "\x07"}}),
              "  command: run it\n  end:     exit code 1\n  standard output:\n" + last +
                  "  standard error:\n    \\x07\n");
    EXPECT_EQ(ctl::commandReport({{"command", "c"}, {"exit", 0}, {"stdout", "\n\n"}}),
              "  command: c\n  end:     exit code 0\n");
    EXPECT_EQ(ctl::commandReport({{"command", "c"}, {"exit", 0}, {"stdout", "\na"}}),
              "  command: c\n  end:     exit code 0\n  standard output:\n    \n    a\n");
}

TEST(CommandReport, OfAFailureIsThatOfTheCommandsThatFailedElseOfTheLast) {
    const json first = {{"command", "a"}, {"exit", 1}};
    const json second = {{"command", "b"}, {"exit", 0}};
    EXPECT_EQ(ctl::failureReport({first, second}), ctl::commandReport(first));
    EXPECT_EQ(ctl::failureReport(json::array({second, second})), ctl::commandReport(second));
    EXPECT_EQ(ctl::failureReport(json::array()), "");
    EXPECT_EQ(ctl::failureReport(json()), "");
}

TEST(CommandReport, HidesSecretsInCommandsAndTheirOutput) {
    const std::string shown = ctl::commandReport({{"command", "setup --password=hunter2 -q"},
                                                  {"error", "token=hunter2"},
                                                  {"stdout", "a\nDB_PWD: hunter2\nb"},
                                                  {"stderr", "secret = hunter2"}});
    EXPECT_EQ(shown,
              "  command: setup --password=*** -q\n"
              "  end:     could not be run: token=***\n"
              "  standard output:\n    a\n    DB_PWD: ***\n    b\n"
              "  standard error:\n    secret = ***\n");
}

}  // namespace
