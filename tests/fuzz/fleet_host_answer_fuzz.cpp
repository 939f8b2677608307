// What a host answers its link, which believes no more of it than it must: whatever comes, the link
// decides something. An input is a byte for the kind, a line with the status of the HTTP answer,
// and its body.

#include <charconv>

#include "fleet/link/program/host_answers.h"
#include "support/fuzz_support.h"

using fuzz::require;
using namespace fleet;

namespace {

HostAnswer answerOf(std::string_view status, std::string_view body) {
    unsigned number = 0;
    std::from_chars(status.data(), status.data() + status.size(), number);
    HostAnswer answer;
    answer.status = number;
    answer.body = body;
    return answer;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    fuzz::Input input(data, size);
    const unsigned kind = input.below(4);
    const std::string_view status = input.line();
    const HostAnswer answer = answerOf(status, input.rest());
    const HostAnswer other = answerOf("404", "{}");
    switch (kind) {
        case 0:
            static_cast<void>(recordedBy(answer));
            static_cast<void>(recordOf(answer, other));
            static_cast<void>(recordOf(other, answer));
            break;
        case 1:
            static_cast<void>(cancelledBy(answer));
            static_cast<void>(cancelledOf(answer, other));
            break;
        case 2:
            static_cast<void>(lookUpOf(answer, "0123456789abcdef0123456789abcdef", "journal"));
            break;
        default:
            if (const auto outcome = outcomeOf(answer.body, "journal")) {
                require(outcome->journal == "journal", "an outcome is of the journal that told it");
                require(!outcome->state.empty(), "an outcome has a state");
            }
    }
    return 0;
}
