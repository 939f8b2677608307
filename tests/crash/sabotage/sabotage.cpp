// A library that is loaded before SQLite and makes the host's journal break its promises, in the
// way that the variable ZAV_SABOTAGE names.

#include <dlfcn.h>
#include <sqlite3.h>

#include <atomic>
#include <cstdlib>
#include <cstring>
#include <string>

namespace {

bool isWay(const char* way) {
    const char* const chosen = std::getenv("ZAV_SABOTAGE");
    return chosen != nullptr && std::strcmp(chosen, way) == 0;
}

template <typename Function>
Function next(const char* name) {
    return reinterpret_cast<Function>(::dlsym(RTLD_NEXT, name));
}

/// Replaces a part of a text, if it is there.
std::string replaced(std::string text, const std::string& part, const std::string& by) {
    const std::size_t at = text.find(part);
    return at == std::string::npos ? text : text.replace(at, part.size(), by);
}

/// Whether the transaction in progress is one of a host that is at work, not one of its start.
std::atomic<bool> atWork{false};
/// Whether it records an outcome.
std::atomic<bool> hasOutcome{false};
std::atomic<unsigned> commits{0};

}  // namespace

extern "C" {

int sqlite3_exec(sqlite3* connection, const char* sql, int (*each)(void*, int, char**, char**),
                 void* data, char** error) {
    static const auto real = next<decltype(&sqlite3_exec)>("sqlite3_exec");
    if (std::strcmp(sql, "SAVEPOINT part") == 0) atWork = true;
    const bool commit = std::strcmp(sql, "COMMIT") == 0 && atWork.exchange(false);
    const bool outcome = commit && hasOutcome.exchange(false);
    const bool skip = (commit && isWay("skip-commits") && ++commits % 3 == 0) ||
                      (outcome && isWay("lose-outcomes"));
    return real(connection, skip ? "ROLLBACK" : sql, each, data, error);
}

int sqlite3_prepare_v2(sqlite3* connection, const char* sql, int length, sqlite3_stmt** statement,
                       const char** rest) {
    static const auto real = next<decltype(&sqlite3_prepare_v2)>("sqlite3_prepare_v2");
    std::string text = sql;
    if (text.rfind("INSERT INTO outcomes", 0) == 0) hasOutcome = true;
    if (isWay("reverse-order")) {
        text = replaced(text, "run IS NULL ORDER BY number LIMIT 1",
                        "run IS NULL ORDER BY number DESC LIMIT 1");
    }
    // After a kill it looks as if nothing had been handed over.
    if (isWay("forget-hand-overs")) {
        text = replaced(text, "WHERE ended IS NULL AND run IS NOT NULL ORDER BY state = 1",
                        "WHERE ended = 0 AND run IS NOT NULL ORDER BY state = 1");
    }
    if (text == sql) return real(connection, sql, length, statement, rest);
    return real(connection, text.c_str(), -1, statement, nullptr);
}

}  // extern "C"
