#include "ctl/command_line.h"

#include <CLI/CLI.hpp>
#include <algorithm>
#include <iomanip>
#include <nlohmann/json.hpp>
#include <optional>
#include <sstream>
#include <utility>

#include "ctl/verbs/arguments/foreign_words.h"
#include "ctl/verbs/arguments/global_arguments.h"
#include "ctl/verbs/help/help_page.h"
#include "ctl/verbs/help/usage_mistake.h"

namespace ctl {
namespace {

using Words = std::vector<std::string>;

/// Every vocabulary has this verb.
constexpr const char* kVersionName = "version";

/// "config" and "get" of "config get"; nothing and "start" of "start".
std::pair<std::string, std::string> splitName(const std::string& name) {
    const std::size_t blank = name.find(' ');
    if (blank == std::string::npos) return {"", name};
    return {name.substr(0, blank), name.substr(blank + 1)};
}

/// What a value must be: "--port: "0" is not a whole number from 1 to 65535".
CLI::Validator kindOf(const Argument& argument) {
    const bool isWhole = argument.type == Argument::Type::Number;
    const bool isLimited = argument.least < argument.most;
    std::ostringstream kind;
    kind << (isWhole ? "a whole number" : "a number of seconds") << std::fixed
         << std::setprecision(0);
    if (isLimited) kind << " from " << argument.least << " to " << argument.most;
    const auto fits = [=](const std::string& text) {
        double value = 0;
        unsigned whole = 0;
        if (isWhole ? !CLI::detail::lexical_cast(text, whole)
                    : !CLI::detail::lexical_cast(text, value)) {
            return false;
        }
        if (isWhole) value = whole;
        // What is "not a number" is neither below a limit nor above it.
        return !isLimited || (value >= argument.least && value <= argument.most);
    };
    return CLI::Validator(
        [fits, text = kind.str()](const std::string& value) {
            return fits(value) ? std::string() : "\"" + value + "\" is not " + text;
        },
        "");
}

/// The arguments of one command, declared to CLI11, which stores the values where they belong.
/// Whether they are complete and go together is for firstMistake().
class DeclaredArguments {
public:
    DeclaredArguments(CLI::App& app, const ArgumentList& arguments) {
        for (const Argument& argument : arguments) {
            Value& value = values_.add(argument);
            options_.emplace_back(addOption(app, argument, value), &value);
        }
    }
    DeclaredArguments(const DeclaredArguments&) = delete;
    DeclaredArguments& operator=(const DeclaredArguments&) = delete;

    /// After the parse.
    const Values& values() {
        for (auto& [option, value] : options_)
            value->isGiven = option->count() > 0;
        return values_;
    }

private:
    static CLI::Option* addOption(CLI::App& app, const Argument& argument, Value& value) {
        if (argument.kind == Argument::Kind::Flag) return app.add_flag(argument.name, value.flag);
        switch (argument.type) {
            case Argument::Type::Texts:
                return app.add_option(argument.name, value.texts);
            case Argument::Type::Number:
                return app.add_option(argument.name, value.number)->check(kindOf(argument));
            case Argument::Type::Seconds:
                return app.add_option(argument.name, value.seconds)->check(kindOf(argument));
            case Argument::Type::Text:
                break;
        }
        return app.add_option(argument.name, value.text);
    }

    Values values_;
    std::vector<std::pair<CLI::Option*, Value*>> options_;
};

/// Takes words apart, for one verb or for none.
class Parser {
public:
    Parser(const Verb* verb, const ArgumentList& globals)
        : app_("", "zavctl"), globals_(app_, globals) {
        app_.fallthrough();  // global options may stand behind the verb
        app_.allow_extras();
        app_.set_version_flag("--version", "zavctl " ZAV_VERSION);
        if (verb != nullptr) addVerb(*verb);
    }

    /// Throws CLI::ParseError, also for help and the version.
    Values parse(const Words& words) {
        Words reversed(words.rbegin(), words.rend());
        app_.parse(reversed);
        Values given;
        if (arguments_) given = arguments_->values();
        given.append(globals_.values());
        return given;
    }

    /// The words that nobody takes, in no order. After the parse.
    Words unknown() const {
        Words words = app_.remaining(true);
        // What ends the options is listed among them.
        words.erase(std::remove(words.begin(), words.end(), "--"), words.end());
        return words;
    }

private:
    void addVerb(const Verb& verb) {
        const auto [group, name] = splitName(verb.name);
        CLI::App* parent = &app_;
        if (!group.empty()) {
            parent = app_.add_subcommand(group);
            parent->allow_extras();
        }
        CLI::App* const app = parent->add_subcommand(name);
        app->allow_extras();
        arguments_.emplace(*app, verb.arguments);
    }

