#include "ctl/show/instance_table.h"

#include <nlohmann/json.hpp>

#include "ctl/client/row.h"
#include "ctl/show/printable.h"
#include "ctl/show/table.h"

using nlohmann::json;

namespace ctl {

std::string instanceTable(const json& instances) {
    json shown = json::array();
    for (const json& instance : instances) {
        const std::string state = textOf(instance, "state");
        if (state == "stopped") continue;
        shown.push_back({{"target", printable(textOf(instance, "target"))},
                         {"state", state == "missing" ? "should run, does not" : printable(state)},
                         {"user", printable(textOf(instance, "user"))},
                         {"pid", printable(textOf(instance, "pid"))}});
    }
    if (shown.empty()) return {};
    return tableText(
        shown, {{"target", "INSTANCE"}, {"state", "STATE"}, {"user", "USER"}, {"pid", "PROCESS"}});
}

}  // namespace ctl
