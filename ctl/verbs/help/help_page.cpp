#include "ctl/verbs/help/help_page.h"

#include <algorithm>
#include <string_view>
#include <utility>
#include <vector>

#include "ctl/client/failure.h"
#include "ctl/show/nearest.h"
#include "ctl/show/printable.h"
#include "ctl/verbs/help/argument_text.h"

namespace ctl {
namespace {

/// A name and what it stands for.
using Entry = std::pair<std::string, std::string>;
using Entries = std::vector<Entry>;

constexpr std::size_t kColumns = 80;
constexpr std::size_t kWidestName = 24;

/// The text in lines of at most `width` letters, broken at blanks. Its own line ends count as
/// blanks.
std::vector<std::string> wrapped(std::string_view text, std::size_t width) {
    std::vector<std::string> lines(1);
    while (!text.empty()) {
        const std::size_t end = std::min(text.find_first_of(" \n"), text.size());
        const std::string_view word = text.substr(0, end);
        text.remove_prefix(std::min(end + 1, text.size()));
        std::string& line = lines.back();
        if (line.empty()) {
            line = word;
        } else if (line.size() + 1 + word.size() <= width) {
            line += ' ';
            line += word;
        } else {
            lines.emplace_back(word);
        }
    }
    return lines;
}

/// A paragraph about the statuses.
std::string exitStatuses() {
    std::string text = "Exit status:";
    const char* separator = " ";
    for (const ExitMeaning& meaning : kExitMeanings) {
        text += separator + std::to_string(meaning.status) + ' ' + meaning.when;
        separator = "; ";
    }
    std::string paragraph = "\n";
    for (const std::string& line : wrapped(text + '.', kColumns))
        paragraph += line + '\n';
    return paragraph;
}

/// The entries below a title, in two columns; nothing if there are none.
std::string section(const std::string& title, const Entries& entries) {
    if (entries.empty()) return {};
    std::size_t names = 0;
    for (const Entry& entry : entries)
        names = std::max(names, std::min(entry.first.size(), kWidestName));
    const std::size_t indent = names + 4;
    std::string text = "\n" + title + ":\n";
    for (const auto& [name, help] : entries) {
        text += "  " + name;
        std::size_t at = name.size() + 2;
        if (name.size() > kWidestName) {
            text += '\n';
            at = 0;
        }
        for (const std::string& line : wrapped(help, kColumns - indent)) {
            text += std::string(indent - at, ' ') + line + '\n';
            at = 0;
        }
    }
    return text;
}

std::string nameOf(const Argument& argument) {
    if (argument.kind != Argument::Kind::Option) return argument.name;
    return std::string(argument.name) + " " + valueNameOf(argument);
}

Entries entriesOf(const ArgumentList& arguments, bool positionals) {
    Entries entries;
    for (const Argument& argument : arguments) {
        const bool isPositional = argument.kind == Argument::Kind::Positional;
        if (argument.isHidden || isPositional != positionals) continue;
        entries.emplace_back(nameOf(argument), helpOf(argument));
    }
    return entries;
}

std::string globalOptions(const std::string& title, const Vocabulary& vocabulary) {
    Entries entries = entriesOf(vocabulary.globals, false);
    entries.emplace_back("-h, --help", "Print the help");
    entries.emplace_back("--version", "Print the version");
    return section(title, entries);
}

/// "PRODUCT [TEXT]", "[VERB...]".
std::string positionalsOf(const Verb& verb) {
    std::string words;
    for (const Argument& argument : verb.arguments) {
        if (argument.isHidden || argument.kind != Argument::Kind::Positional) continue;
        std::string word = argument.name;
        if (argument.type == Argument::Type::Texts) word += "...";
        words += argument.isRequired ? " " + word : " [" + word + "]";
    }
    return words;
}

/// Whether the verb stands in the group, and is not just called alike.
bool isMemberOf(const Verb& verb, const VerbGroup& group) {
    return std::string(verb.name).rfind(std::string(group.name) + " ", 0) == 0;
}

/// A line for each verb, groups being one line.
Entries commands(const Vocabulary& vocabulary) {
    Entries entries;
    const VerbGroup* last = nullptr;
    const auto& groups = vocabulary.groups;
    for (const Verb* const verb : vocabulary.verbs) {
        const auto group = std::find_if(groups.begin(), groups.end(), [verb](const auto* one) {
            return isMemberOf(*verb, *one);
        });
        // Where a group's name is a verb as well, its line would be taken for that of the group.
        const bool isListed =
            group == groups.end() || vocabulary.findVerb((*group)->name) != nullptr;
        if (isListed) {
            entries.emplace_back(verb->name, verb->help);
        } else if (last != *group) {
            last = *group;
            entries.emplace_back(last->name, last->help);
        }
    }
    return entries;
}

}  // namespace

std::string programHelp(const Vocabulary& vocabulary) {
    return std::string(vocabulary.purpose) + ".\n\nUsage: zavctl [OPTIONS] COMMAND ...\n" +
           section("Commands", commands(vocabulary)) +
           globalOptions("Options of every command", vocabulary) +
           "\nzavctl help COMMAND explains a command, with examples.\n" + exitStatuses();
}

std::string groupHelp(const VerbGroup& group, const Vocabulary& vocabulary) {
    Entries entries;
    std::string examples;
    for (const Verb* const verb : vocabulary.verbs) {
        if (!isMemberOf(*verb, group)) continue;
        entries.emplace_back(verb->name, verb->help);
        examples += std::string("  ") + verb->examples[0] + "\n";
    }
    return std::string(group.help) + ".\n\nUsage: zavctl " + group.name + " COMMAND ...\n" +
           section("Commands", entries) + "\nExamples:\n" + examples + "\nzavctl help " +
           group.name + " COMMAND explains a command, with more examples.\n";
}

std::string verbHelp(const Verb& verb, const Vocabulary& vocabulary) {
    return std::string(verb.help) + ".\n\nUsage: zavctl " + verb.name + " [OPTIONS]" +
           positionalsOf(verb) + "\n" + section("Arguments", entriesOf(verb.arguments, true)) +
           section("Options", entriesOf(verb.arguments, false)) +
           globalOptions("Options of every command", vocabulary) + "\nExamples:\n  " +
           verb.examples[0] + "\n  " + verb.examples[1] + "\n" + exitStatuses();
}

std::string helpAbout(const std::vector<std::string>& words, const Vocabulary& vocabulary) {
    std::string name;
    for (const std::string& word : words)
        name += (name.empty() ? "" : " ") + word;
    if (name.empty()) return programHelp(vocabulary);
    if (const Verb* const verb = vocabulary.findVerb(name)) return verbHelp(*verb, vocabulary);
    if (const VerbGroup* const group = vocabulary.findGroup(name)) {
        return groupHelp(*group, vocabulary);
    }
    std::vector<std::string> known;
    for (const Verb* const verb : vocabulary.verbs)
        known.emplace_back(verb->name);
    throw Failure(kWrongUsage,
                  "there is no command \"" + printable(name) + "\"" + suggestion(name, known));
}

}  // namespace ctl
