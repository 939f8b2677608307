#include "fleet/server/core/centre_counts.h"

#include <chrono>
#include <string>
#include <vector>

#include "fleet/bus/messages/document.h"
#include "fleet/bus/messages/order.h"
#include "fleet/bus/trust/signed.h"

namespace fleet {
namespace {

/// The commands of the host's tasks, and what only a fleet has.
std::vector<std::string> countedCommands() {
    return {"START",     "STOP",           "RESTART",          "INSTALL", "UNINSTALL",
            "SETCONFIG", "REMOVEINSTANCE", "COMPLETE_INSTALL", kCancel,   kPush};
}

std::vector<std::string> countedEnds() {
    return {"done", "failed", "refused", "cancelled", "expired", "interrupted", kUnknown};
}

/// From a disk with a cache of its own to one that is as good as broken.
std::vector<metrics::Histogram::Duration> commitBounds() {
    using std::chrono::milliseconds;
    return {milliseconds(1),   milliseconds(5),   milliseconds(10),   milliseconds(50),
            milliseconds(100), milliseconds(500), milliseconds(1000), milliseconds(5000)};
}

/// "" if the record has no order, as one of which only the host's journal knows.
std::string commandOf(const OrderRecord& record) {
    try {
        const auto numbered = partsOf(record.bytes);
        return numbered ? readOrder(numbered->carried).order.kind : "";
    } catch (const MessageError&) {
        return "";
    }
}

}  // namespace

CentreCounts::CentreCounts()
    : commits(commitBounds()), outcomes_(countedCommands(), countedEnds()) {}

void CentreCounts::noteOutcome(const OrderRecord& order, const EndState& state) {
    outcomes_.at(commandOf(order)).at(state).add();
}

}  // namespace fleet
