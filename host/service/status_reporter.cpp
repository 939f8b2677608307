#include "host/service/status_reporter.h"

#include <exception>
#include <utility>

namespace host {

StatusReporter::StatusReporter(const Notifier& notifier, Status status,
                               std::chrono::milliseconds pause)
    : notifier_(notifier), status_(std::move(status)) {
    if (notifier_.isWanted()) looks_.emplace(pause, [this] { return report(); });
}

void StatusReporter::changed() {
    if (looks_) looks_->changed();
}

void StatusReporter::stop() {
    if (looks_) looks_->stop();
}

bool StatusReporter::report() {
    try {
        std::string status = status_();
        if (status == last_) return true;
        if (!notifier_.tell("STATUS=" + status + "\n")) return false;
        last_ = std::move(status);
        return true;
    } catch (const std::exception&) {
        // The journal cannot be read now; requests say so to those whom it concerns.
        return false;
    }
}

}  // namespace host
