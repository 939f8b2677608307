// fleet_simulator: has many hosts join a fleet, and runs their links in one process.

#include <pthread.h>
#include <sys/resource.h>
#include <unistd.h>

#include <chrono>
#include <csignal>
#include <cstdio>
#include <exception>
#include <memory>
#include <string>
#include <thread>
#include <vector>

#include "fleet/log/log.h"
#include "tests/fleet/scale/link_crowd.h"
#include "tests/fleet/scale/simulated_members.h"

namespace fleet_scale {
namespace {

constexpr const char* kUsage =
    "usage: fleet_simulator DIRECTORY HOSTS STATE MILLISECONDS\n"
    "\n"
    "Has HOSTS simulated hosts join the fleet whose keys are in DIRECTORY, says so, and runs\n"
    "their links until it gets SIGTERM. The centre is to be started afterwards. A task takes\n"
    "MILLISECONDS on each host. STATE is an empty directory.\n";
constexpr std::size_t kLoops = 2;
constexpr std::size_t kMostComing = 16;  ///< links whose connections are being made
constexpr std::size_t kStackBytes = 256 * 1024;

/// Tens of thousands of threads: small stacks, without a page between them, because the system
/// counts the pieces of a process's memory.
void wantSmallStacks() {
    pthread_attr_t attributes;
    ::pthread_attr_init(&attributes);
    ::pthread_attr_setstacksize(&attributes, kStackBytes);
    ::pthread_attr_setguardsize(&attributes, 0);
    ::pthread_setattr_default_np(&attributes);
    ::pthread_attr_destroy(&attributes);
}

void wantManyDescriptors() {
    rlimit limit{};
    ::getrlimit(RLIMIT_NOFILE, &limit);
    limit.rlim_cur = limit.rlim_max;
    ::setrlimit(RLIMIT_NOFILE, &limit);
}

sigset_t blockSignals() {
    sigset_t signals;
    ::sigemptyset(&signals);
    ::sigaddset(&signals, SIGTERM);
    ::sigaddset(&signals, SIGINT);
    ::pthread_sigmask(SIG_BLOCK, &signals, nullptr);
    ::signal(SIGPIPE, SIG_IGN);
    return signals;
}

using Loops = std::vector<std::unique_ptr<LinkLoop>>;

/// The links come as fast as this one machine can make their connections.
void addAll(const Loops& loops, const std::vector<SimulatedMember>& members) {
    for (std::size_t i = 0; i < members.size(); ++i) {
        const auto come = [&] {
            std::size_t count = 0;
            for (const auto& loop : loops)
                count += loop->came();
            return count;
        };
        // Those that fail try again by themselves, at their own pace.
        const auto patience = std::chrono::steady_clock::now() + std::chrono::seconds(5);
        while (i >= come() + kMostComing && std::chrono::steady_clock::now() < patience)
            std::this_thread::sleep_for(std::chrono::milliseconds(1));
        loops[i % kLoops]->add(members[i]);
    }
}

int run(const std::vector<std::string>& words) {
    const sigset_t signals = blockSignals();
    wantManyDescriptors();
    wantSmallStacks();
    const fleet::FleetDirectory directory(words.at(0));
    SimulatedWorld world;
    world.taskTime = std::chrono::milliseconds(std::stol(words.at(3)));
    const std::vector<SimulatedMember> members =
        enrolSimulated(directory, std::stoul(words.at(1)), words.at(2));
    std::printf("enrolled\n");
    std::fflush(stdout);
    Loops loops;
    for (std::size_t i = 0; i < kLoops; ++i)
        loops.push_back(std::make_unique<LinkLoop>(world, members.size()));
    addAll(loops, members);
    std::printf("running\n");
    std::fflush(stdout);
    int signal = 0;
    ::sigwait(&signals, &signal);
    for (const auto& loop : loops) {
        for (const std::string& why : loop->ended())
            std::printf("ended: %s\n", why.c_str());
    }
    std::printf("%llu tasks, %llu out of turn\n", static_cast<unsigned long long>(world.tasks),
                static_cast<unsigned long long>(world.outOfTurn));
    std::fflush(stdout);
    // Nothing of theirs is worth the time that ten thousand farewells take.
    ::_exit(0);
}

}  // namespace
}  // namespace fleet_scale

int main(int argc, char** argv) {
    fleet::nameProgram("fleet_simulator");
    const std::vector<std::string> words(argv + 1, argv + argc);
    if (words.size() != 4) return std::fputs(fleet_scale::kUsage, stderr) < 0 ? 1 : 2;
    try {
        return fleet_scale::run(words);
    } catch (const std::exception& error) {
        fleet::say(fleet::Priority::Error, error.what());
        return 1;
    }
}
