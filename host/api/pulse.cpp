#include "host/api/pulse.h"

#include "host/commands/plugin_threads.h"
#include "host/journal/journal.h"

namespace host {
namespace {

constexpr std::chrono::seconds kHangsAfter{60};

bool isOverdue(const std::optional<Pulse::Time>& since, Pulse::Time now) {
    return since && now - *since > kHangsAfter;
}

}  // namespace

Pulse pulseOf(const Journal& journal) {
    return {PluginThreads::ofProcess().deadline(), journal.commitBegan()};
}

std::vector<Hang> hangsOf(const Pulse& pulse, Pulse::Time now) {
    std::vector<Hang> hangs;
    if (isOverdue(pulse.commandDeadline, now)) {
        hangs.push_back({"command",
                         "a command has outlived its time by a minute, so no further task can "
                         "begin"});
    }
    if (isOverdue(pulse.commitBegan, now)) {
        hangs.push_back(
            {"journal", "writing the journal has hung for a minute, so nothing can be accepted"});
    }
    return hangs;
}

}  // namespace host
