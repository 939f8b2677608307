// zavctl-fleet: the part of zavctl that manages many hosts. zavctl runs it.

#include <algorithm>
#include <csignal>
#include <exception>
#include <string>
#include <vector>

#include "ctl/client/failure.h"
#include "ctl/command_line.h"
#include "ctl/completion/completion.h"
#include "ctl/show/page.h"
#include "ctl/show/standard_streams.h"
#include "ctl/show/terminal.h"
#include "ctl/verbs/invocation.h"
#include "ctl/verbs/verb_table.h"
#include "fleet/bus/messages/document.h"
#include "fleet/files/file_error.h"
#include "fleet/https/client/https_error.h"
#include "fleet/https/client/server_url.h"
#include "fleet/operator/centre/answers.h"
#include "fleet/operator/verbs/fleet_arguments.h"
#include "fleet/operator/verbs/fleet_verbs.h"
#include "fleet/operator/verbs/many_hosts.h"
#include "fleet/operator/verbs/one_hosts_verbs.h"

namespace {

ctl::ExitStatus runVerb(const ctl::CommandLine& line, ctl::Format format) {
    fleet::insistOnMeaning(*line.verb, line.given);
    const ctl::Invocation invocation{line.given, {}, format};
    // A verb of one host, which is done on many.
    const bool isOfOne = ctl::hostVocabulary().findVerb(line.verb->name) == line.verb;
    return isOfOne ? fleet::runOnMany(*line.verb, invocation) : line.verb->run(invocation);
}

/// What the parts of a fleet throw, as failures of the program.
ctl::ExitStatus runWithFailures(const ctl::CommandLine& line, ctl::Format format) {
    try {
        return runVerb(line, format);
    } catch (const fleet::HttpsError& error) {
        throw fleet::centreFailure(error);
    } catch (const fleet::UrlError& error) {
        throw ctl::Failure(ctl::kWrongUsage, error.what());
    } catch (const fleet::FileError& error) {
        throw ctl::Failure(ctl::kWrongUsage, error.what());
    } catch (const fleet::MessageError& error) {
        throw fleet::senseless(error.what());
    }
}

/// Of a line that is not taken apart.
ctl::Format formatAskedFor(const std::vector<std::string>& words) {
    const bool isJson = std::find(words.begin(), words.end(), ctl::kJson.name) != words.end();
    return isJson ? ctl::Format::Json : ctl::Format::Text;
}

ctl::ExitStatus run(const std::vector<std::string>& words) {
    if (!words.empty() && words.front() == ctl::kCompletionWord) {
        const std::vector<std::string> line(words.begin() + 1, words.end());
        return ctl::print(
            {ctl::completionBy(fleet::fleetVocabulary(), line), {}, ctl::kSuccess, true});
    }
    if (const auto refusal = fleet::refusalOfOneHostsVerb(words)) {
        return ctl::print(ctl::failurePage(*refusal, formatAskedFor(words)));
    }
    const ctl::CommandLine line = ctl::parseCommandLine(words, fleet::fleetVocabulary());
    const ctl::Format format = line.verb == nullptr ? ctl::Format::Text : ctl::formatOf(line.given);
    ctl::lookAtTerminals(line.verb != nullptr && format == ctl::Format::Text);
    if (line.verb == nullptr) return ctl::print(line.page);
    try {
        return runWithFailures(line, format);
    } catch (const ctl::Failure& failure) {
        return ctl::print(ctl::failurePage(failure, format));
    }
}

}  // namespace

int main(int argc, char** argv) {
    ctl::occupyStandardDescriptors();
    std::signal(SIGPIPE, SIG_IGN);  // a centre that goes away is an error of the write
    try {
        return ctl::withOutputWritten(run({argv + 1, argv + argc}));
    } catch (const std::exception& error) {
        return ctl::print({{}, ctl::complaint(error.what()), ctl::kNoHost});
    }
}
