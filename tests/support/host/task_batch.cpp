#include "support/host/task_batch.h"

#include <stdexcept>

using nlohmann::json;

std::string TaskBatch::add(const std::vector<std::string>& arguments) {
    const std::string name = "batch-" + std::to_string(tasks_.size());
    std::vector<std::string> task = {"--json"};
    task.insert(task.end(), arguments.begin(), arguments.end());
    auto end = task.begin();
    while (end != task.end() && *end != "--")
        ++end;
    const std::vector<std::string> more = {"--no-wait", "--transid", name};
    task.insert(end, more.begin(), more.end());
    tasks_.push_back(task);
    return name;
}

std::string TaskBatch::addCommand(const std::string& command) {
    return add({"install", "step", "1", "--", command});
}

json TaskBatch::run() {
    const auto events =
        host_.startZavctl({"events", "--count", std::to_string(tasks_.size()), "--timeout", "50"});
    const bool subscribed = eventually([&] {
        const json status = json::parse(host_.zavctl({"--json", "status"}).out, nullptr, false);
        return status.is_object() && status.value("subscriptions", 0) >= 1;
    });
    if (!subscribed) throw std::runtime_error("the host takes no subscription");
    for (const auto& task : tasks_) {
        const ProgramResult queued = host_.zavctl(task);
        if (queued.status != 0) {
            throw std::runtime_error("a task is refused: " + queued.out + queued.err);
        }
    }
    const ProgramResult seen = events->wait();
    if (seen.status != 0) {
        throw std::runtime_error("not all tasks ended: " + seen.out + seen.err);
    }
    json outcomes = json::object();
    const json document = json::parse(seen.out);
    for (const json& row : document["events"])
        outcomes[row["TRANSID"].get<std::string>()] = row;
    return outcomes;
}
