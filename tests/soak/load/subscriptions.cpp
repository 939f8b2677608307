#include "soak/load/subscriptions.h"

#include <algorithm>

namespace soak {
namespace {

/// The indexes of the rows that the subscription was to see.
std::vector<std::size_t> wanted(const SubscriptionRecord& record, const Ledger& ledger) {
    std::vector<std::size_t> found;
    const std::size_t end = std::min(record.rowsAfter, ledger.rows().size());
    for (std::size_t i = record.rowsBefore; i < end; ++i) {
        if (record.filter.matches(ledger, ledger.rows()[i])) found.push_back(i);
    }
    return found;
}

/// Follows the items from `at`; where they end, or no value when they leave the way.
bool follow(const SubscriptionRecord& record, const Ledger& ledger,
            const std::vector<std::size_t>& rows, std::size_t& at) {
    for (const SubscriptionRecord::Item& item : record.items) {
        if (item.number == Ledger::kNone) {
            at += item.lost;
            continue;
        }
        if (at >= rows.size()) return false;
        const Ledger::Row& row = ledger.rows()[rows[at]];
        if (row.number != item.number || row.retval != item.retval) return false;
        ++at;
    }
    return at <= rows.size();
}

}  // namespace

bool EventFilter::matches(const Ledger& ledger, const Ledger::Row& row) const {
    const Ledger::Entry& entry = ledger.entry(row.number);
    return (number == Ledger::kNone || number == row.number) &&
           (command.empty() || command == entry.command) &&
           (target.empty() || target == entry.target) &&
           (messageId.empty() || messageId == row.messageId) &&
           (retval < 0 || retval == row.retval);
}

std::string EventFilter::parameters(const Ledger& ledger) const {
    std::string text;
    if (number != Ledger::kNone) text += "&TRANSID=" + ledger.transid(number);
    if (!command.empty()) text += "&COMMAND=" + command;
    if (!target.empty()) text += "&TARGETMSN=" + target;
    if (!messageId.empty()) text += "&RETMSGID=" + messageId;
    if (retval >= 0) text += "&RETVAL=" + std::to_string(retval);
    return text;
}

void judgeSubscription(const SubscriptionRecord& record, const Ledger& ledger, Tally& tally) {
    const std::vector<std::size_t> rows = wanted(record, ledger);
    // It may have begun anywhere up to the first row whose request was sent when it was live.
    for (std::size_t begin = 0;; ++begin) {
        std::size_t end = begin;
        const bool fits =
            follow(record, ledger, rows, end) && (end == rows.size() || rows[end] >= record.cutoff);
        if (fits) return;
        if (begin == rows.size() ||
            ledger.entry(ledger.rows()[rows[begin]].number).sent >= record.live) {
            break;
        }
    }
    tally.fault("the subscription \"" + record.filter.parameters(ledger) +
                "\" lacks rows, has them twice or in another order: " +
                std::to_string(record.items.size()) + " items beside " +
                std::to_string(rows.size()) + " rows from " + std::to_string(record.rowsBefore) +
                " on, of which those before " + std::to_string(record.cutoff) + " must be there");
}

}  // namespace soak
