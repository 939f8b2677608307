#include "ctl/client/depot_client.h"

#include <nlohmann/json.hpp>

#include "ctl/client/failure.h"
#include "ctl/client/host_client.h"
#include "ctl/client/http/percent_encoding.h"
#include "ctl/client/row.h"

using nlohmann::json;

namespace ctl {
namespace {

/// The host takes a request's head up to 16 KiB.
constexpr std::size_t kLongestTarget = 12'000;

/// One request asks about as many paths as fit. Each answer's array `files` has a row for each.
template <typename Ask>
json askInParts(const std::vector<std::string>& paths, const std::string& begin, Ask ask) {
    json whole;
    for (std::size_t at = 0; at < paths.size();) {
        std::string target = begin;
        const std::size_t first = at;
        while (at < paths.size()) {
            const std::string parameter = "path=" + percentEncoded(paths[at]);
            if (at > first && target.size() + parameter.size() > kLongestTarget) break;
            if (target.back() != '?') target += '&';
            target += parameter;
            ++at;
        }
        const json answer = ask(target);
        if (answer.is_null()) return answer;
        if (!answer.is_object() || !answer.contains("files") || !answer["files"].is_array() ||
            answer["files"].size() != at - first) {
            throw Failure(kNoHost, "the host's answer about the depot makes no sense");
        }
        if (whole.is_null()) {
            whole = answer;
        } else {
            // Together they may replace what each request knows only a part of.
            whole["replaced_bytes"] =
                countOf(whole, "replaced_bytes") + countOf(answer, "replaced_bytes");
            whole["files"].insert(whole["files"].end(), answer["files"].begin(),
                                  answer["files"].end());
        }
    }
    return whole;
}

}  // namespace

json DepotClient::check(const std::vector<std::string>& names, std::uintmax_t bytes) const {
    const HostClient client(host_.socket);
    const std::string begin = "/v1/depot/check?bytes=" + std::to_string(bytes);
    return askInParts(names, begin, [&](const std::string& target) {
        return client.getIfThere(target, deadlineIn(host_.timeout));
    });
}

json DepotClient::sums(const std::vector<std::string>& paths) const {
    const HostClient client(host_.socket);
    const json answer = askInParts(paths, "/v1/depot/sum?", [&](const std::string& target) {
        return client.getIfThere(target, deadlineIn(host_.timeout));
    });
    return answer.is_null() ? json() : answer["files"];
}

json DepotClient::list(const std::string& path) const {
    const std::string target = "/v1/depot?path=" + percentEncoded(path);
    return HostClient(host_.socket).get(target, deadlineIn(host_.timeout));
}

void DepotClient::remove(const std::string& path, bool recursive) const {
    const std::string target =
        "/v1/depot?path=" + percentEncoded(path) + (recursive ? "&recursive=1" : "");
    HostClient(host_.socket).remove(target, deadlineIn(host_.timeout));
}

}  // namespace ctl
