// push: files for the depots of many hosts.

#include <nlohmann/json.hpp>
#include <string>
#include <vector>

#include "ctl/client/tasks/task_request.h"
#include "ctl/show/printable.h"
#include "ctl/verbs/arguments/common_arguments.h"
#include "ctl/verbs/invocation.h"
#include "fleet/operator/orders/brought_files.h"
#include "fleet/operator/verbs/fleet_verbs.h"
#include "fleet/operator/verbs/many_hosts.h"

namespace fleet {
namespace {

constexpr ctl::Argument kFile =
    ctl::positional("FILE", "File or folder").required().completedBy(ctl::Completion::LocalFile);
constexpr ctl::Argument kDestination = ctl::positional(
    "DEST", "Name in the depot; the file's own if not given, and below it if it ends in /");
constexpr ctl::Argument kArguments[] = {kFile, kDestination, ctl::kNoWait};

/// What makes it a verb for many hosts; run() adds the files.
ctl::TaskRequest requestOf(const ctl::Values&) {
    ctl::TaskRequest request;
    request.command = kPush;
    return request;
}

ctl::ExitStatus run(const ctl::Invocation& invocation) {
    const ctl::Values& given = invocation.given;
    std::vector<std::string> notes;
    const std::vector<BroughtFile> files =
        filesToBring(given.text(kFile), given.text(kDestination), notes);
    for (const std::string& note : notes)
        ctl::print({{}, ctl::printable(note) + "\n"});
    Work work;
    work.kind = kPush;
    work.body = nlohmann::json::object();
    for (const BroughtFile& file : files)
        work.files.push_back(file.file);
    return runWork(work, invocation, !given.flag(ctl::kNoWait),
                   [&files](Centre& centre) { bringFiles(centre, files); });
}

}  // namespace

constexpr ctl::Verb kFleetPushVerb = {
    "push",
    "Send a file, or a folder file by file, to the depots of many hosts",
    kArguments,
    {"zavctl --fleet https://centre.example push --on env=test package.tar",
     "zavctl --fleet https://centre.example push --on 'web-*' bundle/ ux/7.1"},
    run,
    requestOf,
};

}  // namespace fleet
