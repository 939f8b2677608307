#include "fleet/server/keys/trust/trust_database.h"

#include <filesystem>

#include "fleet/server/keys/files/keys_error.h"
#include "fleet/server/keys/trust/trust_schema.h"

namespace fleet {

namespace fs = std::filesystem;

void TrustDatabase::make(const std::string& file) try {
    if (fs::exists(fs::symlink_status(file))) throw KeysError(file + " is there already");
    sqlite::Database database(file);
    // Now, while nobody else has it open: a change of the mode needs the file for itself.
    database.run("PRAGMA journal_mode = WAL; PRAGMA synchronous = FULL");
    makeTrustTables(database);
} catch (const sqlite::DatabaseError& error) {
    throw KeysError("cannot make " + file + ": " + error.what());
} catch (const fs::filesystem_error& error) {
    throw KeysError(error.what());
}

TrustDatabase::TrustDatabase(const std::string& file) try {
    if (!fs::exists(file)) throw KeysError(file + " is missing. Put a backup in its place");
    // A copy that was put back may have any mode.
    fs::permissions(file, fs::perms::owner_read | fs::perms::owner_write);
    connection_.emplace(file);
    adoptTrustTables(*connection_, file);
} catch (const sqlite::DatabaseError& error) {
    throw KeysError(file + (error.damaged() ? " is damaged (" : " cannot be used (") +
                    error.what() +
                    (error.damaged() ? "); it was not replaced. Put a backup in its place" : ")"));
} catch (const fs::filesystem_error& error) {
    throw KeysError(error.what());
}

}  // namespace fleet
