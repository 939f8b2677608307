// Writes the manual pages of zavctl: zavctl_manual TEMPLATES DIRECTORY DATE
//
// What a verb does beyond its one line of help stands in TEMPLATES/verbs, if there is more to say.

#include <algorithm>
#include <cctype>
#include <set>
#include <string>

#include "ctl/client/failure.h"
#include "ctl/verbs/arguments/global_arguments.h"
#include "ctl/verbs/help/argument_text.h"
#include "ctl/verbs/verb_table.h"
#include "tools/manual/mdoc.h"
#include "tools/manual/pages.h"

namespace manual {
namespace {

using ctl::Argument;

/// "config get" is the page zavctl-config-get.
std::string pageOf(const ctl::Verb& verb) {
    std::string name = std::string("zavctl-") + verb.name;
    std::replace(name.begin(), name.end(), ' ', '-');
    return name;
}

/// "Fl -socket Ar PATH", "Ar PRODUCT", "Fl v".
std::string macrosOf(const Argument& argument) {
    if (argument.kind == Argument::Kind::Positional) return std::string("Ar ") + argument.name;
    const std::string name = std::string("Fl ") + (argument.name + 1);
    if (argument.kind == Argument::Kind::Flag) return name;
    return name + " Ar " + escaped(ctl::valueNameOf(argument));
}

std::string listOf(const ctl::ArgumentList& arguments, bool positionals) {
    std::string entries;
    for (const Argument& argument : arguments) {
        const bool isPositional = argument.kind == Argument::Kind::Positional;
        if (argument.isHidden || isPositional != positionals) continue;
        entries += entry(macrosOf(argument), ctl::helpOf(argument));
    }
    return entries.empty() ? entries : ".Bl -tag -width Ds\n" + entries + ".El\n";
}

/// A list below a sentence; nothing if there is no list.
std::string below(const std::string& sentence, const std::string& list) {
    return list.empty() ? list : ".Pp\n" + sentence + '\n' + list;
}

std::string synopsisOf(const ctl::Verb& verb) {
    std::string lines = ".Nm zavctl " + std::string(verb.name) + "\n.Op Ar options\n";
    for (const Argument& argument : verb.arguments) {
        if (argument.isHidden || argument.kind != Argument::Kind::Positional) continue;
        const std::string more = argument.type == Argument::Type::Texts ? " ..." : "";
        const std::string word = std::string("Ar ") + argument.name + more;
        lines += argument.isRequired ? "." + word + '\n' : ".Op " + word + '\n';
    }
    return lines;
}

std::string examplesOf(const ctl::Verb& verb) {
    std::string lines;
    for (const char* const example : verb.examples)
        lines += ".Dl " + escaped(example) + '\n';
    return lines;
}

std::string exitStatuses() {
    std::string entries = ".Bl -tag -width 130\n";
    for (const ctl::ExitMeaning& meaning : ctl::kExitMeanings)
        entries += entry(std::to_string(meaning.status), meaning.when);
    return entries + ".El\n";
}

std::string verbs() {
    std::string entries = ".Bl -tag -width Ds\n";
    for (const ctl::Verb* const verb : ctl::kVerbs)
        entries += entry("Xr " + pageOf(*verb) + " 1", verb->help);
    return entries + ".El\n";
}

/// Verbs of the same group, in the order of the alphabet.
std::string relativesOf(const ctl::Verb& verb) {
    const std::string name = verb.name;
    const std::string group = name.substr(0, name.find(' ') + 1);
    if (group.empty()) return {};
    std::set<std::string> pages;
    for (const ctl::Verb* const other : ctl::kVerbs) {
        const bool isRelative = std::string(other->name).rfind(group, 0) == 0;
        if (isRelative && other != &verb) pages.insert(pageOf(*other));
    }
    std::string lines;
    for (const std::string& page : pages)
        lines += ".Xr " + page + " 1 ,\n";
    return lines;
}

void writeVerb(const ctl::Verb& verb, const std::string& templates, const std::string& directory,
               const std::string& date) {
    const std::string page = pageOf(verb);
    std::string title = page;
    for (char& letter : title)
        letter = static_cast<char>(std::toupper(static_cast<unsigned char>(letter)));
    std::string description = contentIfThere(templates + "/verbs/" + page + ".mdoc");
    if (description.empty()) description = sentences(verb.help);
    write(directory + '/' + page + ".1",
          filled(templates + "/zavctl-verb.1.in",
                 {{"DATE", date},
                  {"TITLE", title},
                  {"PAGE", page},
                  {"HELP", escaped(verb.help)},
                  {"SYNOPSIS", synopsisOf(verb)},
                  {"DESCRIPTION", description},
                  {"ARGUMENTS", below("The arguments are:", listOf(verb.arguments, true))},
                  {"OPTIONS", below("The options are:", listOf(verb.arguments, false))},
                  {"GLOBAL_OPTIONS", listOf(ctl::kGlobalArguments, false)},
                  {"EXAMPLES", examplesOf(verb)},
                  {"RELATIVES", relativesOf(verb)}}));
}

}  // namespace

void writePages(const std::string& templates, const std::string& directory,
                const std::string& date) {
    write(directory + "/zavctl.1",
          filled(templates + "/zavctl.1.in", {{"DATE", date},
                                              {"OPTIONS", listOf(ctl::kGlobalArguments, false)},
                                              {"VERBS", verbs()},
                                              {"EXIT_STATUSES", exitStatuses()}}));
    for (const ctl::Verb* const verb : ctl::kVerbs)
        writeVerb(*verb, templates, directory, date);
}

}  // namespace manual
