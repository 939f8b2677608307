#include "ctl/show/tasks/task_record.h"

#include <gtest/gtest.h>

#include <nlohmann/json.hpp>

namespace {

using nlohmann::json;

const json kRecord = {
    {"id", "17"},
    {"transid", "deploy-7"},
    {"command", "INSTALL"},
    {"product", "ux"},
    {"version", "6.3"},
    {"state", "running"},
    {"started", "then"},
    {"ended", nullptr},
    {"asker", "root"},
    {"details",
     {{"commands",
       {{{"command", "first"}, {"pid", 1}, {"started", "t1"}, {"ended", "t2"}, {"exit", 0}},
        {{"command", "sh \x1b"}, {"pid", 4711}, {"started", "t3"}, {"ended", nullptr}}}}}}};

TEST(TaskRecord, AtWorkIsWhatItIsAndItsProcesses) {
    EXPECT_EQ(ctl::workText(kRecord, {}),
              "deploy-7: INSTALL ux 6.3, running since then\n  4711  sh \\x1B (t3)\n");
    json secret = kRecord;
    secret["transid"] = "key=7";
    secret["details"]["commands"][1]["command"] = "sh pwd=x";
    EXPECT_EQ(ctl::workText(secret, {}),
              "key=7: INSTALL ux 6.3, running since then\n  4711  sh pwd=*** (t3)\n")
        << "a task keeps its name";
    EXPECT_EQ(ctl::workText({{"id", "17"}, {"command", "STOP"}, {"state", "running"}}, {}),
              "17: STOP, running\n");
    EXPECT_EQ(
        ctl::workText(
            {{"id", "17"}, {"command", "STOP"}, {"state", "queued"}, {"accepted", "then"}}, {}),
        "17: STOP, queued since then\n");
}

TEST(TaskRecord, GivesNoProcessNumberThatIsNone) {
    json record = kRecord;
    for (const char* number : {"0", "-1", "4194305", "18446744073709551615", "1.5", "\"-9\""}) {
        record["details"]["commands"][1]["pid"] = json::parse(number);
        EXPECT_EQ(ctl::workText(record, {}),
                  "deploy-7: INSTALL ux 6.3, running since then\n"
                  "  (no process number)  sh \\x1B (t3)\n")
            << number;
    }
    record["details"]["commands"][1]["pid"] = nullptr;
    EXPECT_EQ(ctl::workText(record, {}),
              "deploy-7: INSTALL ux 6.3, running since then\n  -  sh \\x1B (t3)\n");
}

TEST(TaskRecord, HasItsTimesAndHowItEnded) {
    json record = kRecord;
    record["state"] = "failed";
    record["ended"] = "later";
    record["events"] = {{{"RETVAL", 1031}, {"RETMSGID", "ZAV1031E"}, {"RETMSGPARM", "3"}}};
    record["details"]["commands"].erase(0);
    record["details"]["commands"][0]["exit"] = 3;
    EXPECT_EQ(ctl::recordText(record, {}),
              "deploy-7: INSTALL ux 6.3, failed\n"
              "  asked by root\n"
              "  started  then\n"
              "  ended    later\n"
              "  ZAV1031E: the install command ended with a bad return code [3]\n"
              "  command: sh \\x1B\n"
              "  end:     exit code 3\n");
}

TEST(TaskRecord, ThatWasRefusedSaysWhy) {
    const json record = {{"id", "1"},
                         {"command", "START"},
                         {"state", "refused"},
                         {"events", json::array()},
                         {"reply", {{"RETVAL", 1003}, {"RETMSGID", "ZAV1003E"}}}};
    EXPECT_EQ(ctl::recordText(record, {}),
              "1: START, refused\n  ZAV1003E: the request names no product\n");
}

TEST(TaskRecord, WithoutARowSaysWhatTheHostSays) {
    const json record = {{"id", "1"},         {"command", "START"},    {"state", "refused"},
                         {"reason", "no ux"}, {"hint", "Install it."}, {"reply", nullptr}};
    EXPECT_EQ(ctl::recordText(record, {}), "1: START, refused\n  no ux\n  Install it.\n");
}

TEST(TaskRecord, OfAnyShapeIsText) {
    for (const json& record : {json(), json::array({1}), json{{"details", 7}, {"events", {1}}},
                               json{{"details", {{"commands", {7, "x"}}}}}}) {
        EXPECT_NE(ctl::recordText(record, {}), "");
        EXPECT_NE(ctl::workText(record, {}), "");
    }
}

}  // namespace
