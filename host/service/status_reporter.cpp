#include "host/service/status_reporter.h"

#include <exception>
#include <utility>

namespace host {

StatusReporter::StatusReporter(const Notifier& notifier, Status status,
                               std::chrono::milliseconds every)
    : notifier_(notifier), status_(std::move(status)) {
    if (notifier_.isWanted()) looks_.emplace(every, [this] { report(); });
}

void StatusReporter::stop() {
    if (looks_) looks_->stop();
}

void StatusReporter::report() {
    try {
        std::string status = status_();
        if (status == last_) return;
        // What the receiver had no room for is sent at the next look.
        if (notifier_.tell("STATUS=" + status + "\n")) last_ = std::move(status);
    } catch (const std::exception&) {
        // The journal cannot be read now; requests say so to those whom it concerns.
    }
}

}  // namespace host
