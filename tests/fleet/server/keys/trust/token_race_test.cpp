// ctest-label: threaded
/// Tokens that several bring at the same instant.
#include <gtest/gtest.h>

#include <atomic>
#include <string>
#include <thread>
#include <vector>

#include "fleet/server/keys/trust/join_refused.h"
#include "tests/fleet/server/keys/trust/joining.h"

namespace {

using joining::kDay;
using joining::kNow;
using joining::Machine;

constexpr int kRounds = 10;
constexpr int kComers = 4;

/// Runs an act for each comer in a thread of its own, all at once; returns how many were let in.
template <typename Act>
int letIn(Act act) {
    std::atomic<int> waiting{kComers};
    std::atomic<int> in{0};
    std::vector<std::thread> threads;
    for (int comer = 0; comer < kComers; ++comer) {
        threads.emplace_back([&, comer] {
            --waiting;
            while (waiting > 0)
                std::this_thread::yield();
            try {
                act(comer);
                ++in;
            } catch (const fleet::JoinRefused&) {
                // Somebody else was first.
            }
        });
    }
    for (std::thread& thread : threads)
        thread.join();
    return in;
}

TEST(TokenRace, LetsOneHostIn) {
    joining::Fleet made;
    const std::string file = made.made.directory().trustDatabase();
    for (int round = 0; round < kRounds; ++round) {
        const std::string token = made.invite("web" + std::to_string(round));
        std::vector<std::string> requests;
        for (int comer = 0; comer < kComers; ++comer)
            requests.push_back(Machine().request(token));
        const int in = letIn([&](int comer) {
            fleet::TrustDatabase database(file);
            joining::Register hosts;
            fleet::HostEnrolment(database.connection())
                .redeem(requests[static_cast<std::size_t>(comer)], made.made.directory(), hosts,
                        kNow);
        });
        EXPECT_EQ(in, 1);
    }
    joining::Register hosts;
    made.enrolment.tell(hosts);
    EXPECT_EQ(hosts.hosts.size(), std::size_t{kRounds});
}

TEST(TokenRace, LetsOneKeyOfAnOperatorIn) {
    joining::Fleet made;
    const std::string file = made.made.directory().trustDatabase();
    const fleet::FleetFacts facts = made.made.directory().facts();
    for (int round = 0; round < kRounds; ++round) {
        const std::string token = made.operators.invite(
            {"anna", fleet::Role::Viewer, {}, {}, "*", kDay}, std::chrono::hours(1), kNow);
        const int in = letIn([&](int) {
            fleet::TrustDatabase database(file);
            const auto key = fleet::KeyPair::make(fleet::KeyKind::User);
            fleet::Operators(database.connection())
                .login(joining::loginOf(key, token), facts, kNow);
        });
        EXPECT_EQ(in, 1);
    }
    EXPECT_EQ(made.operators.waiting().size(), std::size_t{kRounds});
}

TEST(TokenRace, GivesOneHostThatAsksTwiceAtOnceTheSameAnswer) {
    joining::Fleet made;
    const std::string file = made.made.directory().trustDatabase();
    const std::string request = Machine().request(made.invite("web1"));
    std::vector<std::string> answers(kComers);
    const int in = letIn([&](int comer) {
        fleet::TrustDatabase database(file);
        joining::Register hosts;
        answers[static_cast<std::size_t>(comer)] =
            fleet::enrolmentAnswerText(fleet::HostEnrolment(database.connection())
                                           .redeem(request, made.made.directory(), hosts, kNow));
    });
    EXPECT_EQ(in, kComers);
    for (const std::string& answer : answers)
        EXPECT_EQ(answer, answers.front());
}

}  // namespace
