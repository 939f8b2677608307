#include "soak/run.h"

#include <algorithm>
#include <atomic>
#include <cinttypes>
#include <cstdio>
#include <filesystem>
#include <stdexcept>

#include "soak/load/requester.h"
#include "soak/load/subscriber.h"

namespace soak {
namespace {

constexpr double kProgressSeconds = 10;
constexpr double kDrainSeconds = 240;
/// At the latest, one more task has been carried out.
constexpr double kFenceSeconds = 60;
constexpr double kHostEndSeconds = 30;
/// Children that nobody waits for any more end by themselves within that.
constexpr double kSettleSeconds = 20;
/// How far the memory after the warm-up may be exceeded: what the allocator keeps in pieces.
constexpr long kMemoryMarginKiB = 4096;

// Instrumented programs keep freed memory for a while.
#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
constexpr bool kMeasuresMemory = false;
#else
constexpr bool kMeasuresMemory = true;
#endif

std::atomic<bool> interruption{false};

bool holdsMore(const Gauges& before, const Gauges& after) {
    return after.residentKiB > before.residentKiB + kMemoryMarginKiB;
}

}  // namespace

void Run::interrupt() {
    interruption = true;
}

bool Run::interrupted() {
    return interruption;
}

Run::Run(const Options& options, const SoakHome& home)
    : options_(options),
      home_(home),
      world_(options.seed, home),
      host_(options.host, options.plugin, home),
      crowd_(world_),
      mix_(world_, crowd_, options.clients),
      weather_(world_, host_) {}

Run::Result Run::toTheEnd() {
    const double whole = options_.minutes * 60;
    const double warmUp = std::min(60.0, whole / 4);
    Gauges before;
    Gauges after;
    if (openControl()) {
        traffic(warmUp);
        drain();
        before = settledGauges();
        std::printf("%6.0f s  warm: %ld descriptors, %ld threads, %ld KiB resident\n",
                    world_.clock.wall(), before.descriptors, before.threads, before.residentKiB);
        traffic(whole - warmUp);
        drain();
        after = settledGauges();
    }
    if (!interrupted()) judgeTraffic();
    if (!interrupted()) judgeHost(before, after);
    weather_.killLeftChildren();
    if (interrupted()) return Result::Interrupted;
    endHost();
    printTraffic();
    printHost(before, after);
    printFaults();
    return world_.tally.faultCount() == 0 ? Result::Good : Result::Bad;
}

/// False when the run was interrupted or the host is gone.
bool Run::goesOn() {
    return !interrupted() && host_.running();
}

bool Run::openControl() {
    auto control = std::make_unique<ControlSubscriber>(world_);
    const ControlSubscriber& opened = *control;
    crowd_.add(std::move(control));
    if (turnUntil(30, [&opened] { return opened.live(); })) return true;
    world_.tally.fault("the control subscription cannot be opened");
    return false;
}

bool Run::turnUntil(double seconds, const std::function<bool()>& done) {
    const double end = world_.clock.wall() + seconds;
    while (!done()) {
        if (!goesOn() || world_.clock.wall() >= end) return false;
        crowd_.turn();
        progress();
    }
    return true;
}

void Run::traffic(double seconds) {
    world_.draining = false;
    turnUntil(seconds, [this] {
        mix_.pass();
        weather_.pass();
        return false;
    });
    weather_.clear();
}

void Run::drain() {
    world_.draining = true;
    const bool left = turnUntil(kDrainSeconds, [this] { return crowd_.size() <= 1; });
    if (!left && goesOn()) {
        for (const auto& [kind, count] : crowd_.kinds()) {
            if (count > 0 && kind != "control") {
                world_.tally.fault(std::to_string(count) + " clients of the kind \"" + kind +
                                   "\" do not come to their end");
            }
        }
    }
    // What clients that have vanished left behind is accepted before the second fence at the
    // latest.
    if (!awaitFence() || !awaitFence()) {
        if (goesOn()) world_.tally.fault("the queue does not come to its end");
    }
}

/// Tasks are carried out one after the other, so when this one is, those before it are.
bool Run::awaitFence() {
    turnUntil(1, [] { return false; });
    const Ledger::Number number = mix_.commands().announceStart();
    crowd_.add(std::make_unique<Requester>(
        world_, "fence",
        [this, number] {
            std::vector<Exchange> exchanges;
            exchanges.push_back(mix_.commands().announced(number));
            return exchanges;
        },
        1));
    while (goesOn() && !world_.ledger.done(number)) {
        const std::size_t rows = world_.ledger.rows().size();
        if (!turnUntil(kFenceSeconds, [&] { return world_.ledger.rows().size() > rows; })) break;
    }
    return world_.ledger.done(number);
}

Gauges Run::settledGauges() {
    home_.removePushedFiles();
    turnUntil(kSettleSeconds,
              [this] { return childrenOf(host_.pid()).empty() && crowd_.size() <= 1; });
    // The host notices closed connections, and children of children end.
    turnUntil(7, [] { return false; });
    return gaugesOf(host_.pid(), home_);
}

void Run::progress() {
    if (world_.clock.wall() < nextProgress_) return;
    nextProgress_ += kProgressSeconds;
    const Tally& tally = world_.tally;
    std::printf(
        "%6.0f s  %" PRIu64 " requests, %zu commands, %" PRIu64
        " outcomes, %zu on their way, %zu clients, %" PRIu64 " pushes, %" PRIu64 " faults\n",
        world_.clock.wall(), tally.of("requests"), world_.ledger.size(), tally.of("outcomes"),
        world_.ledger.outstanding(), crowd_.size(), tally.of("pushes"), tally.faultCount());
    std::fflush(stdout);
}

void Run::judgeTraffic() {
    world_.ledger.judge(world_.tally);
    for (const SubscriptionRecord& record : world_.subscriptions)
        judgeSubscription(record, world_.ledger, world_.tally);
}

void Run::judgeHost(const Gauges& before, const Gauges& after) {
    Tally& tally = world_.tally;
    if (!host_.running()) return tally.foremostFault("the host has ended by itself");
    if (after.descriptors > before.descriptors) tally.fault("the host holds more descriptors");
    if (after.threads > before.threads) tally.fault("the host has more threads");
    if (after.children > 0) tally.fault("the host has children left");
    if (kMeasuresMemory && holdsMore(before, after)) {
        tally.fault("the host holds more memory");
    }
    for (const std::string& file : after.files) {
        if (before.files.count(file) == 0) tally.fault("a file is left: " + file);
    }
}

void Run::endHost() {
    const int status = host_.end(kHostEndSeconds);
    Tally& tally = world_.tally;
    if (status != 0) tally.foremostFault("the host ended with status " + std::to_string(status));
    const std::string errors = contentOf(home_.log("host.err"));
    if (!errors.empty())
        tally.foremostFault("the host wrote to its standard error: " + errors.substr(0, 4000));
    for (const std::string& socket : {home_.socket(), home_.transferSocket()}) {
        if (std::filesystem::exists(socket)) tally.fault("the host left its socket " + socket);
    }
}

void Run::printTraffic() const {
    std::printf("\n%-32s %12s\n", "traffic", "count");
    for (const auto& [what, count] : world_.tally.counts())
        std::printf("%-32s %12" PRIu64 "\n", what.c_str(), count);
}

void Run::printHost(const Gauges& before, const Gauges& after) const {
    const auto line = [](const char* what, long begin, long end, bool good) {
        std::printf("%-32s %12ld %12ld  %s\n", what, begin, end, good ? "good" : "BAD");
    };
    std::printf("\n%-32s %12s %12s  %s\n", "what", "begin", "end", "verdict");
    line("descriptors", before.descriptors, after.descriptors,
         after.descriptors <= before.descriptors);
    line("threads", before.threads, after.threads, after.threads <= before.threads);
    line("children", before.children, after.children, after.children == 0);
    line(kMeasuresMemory ? "KiB resident (margin 4096)" : "KiB resident (not judged)",
         before.residentKiB, after.residentKiB, !kMeasuresMemory || !holdsMore(before, after));
    line("files", static_cast<long>(before.files.size()), static_cast<long>(after.files.size()),
         std::includes(before.files.begin(), before.files.end(), after.files.begin(),
                       after.files.end()));
}

void Run::printFaults() const {
    std::printf("\n");
    for (const std::string& fault : world_.tally.faults())
        std::printf("fault: %s\n", fault.c_str());
    std::printf("%" PRIu64 " faults\n", world_.tally.faultCount());
}

}  // namespace soak
