// ctest-label: threaded

// What waits for a browser.
#include "fleet/operator/console/browser_feed.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <atomic>
#include <chrono>
#include <memory>
#include <string>
#include <thread>

namespace {

using fleet::BrowserFeed;
using std::chrono::hours;

const std::string kEvent = "data: " + std::string(10'000, 'x') + "\n\n";

TEST(BrowserFeed, HandsOutWholeEventsOnly) {
    BrowserFeed feed;
    int woken = 0;
    feed.start([&] { ++woken; });
    EXPECT_TRUE(feed.keep("data: a\n\ndata:"));
    EXPECT_GT(woken, 1);
    EXPECT_EQ(feed.take(), "data: a\n\n");
    EXPECT_TRUE(feed.empty());
    EXPECT_TRUE(feed.keep(" b\n"));
    EXPECT_TRUE(feed.empty());
    EXPECT_TRUE(feed.keep("\n"));
    feed.end();
    EXPECT_FALSE(feed.over()) << "there is something to take";
    EXPECT_EQ(feed.take(), "data: b\n\n");
    EXPECT_TRUE(feed.over());
}

TEST(BrowserFeed, HoldsABoundedNumberOfBytes) {
    constexpr std::size_t kMuch = std::size_t{16} << 20;
    BrowserFeed feed;
    std::thread writer([&] {
        for (std::size_t sent = 0; sent < kMuch; sent += kEvent.size())
            feed.keep(kEvent);
        feed.end();
    });
    std::size_t most = 0;
    std::size_t taken = 0;
    while (!feed.over()) {
        const std::size_t length = feed.take().size();
        most = std::max(most, length);
        taken += length;
        std::this_thread::yield();
    }
    writer.join();
    EXPECT_GE(taken, kMuch);
    EXPECT_LE(most, std::size_t{256} * 1024 + kEvent.size());
}

TEST(BrowserFeed, LetsItsWriterGoWhenTheBrowserGoes) {
    const auto feed = std::make_shared<BrowserFeed>();
    std::atomic<bool> isOver{false};
    auto source = sourceOf(feed, "1-2-0", [feed] { feed->cancel(); });
    EXPECT_EQ(source->position(), "1-2-0");
    std::thread writer([&] {
        while (feed->keep(kEvent)) {
        }
        EXPECT_FALSE(feed->pause(hours(1))) << "and it does not wait";
        isOver = true;
    });
    std::thread waiter([&] { EXPECT_FALSE(feed->pause(hours(1))); });
    source.reset();
    writer.join();
    waiter.join();
    EXPECT_TRUE(isOver);
}

TEST(BrowserFeed, EndsWithAnEventThatIsTooLarge) {
    BrowserFeed feed;
    EXPECT_FALSE(feed.keep(std::string((std::size_t{8} << 20) + 1, 'x')));
}

}  // namespace
