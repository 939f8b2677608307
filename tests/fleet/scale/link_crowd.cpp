#include "tests/fleet/scale/link_crowd.h"

#include <algorithm>
#include <exception>
#include <utility>

namespace fleet_scale {
namespace {

using std::chrono::milliseconds;
using Steady = std::chrono::steady_clock;

/// Each link is looked at so often, a part of them at a time; its seconds are its own.
constexpr milliseconds kRound{500};
constexpr milliseconds kSlice{10};
constexpr std::size_t kSlices = 50;

/// What a machine of its own would have on its disk.
class MemoryInMemory : public fleet::LinkMemory {
public:
    explicit MemoryInMemory(const SimulatedMember& member)
        : bus_(member.bus), signing_(member.signing), token_(member.token) {}

    const fleet::KeyPair& bus() const override { return bus_; }
    const fleet::KeyPair& signing() const override { return signing_; }
    const std::string& token() const override { return token_; }
    const fleet::Kept& kept() const override { return kept_; }
    void keep(const fleet::Kept& kept) override { kept_ = kept; }

private:
    const fleet::KeyPair bus_;
    const fleet::KeyPair signing_;
    const std::string token_;
    fleet::Kept kept_;
};

static_assert(kSlice * kSlices == kRound);

}  // namespace

LinkLoop::LinkLoop(SimulatedWorld& world, std::size_t most) : world_(world) {
    places_.reserve(most);
    thread_ = std::thread([this] { run(); });
}

LinkLoop::~LinkLoop() {
    {
        const std::lock_guard lock(mutex_);
        isEnding_ = true;
    }
    changed_.notify_all();
    if (thread_.joinable()) thread_.join();
    for (const auto& place : places_)
        place->link.reset();
}

void LinkLoop::add(const SimulatedMember& member) {
    places_.push_back(std::make_unique<Place>());
    Place& place = *places_.back();
    fleet::LinkParts parts;
    parts.memory = std::make_unique<MemoryInMemory>(member);
    parts.host = [this](fleet::HostSide::Events events) {
        return std::make_unique<SimulatedHost>(world_, std::move(events));
    };
    parts.sharesThreads = true;
    parts.hasWork = [this, &place] {
        // One letter comes from the host, which is there from the beginning.
        if (++place.letters == 2) ++came_;
        makeReady(place);
    };
    place.link = std::make_unique<fleet::LinkProgram>(member.configuration, std::move(parts));
    place.isMade = true;
    count_ = places_.size();
    makeReady(place);
}

std::vector<std::string> LinkLoop::ended() const {
    const std::lock_guard lock(mutex_);
    return ended_;
}

void LinkLoop::makeReady(Place& place) {
    if (place.isReady.exchange(true)) return;
    {
        const std::lock_guard lock(mutex_);
        ready_.push_back(&place);
    }
    changed_.notify_all();
}

void LinkLoop::run() {
    auto nextSlice = Steady::now();
    std::unique_lock lock(mutex_);
    while (!isEnding_) {
        if (!ready_.empty()) {
            Place& place = *ready_.front();
            ready_.pop_front();
            lock.unlock();
            // What comes from now on makes it ready once more.
            place.isReady = false;
            visit(place);
            lock.lock();
        } else if (Steady::now() < nextSlice) {
            changed_.wait_until(lock, nextSlice);
        }
        if (Steady::now() < nextSlice) continue;
        nextSlice = std::max(nextSlice + kSlice, Steady::now() - kRound);
        lock.unlock();
        visitSlice();
        lock.lock();
    }
}

void LinkLoop::visit(Place& place) {
    if (!place.isMade || place.hasEnded) return;
    std::string why;
    try {
        if (!place.link->work()) return;
        why = "it must not go on";
    } catch (const std::exception& error) {
        why = error.what();
    }
    place.hasEnded = true;
    const std::lock_guard lock(mutex_);
    ended_.push_back(place.link->host() + ": " + why);
}

void LinkLoop::visitSlice() {
    for (std::size_t i = nextSlice_; i < count_; i += kSlices)
        visit(*places_[i]);
    nextSlice_ = (nextSlice_ + 1) % kSlices;
}

}  // namespace fleet_scale
