#include "ctl/client/transfer/push.h"

#include <algorithm>
#include <chrono>
#include <optional>
#include <utility>

#include "ctl/client/failure.h"
#include "ctl/client/transfer/arrival.h"
#include "ctl/client/transfer/interruption.h"
#include "ctl/client/transfer/push_check.h"

namespace ctl {
namespace {

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
void send(const HostAddress& host, const PushCheck& check, const PushOptions& options,
          Pusher::Sums sums, PushReport& report) {
    std::optional<Interruption> interruption;
    if (options.isInterruptible) interruption.emplace();
    const auto begin = std::chrono::steady_clock::now();
    try {
        Pusher pusher(host, options.onAnswer, sums);
        try {
            sendAll(pusher, report.files);
        } catch (const Failure&) {
            pusher.abandon();
            throw;
        }
    } catch (const Failure& failure) {
        throw withRemains(failure, cleanUp(host, check, report.files, failure));
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

PushReport pushToDepot(const HostAddress& host, PushPlan plan, const PushOptions& options) {
    PushReport report;
    report.files = std::move(plan.files);
    report.notes = std::move(plan.skipped);
    report.showsSums = options.wantsSums;
    const PushCheck check = checkPush(host, report.files);
    append(report.notes, check.notes);
    report.refused = !check.taken;
    if (report.refused) return report;

    const bool needsSums = options.wantsSums || (options.verifies && check.guarded);
    send(host, check, options, needsSums ? Pusher::Sums::Yes : Pusher::Sums::No, report);
    if (check.guarded) append(report.notes, removePartialFiles(host, report.files));
    explainRefusals(host, report.files);
    if (options.verifies) verify(host, check, report);
    return report;
}

}  // namespace ctl
