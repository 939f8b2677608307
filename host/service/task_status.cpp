#include "host/service/task_status.h"

#include <cstddef>
#include <string_view>

#include "host/tables/plugin_facts.h"

namespace host {
namespace {

constexpr std::size_t kLongestWord = 32;

/// A line break would begin another message to the service manager.
std::string printable(std::string_view text) {
    std::string result(text.substr(0, kLongestWord));
    for (char& character : result) {
        if (character < ' ' || character > '~') character = '?';
    }
    return result;
}

}  // namespace

std::string wordsForTask(const Task& task) {
    const std::string command = printable(task.value(plugin::kCommandColumn));
    const std::string product = printable(task.value(plugin::kProductColumn));
    return product.empty() ? command : command + " " + product;
}

std::string taskStatus(std::int64_t queued, const std::vector<Task>& running) {
    if (queued <= 0 && running.empty()) return "idle";
    std::string line;
    if (queued > 0) line = std::to_string(queued) + " queued";
    if (running.empty()) return line;
    if (!line.empty()) line += ", ";
    line += std::to_string(running.size()) + " running: ";
    for (const Task& task : running)
        line += (&task == &running.front() ? "" : ", ") + wordsForTask(task);
    return line;
}

}  // namespace host
