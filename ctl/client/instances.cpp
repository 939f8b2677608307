#include "ctl/client/instances.h"

#include <algorithm>
#include <chrono>
#include <nlohmann/json.hpp>
#include <utility>

#include "ctl/client/failure.h"

using nlohmann::json;

namespace ctl {

json listInstances(const HostClient& client, Deadline deadline) {
    constexpr std::chrono::seconds kPatience{15};
    json answer = client.getIfThere("/v1/instances", std::min(deadline, deadlineIn(kPatience)));
    if (answer.is_null()) return answer;
    const auto found = answer.is_object() ? answer.find("instances") : answer.end();
    if (found == answer.end() || !found->is_array()) {
        throw Failure(kNoHost, "the host's answer does not say which agents run");
    }
    return std::move(*found);
}

}  // namespace ctl
