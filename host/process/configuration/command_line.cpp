#include "host/process/configuration/command_line.h"

#include <CLI/CLI.hpp>
#include <string>
#include <utility>
#include <vector>

#include "host/process/configuration/option_table.h"
#include "host/process/start_error.h"
#include "host/process/version.h"
#include "text/nearest_name.h"

namespace host {
namespace {

using Declared = std::vector<std::pair<const OptionRow*, CLI::Option*>>;

constexpr const char* kHint = " (--help shows the options)";

Declared declare(CLI::App& app) {
    app.set_version_flag("--version", kVersion, "Print the version and end");
    app.set_help_flag("-h,--help", "Print this help and end");
    app.allow_extras();
    Declared declared;
    for (const OptionRow& row : optionTable()) {
        const std::string name = std::string("--") + row.name;
        CLI::Option* const option = row.kind == OptionKind::Flag ? app.add_flag(name, row.help)
                                                                 : app.add_option(name, row.help);
        if (row.kind != OptionKind::Flag) option->type_size(1)->expected(1)->type_name(row.value);
        declared.emplace_back(&row, option);
    }
    return declared;
}

std::vector<std::string> namesOf(const CLI::App& app) {
    std::vector<std::string> names;
    for (const CLI::Option* const option : app.get_options()) {
        for (const std::string& name : option->get_lnames())
            names.push_back("--" + name);
    }
    return names;
}

[[noreturn]] void failOnStray(const CLI::App& app, const std::string& stray) {
    const bool isOption = !stray.empty() && stray.front() == '-';
    const std::string name = stray.substr(0, stray.find('='));
    const std::string nearest = isOption ? text::nearestName(name, namesOf(app)) : "";
    throw StartError(
        (isOption ? "there is no option " + name : "the argument \"" + stray + "\" has no place") +
        (nearest.empty() ? "" : "; did you mean " + nearest + "?") + kHint);
}

std::string textOf(const OptionRow& row, const CLI::Option& option) {
    if (row.kind == OptionKind::Flag) return option.as<bool>() ? "true" : "false";
    return option.as<std::string>();
}

}  // namespace

std::optional<Settings> readCommandLine(int argc, const char* const* argv) {
    CLI::App app("A small agent process: loads the management plug-in and serves local clients",
                 "zavhost");
    const Declared declared = declare(app);
    Settings settings;
    try {
        app.parse(argc, argv);
        for (const auto& [row, option] : declared) {
            if (option->count() > 0) settings.add(row->name, {textOf(*row, *option), "", 0});
        }
    } catch (const CLI::Success& wanted) {
        app.exit(wanted);
        return std::nullopt;
    } catch (const CLI::Error& error) {
        throw StartError(std::string(error.what()) + kHint);
    }
    const std::vector<std::string> strays = app.remaining();
    if (!strays.empty()) failOnStray(app, strays.front());
    return settings;
}

}  // namespace host
