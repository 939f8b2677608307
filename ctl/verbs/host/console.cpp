#include "ctl/verbs/host/console.h"

#include "ctl/sibling_program.h"
#include "ctl/verbs/arguments/global_arguments.h"
#include "ctl/verbs/invocation.h"
#include "ctl/verbs/verb_table.h"

namespace ctl {
namespace {

constexpr Argument kArguments[] = {kConsolePort, kBrowserUser};

constexpr SiblingProgram kConsoleProgram = {"zavctl-console", "the console is not installed here"};

ExitStatus run(const Invocation& invocation) {
    std::vector<std::string> words = consoleWords(invocation.given);
    std::vector<char*> argv;
    for (std::string& word : words)
        argv.push_back(word.data());
    argv.push_back(nullptr);
    becomeProgram(kConsoleProgram, argv.data());
}

}  // namespace

constexpr Verb kConsoleVerb = {
    "console",  "Serve a page for a browser on this machine, and print the link to it",
    kArguments, {"zavctl console", "zavctl console --port 8080"},
    run,
};

std::vector<std::string> hostWords(const Values& given) {
    std::vector<std::string> words;
    for (const Argument& argument : {kSocket, kRpcSocket, kHostUser}) {
        if (given.has(argument)) words.insert(words.end(), {argument.name, given.text(argument)});
    }
    return words;
}

std::vector<std::string> consoleWords(const Values& given) {
    std::vector<std::string> words = {kConsoleProgram.name};
    const std::vector<std::string> host = hostWords(given);
    words.insert(words.end(), host.begin(), host.end());
    if (given.has(kTimeout))
        words.insert(words.end(), {kTimeout.name, std::to_string(given.seconds(kTimeout))});
    if (given.flag(kJson)) words.emplace_back(kJson.name);
    words.emplace_back(kConsoleVerb.name);
    if (given.has(kConsolePort))
        words.insert(words.end(), {kConsolePort.name, std::to_string(given.number(kConsolePort))});
    if (given.has(kBrowserUser))
        words.insert(words.end(), {kBrowserUser.name, given.text(kBrowserUser)});
    return words;
}

}  // namespace ctl
