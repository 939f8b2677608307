#include "ctl/verbs/events.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <nlohmann/json.hpp>

namespace {

using ctl::Format;
using ctl::showEvent;
using ctl::wordsFor;
using nlohmann::json;

const json kDone = {{"TRANSID", "T"}, {"COMMAND", "START"}, {"RETVAL", 0}};
const json kFailed = {{"TRANSID", "T"},
                      {"COMMAND", "STOP"},
                      {"RETVAL", 1024},
                      {"RETMSGID", "ZAV1024E"},
                      {"TARGETMSN", "a:h:UX"}};

TEST(Events, AreLinesThatSayHowTasksEnded) {
    EXPECT_EQ(showEvent(kDone, true, Format::Text), "T  START  done\n");
    EXPECT_EQ(showEvent(kFailed, false, Format::Text),
              "T  STOP  failed; ZAV1024E: the start or stop command ended with a bad return code  "
              "target a:h:UX\n");
}

TEST(Events, ShowNoControlCharactersAndTakeAMissingReturnCodeForNoSuccess) {
    const json row = {{"TRANSID", "T\x1b[2J"}, {"COMMAND", "START"}};
    EXPECT_EQ(showEvent(row, true, Format::Text),
              "T\\x1B[2J  START  failed; the host gave no return code\n");
    EXPECT_EQ(showEvent({{"A", "\x7f"}}, true, Format::Json), "\n  {\"A\":\"\\u007F\"}");
}

TEST(Events, HaveTheirIdentifierBesideThemOnRequest) {
    EXPECT_EQ(showEvent(kDone, true, Format::Text, "abc-7"), "abc-7  T  START  done\n");
    json shown = kDone;
    shown["id"] = "abc-7";
    EXPECT_EQ(json::parse(showEvent(kDone, true, Format::Json, "abc-7")), shown);
}

TEST(Events, ThatAreMissingAreToldInWords) {
    EXPECT_EQ(wordsFor({"gap", R"({"missing":5})", "abc-7"}),
              "5 events are missing here: the host does not keep them any more");
    EXPECT_EQ(wordsFor({"gap", R"({"missing":1})", "abc-7"}),
              "1 event is missing here: the host does not keep it any more");
    for (const char* unknown : {R"({"missing":null})", "{}", "[]", "x", R"({"missing":-1})"}) {
        EXPECT_EQ(wordsFor({"gap", unknown, ""}).find("the host does not know that identifier"), 0U)
            << unknown;
    }
    EXPECT_EQ(wordsFor({"overflow", "3 lost", ""}), "overflow: 3 lost");
}

TEST(Events, AreElementsOfOneListAsJson) {
    const std::string list = "[" + showEvent(kDone, true, Format::Json) +
                             showEvent(kFailed, false, Format::Json) + "\n]";
    EXPECT_EQ(json::parse(list), (json{kDone, kFailed}));
    EXPECT_EQ(std::count(list.begin(), list.end(), '\n'), 3) << "a line for each";
}

}  // namespace
