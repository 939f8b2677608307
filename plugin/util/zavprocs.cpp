// Helpers for child processes: user tokens, error texts and pruning of logs.

#include "util/zavprocs.h"

#include <grp.h>
#include <pwd.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstring>
#include <optional>

#include "base/zavtrace.h"
#include "platform/fsi1.h"
#include "util/error_text.h"
#include "util/zavutil.h"

namespace ZAV {
namespace {

RAS1_UNIT traceUnit{"zavprocs"};

constexpr std::uint32_t kUnknownId = 65533;
constexpr std::size_t kLargestEntry = 1 << 20;

/// Calls one of the C library's re-entrant look-up functions with a buffer that is large enough.
/// Returns whether it found an entry.
template <typename Entry, typename LookUp>
bool lookUp(LookUp function, const char* name, Entry& entry, std::vector<char>& buffer) {
    buffer.resize(1024);
    for (;;) {
        Entry* found = nullptr;
        const int error = function(name, &entry, buffer.data(), buffer.size(), &found);
        if (error == ERANGE && buffer.size() < kLargestEntry) {
            buffer.resize(buffer.size() * 2);
        } else if (error != EINTR) {
            return found != nullptr;
        }
    }
}

struct UserEntry {
    std::uint32_t uid;
    std::uint32_t gid;
};

std::optional<UserEntry> findUser(const char* name) {
    passwd entry{};
    std::vector<char> buffer;
    if (!lookUp(::getpwnam_r, name, entry, buffer)) return std::nullopt;
    return UserEntry{entry.pw_uid, entry.pw_gid};
}

std::optional<std::uint32_t> findGroup(const char* name) {
    group entry{};
    std::vector<char> buffer;
    if (!lookUp(::getgrnam_r, name, entry, buffer)) return std::nullopt;
    return entry.gr_gid;
}

std::uint32_t groupId(const char* name, const std::optional<UserEntry>& user) {
    if (const auto found = findGroup(name)) return *found;
    if (user && findGroup("nobody")) return user->gid;
    return kUnknownId;
}

const char* fileName(const char* path) {
    const char* name = path;
    for (const char* at = path; *at != '\0'; ++at) {
        if (*at == '/' || *at == '\\') name = at + 1;
    }
    return name;
}

/// The log files in a directory listing: how many there are, and which one is the oldest.
struct Logs {
    int count = 0;
    std::string oldest;
    std::int64_t oldestTime = 0;

    void add(const FSI1_ENTRY& entry) {
        if (++count == 1 || entry.timeStamp < oldestTime) {
            oldest = entry.path;
            oldestTime = entry.timeStamp;
        }
    }
};

/// Reads a directory listing to its end. Returns the status that ended it.
int collectLogs(FSI1_LIST* list, const char* prefix, Logs& logs) {
    FSI1_ENTRY entry;
    for (;;) {
        const int code = FSI1_FetchList(list, &entry);
        if (code != FSI1_OK) return code;
        if (entry.isDirectory) continue;
        if (std::strncmp(fileName(entry.path), prefix, std::strlen(prefix)) == 0) logs.add(entry);
    }
}

struct ClosedList {
    void operator()(FSI1_LIST* list) const { FSI1_DeleteList(list); }
};

}  // namespace

user_s_t* create_user_token(const char* user, const char* group, const char* /*unused*/) {
    Trace trace(traceUnit);
    auto* const token = static_cast<user_s_t*>(std::malloc(sizeof(user_s_t)));
    if (token == nullptr) return nullptr;
    std::optional<UserEntry> entry;
    if (user != nullptr) {
        entry = findUser(user);
        if (!entry) entry = findUser("nobody");
        token->uid = entry ? entry->uid : kUnknownId;
    } else {
        token->uid = ::getuid();
    }
    token->gid = group != nullptr ? groupId(group, entry) : ::getgid();
    trace().detail("User: %s UID: %d Group: %s GID: %d", user, static_cast<int>(token->uid), group,
                   static_cast<int>(token->gid));
    return token;
}

char* getErrorMsg(int errnum) {
    Trace trace(traceUnit);
    const std::string text = errorText(errnum);
    const std::size_t size = text.size() * 30;
    char* const message = static_cast<char*>(std::malloc(size));
    if (message != nullptr) {
        std::snprintf(message, size, "Error occurred: ERRNO:%d %s", errnum, text.c_str());
    }
    return message;
}

void pruneLogs(const char* dir, const char* prefix, int keep) {
    Trace trace(traceUnit);
    FSI1_LIST* opened = nullptr;
    const int openCode = FSI1_NewList(dir, &opened);
    if (openCode != FSI1_OK) {
        trace().error("FSI1_NewList error %d\n", openCode);
        return;
    }
    std::unique_ptr<FSI1_LIST, ClosedList> list(opened);
    Logs logs;
    const int lastCode = collectLogs(list.get(), prefix, logs);
    if (logs.count > 0 && logs.count >= keep) {
        trace().detail("deleting file: %s\n", logs.oldest);
        Util::deleteFile(String(logs.oldest.c_str()));
    }
    if (lastCode != FSI1_END_OF_LIST) trace().error("FSI1_FetchList error %d\n", lastCode);
    const int closeCode = FSI1_DeleteList(list.release());
    if (closeCode != FSI1_OK) trace().error("FSI1_DeleteList error %d\n", closeCode);
}

}  // namespace ZAV
