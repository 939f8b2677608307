#include "ctl/command_line.h"

#include <CLI/CLI.hpp>
#include <deque>
#include <map>
#include <optional>
#include <sstream>
#include <utility>

#include "ctl/client/failure.h"
#include "ctl/verbs/global_arguments.h"
#include "ctl/verbs/verb_table.h"

namespace ctl {
namespace {

using Words = std::vector<std::string>;
using Verbs = std::vector<const Verb*>;

constexpr const char* kExitStatuses =
    "Exit status: 0 success, 1 the host reported a failure, 2 wrong usage,\n"
    "3 no host reached, 4 no outcome within --timeout.";

std::string joined(const Words& words) {
    std::string text;
    for (const std::string& word : words)
        text += (text.empty() ? "" : " ") + word;
    return text;
}

/// "config" and "get" of "config get"; nothing and "start" of "start".
std::pair<std::string, std::string> splitName(const std::string& name) {
    const std::size_t blank = name.find(' ');
    if (blank == std::string::npos) return {"", name};
    return {name.substr(0, blank), name.substr(blank + 1)};
}

/// The arguments of one command, declared to CLI11, which stores the values where they belong.
class DeclaredArguments {
public:
    DeclaredArguments(CLI::App& app, const ArgumentList& arguments) {
        for (const Argument& argument : arguments)
            declareOne(app, argument);
        for (const Argument& argument : arguments) {
            CLI::Option& option = *options_.at(argument.name).first;
            if (argument.excludes != nullptr) option.excludes(options_.at(argument.excludes).first);
            if (argument.needs != nullptr) option.needs(options_.at(argument.needs).first);
        }
    }
    DeclaredArguments(const DeclaredArguments&) = delete;
    DeclaredArguments& operator=(const DeclaredArguments&) = delete;

    /// After the parse.
    const Values& values() {
        for (auto& [name, declared] : options_)
            declared.second->isGiven = declared.first->count() > 0;
        return values_;
    }

private:
    static std::string helpOf(const Argument& argument) {
        if (argument.fallback == nullptr) return argument.help;
        return std::string(argument.help) + "; " + argument.fallback + " if not given";
    }

    static CLI::Option* addOption(CLI::App& app, const Argument& argument, Value& value) {
        const std::string help = helpOf(argument);
        if (argument.kind == Argument::Kind::Flag) {
            return app.add_flag(argument.name, value.flag, help);
        }
        switch (argument.type) {
            case Argument::Type::Texts:
                return app.add_option(argument.name, value.texts, help);
            case Argument::Type::Number:
                return app.add_option(argument.name, value.number, help);
            case Argument::Type::Seconds:
                return app.add_option(argument.name, value.seconds, help);
            case Argument::Type::Text:
                break;
        }
        return app.add_option(argument.name, value.text, help);
    }

    static void limit(CLI::Option& option, const Argument& argument) {
        if (argument.least >= argument.most) return;
        if (argument.type == Argument::Type::Number) {
            option.check(CLI::Range(static_cast<unsigned>(argument.least),
                                    static_cast<unsigned>(argument.most)));
        } else {
            option.check(CLI::Range(argument.least, argument.most));
        }
    }

    void declareOne(CLI::App& app, const Argument& argument) {
        Value& value = values_.add(argument);
        CLI::Option* const option = addOption(app, argument, value);
        option->required(argument.isRequired);
        if (argument.valueName != nullptr) option->type_name(argument.valueName);
        if (argument.isHidden) option->group("");
        limit(*option, argument);
        options_[argument.name] = {option, &value};
    }

    Values values_;
    std::map<std::string, std::pair<CLI::Option*, Value*>> options_;
};

/// A parser that knows some of the verbs, or all.
class Parser {
public:
    explicit Parser(const Verbs& verbs)
        : app_("Manages the monitoring agents of one host.", "zavctl") {
        app_.require_subcommand(1);
        app_.fallthrough();  // global options may stand behind the verb
        app_.footer(kExitStatuses);
        globals_.emplace(app_, kGlobalArguments);
        app_.set_version_flag("--version", "zavctl " ZAV_VERSION, "Print the version and exit");
        for (const Verb* const verb : verbs)
            addVerb(*verb);
    }