    CLI::App app_;
    DeclaredArguments globals_;
    std::optional<DeclaredArguments> arguments_;
};

bool takesValue(const std::string& option, const ArgumentList& globals) {
    for (const Argument& argument : globals) {
        if (option == argument.name) return argument.kind == Argument::Kind::Option;
    }
    return false;
}

/// How far the words name a command, seen without parsing them.
NamedCommand nameIn(const Words& words, const Vocabulary& vocabulary) {
    NamedCommand named;
    for (std::size_t i = 0; i < words.size(); ++i) {
        const bool isOption = words[i].rfind('-', 0) == 0;
        if (takesValue(words[i], vocabulary.globals)) ++i;
        if (isOption) continue;
        named.name += (named.name.empty() ? "" : " ") + words[i];
        const VerbGroup* const group = vocabulary.findGroup(named.name);
        if (group == nullptr) break;
        named.group = group;
    }
    named.verb = vocabulary.findVerb(named.name);
    if (named.verb == nullptr && named.group != nullptr) {
        // A group's name may be a verb as well, and what follows it an argument.
        named.verb = vocabulary.findVerb(named.group->name);
    }
    return named;
}

CommandLine helpFor(const NamedCommand& named, const Vocabulary& vocabulary) {
    CommandLine line;
    line.page.out = named.verb != nullptr    ? verbHelp(*named.verb, vocabulary)
                    : named.group != nullptr ? groupHelp(*named.group, vocabulary)
                                             : programHelp(vocabulary);
    return line;
}

/// Whether a line that could not be taken apart asks for JSON.
bool asksForJson(const Words& words) {
    const auto end = std::find(words.begin(), words.end(), "--");
    return std::find(words.begin(), end, kJson.name) != end;
}

CommandLine wrongUsage(const std::string& mistake, const NamedCommand& named, const Words& words) {
    std::string hint = "zavctl help";
    if (named.verb != nullptr) {
        hint += std::string(" ") + named.verb->name + " shows how it is used";
    } else {
        if (named.group != nullptr) hint += std::string(" ") + named.group->name;
        hint += " lists the commands";
    }
    CommandLine line;
    line.page = {{}, complaint(mistake) + hint + "\n", kWrongUsage};
    if (asksForJson(words)) line.page.out = jsonText({{"error", mistake}});
    return line;
}

/// "--version" is the verb "version", whatever else stands on the line.
CommandLine versionLine(const Words& words, const Vocabulary& vocabulary) {
    CommandLine line;
    line.verb = vocabulary.findVerb(kVersionName);
    Words options = {kVersionName};
    std::copy_if(words.begin(), words.end(), std::back_inserter(options),
                 [](const std::string& word) { return word != "--version"; });
    line.given = Parser(line.verb, vocabulary.globals).parse(options);
    return line;
}

CommandLine dashesMissing(const Verb& verb, const std::string& corrected, const Words& words) {
    const Failure failure(kWrongUsage, std::string("put the ") + verb.name + " command behind --",
                          corrected);
    CommandLine line;
    line.page = failurePage(failure, asksForJson(words) ? Format::Json : Format::Text);
    return line;
}

}  // namespace

const Verb* namedVerb(const std::vector<std::string>& words, const Vocabulary& vocabulary) {
    return nameIn(words, vocabulary).verb;
}

CommandLine parseCommandLine(const std::vector<std::string>& words, const Vocabulary& vocabulary) {
    const NamedCommand named = nameIn(words, vocabulary);
    if (named.verb != nullptr) {
        const std::string corrected = lineWithDashes(*named.verb, words, vocabulary.globals);
        if (!corrected.empty()) return dashesMissing(*named.verb, corrected, words);
    }
    Parser parser(named.verb, vocabulary.globals);
    CommandLine line;
    try {
        line.given = parser.parse(words);
    } catch (const CLI::CallForHelp&) {
        return helpFor(named, vocabulary);
    } catch (const CLI::CallForVersion&) {
        return versionLine(words, vocabulary);
    } catch (const CLI::ArgumentMismatch& mismatch) {
        const std::string text = mismatch.what();
        return wrongUsage(text.substr(0, text.find(':')) + " needs a value", named, words);
    } catch (const CLI::ParseError& error) {
        return wrongUsage(error.what(), named, words);
    }
    const std::string mistake =
        firstMistake(named, {words, parser.unknown(), line.given}, vocabulary);
    if (!mistake.empty()) return wrongUsage(mistake, named, words);
    line.verb = named.verb;
    return line;
}

}  // namespace ctl
