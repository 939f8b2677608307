#include "ctl/verbs/config/config_set.h"

#include <unistd.h>

#include <filesystem>
#include <nlohmann/json.hpp>
#include <system_error>

#include "ctl/client/failure.h"
#include "ctl/client/guarded.h"
#include "ctl/client/whole_file.h"
#include "ctl/show/shell_quoted.h"
#include "ctl/verbs/arguments/common_arguments.h"
#include "ctl/verbs/commands/queued.h"
#include "ctl/verbs/invocation.h"
#include "ctl/verbs/verb_table.h"

namespace ctl {
namespace {

constexpr Argument kFile =
    textOption("--file", "File with the configuration").completedBy(Completion::LocalFile);
constexpr Argument kText = positional("TEXT", "The configuration itself, or - for standard input");
constexpr Argument kArguments[] = {kProduct, kText,   kTarget,  kFile,
                                   kForce,   kNoWait, kTransid, kOnce};

/// The host takes SETCONFIG for the universal agent as the import of a metafile, whatever the
/// context says. Without a metafile it changes nothing and reports success.
void warnOfUniversalAgent(const std::string& product) {
    if (product != "um" && product != "UM" && product != "Um" && product != "uM") return;
    print({{},
           complaint("note: the host changes nothing of the universal agent by this; "
                     "ua-config imports metafiles")});
}

bool isUtf8(const std::string& text) {
    try {
        nlohmann::json(text).dump();
        return true;
    } catch (const nlohmann::json::type_error&) {
        return false;
    }
}

/// Whether a text that has no form of a configuration is the name of a file here.
bool isFileName(const std::string& text) {
    std::error_code ignored;
    return text.find_first_of("=\n") == std::string::npos &&
           std::filesystem::is_regular_file(text, ignored);
}

/// Somebody who forgets --file would replace the agent's configuration by a file's name.
void refuseFileName(const Values& given) {
    const std::string& text = given.text(kText);
    if (!isFileName(text)) return;
    throw Failure(kWrongUsage, text + " is the name of a file, and no configuration",
                  "To send what is in it: zavctl config set " + shellQuoted(given.text(kProduct)) +
                      " --file " + shellQuoted(text));
}

std::string textToSet(const Values& given) {
    const std::string& file = given.text(kFile);
    const std::string& text = given.text(kText);
    if (file.empty() == text.empty()) {
        throw Failure(kWrongUsage, "config set takes --file FILE, a text, or - for standard input");
    }
    if (!file.empty()) return readFile(file);
    return text == "-" ? readDescriptor(STDIN_FILENO, "standard input") : text;
}

TaskRequest requestOf(const Values& given) {
    TaskRequest request =
        configurationRequest(given.text(kProduct), given.text(kTarget), textToSet(given));
    request.isForced = given.flag(kForce);
    return request;
}

TaskRequest checkedRequest(const Values& given) {
    refuseFileName(given);
    return requestOf(given);
}

ExitStatus run(const Invocation& invocation) {
    const Values& given = invocation.given;
    if (isFileName(given.text(kText)) && isGuarded(invocation.host, invocation.deadline())) {
        refuseFileName(given);
    }
    const TaskRequest request = requestOf(given);
    return runQueued(invocation,
                     queuedCommand(invocation, request, "config set " + request.product));
}

}  // namespace

constexpr Verb kConfigSetVerb = {
    "config set",
    "Replace a configuration",
    kArguments,
    {"zavctl config set ux --file ux.config",
     "printf 'INSTANCE=\\nA=1\\n' | zavctl config set ux -"},
    run,
    checkedRequest,
};

TaskRequest configurationRequest(const std::string& product, const std::string& target,
                                 const std::string& text) {
    if (text.empty()) throw Failure(kWrongUsage, "the configuration is empty");
    if (!isUtf8(text)) {
        throw Failure(kWrongUsage, "the configuration is not UTF-8, so its letters would be lost",
                      "iconv -f LATIN1 -t UTF-8 converts one from Latin-1, for example.");
    }
    warnOfUniversalAgent(product);
    TaskRequest request;
    request.command = "SETCONFIG";
    request.product = product;
    request.targetmsn = target;
    request.context = text;
    return request;
}

}  // namespace ctl
