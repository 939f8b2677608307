#include "soak/run.h"

#include <algorithm>
#include <atomic>
#include <cinttypes>
#include <cstdio>
#include <filesystem>
#include <nlohmann/json.hpp>
#include <sstream>

#include "soak/answers.h"
#include "soak/load/requester.h"

namespace soak {

using nlohmann::json;

namespace {

constexpr double kProgressSeconds = 10;
constexpr double kDrainSeconds = 240;
/// At the latest, one more task has been carried out.
constexpr double kFenceSeconds = 60;
constexpr double kHostEndSeconds = 30;
/// The part of the time in which the host is killed again and again.
constexpr double kStormyPart = 0.25;
constexpr double kMeanLifeSeconds = 3;
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

/// Without what each start behind a kill says about the tasks that it found, and without the
/// beginnings and ends of tasks.
std::string unexpectedErrors(const std::string& errors) {
    std::string unexpected;
    std::istringstream lines(errors);
    for (std::string line; std::getline(lines, line);) {
        const bool isExpected = line.find(" tasks wait") != std::string::npos ||
                                line.find(" zavhost: task ") != std::string::npos;
        if (!isExpected) unexpected += line + '\n';
    }
    return unexpected;
}

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
    const double stormy = whole * kStormyPart;
    const double warmUp = std::min(60.0, whole / 4);
    Gauges before;
    Gauges after;
    if (openControl({})) {
        traffic(warmUp);
        drain();
        before = settledGauges();
        std::printf("%6.0f s  warm: %ld descriptors, %ld threads, %ld KiB resident\n",
                    world_.clock.wall(), before.descriptors, before.threads, before.residentKiB);
        traffic(whole - warmUp - stormy);
        drain();
        after = settledGauges();
    }
    if (!interrupted()) judgeHost(before, after);
    if (goesOn()) kills(stormy);
    if (goesOn()) judgeJournal();
    if (!interrupted()) judgeTraffic();
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

/// Behind this event, or from now on.
bool Run::openControl(const std::string& after) {
    auto control = std::make_unique<ControlSubscriber>(world_, after);
    control_ = control.get();
    crowd_.add(std::move(control));
    if (turnUntil(30, [this] { return control_->live(); })) return true;
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

/// The same traffic on a host that is killed at random moments and started again.
void Run::kills(double seconds) {
    world_.draining = false;
    const double end = world_.clock.wall() + seconds;
    while (world_.clock.wall() < end) {
        const double life = world_.chance.seconds(0.2, 2 * kMeanLifeSeconds);
        traffic(std::min(life, end - world_.clock.wall()));
        if (!goesOn()) return;
        const std::string seen = killHost();
        if (!openControl(seen)) return;
    }
    drain();
}

/// Returns the last event that was seen of it.
std::string Run::killHost() {
    weather_.clear();
    host_.kill();
    crowd_.loseHost();
    const std::string seen = control_->position();
    crowd_.clear();
    world_.ledger.newLife();
    world_.tally.count("kills of the host");
    world_.clock.stop();
    host_.start();
    world_.clock.resume();
    return seen;
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
    if (!awaitFence(Way::Turn) || !awaitFence(Way::Table) || !awaitFence(Way::Turn)) {
        if (goesOn()) world_.tally.fault("the queue does not come to its end");
    }
}

/// Tasks of one way are carried out one after the other, so when this one is, those before it are.
bool Run::awaitFence(Way way) {
    turnUntil(1, [] { return false; });
    const Ledger::Number number = mix_.commands().announceStart();
    crowd_.add(std::make_unique<Requester>(
        world_, "fence",
        [this, number, way] {
            std::vector<Exchange> exchanges;
            exchanges.push_back(way == Way::Turn ? mix_.commands().announcedInTurn(number)
                                                 : mix_.commands().announced(number));
            return exchanges;
        },
        1));
    const auto isOver = [&] { return world_.ledger.entry(number).ends > 0; };
    while (goesOn() && !isOver()) {
        const std::uint64_t events = world_.tally.of("events");
        if (!turnUntil(kFenceSeconds, [&] { return world_.tally.of("events") > events; })) break;
    }
    return isOver();
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

/// What the journal itself says at the end, and what the tasks wrote down.
void Run::judgeJournal() {
    std::multimap<std::string, std::string> states;
    for (std::string position = "?limit=1000"; !position.empty();) {
        if (!addListed(position, states)) {
            return world_.tally.fault("the journal does not list its tasks");
        }
    }
    world_.tally.count("tasks listed", states.size());
    world_.ledger.judgeListed(states, world_.tally);
    world_.ledger.judgeRuns(contentOf(home_.notes()), world_.tally);
}

/// Adds a page of the list of tasks; then `position` is the next one's, or empty.
bool Run::addListed(std::string& position, std::multimap<std::string, std::string>& states) {
    json page;
    bool answered = false;
    const auto ask = [&] {
        return std::vector<Exchange>{
            {getRequest("/v1/tasks" + position), nullptr, [&](const Answer* answer) {
                 page = documentOf(world_, answer, "/v1/tasks");
                 answered = true;
             }}};
    };
    crowd_.add(std::make_unique<Requester>(world_, "listing", ask, 1));
    // It is gone before what it refers to is.
    turnUntil(kDrainSeconds, [&] { return answered && crowd_.size() <= 1; });
    if (page.is_null()) return false;
    for (const json& task : page.at("tasks"))
        states.emplace(task.at("transid"), task.at("state"));
    const json next = page.at("next");
    position = next.is_null() ? "" : "?limit=1000&after=" + next.dump();
    return true;
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
    const std::string errors = unexpectedErrors(contentOf(home_.log("host.err")));
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
