/// The file of the centre's database.
#pragma once

#include <optional>
#include <string>

#include "fleet/server/store/centre_directory.h"
#include "sqlite/database.h"

namespace fleet {

/// Holds the directory's lock as long as it lives. What a transaction has committed is durable.
class CentreDatabase {
public:
    /// Opens the database in the directory, and makes it if there is none. Throws StoreError when
    /// it is damaged, newer or in use; then nothing was changed. Reads the whole file.
    explicit CentreDatabase(const std::string& directory);

    /// Ready for use. One thread at a time.
    sqlite::Database& connection() { return *connection_; }

    /// Writes a consistent copy of what is committed to a file with mode 0600, which replaces an
    /// older one at once and when it is complete. Any thread, while others use the connection.
    /// Throws StoreError or sqlite::DatabaseError; then an older copy is as it was.
    void backup(const std::string& to) const;

private:
    void openDatabase(const std::string& file);

    CentreDirectory directory_;
    std::optional<sqlite::Database> connection_;
};

/// CentreDatabase::backup() of the database in a directory, which another process may have open.
void backUpCentre(const std::string& directory, const std::string& to);

/// Puts a copy in the place of the database in a directory, which nobody may have open. The centre
/// that opens it next learns that; see SqliteCentreStore::isPutBack(). Throws StoreError or
/// sqlite::DatabaseError, before anything was changed if the copy is no centre's.
void putBackCentre(const std::string& directory, const std::string& from);

}  // namespace fleet
