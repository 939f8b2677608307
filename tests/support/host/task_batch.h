/// Queues many tasks on a host at once and collects how they ended, so that a test with many cases
/// does not wait for each of them.
#pragma once

#include <nlohmann/json.hpp>
#include <string>
#include <vector>

#include "support/host/managed_host.h"

class TaskBatch {
public:
    explicit TaskBatch(const ManagedHost& host) : host_(host) {}

    /// A task by its zavctl arguments, which must be those of a queued command. What follows "--"
    /// stays behind it. Returns the name under which its outcome will be found.
    std::string add(const std::vector<std::string>& arguments);
    /// An INSTALL that runs this command line, as a step between two tasks.
    std::string addCommand(const std::string& command);

    /// Queues all tasks in the order in which they were added and waits for as many outcomes;
    /// throws when they do not come. Outcomes by the name of their task.
    nlohmann::json run();

private:
    const ManagedHost& host_;
    std::vector<std::vector<std::string>> tasks_;
};
