#include "ctl/completion/completion.h"

#include <algorithm>
#include <chrono>
#include <iterator>

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

void addFitting(const std::vector<Candidate>& candidates, Wanted& wanted) {
    std::copy_if(candidates.begin(), candidates.end(), std::back_inserter(wanted.words),
                 [&wanted](const Candidate& candidate) {
                     return candidate.word.compare(0, wanted.typed.size(), wanted.typed) == 0;
                 });
}

}  // namespace

std::string completionBy(const Vocabulary& vocabulary, const std::vector<std::string>& words) {
    const Wanted wanted = wantedBy(words, vocabulary);
    if (wanted.source == Completion::LocalFile) return "files\n";
    return "words\n" + linesOf("", wanted.words);
}

std::string completionOf(const std::vector<std::string>& words, const std::vector<Candidate>& verbs,
                         const std::vector<Candidate>& options) {
    Wanted wanted = wantedBy(words);
    if (wanted.source == Completion::LocalFile) return "files\n";
    if (wanted.isVerb) addFitting(verbs, wanted);
    if (wanted.isOption) addFitting(options, wanted);
    if (wanted.host.socket.empty()) wanted.host.socket = defaultSocket();
    wanted.host.timeout = kPatience;
    return "words\n" + linesOf("", wanted.words) +
           linesOf(wanted.lead, offersFor(wanted, deadlineIn(kPatience)));
}

}  // namespace ctl
