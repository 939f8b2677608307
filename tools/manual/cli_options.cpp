#include "tools/manual/cli_options.h"

#include <CLI/CLI.hpp>
#include <cctype>
#include <vector>

#include "tools/manual/mdoc.h"

namespace manual {
namespace {

/// Those that a page explains.
std::vector<const CLI::Option*> shownOptions(const CLI::App& app) {
    std::vector<const CLI::Option*> shown;
    for (const CLI::Option* const option : app.get_options()) {
        if (option != app.get_help_ptr()) shown.push_back(option);
    }
    return shown;
}

bool takesValue(const CLI::Option& option) {
    return option.get_items_expected_max() > 0;
}

/// "--max-failures" has the value MAX_FAILURES; its own name would say less.
std::string valueName(const CLI::Option& option) {
    std::string name = option.get_lnames().front();
    for (char& c : name)
        c = c == '-' ? '_' : static_cast<char>(std::toupper(static_cast<unsigned char>(c)));
    return name;
}

std::string macrosOf(const CLI::Option& option) {
    if (option.get_positional()) return "Ar " + escaped(option.get_name(true, false));
    const std::string flag = "Fl -" + option.get_lnames().front();
    return takesValue(option) ? flag + " Ar " + escaped(valueName(option)) : flag;
}

std::string explanationOf(const CLI::Option& option) {
    const std::string usual = option.get_default_str();
    if (usual.empty() || !takesValue(option)) return option.get_description();
    return option.get_description() + "; without it " + usual;
}

}  // namespace

std::string optionList(const CLI::App& app) {
    std::string entries;
    for (const CLI::Option* const option : shownOptions(app))
        entries += entry(macrosOf(*option), explanationOf(*option));
    return entries.empty() ? "" : ".Bl -tag -width Ds\n" + entries + ".El\n";
}

std::string synopsisOf(const CLI::App& app) {
    std::string flags;
    std::string words;
    for (const CLI::Option* const option : shownOptions(app)) {
        std::string& place = option->get_positional() ? words : flags;
        place += option->get_required() ? "\n." + macrosOf(*option) : "\n.Op " + macrosOf(*option);
    }
    return flags + words;
}

}  // namespace manual
