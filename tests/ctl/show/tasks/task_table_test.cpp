#include "ctl/show/tasks/task_table.h"

#include <gtest/gtest.h>

#include <nlohmann/json.hpp>

#include "ctl/show/fold.h"

namespace {

using nlohmann::json;

const ctl::WallTime kNow = *ctl::parseTime("2026-03-01T12:00:00Z");

json task() {
    return {{"id", "0123456789abcdef-7"},
            {"transid", "deploy-7"},
            {"command", "INSTALL"},
            {"product", "ux"},
            {"version", "6.3"},
            {"state", "done"},
            {"accepted", "2026-03-01T11:55:00Z"},
            {"started", "2026-03-01T11:58:00Z"},
            {"ended", "2026-03-01T11:58:09Z"}};
}

TEST(TaskTable, HasALineForEachTask) {
    EXPECT_EQ(ctl::taskTable(json::array({task()}), kNow),
              "TASK                STATE  COMMAND         ASKED      TOOK  TRANSID\n"
              "0123456789abcdef-7  done   INSTALL ux 6.3  5 min ago  9 s   deploy-7\n");
}

TEST(TaskTable, CountsTheTimeOfATaskThatRunsAndNoneOfOneThatWaits) {
    json running = task();
    running["state"] = "running";
    running["ended"] = nullptr;
    EXPECT_NE(ctl::taskTable(json::array({running}), kNow).find("5 min ago  2 min"),
              std::string::npos);
    json queued = running;
    queued["started"] = nullptr;
    EXPECT_EQ(ctl::taskTable(json::array({queued}), kNow).find("2 min"), std::string::npos);
}

TEST(TaskTable, LeavesOutNamesThatNobodyHasChosen) {
    json made = task();
    made["transid"] = "zavctl-123-0123456789abcdef";
    EXPECT_EQ(ctl::taskTable(json::array({made}), kNow).find("zavctl-"), std::string::npos);
}

TEST(TaskTable, FitsATerminalWhateverIsInIt) {
    json wide = task();
    wide["id"] = "0123456789abcdef-1234567";
    wide["state"] = "interrupted";
    wide["targetmsn"] = std::string(60, 'm');
    wide["transid"] = std::string(80, 't') + "\x1b[2J";
    const std::string text = ctl::taskTable(json::array({wide}), kNow);
    EXPECT_EQ(text.find('\x1b'), std::string::npos);
    for (std::size_t start = 0; start < text.size();) {
        const std::size_t end = text.find('\n', start);
        EXPECT_LE(ctl::widthOf(text.substr(start, end - start)), 80U);
        start = end + 1;
    }
}

TEST(TaskTitle, IsWhatTheVerbWouldSay) {
    EXPECT_EQ(ctl::taskTitle(task()), "install ux (deploy-7)");
    json made = task();
    made["transid"] = "zavctl-123-0123456789abcdef";
    EXPECT_EQ(ctl::taskTitle(made), "install ux (0123456789abcdef-7)");
}

TEST(TimeTaken, IsThatFromTheAcceptanceToTheEnd) {
    EXPECT_EQ(ctl::timeTaken(task()), std::chrono::seconds(189));
    EXPECT_EQ(ctl::timeTaken(json{{"accepted", "2026-03-01T11:55:00Z"}}), std::chrono::seconds(0));
}

}  // namespace
