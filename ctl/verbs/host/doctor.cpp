#include "ctl/verbs/host/doctor.h"

#include <algorithm>
#include <nlohmann/json.hpp>
#include <string>

#include "ctl/client/host_client.h"
#include "ctl/show/printable.h"
#include "ctl/verbs/invocation.h"
#include "ctl/verbs/verb_table.h"

using nlohmann::json;

namespace ctl {
namespace {

/// As wide as in the output of zavhost --check.
constexpr std::size_t kResultWidth = 9;
constexpr std::size_t kNameWidth = 14;

ExitStatus run(const Invocation& invocation) {
    const HostClient client(invocation.host.socket);
    return print(showChecks(client.get("/v1/doctor", invocation.deadline()), invocation.format));
}

std::string text(const json& check, const char* member) {
    const auto found = check.is_object() ? check.find(member) : check.end();
    if (found == check.end() || !found->is_string()) {
        throw Failure(kNoHost, "the host's answer is not a list of checks");
    }
    return printable(found->get_ref<const std::string&>());
}

std::string column(std::string text, std::size_t width) {
    text.resize(std::max(text.size() + 1, width), ' ');
    return text;
}

std::string lineOf(const json& check) {
    const std::string remedy = text(check, "remedy");
    return column(text(check, "result"), kResultWidth) + column(text(check, "check"), kNameWidth) +
           text(check, "text") + (remedy.empty() ? "" : "; " + remedy) + "\n";
}

}  // namespace

constexpr Verb kDoctorVerb = {
    "doctor", "Check the host's home and machine", {}, {"zavctl doctor", "zavctl --json doctor"},
    run,
};

Page showChecks(const json& checks, Format format) {
    if (!checks.is_array()) throw Failure(kNoHost, "the host's answer is not a list of checks");
    Page page;
    for (const json& check : checks) {
        page.out += lineOf(check);
        if (text(check, "result") == "error") page.status = kHostReportedFailure;
    }
    return format == Format::Json ? jsonPage(checks, page.status) : page;
}

}  // namespace ctl
