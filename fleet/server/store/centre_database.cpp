#include "fleet/server/store/centre_database.h"

#include <fcntl.h>
#include <unistd.h>

#include <array>
#include <filesystem>
#include <system_error>

#include "fleet/server/store/centre_schema.h"
#include "fleet/server/store/store_error.h"

namespace fleet {
namespace {

namespace fs = std::filesystem;

constexpr std::array<const char*, 4> kEndings = {"", "-journal", "-wal", "-shm"};

void removeDatabase(const std::string& file) {
    for (const char* const ending : kEndings)
        fs::remove(file + ending);
}

/// A database is made under another name, so that one without tables is always a damaged one.
void makeDatabase(const std::string& file) {
    if (fs::exists(file + "-wal") || fs::exists(file + "-journal")) {
        throw StoreError(file +
                         " is missing, but changes to it are there. Put a backup in its place");
    }
    const std::string made = file + ".new";
    removeDatabase(made);
    {
        sqlite::Database database(made);
        database.run("PRAGMA synchronous = FULL");
        makeCentreTables(database);
    }
    fs::rename(made, file);
    syncFolderOf(file);
}

void syncFile(const std::string& file) {
    const int opened = ::open(file.c_str(), O_RDONLY | O_CLOEXEC);
    const bool isSynced = opened >= 0 && ::fsync(opened) == 0;
    if (opened >= 0) ::close(opened);
    if (!isSynced) throw StoreError("cannot sync " + file);
}

/// Makes the file before SQLite does, which would use the mode that the umask leaves.
void makePrivateFile(const std::string& file) {
    const int made =
        ::open(file.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC | O_NOFOLLOW, 0600);
    if (made < 0) {
        throw StoreError("cannot make " + file + ": " + std::generic_category().message(errno));
    }
    ::close(made);
}

void copyDatabase(const std::string& file, const std::string& to) {
    const std::string made = to + ".new";
    try {
        if (fs::exists(to) && fs::equivalent(to, file)) {
            throw StoreError(to + " is the database itself");
        }
        removeDatabase(made);
        makePrivateFile(made);
        // A connection of its own reads beside the one that writes.
        sqlite::Database reader(file);
        reader.change("VACUUM INTO CAST(? AS TEXT)", made);
        syncFile(made);
        fs::rename(made, to);
        syncFolderOf(to);
    } catch (const fs::filesystem_error& error) {
        throw StoreError(error.what());
    }
}

/// Nothing of an older database may be taken for changes of the one that comes in its place.
void emptyLog(const std::string& file) {
    try {
        sqlite::Database(file).run("PRAGMA journal_mode = DELETE");
    } catch (const sqlite::DatabaseError&) {
        // A damaged one: that is why there is another.
    }
    for (const char* const ending : {"-journal", "-wal", "-shm"})
        fs::remove(file + ending);
}

}  // namespace

CentreDatabase::CentreDatabase(const std::string& directory) try : directory_(directory) {
    const std::string file = directory_.database();
    if (!fs::exists(fs::symlink_status(file))) makeDatabase(file);
    // A copy that was put back may have any mode.
    fs::permissions(file, fs::perms::owner_read | fs::perms::owner_write);
    openDatabase(file);
} catch (const fs::filesystem_error& error) {
    throw StoreError(error.what());
}

void CentreDatabase::openDatabase(const std::string& file) {
    try {
        connection_.emplace(file);
        adoptCentreTables(*connection_, file);
    } catch (const sqlite::DatabaseError& error) {
        if (!error.damaged()) throw;
        throw StoreError(file + " is damaged (" + error.what() +
                         "); it was not replaced. Put a backup in its place");
    }
}

void CentreDatabase::backup(const std::string& to) const {
    copyDatabase(directory_.database(), to);
}

void backUpCentre(const std::string& directory, const std::string& to) {
    const std::string file = CentreDirectory::databaseIn(directory);
    if (!fs::exists(file)) throw StoreError("there is no centre's database in " + directory);
    copyDatabase(file, to);
}

void putBackCentre(const std::string& directory, const std::string& from) {
    if (!fs::exists(from)) throw StoreError(from + " is missing");
    const CentreDirectory owned(directory);
    const std::string file = owned.database();
    const std::string made = file + ".put-back";
    copyDatabase(from, made);
    {
        sqlite::Database copy(made);
        adoptCentreTables(copy, from);
        copy.run("INSERT OR REPLACE INTO facts VALUES ('put_back', 1)");
        // So that all of it is in the one file.
        copy.run("PRAGMA journal_mode = DELETE");
    }
    try {
        if (fs::exists(file)) emptyLog(file);
        fs::rename(made, file);
        syncFolderOf(file);
    } catch (const fs::filesystem_error& error) {
        throw StoreError(error.what());
    }
}

}  // namespace fleet
