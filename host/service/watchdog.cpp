#include "host/service/watchdog.h"

namespace host {
namespace {

constexpr std::chrono::seconds kHangsAfter{60};

bool isOverdue(const std::optional<Pulse::Time>& since, Pulse::Time now) {
    return since && now - *since > kHangsAfter;
}

}  // namespace

bool isAlive(const Pulse& pulse, Pulse::Time now) {
    return !isOverdue(pulse.commandDeadline, now) && !isOverdue(pulse.commitBegan, now);
}

}  // namespace host
