#include "fleet/link/questions/allowed_tasks.h"

#include <nlohmann/json.hpp>
#include <utility>

#include "fleet/bus/messages/question.h"

using nlohmann::json;

namespace fleet {
namespace {

constexpr int kMostLists = 20;

bool maySee(const json& task, const Certificate& certificate) {
    const auto product = task.find("product");
    const bool isOfProduct = product != task.end() && product->is_string();
    return allows(certificate, kAsksTasks,
                  isOfProduct ? product->get_ref<const std::string&>() : std::string());
}

/// Where the host's next list begins; "" if this was the last one.
std::string cursorIn(const json& document) {
    const auto next = document.find("next");
    if (next == document.end() || next->is_null()) return {};
    return next->is_string() ? next->get<std::string>() : next->dump();
}

}  // namespace

json allowedTasks(const AskTasks& ask, Number most, const Certificate& certificate) {
    json seen = json::array();
    json document;
    std::string after;
    for (int list = 0; list < kMostLists; ++list) {
        document = ask(most - seen.size(), after);
        const auto tasks = document.find("tasks");
        if (tasks == document.end() || !tasks->is_array()) break;
        for (json& task : *tasks) {
            const bool isSeen = task.is_object() && maySee(task, certificate);
            if (isSeen && seen.size() < most) seen.push_back(std::move(task));
        }
        after = cursorIn(document);
        if (after.empty() || seen.size() >= most) break;
    }
    document["tasks"] = std::move(seen);
    return document;
}

}  // namespace fleet
