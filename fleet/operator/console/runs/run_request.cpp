#include "fleet/operator/console/runs/run_request.h"

#include <algorithm>
#include <cstring>
#include <nlohmann/json.hpp>
#include <string_view>
#include <utility>

#include "ctl/client/failure.h"
#include "ctl/client/http/bounded_json.h"
#include "ctl/show/printable.h"
#include "ctl/show/shell_quoted.h"
#include "fleet/operator/console/runs/child_program.h"
#include "fleet/operator/console/runs/run_line.h"
#include "fleet/operator/console/runs/run_verbs.h"
#include "fleet/operator/verbs/fleet_arguments.h"
#include "fleet/operator/verbs/fleet_verbs.h"

using nlohmann::json;

namespace fleet {
namespace {

constexpr std::size_t kMostWords = 256;
constexpr std::size_t kLongestWord = std::size_t{8} * 1024;
constexpr std::size_t kMostNamedHosts = 10'000;
constexpr std::size_t kLongestHost = 256;

[[noreturn]] void refuse(const std::string& what) {
    throw ctl::Failure(ctl::kWrongUsage, what);
}

std::string quotedName(const std::string& name) {
    constexpr std::size_t kShown = 64;
    return "\"" + ctl::printable(name.substr(0, kShown)) + "\"";
}

/// A text that can stand in a command line, and means one thing wherever it is shown.
std::string wordIn(const json& value, const std::string& what) {
    if (!value.is_string()) refuse(what + " is no text");
    const std::string word = value.get<std::string>();
    if (word.empty()) refuse(what + " is empty");
    if (word.size() > kLongestWord) refuse(what + " is too long");
    const bool isLine = std::none_of(word.begin(), word.end(),
                                     [](unsigned char c) { return c < ' ' || c == '\x7f'; });
    if (!isLine) refuse(what + " is no single line of text");
    return word;
}

void insistOnSelector(const std::string& word) {
    if (word.front() == '@') refuse("a selector of the console's names no file");
}

const json& listOf(const json& object, const char* member) {
    static const json kNothing = json::array();
    const auto found = object.find(member);
    if (found == object.end()) return kNothing;
    if (!found->is_array()) refuse(std::string(member) + " is no list");
    return *found;
}

/// Reads the request's members one after the other.
class RunReader {
public:
    RunReader(json request, const std::string& url)
        : request_(std::move(request)), row_(rowIn(request_)) {
        line_.url = url;
        line_.verb = &declarationOf(row_);
    }

    RunRequest read() {
        insistOnMembers();
        readArguments();
        readOptions();
        readHosts();
        readInput();
        insistThatTaken(line_);
        const bool beginsRollout = line_.verb->requestOf != nullptr && !isGiven(kDryRun);
        return {programWords(line_), std::move(input_), std::move(hosts_), shownLine(),
                beginsRollout};
    }

private:
    static const RunVerb& rowIn(const json& request) {
        const auto found = request.find("verb");
        if (found == request.end() || !found->is_string()) refuse("verb is no text");
        const std::string name = found->get<std::string>();
        const RunVerb* const row = findRunVerb(name);
        if (row == nullptr) refuse("the console runs no " + quotedName(name));
        return *row;
    }

    void insistOnMembers() const {
        constexpr const char* kMembers[] = {"verb", "arguments", "options", "hosts", "input"};
        for (const auto& member : request_.items()) {
            const bool isKnown = std::find(std::begin(kMembers), std::end(kMembers),
                                           member.key()) != std::end(kMembers);
            if (!isKnown) refuse("a request has no " + quotedName(member.key()));
        }
    }

    void readArguments() {
        for (const json& value : listOf(request_, "arguments"))
            line_.arguments.push_back(wordIn(value, "an argument"));
        if (line_.arguments.size() > kMostWords) refuse("there are too many arguments");
    }

    void readOptions() {
        const auto found = request_.find("options");
        if (found == request_.end()) return;
        if (!found->is_object()) refuse("options is no object");
        for (const auto& item : found->items())
            readOption(item.key(), item.value());
    }

