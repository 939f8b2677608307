#include "ctl/verbs/tasks/task_show.h"

#include <nlohmann/json.hpp>

#include "ctl/client/host_client.h"
#include "ctl/client/http/percent_encoding.h"
#include "ctl/show/tasks/task_record.h"
#include "ctl/verbs/invocation.h"
#include "ctl/verbs/tasks/task_argument.h"
#include "ctl/verbs/verb_table.h"

using nlohmann::json;

namespace ctl {
namespace {

constexpr Argument kArguments[] = {kTask};

ExitStatus run(const Invocation& invocation) {
    const std::string path = "/v1/tasks/" + percentEncoded(invocation.given.text(kTask));
    const json record = HostClient(invocation.host.socket).get(path, invocation.deadline());
    return print(showRecord(record, std::chrono::system_clock::now(), invocation.format));
}

}  // namespace

constexpr Verb kTaskShowVerb = {
    "task show", "Show what became of a task",
    kArguments,  {"zavctl task show deploy-7", "zavctl --json task show deploy-7"},
    run,
};

Page showRecord(const json& record, WallTime now, Format format) {
    if (format == Format::Json) return jsonPage(record);
    return {recordText(record, now), {}};
}

}  // namespace ctl
