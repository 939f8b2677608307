/// One SQLite connection and its statements.
///
/// A wrapper of our own: the programs need open, prepare, bind and step, and an exception for every
/// failure. That is less than any library around SQLite brings along.
#pragma once

#include <cstdint>
#include <memory>
#include <optional>
#include <stdexcept>
#include <string>
#include <string_view>

struct sqlite3;
struct sqlite3_stmt;

namespace sqlite {

/// What SQLite says when something failed.
class DatabaseError : public std::runtime_error {
public:
    DatabaseError(const std::string& text, int code) : std::runtime_error(text), code_(code) {}
    /// Damage that something other than a failing statement has shown.
    static DatabaseError ofDamage(const std::string& text);

    /// Whether the file is not a database, or one that is damaged.
    bool damaged() const;

private:
    int code_;
};

/// A statement that is being carried out. One thread at a time; its connection outlives it.
class Statement {
public:
    Statement(sqlite3* connection, const char* sql);

    /// Binds the next parameter. Texts are stored as bytes, whatever their code page.
    void bind(std::int64_t value);
    void bind(std::string_view bytes);
    void bind(std::nullopt_t);
    void bind(const char* bytes) { bind(std::string_view(bytes)); }
    void bind(const std::string& bytes) { bind(std::string_view(bytes)); }
    void bind(int value) { bind(static_cast<std::int64_t>(value)); }
    template <typename Value>
    void bind(const std::optional<Value>& value) {
        if (value) {
            bind(*value);
        } else {
            bind(std::nullopt);
        }
    }

    /// Goes to the next row; false when there is none. Throws DatabaseError.
    bool step();
    /// Columns of the row, from 0. They are copies.
    bool isNull(int column) const;
    std::int64_t integer(int column) const;
    std::string bytes(int column) const;
    std::optional<std::int64_t> maybeInteger(int column) const;

private:
    struct Finalize {
        void operator()(sqlite3_stmt* statement) const;
    };
    void check(int code) const;

    std::unique_ptr<sqlite3_stmt, Finalize> statement_;
    int bound_ = 0;
};

class Database {
public:
    /// Opens the file, which is made with mode 0600 if it is missing; ":memory:" stands for one
    /// that ends with the object. Everything throws DatabaseError. One thread at a time.
    explicit Database(const std::string& file);

    /// Carries out statements without parameters.
    void run(const char* sql);
    /// A statement with its parameters in their order; nothing happens before its first step().
    template <typename... Values>
    Statement ask(const char* sql, const Values&... values) {
        Statement statement(connection_.get(), sql);
        (statement.bind(values), ...);
        return statement;
    }
    /// Carries out one statement; returns the number of rows that it changed.
    template <typename... Values>
    int change(const char* sql, const Values&... values) {
        ask(sql, values...).step();
        return changed();
    }
    /// The first column of the only row.
    template <typename... Values>
    std::int64_t number(const char* sql, const Values&... values) {
        Statement statement = ask(sql, values...);
        return statement.step() ? statement.integer(0) : 0;
    }
    /// The number of the row that was inserted last.
    std::int64_t lastInserted() const;
    /// Rows that were changed on this connection since it was opened.
    std::int64_t totalChanges() const;
    /// Whether a transaction is open; a failure may have ended it.
    bool inTransaction() const;

private:
    struct Close {
        void operator()(sqlite3* connection) const;
    };
    int changed() const;

    std::unique_ptr<sqlite3, Close> connection_;
};

}  // namespace sqlite
