// Associations of the RPC runtime: whatever a client sends, in whatever portions, is answered with
// whole packets or ends the association, and all memory comes back. The first byte of an input is
// the size of the portions, 0 for all at once.
//
// fuzz-options: -max_len=8192

#include <algorithm>
#include <cstring>
#include <memory>

#include "embedded/ncs_association.h"
#include "platform/ncs_packets.h"
#include "support/fuzz_support.h"

using fuzz::require;

namespace {

constexpr std::size_t kMemory = 3000;
/// Beyond this the answers are no longer looked at, as they repeat themselves.
constexpr std::size_t kMostAnswers = std::size_t{1} << 20;

/// Hands bytes over by way of the association's windows; how many it took.
std::size_t feed(ncs::Association& association, const std::uint8_t* bytes, std::size_t size) {
    iovec ranges[2];
    const int count = association.windows(ranges);
    std::size_t done = 0;
    for (int i = 0; i < count; ++i) {
        const std::size_t part = std::min(size - done, ranges[i].iov_len);
        if (part > 0) std::memcpy(ranges[i].iov_base, bytes + done, part);
        done += part;
    }
    association.received(done);
    return done;
}

void takeOutput(ncs::Association& association, std::string& answers) {
    while (!association.output().empty()) {
        if (answers.size() < kMostAnswers) answers += association.output();
        association.output().clear();
        association.handle();
    }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    [[maybe_unused]] static const bool registered = (ncs_test::registerEcho(), true);
    if (size == 0) return 0;
    const std::size_t portion = data[0] == 0 ? size : data[0];
    ncs::SharedState shared(kMemory, kMemory);
    auto association = std::make_unique<ncs::Association>(shared, "135");
    std::string answers;
    for (std::size_t at = 1; at < size && association->isOpen();) {
        const std::size_t taken = feed(*association, data + at, std::min(portion, size - at));
        require(taken > 0, "there is room for the next byte");
        at += taken;
        takeOutput(*association, answers);
    }
    if (answers.size() < kMostAnswers) ncs_test::replies(answers);
    association.reset();
    require(shared.memory.take(kMemory), "all memory comes back");
    return 0;
}
