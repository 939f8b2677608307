#include "ctl/verbs/help/usage_mistake.h"

#include <algorithm>
#include <string_view>

#include "ctl/show/nearest.h"
#include "ctl/show/printable.h"

namespace ctl {
namespace {

std::string quoted(const std::string& word) {
    return "\"" + printable(word) + "\"";
}

bool isOption(const std::string& word) {
    return word.rfind('-', 0) == 0;
}

/// The first of the words in `some`, which is not empty, that stands on the line.
std::string firstOf(const std::vector<std::string>& some, const std::vector<std::string>& line) {
    const auto first = std::find_if(line.begin(), line.end(), [&some](const std::string& word) {
        return std::find(some.begin(), some.end(), word) != some.end();
    });
    return first != line.end() ? *first : some.front();
}

std::vector<std::string> optionsOf(const ArgumentList& arguments) {
    std::vector<std::string> options;
    for (const Argument& argument : arguments) {
        if (argument.kind == Argument::Kind::Positional || argument.isHidden) continue;
        options.emplace_back(argument.name);
    }
    return options;
}

std::string unknownOption(const std::string& word, const Verb* verb, const Vocabulary& vocabulary) {
    std::vector<std::string> known = optionsOf(vocabulary.globals);
    known.insert(known.end(), {"--help", "--version"});
    std::string subject = "there is";
    if (verb != nullptr) {
        const std::vector<std::string> own = optionsOf(verb->arguments);
        known.insert(known.begin(), own.begin(), own.end());
        subject = std::string(verb->name) + " has";
    }
    return subject + " no option " + quoted(word) +
           suggestion(word.substr(0, word.find('=')), known);
}

/// An option before the command that nobody knows; empty if there is none. What stands behind it
/// was perhaps meant to be its value and not a command.
std::string unknownOptionBefore(const std::string& command, const TakenWords& taken) {
    const auto end =
        std::find(taken.words.begin(), taken.words.end(), command.substr(0, command.find(' ')));
    const auto found = std::find_if(taken.words.begin(), end, [&taken](const std::string& word) {
        return isOption(word) && std::find(taken.leftOver.begin(), taken.leftOver.end(), word) !=
                                     taken.leftOver.end();
    });
    return found == end ? std::string() : *found;
}

std::string commandMistake(const NamedCommand& named, const TakenWords& taken,
                           const Vocabulary& vocabulary) {
    if (named.group != nullptr && named.name == named.group->name) {
        return named.name + " needs a command behind it";
    }
    if (named.name.empty()) {
        if (taken.leftOver.empty()) return "a command is missing";
        const std::string word = firstOf(taken.leftOver, taken.words);
        return isOption(word) ? unknownOption(word, nullptr, vocabulary) : "a command is missing";
    }
    const std::string option = unknownOptionBefore(named.name, taken);
    if (!option.empty()) return unknownOption(option, nullptr, vocabulary);
    std::vector<std::string> known;
    for (const Verb* const verb : vocabulary.verbs)
        known.emplace_back(verb->name);
    for (const VerbGroup* const group : vocabulary.groups)
        known.emplace_back(group->name);
    return "there is no command " + quoted(named.name) + suggestion(named.name, known);
}

std::string unknownWord(const Verb& verb, const TakenWords& taken, const Vocabulary& vocabulary) {
    const std::string word = firstOf(taken.leftOver, taken.words);
    if (isOption(word)) return unknownOption(word, &verb, vocabulary);
    return std::string(verb.name) + " does not know what to do with " + quoted(word);
}

/// The declaration that another one names in `excludes` or `needs`; null without a name.
const Argument* declared(const Verb& verb, const char* name) {
    if (name == nullptr) return nullptr;
    const auto found = std::find_if(
        verb.arguments.begin(), verb.arguments.end(),
        [name](const Argument& argument) { return std::string_view(argument.name) == name; });
    return found == verb.arguments.end() ? nullptr : found;
}

std::string argumentMistake(const Verb& verb, const Values& given) {
    for (const Argument& argument : verb.arguments) {
        if (argument.isRequired && !given.has(argument)) {
            return std::string(argument.name) + " is missing";
        }
    }
    for (const Argument& argument : verb.arguments) {
        if (!given.has(argument)) continue;
        const Argument* const excluded = declared(verb, argument.excludes);
        if (excluded != nullptr && given.has(*excluded)) {
            return std::string(argument.name) + " does not go with " + excluded->name;
        }
        const Argument* const needed = declared(verb, argument.needs);
        if (needed != nullptr && !given.has(*needed)) {
            return std::string(argument.name) + " goes only with " + needed->name;
        }
    }
    return {};
}

}  // namespace

std::string firstMistake(const NamedCommand& named, const TakenWords& taken,
                         const Vocabulary& vocabulary) {
    if (named.verb == nullptr) return commandMistake(named, taken, vocabulary);
    if (!taken.leftOver.empty()) return unknownWord(*named.verb, taken, vocabulary);
    return argumentMistake(*named.verb, taken.given);
}

}  // namespace ctl