    /// Throws CLI::ParseError, also for help and the version.
    CommandLine parse(const Words& words) {
        Words reversed(words.rbegin(), words.rend());
        app_.parse(reversed);
        CommandLine line;
        for (Entry& entry : entries_) {
            if (!entry.app->parsed()) continue;
            line.verb = entry.verb;
            line.given = entry.arguments.values();
        }
        line.given.append(globals_->values());
        return line;
    }

    /// The text to print after parse() has thrown. An unknown word hides a missing required one, so
    /// the unknown word is reported.
    Page pageOf(const CLI::ParseError& error) const {
        const Words unknown = app_.remaining(true);
        const bool missing = dynamic_cast<const CLI::RequiredError*>(&error) != nullptr;
        std::ostringstream out;
        std::ostringstream err;
        const int code = missing && !unknown.empty()
                             ? app_.exit(CLI::ExtrasError(app_.get_name(), unknown), out, err)
                             : app_.exit(error, out, err);
        return {out.str(), err.str(), code == 0 ? kSuccess : kWrongUsage};
    }

private:
    struct Entry {
        Entry(const Verb& of, CLI::App& parser)
            : verb(&of), app(&parser), arguments(parser, of.arguments) {}
        const Verb* verb;
        CLI::App* app;
        DeclaredArguments arguments;
    };

    void addVerb(const Verb& verb) {
        const auto [group, name] = splitName(verb.name);
        CLI::App& parent = group.empty() ? app_ : groupOf(group);
        CLI::App* const app = parent.add_subcommand(name, verb.help);
        app->footer(std::string("Examples:\n  ") + verb.examples[0] + "\n  " + verb.examples[1] +
                    "\n\n" + kExitStatuses);
        entries_.emplace_back(verb, *app);
    }

    CLI::App& groupOf(const std::string& name) {
        CLI::App*& group = groups_[name];
        if (group == nullptr) {
            group = app_.add_subcommand(name, findVerbGroup(name)->help);
            group->require_subcommand(1);
        }
        return *group;
    }

    CLI::App app_;
    std::optional<DeclaredArguments> globals_;
    std::map<std::string, CLI::App*> groups_;
    std::deque<Entry> entries_;
};

bool takesValue(const std::string& option) {
    for (const Argument& argument : kGlobalArguments) {
        if (option == argument.name) return argument.kind == Argument::Kind::Option;
    }
    return false;
}

Verbs allVerbs() {
    return {std::begin(kVerbs), std::end(kVerbs)};
}

CommandLine parseWithAllVerbs(const Words& words) {
    Parser parser(allVerbs());
    try {
        return parser.parse(words);
    } catch (const CLI::ParseError& error) {
        CommandLine line;
        line.page = parser.pageOf(error);
        return line;
    }
}

}  // namespace

const Verb* namedVerb(const std::vector<std::string>& words) {
    std::string name;
    for (std::size_t i = 0; i < words.size(); ++i) {
        const bool isOption = words[i].rfind('-', 0) == 0;
        if (takesValue(words[i])) ++i;
        if (isOption) continue;
        name += (name.empty() ? "" : " ") + words[i];
        if (findVerbGroup(name) == nullptr) break;
    }
    return findVerb(name);
}

CommandLine parseCommandLine(const std::vector<std::string>& words) {
    // Declaring all verbs takes longer than most of them run. On an error the line is parsed again
    // with all of them, for a complete message.
    if (const Verb* const verb = namedVerb(words); verb != nullptr) {
        try {
            return Parser({verb}).parse(words);
        } catch (const CLI::ParseError&) {
        }
    }
    return parseWithAllVerbs(words);
}

std::string helpText(const std::vector<std::string>& verb) {
    const std::string name = joined(verb);
    if (!name.empty() && findVerb(name) == nullptr && findVerbGroup(name) == nullptr) {
        throw Failure(kWrongUsage, "there is no command \"" + name + "\"");
    }
    Words words = verb;
    words.emplace_back("--help");
    return parseWithAllVerbs(words).page.out;
}

}  // namespace ctl
