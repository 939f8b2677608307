#include "ctl/verbs/depot/push_page.h"

#include <algorithm>
#include <cstdio>
#include <nlohmann/json.hpp>
#include <numeric>

#include "ctl/show/printable.h"
#include "ctl/show/transfers/transfer_progress.h"
#include "ctl/show/transfers/transfer_status.h"

using nlohmann::json;

namespace ctl {
namespace {

/// Notes of a folder with many odd entries do not bury the result.
constexpr std::size_t kMostNotes = 20;

std::uintmax_t sum(const std::vector<PushedFile>& files, std::uintmax_t PushedFile::*bytes) {
    return std::accumulate(
        files.begin(), files.end(), std::uintmax_t{0},
        [bytes](std::uintmax_t total, const PushedFile& file) { return total + file.*bytes; });
}

json fileDocument(const PushedFile& file, const PushReport& report) {
    json document = {{"name", file.name},
                     {"bytes", file.sent},
                     {"status", file.worst.status},
                     {"fault", file.worst.fault},
                     {"meaning", meaningOf(file, report.refused)}};
    if (!file.guard.empty()) document["guard"] = file.guard;
    if (!file.hint.empty()) document["hint"] = file.hint;
    if (!file.sha256.empty()) document["sha256"] = file.sha256;
    return document;
}

bool allArrived(const PushReport& report) {
    return !report.refused && std::all_of(report.files.begin(), report.files.end(), hasArrived);
}

/// A push that nobody could verify although that was wanted may have gone wrong unnoticed.
ExitStatus statusOf(const PushReport& report) {
    return allArrived(report) && report.verification != Verification::Unknown
               ? kSuccess
               : kHostReportedFailure;
}

json reportDocument(const PushReport& report) {
    json files = json::array();
    for (const PushedFile& file : report.files)
        files.push_back(fileDocument(file, report));
    json document = {{"files", files},
                     {"bytes", sum(report.files, &PushedFile::sent)},
                     {"seconds", report.seconds}};
    if (!report.notes.empty()) document["notes"] = report.notes;
    if (report.verification != Verification::None) {
        document["verified"] = report.verification == Verification::Done && allArrived(report);
    }
    if (report.verification == Verification::Unknown) {
        document["error"] = "not verified: " + report.whyUnknown;
    }
    return document;
}

std::string counted(std::uintmax_t count, const char* one, const char* many) {
    return std::to_string(count) + " " + (count == 1 ? one : many);
}

std::string successText(const std::string& what, double bytes, double seconds) {
    seconds = std::max(seconds, 1e-6);
    char time[32];
    std::snprintf(time, sizeof time, "%.2f s", seconds);
    return "push " + what + ": done; " + bytesText(bytes) + " in " + time + ", " +
           bytesText(bytes / seconds) + "/s\n";
}

std::string notesText(const std::vector<std::string>& notes) {
    std::string text;
    for (std::size_t i = 0; i < std::min(notes.size(), kMostNotes); ++i)
        text += "note: " + printable(notes[i]) + "\n";
    if (notes.size() > kMostNotes) {
        text += "note: and " + std::to_string(notes.size() - kMostNotes) + " more like these\n";
    }
    return text;
}

std::string sumsText(const std::vector<PushedFile>& files) {
    std::string text;
    for (const PushedFile& file : files) {
        if (!file.sha256.empty()) text += file.sha256 + "  " + printable(file.name) + "\n";
    }
    return text;
}

std::string verificationText(const PushReport& report) {
    switch (report.verification) {
        case Verification::Done:
            return "verified: " + counted(report.files.size(), "file", "files") + ", " +
                   counted(sum(report.files, &PushedFile::kept), "byte", "bytes") + "\n";
        case Verification::Unknown:
            return "not verified: " + redacted(report.whyUnknown) + "\n";
        case Verification::NotOffered:
            return "note: not verified: the host cannot compute checksums\n";
        case Verification::None:
            break;
    }
    return "";
}

/// A line for each file that is not in the depot; the number of these.
std::size_t addFailures(const PushReport& report, std::string& text) {
    std::size_t failed = 0;
    for (const PushedFile& file : report.files) {
        if (hasArrived(file)) continue;
        ++failed;
        text += printable(file.name) + ": " + redacted(meaningOf(file, report.refused)) + "\n";
        if (!file.hint.empty()) text += "  " + printable(file.hint) + "\n";
    }
    return failed;
}

std::string reportText(const PushReport& report) {
    const std::size_t count = report.files.size();
    const std::string what =
        count == 1 ? printable(report.files.front().name) : std::to_string(count) + " files";
    std::string text = notesText(report.notes);
    const std::size_t failed = addFailures(report, text);
    if (report.refused) return text + "push " + what + ": refused; nothing was sent\n";
    if (report.showsSums) text += sumsText(report.files);
    if (failed == 0) {
        const auto bytes = double(sum(report.files, &PushedFile::sent));
        return text + successText(what, bytes, report.seconds) + verificationText(report);
    }
    const bool allTaken = std::all_of(report.files.begin(), report.files.end(),
                                      [](const PushedFile& file) { return file.wasTaken(); });
    return text + "push " + what + ": failed; " + std::to_string(failed) + " of " +
           std::to_string(count) + (allTaken ? " not verified\n" : " not taken\n");
}

}  // namespace

bool hasArrived(const PushedFile& file) {
    return file.wasTaken() && file.problem.empty();
}

std::string meaningOf(const PushedFile& file, bool refused) {
    if (!file.problem.empty()) return file.problem;
    if (refused) return "not sent";
    // The host has one status for all that is wrong with a name.
    if (file.worst.status == 6 && leadsOutOfDepot(file.name)) {
        return "the name leads out of the depot";
    }
    return statusText(file.worst);
}

Page showPush(const PushReport& report, Format format) {
    const ExitStatus status = statusOf(report);
    if (format == Format::Json) return jsonPage(reportDocument(report), status);
    return {reportText(report), {}, status};
}

}  // namespace ctl
