#include "fleet/bus/nats/lease.h"

#include <sodium.h>

#include <array>
#include <utility>

namespace fleet {
namespace {

std::string recordOf(const std::string& holder) {
    std::array<unsigned char, 16> mark{};
    randombytes_buf(mark.data(), mark.size());
    std::array<char, 2 * mark.size() + 1> text{};
    sodium_bin2hex(text.data(), text.size(), mark.data(), mark.size());
    return holder + '\n' + text.data();
}

std::string holderOf(const std::string& record) {
    return record.substr(0, record.find('\n'));
}

}  // namespace

Lease::Lease(Connection& connection, Settings settings, Now now)
    : connection_(connection),
      settings_(std::move(settings)),
      now_(std::move(now)),
      record_(recordOf(settings_.holder)) {}

Lease::State Lease::claim() {
    const LastResult last =
        lastOn(connection_, settings_.stream, settings_.subject, settings_.deadline);
    if (last.kind == LastResult::Kind::Missing) return storeOver(0);
    State state;
    state.text = last.text;
    if (last.kind != LastResult::Kind::Found) return state;
    if (last.bytes == record_) return storeOver(last.sequence);
    if (last.sequence != seen_) {
        seen_ = last.sequence;
        seenSince_ = now_();
    }
    state.kind = State::Kind::Others;
    state.holder = holderOf(last.bytes);
    state.age = std::chrono::duration_cast<Connection::Milliseconds>(now_() - seenSince_);
    state.text = state.holder + " has it";
    return state.age > settings_.term ? storeOver(last.sequence) : state;
}

Lease::State Lease::renew() {
    State state;
    if (ours_ == 0) {
        state.kind = State::Kind::Others;
        state.text = "it is not ours";
        return state;
    }
    state = storeOver(ours_);
    return state.kind == State::Kind::Others ? renewFound() : state;
}

/// What is there is another message than expected: our own, if an acknowledgement was lost or the
/// bus has lost its newest messages, or somebody else's.
Lease::State Lease::renewFound() {
    State state;
    const LastResult last =
        lastOn(connection_, settings_.stream, settings_.subject, settings_.deadline);
    const bool isFound = last.kind == LastResult::Kind::Found;
    if (isFound && last.bytes != record_) {
        ours_ = 0;
        state.kind = State::Kind::Others;
        state.holder = holderOf(last.bytes);
        state.text = state.holder + " has it";
        return state;
    }
    state.text = last.text;
    if (!isFound && last.kind != LastResult::Kind::Missing) return state;
    state = storeOver(last.sequence);
    // A server that lags behind has answered. Nobody else's was seen: the next try tells.
    if (state.kind == State::Kind::Others) state.kind = State::Kind::Unknown;
    return state;
}

Lease::State Lease::storeOver(std::uint64_t sequence) {
    const StoreResult stored =
        storeAfter(connection_, settings_.subject, record_, sequence, settings_.deadline);
    State state;
    state.text = stored.text;
    if (stored.kind == StoreResult::Kind::Stored) {
        ours_ = stored.sequence;
        state.kind = State::Kind::Ours;
    } else if (stored.kind == StoreResult::Kind::Occupied) {
        state.kind = State::Kind::Others;
    }
    return state;
}

void Lease::release() {
    // If it fails, the lease grows old like any other.
    if (ours_ != 0) {
        static_cast<void>(erase(connection_, settings_.stream, ours_, settings_.deadline));
    }
    ours_ = 0;
}

}  // namespace fleet
