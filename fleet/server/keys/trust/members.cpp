#include "fleet/server/keys/trust/members.h"

#include "fleet/server/keys/trust/names.h"

namespace fleet {
namespace {

Member memberOf(const sqlite::Statement& row) {
    const Labels given = labelsKept(row.bytes(3));
    return {row.bytes(1), row.bytes(2), given, given};
}

}  // namespace

std::shared_ptr<const Members> MemberList::current() {
    // The first changes with what other connections commit, the second with what this one does.
    const std::pair<std::int64_t, std::int64_t> state{database_.number("PRAGMA data_version"),
                                                      database_.number("SELECT total_changes()")};
    if (members_ && state == seen_) return members_;
    Members members;
    sqlite::Statement rows = database_.ask(
        "SELECT host, name, signing, labels FROM hosts h WHERE host IS NOT NULL AND NOT EXISTS "
        "(SELECT 1 FROM revocations r WHERE r.key = h.host)");
    while (rows.step())
        members[rows.bytes(0)] = memberOf(rows);
    members_ = std::make_shared<const Members>(std::move(members));
    seen_ = state;
    return members_;
}

bool MemberList::label(const std::string& host, const Labels& labels) {
    if (current()->count(host) == 0) return false;
    database_.change("UPDATE hosts SET labels = ? WHERE host = ?", keptLabels(labels), host);
    return true;
}

}  // namespace fleet
