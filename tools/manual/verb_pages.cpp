#include "tools/manual/verb_pages.h"

#include <algorithm>
#include <cctype>
#include <set>

#include "ctl/client/failure.h"
#include "ctl/verbs/help/argument_text.h"
#include "tools/manual/mdoc.h"

namespace manual {
namespace {

using ctl::Argument;

/// "Fl -socket Ar PATH", "Ar PRODUCT", "Fl v".
std::string macrosOf(const Argument& argument) {
    if (argument.kind == Argument::Kind::Positional) return std::string("Ar ") + argument.name;
    const std::string name = std::string("Fl ") + (argument.name + 1);
    if (argument.kind == Argument::Kind::Flag) return name;
    return name + " Ar " + escaped(ctl::valueNameOf(argument));
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

/// The verb's examples, as a list of their own.
std::string exampleLines(const ctl::Verb& verb) {
    return ".Pp\nExamples:\n.Pp\n" + examplesOf(verb);
}

}  // namespace

std::string pageOf(const ctl::Verb& verb) {
    std::string name = std::string("zavctl-") + verb.name;
    std::replace(name.begin(), name.end(), ' ', '-');
    return name;
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

std::string exitStatuses() {
    std::string entries = ".Bl -tag -width 130\n";
    for (const ctl::ExitMeaning& meaning : ctl::kExitMeanings)
        entries += entry(std::to_string(meaning.status), meaning.when);
    return entries + ".El\n";
}

std::string entriesOf(const std::vector<const ctl::Verb*>& verbs) {
    std::string entries = ".Bl -tag -width Ds\n";
    for (const ctl::Verb* const verb : verbs)
        entries += entry("Xr " + pageOf(*verb) + " 1", verb->help);
    return entries + ".El\n";
}

std::string subsectionOf(const ctl::Verb& verb) {
    return ".Ss " + std::string(verb.name) + '\n' + synopsisOf(verb) + ".Pp\n" +
           sentences(verb.help) + below("The arguments are:", listOf(verb.arguments, true)) +
           below("The options are:", listOf(verb.arguments, false)) + exampleLines(verb);
}

/// Verbs of the same group, in the order of the alphabet.
std::string VerbPages::relativesOf(const ctl::Verb& verb) const {
    const std::string name = verb.name;
    const std::string group = name.substr(0, name.find(' ') + 1);
    std::set<std::string> pages;
    for (const ctl::Verb* const other : verbs) {
        const bool isRelative = !group.empty() && std::string(other->name).rfind(group, 0) == 0;
        if (isRelative && other != &verb) pages.insert(pageOf(*other));
    }
    std::string lines;
    for (const std::string& page : pages)
        lines += ".Xr " + page + " 1 ,\n";
    return lines;
}

void VerbPages::writeVerb(const ctl::Verb& verb) const {
    const std::string page = pageOf(verb);
    std::string title = page;
    for (char& letter : title)
        letter = static_cast<char>(std::toupper(static_cast<unsigned char>(letter)));
    std::string description = contentIfThere(templates + "/verbs/" + page + ".mdoc");
    if (description.empty()) description = sentences(verb.help);
    manual::write(directory + '/' + page + ".1",
                  filled(templates + "/zavctl-verb.1.in",
                         {{"DATE", date},
                          {"TITLE", title},
                          {"PAGE", page},
                          {"PROGRAM", program},
                          {"HELP", escaped(verb.help)},
                          {"SYNOPSIS", synopsisOf(verb)},
                          {"DESCRIPTION", description},
                          {"ARGUMENTS", below("The arguments are:", listOf(verb.arguments, true))},
                          {"OPTIONS", below("The options are:", listOf(verb.arguments, false))},
                          {"GLOBAL_OPTIONS", listOf(globals, false)},
                          {"EXAMPLES", examplesOf(verb)},
                          {"RELATIVES", relativesOf(verb)}}));
}

void VerbPages::write() const {
    for (const ctl::Verb* const verb : verbs)
        writeVerb(*verb);
}

}  // namespace manual
