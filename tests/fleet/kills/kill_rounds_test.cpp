// Kills the bus, the centre, links and hosts at random moments while roll-outs run, and compares
// afterwards what the centre has recorded with the journals of the hosts and with what their agents
// wrote down themselves.
//
//   ZAV_FLEET_KILLS=200 ZAV_FLEET_SEED=17 build/native/bin/fleet_kills_tests
//
// Without these variables it kills twenty times, with a seed of its own, which is printed.

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <signal.h>

#include <algorithm>
#include <iostream>
#include <map>
#include <random>
#include <string>
#include <thread>
#include <vector>

#include "crash/variable_or.h"
#include "tests/fleet/kills/harmed_fleet.h"

namespace {

using harmed_fleet::HarmedFleet;
using harmed_fleet::kHosts;

/// Nobody works for half a minute after the centre was killed, so it is killed less often.
constexpr int kShareOfCentre = 20;

enum class Victim { Bus, Centre, Link, Host };

const char* nameOf(Victim victim) {
    constexpr const char* kNames[] = {"the bus", "the centre", "a link", "a host"};
    return kNames[static_cast<int>(victim)];
}

/// Each of them, the centre seldom, in an order of chance.
std::vector<Victim> victims(unsigned rounds, std::mt19937& random) {
    std::vector<Victim> all;
    for (unsigned i = 0; i < rounds; ++i) {
        constexpr Victim kOthers[] = {Victim::Bus, Victim::Link, Victim::Host};
        all.push_back(i % kShareOfCentre == 0 ? Victim::Centre : kOthers[i % 3]);
    }
    std::shuffle(all.begin(), all.end(), random);
    return all;
}

class KillRounds : public HarmedFleet {
protected:
    void kill(Victim victim, std::size_t host) {
        switch (victim) {
            case Victim::Bus:
                fleet_.endBus(SIGKILL);
                return fleet_.startBus();
            case Victim::Centre:
                fleet_.endCentre(SIGKILL);
                return fleet_.startCentre();
            case Victim::Link:
                hosts_[host]->killLink();
                return hosts_[host]->startLink();
            case Victim::Host:
                hosts_[host]->killHost();
                return hosts_[host]->startHost();
        }
    }
};

TEST_F(KillRounds, LoseNoOrderAndRepeatNone) {
    const unsigned rounds = variableOr("ZAV_FLEET_KILLS", 20);
    const unsigned seed = variableOr("ZAV_FLEET_SEED", std::random_device()());
    std::cout << rounds << " kills with the seed " << seed << std::endl;
    std::mt19937 random(seed);
    std::uniform_int_distribution<int> delays(0, 1500);
    std::uniform_int_distribution<std::size_t> anyHost(0, kHosts - 1);
    for (const Victim victim : victims(rounds, random)) {
        beginRollout();
        if (HasFatalFailure()) return;
        const int delay = delays(random);
        const std::size_t host = anyHost(random);
        std::cout << "k" << products_ << ": " << nameOf(victim) << " after " << delay << " ms"
                  << std::endl;
        std::this_thread::sleep_for(std::chrono::milliseconds(delay));  // the moment is the dice's
        kill(victim, host);
    }
    ASSERT_TRUE(awaitEnd(std::chrono::seconds(rounds))) << whatIsOpen();
    EXPECT_THAT(faults(), testing::IsEmpty());
    const std::map<std::string, int> all = ends();
    for (const auto& [state, count] : all)
        std::cout << count << " are " << state << std::endl;
    EXPECT_GE(all.count("done"), 1U);
    EXPECT_EQ(all.count("unknown"), 0U);
    EXPECT_EQ(fleet_.centre().err().find("two outcomes"), std::string::npos);
}

}  // namespace
