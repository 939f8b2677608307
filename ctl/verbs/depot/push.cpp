#include "ctl/verbs/depot/push.h"

#include <algorithm>
#include <chrono>
#include <numeric>

#include "ctl/client/transfer/arrival.h"
#include "ctl/client/transfer/interruption.h"
#include "ctl/client/transfer/push_check.h"
#include "ctl/client/transfer/pusher.h"
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

void append(std::vector<std::string>& all, const std::vector<std::string>& more) {
    all.insert(all.end(), more.begin(), more.end());
}

/// What a guarded host cannot keep is removed again. One that has just let the whole time-out pass
/// is not given as much again.
std::vector<std::string> cleanUp(HostAddress host, const PushCheck& check,
                                 const std::vector<PushedFile>& files, const Failure& failure) {
    constexpr std::chrono::milliseconds kShort = std::chrono::seconds(5);
    if (failure.status() == kNoOutcome) host.timeout = std::min(host.timeout, kShort);
    return check.guarded ? removePartialFiles(host, files) : namePartialFiles(files);
}

/// The failure with what became of the files that had arrived in part.
Failure withRemains(const Failure& failure, const std::vector<std::string>& remains) {
    const int signal = Interruption::signal();
    // Shells know a program that was ended by a signal by this status.
    const auto status = signal != 0 ? static_cast<ExitStatus>(128 + signal) : failure.status();
    std::string text = signal != 0 ? "interrupted" : failure.what();
    // Of many small files, more than a hundred may be on their way.
    constexpr std::size_t kMost = 5;
    for (std::size_t i = 0; i < std::min(remains.size(), kMost); ++i)
        text += "; " + remains[i];
    if (remains.size() > kMost) {
        text += "; and so on for " + std::to_string(remains.size() - kMost) + " more files";
    }
    return {status, text, failure.hint(), failure.guard()};
}

void sendAll(Pusher& pusher, std::vector<PushedFile>& files) {
    for (PushedFile& file : files)
        pusher.push(file);
    pusher.finish();
    if (Interruption::signal() != 0) throw Failure(kNoHost, "interrupted");
}

/// Sends the files. A push that breaks off does not leave parts of files behind if that can be
/// helped.
void send(const Invocation& invocation, const PushCheck& check, Pusher::Sums sums,
          Progress& progress, PushReport& report) {
    const Interruption interruption;
    const auto begin = std::chrono::steady_clock::now();
    try {
        Pusher pusher(
            invocation.host, [&](std::uintmax_t bytes) { progress.add(bytes); }, sums);
        try {
            sendAll(pusher, report.files);
        } catch (const Failure&) {
            pusher.abandon();
            throw;
        }
    } catch (const Failure& failure) {
        throw withRemains(failure, cleanUp(invocation.host, check, report.files, failure));
    }
    const std::chrono::duration<double> elapsed = std::chrono::steady_clock::now() - begin;
    report.seconds = elapsed.count();
}

void verify(const HostAddress& host, const PushCheck& check, PushReport& report) {
    if (check.isOlder) {
        report.verification = Verification::NotOffered;
        return;
    }
    if (!check.known) {
        report.verification = Verification::Unknown;
        report.whyUnknown = check.whyUnknown;
        return;
    }
    if (!check.guarded) return;
    report.whyUnknown = verifyArrival(host, report.files);
    report.verification = report.whyUnknown.empty() ? Verification::Done : Verification::Unknown;
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
    PushReport report;
    report.files = std::move(plan.files);
    report.notes = std::move(plan.skipped);
    Progress progress(sizeOf(report.files), invocation.format == Format::Text);
    const PushCheck check = checkPush(invocation.host, report.files);
    append(report.notes, check.notes);
    report.refused = !check.taken;
    if (report.refused) return report;

    const bool verifies = !invocation.given.flag(kNoVerify);
    report.showsSums = invocation.given.flag(kChecksum);
    const bool needsSums = report.showsSums || (verifies && check.guarded);
    const auto sums = needsSums ? Pusher::Sums::Yes : Pusher::Sums::No;
    send(invocation, check, sums, progress, report);
    if (check.guarded) {
        append(report.notes, removePartialFiles(invocation.host, report.files));
    }
    explainRefusals(invocation.host, report.files);
    if (verifies) verify(invocation.host, check, report);
    return report;
}

}  // namespace ctl
