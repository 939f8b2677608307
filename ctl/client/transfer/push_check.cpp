#include "ctl/client/transfer/push_check.h"

#include <nlohmann/json.hpp>
#include <numeric>

#include "ctl/client/depot_client.h"
#include "ctl/client/failure.h"
#include "ctl/client/row.h"
#include "ctl/client/transfer/content.h"

using nlohmann::json;

namespace ctl {
namespace {

/// The operation's status for a name that is not taken.
constexpr int kRefused = 6;

std::vector<std::string> namesOf(const std::vector<PushedFile>& files) {
    std::vector<std::string> names;
    for (const PushedFile& file : files)
        names.push_back(file.name);
    return names;
}

std::uintmax_t bytesOf(const std::vector<PushedFile>& files) {
    return std::accumulate(
        files.begin(), files.end(), std::uintmax_t{0},
        [](std::uintmax_t sum, const PushedFile& file) { return sum + file.size; });
}

void store(const json& row, PushedFile& file) {
    file.converted = flagOf(row, "converted", false);
    file.replaces = flagOf(row, "replaces", false);
    if (flagOf(row, "taken", true)) return;
    file.problem = textOf(row, "error");
    if (file.problem.empty()) file.problem = "the host does not take it";
    file.guard = textOf(row, "guard");
    file.hint = textOf(row, "hint");
}

void refuseForSpace(const json& answer, std::uintmax_t needed) {
    const std::uintmax_t room = countOf(answer, "free_bytes") + countOf(answer, "replaced_bytes");
    if (needed <= room) return;
    throw Failure(kHostReportedFailure,
                  "the push needs " + std::to_string(needed) +
                      " bytes, and the depot has room for " + std::to_string(room) +
                      "; zavctl depot rm removes what is no longer needed there");
}

/// Text passes, with a note when it changes; what is no text and would change is refused.
void lookInto(PushedFile& file, std::vector<std::string>& notes) {
    const Content content = contentOf(file.source);
    if (!content.changes) return;
    if (content.isText) {
        notes.push_back(file.name + ": its line ends change on the host, because of its name");
        return;
    }
    file.problem = "it is no text, and the host would drop bytes from it because of its name";
    file.guard = "depot-content";
    file.hint = "Safe is a name without install.sh, DeployLnk.sh and .mdl, such as " +
                unconvertedName(file.name) + ".";
}

PushCheck checkGuarded(std::vector<PushedFile>& files, PushCheck check) {
    for (PushedFile& file : files) {
        if (file.converted && file.problem.empty()) lookInto(file, check.notes);
        if (file.problem.empty()) continue;
        check.taken = false;
        file.worst.status = kRefused;
    }
    return check;
}

}  // namespace

PushCheck checkPush(const HostAddress& host, std::vector<PushedFile>& files) {
    PushCheck check;
    json answer;
    try {
        answer = DepotClient(host).check(namesOf(files), bytesOf(files));
    } catch (const Failure& failure) {
        // A host that hangs would let the transfer wait as long again.
        if (failure.status() == kNoOutcome) {
            throw Failure(kNoOutcome,
                          "the host did not answer within the time-out; nothing was sent");
        }
        // The transfer has a socket of its own, and its own words when nobody listens there. What
        // the host would do to a file is known without asking, and it may do it all the same.
        check.whyUnknown = failure.what();
        for (PushedFile& file : files)
            file.converted = unconvertedName(file.name) != file.name;
        return checkGuarded(files, std::move(check));
    }
    if (answer.is_null()) {
        check.isOlder = true;
        return check;
    }
    check.known = true;
    check.guarded = flagOf(answer, "guarded", false);
    for (std::size_t i = 0; i < files.size(); ++i)
        store(answer["files"][i], files[i]);
    if (!check.guarded) {
        // Nothing is held back, so that what the transfer itself says counts.
        for (PushedFile& file : files)
            file.problem = file.guard = file.hint = std::string();
        return check;
    }
    refuseForSpace(answer, bytesOf(files));
    return checkGuarded(files, std::move(check));
}

void explainRefusals(const HostAddress& host, std::vector<PushedFile>& files) {
    for (PushedFile& file : files) {
        if (file.worst.status != kRefused || !file.problem.empty()) continue;
        try {
            const json answer = DepotClient(host).check({file.name}, 0);
            if (!answer.is_null()) store(answer["files"][0], file);
        } catch (const Failure&) {  // the status has words of its own
            return;
        }
    }
}

}  // namespace ctl
