#include "ctl/verbs/depot/depot_ls.h"

#include <nlohmann/json.hpp>

#include "ctl/client/depot_client.h"
#include "ctl/client/row.h"
#include "ctl/client/transfer/pushed_file.h"
#include "ctl/show/printable.h"
#include "ctl/show/table.h"
#include "ctl/verbs/invocation.h"
#include "ctl/verbs/verb_table.h"

using nlohmann::json;

namespace ctl {
namespace {

constexpr Argument kPath =
    positional("PATH", "Folder or file in the depot; the whole depot if not given")
        .completedBy(Completion::DepotFile);
constexpr Argument kLong = flag("-l", "Show types, sizes and times");
constexpr Argument kArguments[] = {kPath, kLong};

ExitStatus run(const Invocation& invocation) {
    const std::string path = pathInDepot(invocation.given.text(kPath));
    return print(showDepot(DepotClient(invocation.host).list(path), invocation.given.flag(kLong),
                           invocation.format, std::chrono::system_clock::now()));
}

/// Folders are marked as such.
std::string nameOf(const json& entry) {
    return printable(textOf(entry, "name")) + (textOf(entry, "type") == "directory" ? "/" : "");
}

std::string namesText(const json& entries) {
    std::string text;
    for (const json& entry : entries)
        text += nameOf(entry) + "\n";
    return text;
}

std::string longText(const json& entries, WallTime now) {
    json rows = json::array();
    for (const json& entry : entries) {
        rows.push_back({{"type", textOf(entry, "type")},
                        {"bytes", textOf(entry, "bytes")},
                        {"modified", timeText(textOf(entry, "modified"), now)},
                        {"name", nameOf(entry)}});
    }
    return tableText(
        rows, {{"type", "TYPE"}, {"bytes", "BYTES"}, {"modified", "MODIFIED"}, {"name", "NAME"}});
}

}  // namespace

constexpr Verb kDepotLsVerb = {
    "depot ls", "List what the depot holds",
    kArguments, {"zavctl depot ls", "zavctl depot ls -l ux/7.1"},
    run,
};

Page showDepot(const json& listing, bool isLong, Format format, WallTime now) {
    const auto found = listing.find("entries");
    if (found == listing.end() || !found->is_array()) {
        throw Failure(kNoHost, "the host's answer is not a list of what the depot holds");
    }
    if (format == Format::Json) return jsonPage(listing);
    const json& entries = *found;
    Page page;
    if (!entries.empty()) page.out = isLong ? longText(entries, now) : namesText(entries);
    if (!flagOf(listing, "complete", true)) {
        page.err = complaint("the folder holds more; these are " + std::to_string(entries.size()) +
                             " of its entries");
    }
    return page;
}

}  // namespace ctl
