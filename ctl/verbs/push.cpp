#include "ctl/verbs/push.h"

#include <algorithm>
#include <chrono>
#include <cstdio>
#include <nlohmann/json.hpp>
#include <numeric>

#include "ctl/client/transfer/pusher.h"
#include "ctl/show/transfer_progress.h"
#include "ctl/show/transfer_status.h"
#include "ctl/verbs/invocation.h"
#include "ctl/verbs/verb_table.h"

using nlohmann::json;

namespace ctl {
namespace {

constexpr Argument kFile =
    positional("FILE", "File or folder").required().completedBy(Completion::LocalFile);
constexpr Argument kDestination =
    positional("DEST",
               "Name in the depot; the file's own if not given, and below it if it ends in /")
        .completedBy(Completion::DepotFile);
constexpr Argument kArguments[] = {kFile, kDestination};

std::uintmax_t sum(const std::vector<PushedFile>& files, std::uintmax_t PushedFile::*bytes) {
    return std::accumulate(
        files.begin(), files.end(), std::uintmax_t{0},
        [bytes](std::uintmax_t total, const PushedFile& file) { return total + file.*bytes; });
}

json reportDocument(const PushReport& report) {
    json files = json::array();
    for (const PushedFile& file : report.files) {
        files.push_back({{"name", file.name},
                         {"bytes", file.sent},
                         {"status", file.worst.status},
                         {"fault", file.worst.fault},
                         {"meaning", statusText(file.worst)}});
    }
    return {{"files", files},
            {"bytes", sum(report.files, &PushedFile::sent)},
            {"seconds", report.seconds}};
}

std::string successText(const std::string& what, double bytes, double seconds) {
    seconds = std::max(seconds, 1e-6);
    char time[32];
    std::snprintf(time, sizeof time, "%.2f s", seconds);
    return "push " + what + ": done; " + bytesText(bytes) + " in " + time + ", " +
           bytesText(bytes / seconds) + "/s\n";
}

std::string reportText(const PushReport& report) {
    const std::size_t count = report.files.size();
    const std::string what =
        count == 1 ? report.files.front().name : std::to_string(count) + " files";
    std::string text;
    std::size_t failed = 0;
    for (const PushedFile& file : report.files) {
        if (file.wasTaken()) continue;
        ++failed;
        text += file.name + ": " + statusText(file.worst) + "\n";
    }
    if (failed == 0) {
        return successText(what, double(sum(report.files, &PushedFile::sent)), report.seconds);
    }
    return text + "push " + what + ": failed; " + std::to_string(failed) + " of " +
           std::to_string(count) + " not taken\n";
}

ExitStatus run(const Invocation& invocation) {
    return print(showPush(askPush(invocation), invocation.format));
}

}  // namespace

constexpr Verb kPushVerb = {
    "push",     "Send a file, or a folder file by file, to the depot",
    kArguments, {"zavctl push package.tar", "zavctl push bundle/ ux/7.1"},
    run,
};

PushReport askPush(const Invocation& invocation) {
    PushReport report;
    report.files = filesToPush(invocation.given.text(kFile), invocation.given.text(kDestination));
    Progress progress(sum(report.files, &PushedFile::size), invocation.format == Format::Text);
    const auto begin = std::chrono::steady_clock::now();
    Pusher pusher(invocation.host, [&progress](std::uintmax_t bytes) { progress.add(bytes); });
    for (PushedFile& file : report.files)
        pusher.push(file);
    pusher.finish();
    const std::chrono::duration<double> elapsed = std::chrono::steady_clock::now() - begin;
    report.seconds = elapsed.count();
    return report;
}

Page showPush(const PushReport& report, Format format) {
    const bool allTaken = std::all_of(report.files.begin(), report.files.end(),
                                      [](const PushedFile& file) { return file.wasTaken(); });
    const ExitStatus status = allTaken ? kSuccess : kHostReportedFailure;
    if (format == Format::Json) return jsonPage(reportDocument(report), status);
    return {reportText(report), {}, status};
}

}  // namespace ctl
