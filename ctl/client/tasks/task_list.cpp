#include "ctl/client/tasks/task_list.h"

#include <algorithm>

#include "ctl/client/failure.h"
#include "ctl/client/http/percent_encoding.h"
#include "ctl/client/row.h"

using nlohmann::json;

namespace ctl {
namespace {

/// The host gives no more at once.
constexpr std::size_t kPage = 1000;

std::string targetOf(const TaskFilter& filter, std::size_t limit, const std::string& after) {
    std::string target = "/v1/tasks?limit=" + std::to_string(limit);
    if (!filter.state.empty()) target += "&state=" + percentEncoded(filter.state);
    if (!filter.product.empty()) target += "&product=" + percentEncoded(filter.product);
    if (!after.empty()) target += "&after=" + percentEncoded(after);
    return target;
}

}  // namespace

json listTasks(const HostClient& client, const TaskFilter& filter, Deadline deadline) {
    json tasks = json::array();
    json next;
    do {
        const std::size_t limit = std::min(filter.limit - tasks.size(), kPage);
        json page = client.getIfThere(targetOf(filter, limit, valueText(next)), deadline);
        const auto list = page.find("tasks");
        if (list == page.end() || !list->is_array()) {
            throw Failure(kHostReportedFailure, "this host does not list its tasks");
        }
        if (list->empty()) return {{"tasks", std::move(tasks)}, {"next", nullptr}};
        for (json& task : *list)
            tasks.push_back(std::move(task));
        next = page.contains("next") ? page["next"] : json();
    } while (!next.is_null() && tasks.size() < filter.limit);
    return {{"tasks", std::move(tasks)}, {"next", std::move(next)}};
}

}  // namespace ctl
