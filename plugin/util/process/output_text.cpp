// Cleans paths and values that come from scripts and the environment.
#include <sys/stat.h>

#include <cstring>

#include "base/zavtrace.h"
#include "util/zavutil.h"

namespace ZAV {
namespace {

RAS1_UNIT traceUnit{"zavutil"};

constexpr int kDirectory = 0;
constexpr int kNoDirectory = 1;
constexpr int kMissing = 2;

/// Removes a leading quote together with the blanks and quotes after it.
void dropLeadingQuotes(char* path) {
    constexpr unsigned char kFirstKept = '#';
    if (*path != '"') return;
    const char* kept = path;
    while (*kept != '\0' && static_cast<unsigned char>(*kept) < kFirstKept)
        ++kept;
    std::memmove(path, kept, std::strlen(kept) + 1);
}

/// Cleans, in place, a path from a script or a user's profile.
void cleanPath(char* path) {
    dropLeadingQuotes(path);
    std::size_t length = std::strlen(path);
    for (const char unwanted : {'"', '/', '\\'}) {
        while (length > 0 && path[length - 1] == unwanted)
            --length;
    }
    path[length] = '\0';
}

}  // namespace

int Util::fso_test(char* path) {
    Trace trace(traceUnit);
    cleanPath(path);
    struct stat info;
    if (::stat(path, &info) != 0) return trace.exit(kMissing);
    return trace.exit(S_ISDIR(info.st_mode) ? kDirectory : kNoDirectory);
}

void Util::stripNewlineCharsFromOutput(String& text) {
    Trace trace(traceUnit);
    trace().detail("before length = %d", text.length());
    for (const char lineEnd : {'\r', '\n'}) {
        const unsigned at = text.find(lineEnd, 0);
        if (at != String::NPOS) text.erase(at);
    }
    trace().detail("after length = %d", text.length());
}

}  // namespace ZAV
