#include "host/service/task_status.h"

#include <gtest/gtest.h>

namespace {

using host::taskStatus;

host::Task task(const std::string& command, const std::string& product) {
    host::Task made;
    made.request = {{"COMMAND", command}, {"PRODUCT", product}};
    return made;
}

TEST(TaskStatus, CountsWhatWaitsAndNamesWhatRuns) {
    EXPECT_EQ(taskStatus(0, {}), "idle");
    EXPECT_EQ(taskStatus(2, {}), "2 queued");
    EXPECT_EQ(taskStatus(0, {task("INSTALL", "ux")}), "1 running: INSTALL ux");
    EXPECT_EQ(taskStatus(2, {task("INSTALL", "ux")}), "2 queued, 1 running: INSTALL ux");
    EXPECT_EQ(taskStatus(0, {task("START", "ux"), task("COMPLETE_INSTALL", "")}),
              "2 running: START ux, COMPLETE_INSTALL");
}

TEST(TaskStatus, WhatClientsWriteBeginsNoMessageOfItsOwn) {
    EXPECT_EQ(taskStatus(0, {task("START", "u\nMAINPID=1\xE4")}), "1 running: START u?MAINPID=1?");
    EXPECT_EQ(taskStatus(0, {task("START", std::string(1000, 'x'))}),
              "1 running: START " + std::string(32, 'x'));
}

}  // namespace
