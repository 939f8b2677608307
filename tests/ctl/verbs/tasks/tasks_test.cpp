#include "ctl/verbs/tasks/tasks.h"

#include <gtest/gtest.h>

#include <nlohmann/json.hpp>

namespace {

using ctl::Format;
using nlohmann::json;

const json kTasks = {{{"id", "2"}, {"command", "STOP"}, {"state", "queued"}},
                     {{"id", "1"}, {"command", "START"}, {"state", "done"}}};

TEST(Tasks, AreATableOrTheHostsDocument) {
    const json list = {{"tasks", kTasks}, {"next", nullptr}};
    EXPECT_EQ(ctl::showTasks(list, {}, Format::Text).out,
              "TASK  STATE   COMMAND  ASKED  TOOK  TRANSID\n"
              "2     queued  STOP\n"
              "1     done    START\n");
    EXPECT_EQ(json::parse(ctl::showTasks(list, {}, Format::Json).out), list);
}

TEST(Tasks, SayWhetherThereAreMoreOrNone) {
    EXPECT_NE(ctl::showTasks({{"tasks", kTasks}, {"next", 5}}, {}, Format::Text)
                  .out.find("There are more; see --limit.\n"),
              std::string::npos);
    EXPECT_EQ(ctl::showTasks({{"tasks", json::array()}, {"next", nullptr}}, {}, Format::Text).out,
              "There are no such tasks.\n");
}

}  // namespace
