#include "fleet/server/keys/trust/trust_database.h"

#include <filesystem>

#include "fleet/server/keys/files/keys_error.h"
#include "fleet/server/keys/files/private_file.h"
#include "fleet/server/keys/trust/trust_schema.h"

namespace fleet {

namespace fs = std::filesystem;

namespace {

/// A copy that was cut off, with what SQLite has beside it.
void removeCutOff(const std::string& file) {
    for (const char* const ending : {"", "-journal", "-wal", "-shm"})
        fs::remove(file + ending);
}

}  // namespace

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

TrustDatabase::TrustDatabase(const std::string& file) try : file_(file) {
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

void TrustDatabase::backup(const std::string& to) const try {
    if (fs::exists(to) && fs::equivalent(to, file_)) {
        throw KeysError(to + " is the database itself");
    }
    const std::string made = to + ".new";
    removeCutOff(made);
    writeNewPrivateFile(made, "");
    // A connection of its own reads beside the one that writes.
    sqlite::Database(file_).change("VACUUM INTO CAST(? AS TEXT)", made);
    putInPlace(made, to);
} catch (const sqlite::DatabaseError& error) {
    throw KeysError("cannot copy " + file_ + ": " + error.what());
} catch (const fs::filesystem_error& error) {
    throw KeysError(error.what());
}

}  // namespace fleet
