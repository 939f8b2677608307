#include "ctl/verbs/tasks/task_show.h"

#include <gtest/gtest.h>

#include <nlohmann/json.hpp>

namespace {

using ctl::Format;
using nlohmann::json;

TEST(TaskShow, IsTheRecordInWordsOrAsTheHostGivesIt) {
    const json record = {{"id", "1"}, {"transid", "T"}, {"command", "START"}, {"state", "done"}};
    EXPECT_EQ(ctl::showRecord(record, {}, Format::Text).out, "T: START, done\n");
    EXPECT_EQ(json::parse(ctl::showRecord(record, {}, Format::Json).out), record);
}

}  // namespace
