#include "ctl/verbs/depot/depot_ls.h"

#include <nlohmann/json.hpp>

#include "ctl/client/depot_client.h"
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
                           invocation.format));
}

/// Folders are marked as such.
std::string nameOf(const json& entry) {
    return printable(entry.value("name", "")) + (entry.value("type", "") == "directory" ? "/" : "");
}

std::string namesText(const json& entries) {
    std::string text;
    for (const json& entry : entries)
        text += nameOf(entry) + "\n";
    return text;
}

std::string longText(const json& entries) {
    json rows = json::array();
    for (const json& entry : entries) {
        rows.push_back({{"type", entry.value("type", "")},
                        {"bytes", std::to_string(entry.value("bytes", std::uint64_t{0}))},
                        {"modified", entry.value("modified", "")},
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

Page showDepot(const json& listing, bool isLong, Format format) {
    if (format == Format::Json) return jsonPage(listing);
    const json entries = listing.value("entries", json::array());
    Page page;
    if (!entries.empty()) page.out = isLong ? longText(entries) : namesText(entries);
    if (!listing.value("complete", true)) {
        page.err = complaint("the folder holds more; these are " + std::to_string(entries.size()) +
                             " of its entries");
    }
    return page;
}

}  // namespace ctl
