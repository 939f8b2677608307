// zavctl: sends a central server's requests to a managed host and shows how they ended.

#include <algorithm>
#include <csignal>
#include <exception>
#include <iterator>
#include <string>
#include <vector>

#include "ctl/client/address/peer.h"
#include "ctl/client/failure.h"
#include "ctl/command_line.h"
#include "ctl/completion/completion.h"
#include "ctl/fleet_program.h"
#include "ctl/show/page.h"
#include "ctl/show/standard_streams.h"
#include "ctl/show/terminal.h"
#include "ctl/verbs/arguments/global_arguments.h"
#include "ctl/verbs/invocation.h"

namespace {

ctl::ExitStatus run(const ctl::CommandLine& line, ctl::Format format) {
    if (line.verb == nullptr) return ctl::print(line.page);
    try {
        if (line.given.has(ctl::kHostUser)) ctl::trustHostUser(line.given.text(ctl::kHostUser));
        return line.verb->run({line.given, ctl::hostAddressOf(line.given), format});
    } catch (const ctl::Failure& failure) {
        return ctl::print(ctl::failurePage(failure, format));
    }
}

ctl::ExitStatus runForFleet(char* const* argv, const std::vector<std::string>& words) {
    const bool isJson = std::find(words.begin(), words.end(), ctl::kJson.name) != words.end();
    try {
        ctl::becomeFleetProgram(argv);
    } catch (const ctl::Failure& failure) {
        return ctl::print(
            ctl::failurePage(failure, isJson ? ctl::Format::Json : ctl::Format::Text));
    }
}

std::vector<ctl::Candidate> candidatesOf(const std::vector<ctl::FleetWord>& words) {
    std::vector<ctl::Candidate> candidates;
    for (const ctl::FleetWord& one : words)
        candidates.push_back({one.word, one.help});
    return candidates;
}

/// What a shell may offer at the end of these words.
std::string completion(char* const* argv, const std::vector<std::string>& words) {
    // The last word is not complete, so it decides nothing yet.
    const bool isFleets =
        !words.empty() && ctl::isForFleet({words.begin(), std::prev(words.end())});
    try {
        if (isFleets) ctl::becomeFleetProgram(argv);
        return ctl::completionOf(words, candidatesOf(ctl::fleetVerbsOffered()),
                                 candidatesOf(ctl::fleetOptionsOffered()));
    } catch (const ctl::Failure&) {
        return {};  // somebody who types is told nothing of it
    }
}

ctl::ExitStatus run(char* const* argv, const std::vector<std::string>& words) {
    if (!words.empty() && words.front() == ctl::kCompletionWord) {
        return ctl::print(
            {completion(argv, {words.begin() + 1, words.end()}), {}, ctl::kSuccess, true});
    }
    if (ctl::isForFleet(words)) return runForFleet(argv, words);
    const ctl::CommandLine line = ctl::parseCommandLine(words);
    const ctl::Format format = line.verb == nullptr ? ctl::Format::Text : ctl::formatOf(line.given);
    // What stands on a page that needs no verb fits already.
    ctl::lookAtTerminals(line.verb != nullptr && format == ctl::Format::Text);
    return run(line, format);
}

}  // namespace

int main(int argc, char** argv) {
    ctl::occupyStandardDescriptors();
    std::signal(SIGPIPE, SIG_IGN);  // a host that goes away is an error of the write
    try {
        return ctl::withOutputWritten(run(argv, {argv + 1, argv + argc}));
    } catch (const std::exception& error) {
        return ctl::print({{}, ctl::complaint(error.what()), ctl::kNoHost});
    }
}