    void readOption(const std::string& key, const json& value) {
        const ctl::Argument* const option = findRunOption(*line_.verb, key);
        if (option == nullptr) refuse(name() + " has no option " + quotedName(key));
        if (option->kind == ctl::Argument::Kind::Flag) {
            if (!value.is_boolean()) refuse(key + " is neither true nor false");
            if (value.get<bool>()) line_.options.push_back({option, ""});
            return;
        }
        const std::string word = value.is_number_unsigned() ? value.dump() : wordIn(value, key);
        if (option->name == std::string_view(kOn.name)) insistOnSelector(word);
        line_.options.push_back({option, word});
    }

    void readHosts() {
        const json& names = listOf(request_, "hosts");
        if (names.empty()) return;
        if (isGiven(kOn)) refuse("hosts does not go with on");
        if (names.size() > kMostNamedHosts) refuse("hosts has too many names");
        for (const json& value : names) {
            const std::string host = wordIn(value, "a host's name");
            // What a file of names would not take as one name.
            const bool isName =
                host.size() <= kLongestHost && host.find_first_of(" #") == std::string::npos;
            if (!isName) refuse(quotedName(host) + " is no host's name");
            hosts_ += host + '\n';
            names_.push_back(host);
        }
        line_.options.push_back({&kOn, std::string("@") + kGivenPath});
    }

    void readInput() {
        const auto found = request_.find("input");
        if ((found != request_.end()) != row_.readsInput) {
            refuse(name() + (row_.readsInput ? " needs an input" : " takes no input"));
        }
        if (!row_.readsInput) return;
        if (!found->is_string()) refuse("input is no text");
        input_ = found->get<std::string>();
        // The text itself would be the argument behind the others.
        const bool saysSo = !line_.arguments.empty() && line_.arguments.back() == kFromInput;
        if (!saysSo) line_.arguments.emplace_back(kFromInput);
        if (line_.arguments.size() != positionals()) refuse(name() + " has other arguments");
    }

    bool isGiven(const ctl::Argument& option) const {
        return std::any_of(line_.options.begin(), line_.options.end(),
                           [&option](const GivenOption& given) {
                               return std::strcmp(given.argument->name, option.name) == 0;
                           });
    }

    std::size_t positionals() const {
        return static_cast<std::size_t>(
            std::count_if(line_.verb->arguments.begin(), line_.verb->arguments.end(),
                          [](const ctl::Argument& argument) {
                              return argument.kind == ctl::Argument::Kind::Positional;
                          }));
    }

    std::string name() const { return line_.verb->name; }

    /// The hosts come where there is room for them.
    std::string shownLine() const {
        if (names_.empty()) return lineToCopy(line_);
        RunLine shown = line_;
        shown.options.back().value = row_.readsInput ? "@FILE" : "@/dev/stdin";
        if (row_.readsInput) return lineToCopy(shown);
        std::string printed = "printf '%s\\n'";
        for (const std::string& host : names_)
            printed += ' ' + ctl::shellQuoted(host);
        return printed + " | " + lineToCopy(shown);
    }

    const json request_;
    const RunVerb& row_;
    RunLine line_;
    std::vector<std::string> names_;
    std::string hosts_;
    std::string input_;
};

}  // namespace

RunRequest readRunRequest(const std::string& body, const std::string& url) {
    const ctl::ParsedJson parsed = ctl::parseBounded(body);
    if (parsed.fault != nullptr) refuse(std::string("the request ") + parsed.fault);
    if (!parsed.document.is_object()) refuse("the request is no JSON object");
    return RunReader(parsed.document, url).read();
}

RunRequest pushRequest(const std::string& path, const std::string& selector,
                       const std::string& url) {
    insistOnSelector(wordIn(selector, "on"));
    // It names the file, and no folder to put it in.
    if (wordIn(path, "path").back() == '/') refuse("path names no file");
    RunLine line{url,
                 fleetVocabulary().findVerb("push"),
                 {kGivenPath, path},
                 {{&kOn, selector}},
                 kPushSeconds};
    insistThatTaken(line);
    RunRequest made{programWords(line), "", "", "", true};
    line.arguments.front() = "FILE";
    made.command = lineToCopy(line);
    return made;
}

}  // namespace fleet
