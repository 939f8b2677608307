// Splits command lines into arguments.

#include <cerrno>
#include <cstring>

#include "base/zavtrace.h"
#include "util/error_text.h"
#include "util/zavprocs.h"

namespace ZAV {
namespace {

RAS1_UNIT traceUnit{"zavprocs"};

/// Overwrites every separator and every grouping quote with a 0. Returns the number of arguments
/// that the blanks outside quotes delimit.
int cutIntoWords(std::string& line) {
    bool inQuote = false;
    bool atSeparator = true;
    int count = 1;
    char before = '\0';  // the character as it was before it was overwritten
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

/// Copies the runs between zeros; the rest of the `count` arguments are empty texts. Null when out
/// of memory.
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
