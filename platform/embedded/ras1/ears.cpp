#include "ras1/ears.h"

#include <cstring>
#include <ctime>
#include <new>
#include <stdexcept>
#include <utility>

namespace ras1 {
namespace {

constexpr unsigned kHearable = RAS1_DETAIL | RAS1_ERROR;

void pauseShortly() {
    constexpr long kMillisecond = 1000 * 1000;
    const timespec length{0, kMillisecond};
    ::nanosleep(&length, nullptr);
}

}  // namespace

Ears& Ears::ofProcess() {
    // Never destroyed, because threads trace until the process ends. Constructed in static storage,
    // because who traces may be out of memory.
    alignas(Ears) static unsigned char place[sizeof(Ears)];
    static Ears& instance = *new (place) Ears;
    return instance;
}

bool Ears::open(Listener& listener, std::vector<HeardUnit> units) {
    const std::lock_guard<std::mutex> lock(opening_);
    if (open_.load() != nullptr) return false;
    ears_.push_back(std::unique_ptr<const Ear>(new Ear{listener, std::move(units)}));
    open_.store(ears_.back().get());
    return true;
}

void Ears::close() {
    open_.store(nullptr);
    // No condition to wait for: who tells may be a child on its parent's memory.
    while (calls_.load() > 0)
        pauseShortly();
}

unsigned Ears::levelsOf(const char* unit) const {
    const Ear* const ear = open_.load();
    if (ear == nullptr) return 0;
    for (const HeardUnit& heard : ear->units) {
        if (std::strcmp(unit, heard.name) == 0) return heard.levels & kHearable;
    }
    return 0;
}

void Ears::tell(const HeardLine& line) {
    ++calls_;  // before the look: whoever closes sees either this call or that it finds nobody
    if (const Ear* const ear = open_.load()) ear->listener.hear(line);
    --calls_;
}

Listening::Listening(Listener& listener, std::vector<HeardUnit> units) {
    if (!Ears::ofProcess().open(listener, std::move(units))) {
        throw std::logic_error("somebody listens to the trace already");
    }
    ++RAS1_Generation;
}

Listening::~Listening() {
    Ears::ofProcess().close();
    ++RAS1_Generation;
}

}  // namespace ras1
