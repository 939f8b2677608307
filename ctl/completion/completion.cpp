#include "ctl/completion/completion.h"

#include <chrono>

#include "ctl/client/address/host_address.h"
#include "ctl/completion/offers.h"
#include "ctl/completion/wanted.h"

namespace ctl {
namespace {

constexpr std::chrono::seconds kPatience{2};

std::string linesOf(const std::string& lead, const std::vector<Candidate>& candidates) {
    std::string lines;
    for (const Candidate& candidate : candidates) {
        lines += lead + candidate.word;
        if (!candidate.help.empty()) lines += "\t" + candidate.help;
        lines += "\n";
    }
    return lines;
}

}  // namespace

std::string completionOf(const std::vector<std::string>& words) {
    Wanted wanted = wantedBy(words);
    if (wanted.source == Completion::LocalFile) return "files\n";
    if (wanted.host.socket.empty()) wanted.host.socket = defaultSocket();
    wanted.host.timeout = kPatience;
    return "words\n" + linesOf("", wanted.words) +
           linesOf(wanted.lead, offersFor(wanted, deadlineIn(kPatience)));
}

}  // namespace ctl
