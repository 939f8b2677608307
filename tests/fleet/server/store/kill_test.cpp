/// A centre that is killed while it gives numbers: what it has told is there, and nothing twice.
#include <gtest/gtest.h>
#include <signal.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <set>
#include <string>
#include <vector>

#include "fleet/server/store/centre_database.h"
#include "fleet/server/store/sqlite_centre_store.h"
#include "tests/support/scratch_dir.h"

namespace {

using fleet::CentreDatabase;
using fleet::Number;
using fleet::SqliteCentreStore;

constexpr int kLives = 12;

std::string nameOf(int life, std::uint64_t turn) {
    return std::to_string(life) + "-" + std::to_string(turn);
}

std::string sealed(Number number) {
    return "sealed " + std::to_string(number);
}

/// Gives numbers without end, and tells each when it is committed.
[[noreturn]] void giveWithoutEnd(const std::string& directory, int life, int teller) {
    try {
        CentreDatabase database(directory);
        SqliteCentreStore store(database.connection());
        for (std::uint64_t turn = 0;; ++turn) {
            const Number given = store.give("a", nameOf(life, turn), sealed).value();
            if (::write(teller, &given, sizeof given) != sizeof given) break;
        }
    } catch (const std::exception&) {
        // The pipe ends without a number, which fails the test.
    }
    ::_exit(1);
}

/// All numbers that were told before and after the kill, which comes when `before` were.
std::vector<Number> numbersToldUntilKilled(const std::string& directory, int life, int before) {
    std::array<int, 2> pipe{};
    if (::pipe(pipe.data()) != 0) return {};
    const pid_t child = ::fork();
    if (child == 0) {
        ::close(pipe[0]);
        giveWithoutEnd(directory, life, pipe[1]);
    }
    ::close(pipe[1]);
    std::vector<Number> told;
    Number number = 0;
    while (::read(pipe[0], &number, sizeof number) == sizeof number) {
        told.push_back(number);
        if (told.size() == static_cast<std::size_t>(before)) ::kill(child, SIGKILL);
    }
    ::close(pipe[0]);
    ::waitpid(child, nullptr, 0);
    return told;
}

/// Whether the orders have the numbers from 1 on without a gap, each with its bytes.
void expectAllNumbersOnce(SqliteCentreStore& store) {
    const Number last = store.host("a")->last;
    std::set<std::string> orders;
    for (Number number = 1; number <= last; ++number) {
        const auto order = store.orderAt("a", number);
        ASSERT_TRUE(order.has_value()) << number;
        EXPECT_EQ(order->bytes, sealed(number));
        EXPECT_TRUE(orders.insert(order->order).second) << order->order;
    }
    EXPECT_EQ(store.open("a", 0, last + 1, last + 1).size(), last);
}

TEST(CentreStoreKilled, HasEveryNumberThatItToldAndNoneTwice) {
    const ScratchDir scratch;
    const std::string directory = scratch.path("centre");
    {
        CentreDatabase database(directory);
        fleet::HostRecord record;
        record.host = "a";
        SqliteCentreStore(database.connection()).keepHost(record);
    }
    Number highest = 0;
    for (int life = 0; life < kLives; ++life) {
        const std::vector<Number> told = numbersToldUntilKilled(directory, life, 1 + 7 * life);
        ASSERT_FALSE(told.empty()) << "life " << life;
        CentreDatabase database(directory);
        SqliteCentreStore store(database.connection());
        for (std::size_t turn = 0; turn < told.size(); ++turn) {
            EXPECT_GT(told[turn], highest);
            highest = told[turn];
            EXPECT_EQ(store.order("a", nameOf(life, turn))->number, told[turn]);
        }
        expectAllNumbersOnce(store);
    }
}

}  // namespace
