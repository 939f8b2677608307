#include "sqlite/database.h"

#include <fcntl.h>
#include <sqlite3.h>
#include <unistd.h>

#include <cerrno>
#include <system_error>

namespace sqlite {
namespace {

/// On a busy disk another connection's commit may take as long.
constexpr int kBusyMilliseconds = 20'000;

[[noreturn]] void fail(sqlite3* connection, int code) {
    throw DatabaseError(connection == nullptr ? sqlite3_errstr(code) : sqlite3_errmsg(connection),
                        code);
}

/// SQLite would make the file with the mode that the umask leaves; its other files take over this
/// one's. A file that is there is not touched: when a process closes any descriptor of a file, the
/// system drops all locks that the process has on it, those of other connections among them.
void makePrivate(const std::string& file) {
    const int made = ::open(file.c_str(), O_RDWR | O_CREAT | O_EXCL | O_CLOEXEC | O_NOFOLLOW, 0600);
    if (made >= 0) {
        ::close(made);
    } else if (errno != EEXIST) {
        throw DatabaseError(file + ": " + std::generic_category().message(errno), SQLITE_CANTOPEN);
    }
}

}  // namespace

DatabaseError DatabaseError::ofDamage(const std::string& text) {
    return {text, SQLITE_CORRUPT};
}

bool DatabaseError::damaged() const {
    return (code_ & 0xFF) == SQLITE_CORRUPT || (code_ & 0xFF) == SQLITE_NOTADB;
}

void Statement::Finalize::operator()(sqlite3_stmt* statement) const {
    sqlite3_finalize(statement);
}

Statement::Statement(sqlite3* connection, const char* sql) {
    sqlite3_stmt* made = nullptr;
    const int code = sqlite3_prepare_v2(connection, sql, -1, &made, nullptr);
    statement_.reset(made);
    if (code != SQLITE_OK) fail(connection, code);
}

void Statement::check(int code) const {
    if (code != SQLITE_OK) fail(sqlite3_db_handle(statement_.get()), code);
}

void Statement::bind(std::int64_t value) {
    check(sqlite3_bind_int64(statement_.get(), ++bound_, value));
}

void Statement::bind(std::string_view bytes) {
    // A view without bytes may have no address, which SQLite would take for NULL.
    const char* const data = bytes.empty() ? "" : bytes.data();
    check(sqlite3_bind_blob64(statement_.get(), ++bound_, data, bytes.size(), SQLITE_TRANSIENT));
}

void Statement::bind(std::nullopt_t) {
    check(sqlite3_bind_null(statement_.get(), ++bound_));
}

bool Statement::step() {
    const int code = sqlite3_step(statement_.get());
    if (code == SQLITE_ROW) return true;
    if (code != SQLITE_DONE) fail(sqlite3_db_handle(statement_.get()), code);
    return false;
}

bool Statement::isNull(int column) const {
    return sqlite3_column_type(statement_.get(), column) == SQLITE_NULL;
}

std::int64_t Statement::integer(int column) const {
    return sqlite3_column_int64(statement_.get(), column);
}

std::string Statement::bytes(int column) const {
    const void* const data = sqlite3_column_blob(statement_.get(), column);
    const auto size = static_cast<std::size_t>(sqlite3_column_bytes(statement_.get(), column));
    return data == nullptr ? std::string() : std::string(static_cast<const char*>(data), size);
}

std::optional<std::int64_t> Statement::maybeInteger(int column) const {
    if (isNull(column)) return std::nullopt;
    return integer(column);
}

void Database::Close::operator()(sqlite3* connection) const {
    sqlite3_close(connection);
}

Database::Database(const std::string& file) {
    if (file != ":memory:") makePrivate(file);
    sqlite3* opened = nullptr;
    const int code = sqlite3_open_v2(file.c_str(), &opened,
                                     SQLITE_OPEN_READWRITE | SQLITE_OPEN_NOFOLLOW, nullptr);
    connection_.reset(opened);
    if (code != SQLITE_OK) fail(opened, code);
    sqlite3_extended_result_codes(opened, 1);
    sqlite3_busy_timeout(opened, kBusyMilliseconds);
    run("PRAGMA cache_size = -128");  // KiB: what is read is mostly new
}

void Database::run(const char* sql) {
    const int code = sqlite3_exec(connection_.get(), sql, nullptr, nullptr, nullptr);
    if (code != SQLITE_OK) fail(connection_.get(), code);
}

std::int64_t Database::lastInserted() const {
    return sqlite3_last_insert_rowid(connection_.get());
}

std::int64_t Database::totalChanges() const {
    return sqlite3_total_changes(connection_.get());
}

bool Database::inTransaction() const {
    return sqlite3_get_autocommit(connection_.get()) == 0;
}

int Database::changed() const {
    return sqlite3_changes(connection_.get());
}

}  // namespace sqlite
