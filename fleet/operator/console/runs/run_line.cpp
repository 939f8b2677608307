#include "fleet/operator/console/runs/run_line.h"

#include <nlohmann/json.hpp>

#include "ctl/client/http/bounded_json.h"
#include "ctl/command_line.h"
#include "ctl/show/shell_quoted.h"
#include "ctl/verbs/arguments/common_arguments.h"
#include "fleet/operator/centre/answers.h"
#include "fleet/operator/verbs/fleet_arguments.h"
#include "fleet/operator/verbs/fleet_verbs.h"

namespace fleet {
namespace {

constexpr const char* kProgramName = "zavctl-fleet";
constexpr const char* kDashes = "--";

using Words = std::vector<std::string>;

bool isPositional(const ctl::Argument& argument) {
    return argument.kind == ctl::Argument::Kind::Positional;
}

bool startsWithDash(const std::string& word) {
    return !word.empty() && word.front() == '-';
}

/// "config" and "get" of "config get".
Words nameWords(const ctl::Verb& verb) {
    const std::string name = verb.name;
    const std::size_t blank = name.find(' ');
    if (blank == std::string::npos) return {name};
    return {name.substr(0, blank), name.substr(blank + 1)};
}

/// Whether the values are the line's own, each in its place.
bool areThoseOf(const RunLine& line, const ctl::Values& given) {
    if (given.text(kFleet) != line.url || !given.flag(ctl::kJson)) return false;
    auto word = line.arguments.begin();
    for (const ctl::Argument& argument : line.verb->arguments) {
        if (!isPositional(argument)) continue;
        if (argument.type == ctl::Argument::Type::Texts) {
            return given.texts(argument) == Words(word, line.arguments.end());
        }
        const bool isThere = word != line.arguments.end();
        if (given.text(argument) != (isThere ? *word : "")) return false;
        if (isThere) ++word;
    }
    return word == line.arguments.end();
}

/// How many arguments stand before "--": none that would be an option, and none of another program.
std::size_t plainArguments(const RunLine& line) {
    std::size_t count = 0;
    for (const ctl::Argument& argument : line.verb->arguments) {
        if (!isPositional(argument)) continue;
        const bool isPlain =
            count < line.arguments.size() && !argument.isForeign &&
            (!startsWithDash(line.arguments[count]) || line.arguments[count] == kFromInput);
        if (!isPlain) break;
        if (argument.type == ctl::Argument::Type::Texts) return line.arguments.size();
        ++count;
    }
    return count;
}

std::string optionToCopy(const GivenOption& option) {
    const std::string name = option.argument->name;
    if (option.argument->kind == ctl::Argument::Kind::Flag) return name;
    return startsWithDash(option.value) ? ctl::shellQuoted(name + '=' + option.value)
                                        : name + ' ' + ctl::shellQuoted(option.value);
}

}  // namespace

Words programWords(const RunLine& line) {
    Words words = {kProgramName, std::string(kFleet.name) + '=' + line.url, ctl::kJson.name,
                   std::string(kFleetTimeout.name) + '=' + std::to_string(line.seconds)};
    for (const std::string& word : nameWords(*line.verb))
        words.push_back(word);
    for (const GivenOption& option : line.options) {
        const bool isFlag = option.argument->kind == ctl::Argument::Kind::Flag;
        words.push_back(option.argument->name + (isFlag ? "" : '=' + option.value));
    }
    if (line.verb->requestOf != nullptr) words.emplace_back(ctl::kNoWait.name);
    if (!line.arguments.empty()) words.emplace_back(kDashes);
    words.insert(words.end(), line.arguments.begin(), line.arguments.end());
    return words;
}

void insistThatTaken(const RunLine& line) {
    const Words words = programWords(line);
    const ctl::CommandLine taken =
        ctl::parseCommandLine({words.begin() + 1, words.end()}, fleetVocabulary());
    if (taken.verb == nullptr) {
        throw ctl::Failure(ctl::kWrongUsage, memberText(ctl::objectIn(taken.page.out), "error"));
    }
    if (taken.verb != line.verb || !areThoseOf(line, taken.given)) {
        throw ctl::Failure(ctl::kWrongUsage, "the program would take the request for another one");
    }
    insistOnMeaning(*line.verb, taken.given);
}

std::string lineToCopy(const RunLine& line) {
    std::string text = "zavctl " + std::string(kFleet.name) + ' ' + ctl::shellQuoted(line.url);
    for (const std::string& word : nameWords(*line.verb))
        text += ' ' + word;
    const std::size_t plain = plainArguments(line);
    const auto addArguments = [&](std::size_t from, std::size_t to) {
        for (std::size_t i = from; i < to; ++i)
            text += ' ' + ctl::shellQuoted(line.arguments[i]);
    };
    addArguments(0, plain);
    for (const GivenOption& option : line.options)
        text += ' ' + optionToCopy(option);
    if (plain < line.arguments.size()) text += std::string(" ") + kDashes;
    addArguments(plain, line.arguments.size());
    return text;
}

}  // namespace fleet
