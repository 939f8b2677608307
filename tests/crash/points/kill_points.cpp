// A library that is loaded before all others and kills the host at a point of a task's way, which
// the variable ZAV_KILL_POINT names, once: as soon as the file in ZAV_KILL_ARMED is there.

#include <dlfcn.h>
#include <signal.h>
#include <sqlite3.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <cstring>

namespace {

bool isPoint(const char* point) {
    const char* const chosen = std::getenv("ZAV_KILL_POINT");
    return chosen != nullptr && std::strcmp(chosen, point) == 0;
}

/// Once: who removes the file dies. The host's children have this library, too, and live.
void dieIfArmed() {
    const char* const armed = std::getenv("ZAV_KILL_ARMED");
    if (armed == nullptr || std::strcmp(program_invocation_short_name, "zavhost") != 0) return;
    if (::unlink(armed) == 0) ::kill(::getpid(), SIGKILL);
}

template <typename Function>
Function next(const char* name) {
    return reinterpret_cast<Function>(::dlsym(RTLD_NEXT, name));
}

/// What the transaction in progress on this thread records.
thread_local bool accepts = false;
thread_local bool ends = false;

bool begins(const char* text, const char* with) {
    return std::strncmp(text, with, std::strlen(with)) == 0;
}

}  // namespace

extern "C" {

int sqlite3_prepare_v2(sqlite3* connection, const char* sql, int length, sqlite3_stmt** statement,
                       const char** rest) {
    static const auto real = next<decltype(&sqlite3_prepare_v2)>("sqlite3_prepare_v2");
    if (begins(sql, "INSERT INTO tasks")) accepts = true;
    if (begins(sql, "INSERT INTO outcomes")) ends = true;
    return real(connection, sql, length, statement, rest);
}

int sqlite3_exec(sqlite3* connection, const char* sql, int (*each)(void*, int, char**, char**),
                 void* data, char** error) {
    static const auto real = next<decltype(&sqlite3_exec)>("sqlite3_exec");
    if (std::strcmp(sql, "COMMIT") != 0) return real(connection, sql, each, data, error);
    if (accepts && isPoint("before-acceptance-is-durable")) dieIfArmed();
    if (ends && isPoint("before-outcome-is-durable")) dieIfArmed();
    const int result = real(connection, sql, each, data, error);
    if (accepts && isPoint("after-acceptance-is-durable")) dieIfArmed();
    if (ends && isPoint("after-outcome-is-durable")) dieIfArmed();
    accepts = false;
    ends = false;
    return result;
}

// The plug-in has seen the end of its command.
pid_t waitpid(pid_t process, int* status, int options) {
    static const auto real = next<decltype(&waitpid)>("waitpid");
    const pid_t ended = real(process, status, options);
    if (ended > 0 && isPoint("after-command-ended")) dieIfArmed();
    return ended;
}

}  // extern "C"
