/// The directory of what the host itself keeps.
#pragma once

#include <optional>
#include <string>

#include "host/process/home_lock.h"
#include "system/file_descriptor.h"

namespace host {

/// Makes the directory with mode 0700, and those above it, if they are missing. Throws StartError
/// when it cannot be made, or when another user could write to it.
void provideStateDirectory(const std::string& path);

/// Belongs to one host at a time, and to nobody but its user. It holds:
///
/// | journal.db, journal.db-wal, journal.db-shm | the journal |
/// | identity | the journal's identity, which is known by it when the journal cannot be read |
/// | clean | there is one when the last host that used the directory ended in good order |
/// | reserve | space that is given up when the disk is full, so that outcomes still find room |
/// | trace.log, trace.log.1 ... | the trace of a host whose standard error is a log (trace_log.h) |
///
/// One thread at a time.
class StateDirectory {
public:
    static constexpr long long kReserve = 4LL << 20;  // bytes

    /// Makes the directory with mode 0700, and those above it, if they are missing; locks it.
    /// Throws StartError when it cannot be made, when another user could write to it, or when
    /// another host uses it.
    explicit StateDirectory(const std::string& path);

    std::string database() const { return path_ + "/journal.db"; }
    const std::string& path() const { return path_; }

    /// Whether the last host ended in good order, or there was none. From now on there is one that
    /// has not.
    bool endedCleanly() const { return endedCleanly_; }
    /// This host ends in good order. Errors are ignored: the next start then looks more closely.
    void noteCleanEnd() const noexcept;

    /// Gives the database another name, with what belongs to it, and mode 0600; returns that name.
    /// Throws StartError.
    std::string setAside() const;

    /// The identity of the journal that was noted last; empty if none is known.
    std::string notedIdentity() const;
    /// Notes it. Errors are ignored: it is needed only when the journal itself is damaged.
    void noteIdentity(const std::string& identity) const noexcept;

    /// Takes the reserve unless it is there; false when there is no room for it.
    bool takeReserve() const;
    /// Gives it up; false if there is none.
    bool freeReserve() const;

private:
    const std::string path_;
    std::optional<HomeLock> lock_;
    bool endedCleanly_ = false;
};

}  // namespace host
