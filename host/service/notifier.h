/// Tells a service manager how the host is doing.
#pragma once

#include <string>

#include "system/file_descriptor.h"

namespace host {

/// Sends datagrams of the notify protocol. Without an address it does nothing. Any thread.
class Notifier {
public:
    /// `address` is a path, or a name that begins with '@' in the abstract name space. Throws
    /// StartError for anything else and for names that are too long.
    explicit Notifier(const std::string& address);
    Notifier(const Notifier&) = delete;
    Notifier& operator=(const Notifier&) = delete;

    bool isWanted() const { return !address_.empty(); }
    /// Sends lines of the form NAME=VALUE. Returns false when nobody took them: the receiver is
    /// gone, or has not read what came before.
    bool tell(const std::string& lines) const { return send(lines, false); }
    /// The same, but waits for a receiver that is busy, for a few seconds at most.
    bool tellSurely(const std::string& lines) const { return send(lines, true); }

private:
    bool send(const std::string& lines, bool waits) const;

    std::string address_;  ///< as the system takes it, with 0 in the place of '@'
    sys::FileDescriptor socket_;
};

/// RELOADING=1 with the time that goes with it. READY=1 has to follow.
std::string reloadingNotice();

}  // namespace host
