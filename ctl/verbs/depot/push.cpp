#include "ctl/verbs/depot/push.h"

#include <numeric>
#include <utility>

#include "ctl/client/transfer/push.h"
#include "ctl/show/transfers/transfer_progress.h"
#include "ctl/verbs/invocation.h"
#include "ctl/verbs/verb_table.h"

namespace ctl {
namespace {

constexpr Argument kFile =
    positional("FILE", "File or folder").required().completedBy(Completion::LocalFile);
constexpr Argument kDestination =
    positional("DEST",
               "Name in the depot; the file's own if not given, and below it if it ends in /")
        .completedBy(Completion::DepotFile);
constexpr Argument kChecksum = flag("--checksum", "Print the SHA-256 of what arrives");
constexpr Argument kNoVerify =
    flag("--no-verify", "Do not compare the files in the depot with what was sent");
constexpr Argument kFollow =
    flag("--follow", "Push files outside the folder too that links in it lead to");
constexpr Argument kArguments[] = {kFile, kDestination, kChecksum, kNoVerify, kFollow};

ExitStatus run(const Invocation& invocation) {
    return print(showPush(askPush(invocation), invocation.format));
}

std::uintmax_t sizeOf(const std::vector<PushedFile>& files) {
    return std::accumulate(
        files.begin(), files.end(), std::uintmax_t{0},
        [](std::uintmax_t total, const PushedFile& file) { return total + file.size; });
}

}  // namespace

constexpr Verb kPushVerb = {
    "push",     "Send a file, or a folder file by file, to the depot",
    kArguments, {"zavctl push package.tar", "zavctl push bundle/ ux/7.1"},
    run,
};

PushReport askPush(const Invocation& invocation) {
    const Links links = invocation.given.flag(kFollow) ? Links::All : Links::Inside;
    PushPlan plan =
        filesToPush(invocation.given.text(kFile), invocation.given.text(kDestination), links);
    Progress progress(sizeOf(plan.files), invocation.format == Format::Text);
    PushOptions options;
    options.verifies = !invocation.given.flag(kNoVerify);
    options.wantsSums = invocation.given.flag(kChecksum);
    options.isInterruptible = true;
    options.onAnswer = [&](std::uintmax_t bytes) { progress.add(bytes); };
    return pushToDepot(invocation.host, std::move(plan), options);
}

}  // namespace ctl
