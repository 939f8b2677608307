/// Keeps the service manager's line about the host up to date.
#pragma once

#include <chrono>
#include <functional>
#include <optional>
#include <string>

#include "host/service/notifier.h"
#include "host/service/on_change.h"

namespace host {

/// Looks at once and after changes, on a thread of its own, and sends the status when it is another
/// one. So a journal that hangs stops this thread only, and a thousand tasks in a second make one
/// message.
class StatusReporter {
public:
    /// The status in one line. Called on the reporter's thread; may throw, which leaves the line as
    /// it is until the next look, a pause later.
    using Status = std::function<std::string()>;

    /// The notifier outlives this object. Without somebody to notify, there is no thread.
    StatusReporter(const Notifier& notifier, Status status,
                   std::chrono::milliseconds pause = std::chrono::seconds(1));
    StatusReporter(const StatusReporter&) = delete;
    StatusReporter& operator=(const StatusReporter&) = delete;

    /// The status may be another one now. Never waits. Any thread.
    void changed();
    /// Sends nothing more. Waits for a look in progress.
    void stop();

private:
    /// False when it has to be tried again.
    bool report();

    const Notifier& notifier_;
    const Status status_;
    std::string last_;               ///< of the thread alone
    std::optional<OnChange> looks_;  ///< last, so that it finds everything else
};

}  // namespace host
