// Command lines and their arguments.

#include <cerrno>
#include <cstring>

#include "base/zavtrace.h"
#include "util/error_text.h"
#include "util/zavprocs.h"

namespace ZAV {
namespace {

RAS1_UNIT traceUnit{"zavprocs"};

/// Puts a 0 in place of every separator and every quote that groups; returns the number of
/// arguments that the blanks outside quotes make.
int cutIntoWords(std::string& line) {
    bool inQuote = false;
    bool atSeparator = true;
    int count = 1;
    char before = '\0';  // as it was written, not as it was cut
    for (char& at : line) {
        const char here = at;
        if (here == ' ' && !inQuote) {
            if (!atSeparator) ++count;
            atSeparator = true;
            at = '\0';
        } else {
            if ((here == '"' || here == '\'') && before != '\\') {
                at = '\0';
                inQuote = !inQuote;
            }
            atSeparator = false;
        }
        before = here;
    }
    return count;
}

void freeArguments(char** arguments) {
    for (char** at = arguments; *at != nullptr; ++at)
        std::free(*at);
    std::free(arguments);
}

/// Each argument is the next run between zeros; what the count demands beyond them is empty. Null
/// when memory is short.
char** copyWords(const std::string& words, int count) {
    auto** const arguments =
        static_cast<char**>(std::calloc(static_cast<std::size_t>(count) + 1, sizeof(char*)));
    if (arguments == nullptr) return nullptr;
    std::size_t at = 0;
    for (int i = 0; i < count; ++i) {
        at = std::min(words.find_first_not_of('\0', at), words.size());
        const char* const word = words.c_str() + at;
        arguments[i] = ::strdup(word);
        if (arguments[i] == nullptr) {
            freeArguments(arguments);
            return nullptr;
        }
        at += std::strlen(word);
    }
    return arguments;
}

}  // namespace

int MakeArgv(const String* command, char*** argv) {
    Trace trace(traceUnit);
    if (command == nullptr || argv == nullptr) {
        errno = EINVAL;
        trace().error("Error occurred. ERRNO:%d %s", errno, errorText(errno));
        return trace.exit(255);
    }
    const CharStar narrow = command->c_str();
    std::string words(static_cast<const char*>(narrow));
    const int count = cutIntoWords(words);
    *argv = copyWords(words, count);
    return trace.exit(*argv != nullptr ? count : 0);
}

}  // namespace ZAV
