/// The database of who may take part in the fleet: invitations, hosts, operators, revocations.
///
/// It is a file of its own, apart from the centre's orders, for two reasons. Orders may have to be
/// restored from a backup; a revocation that a restore undid would let a thief in again. And the
/// centre alone uses its orders while it runs, but administrators invite and revoke beside it.
#pragma once

#include <optional>
#include <string>

#include "sqlite/database.h"

namespace fleet {

/// What a transaction has committed is durable. Several processes may use the file at once; an
/// object is for one thread at a time.
class TrustDatabase {
public:
    /// Makes the file, once in a fleet's life. Throws KeysError if it is there.
    static void make(const std::string& file);

    /// Opens it. Throws KeysError when it is missing, damaged or newer: an empty one in its place
    /// would have forgotten whose keys were stolen.
    explicit TrustDatabase(const std::string& file);

    sqlite::Database& connection() { return *connection_; }

    /// Writes a consistent copy of what is committed to a file with mode 0600, which replaces an
    /// older one at once and when it is complete. Any thread, while others use the file. Throws
    /// KeysError; then an older copy is as it was. Who puts a copy back revokes again what was
    /// revoked since.
    void backup(const std::string& to) const;

private:
    const std::string file_;
    std::optional<sqlite::Database> connection_;
};

}  // namespace fleet
