#include "ctl/verbs/arguments/foreign_words.h"

#include <algorithm>
#include <cstring>

#include "ctl/show/shell_quoted.h"

namespace ctl {
namespace {

using Words = std::vector<std::string>;

/// How many positionals stand before the other program's words; -1 if the verb takes none such.
int placeOfForeignWords(const Verb& verb) {
    int place = 0;
    for (const Argument& argument : verb.arguments) {
        if (argument.isForeign) return place;
        if (argument.kind == Argument::Kind::Positional) ++place;
    }
    return -1;
}

bool isOption(const std::string& word) {
    return word.size() > 1 && word.front() == '-';
}

bool takesValue(const Verb& verb, const ArgumentList& globals, const std::string& option) {
    for (const ArgumentList& arguments : {globals, verb.arguments}) {
        for (const Argument& argument : arguments) {
            if (option == argument.name) return argument.kind == Argument::Kind::Option;
        }
    }
    return false;
}

/// Where the other program's first word stands; the end if there is none. The verb's own name takes
/// as many words as it has.
Words::const_iterator foreignBegin(const Verb& verb, const Words& words, int place,
                                   const ArgumentList& globals) {
    auto left = place + 1 + std::count(verb.name, verb.name + std::strlen(verb.name), ' ') + 1;
    for (auto word = words.begin(); word != words.end(); ++word) {
        if (takesValue(verb, globals, *word)) {
            if (++word == words.end()) break;
        } else if (!isOption(*word) && --left == 0) {
            return word;
        }
    }
    return words.end();
}

}  // namespace

std::string lineWithDashes(const Verb& verb, const Words& words, const ArgumentList& globals) {
    const int place = placeOfForeignWords(verb);
    if (place < 0 || std::find(words.begin(), words.end(), "--") != words.end()) return {};
    const auto begin = foreignBegin(verb, words, place, globals);
    if (std::none_of(begin, words.end(), isOption)) return {};
    std::string line = "zavctl";
    for (auto word = words.begin(); word != words.end(); ++word)
        line += (word == begin ? " -- " : " ") + shellQuoted(*word);
    return line;
}

}  // namespace ctl
