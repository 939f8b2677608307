// ctest-label: threaded
// Descriptors beside its clients that a server attends to.
#include <gtest/gtest.h>
#include <sys/eventfd.h>

#include <cstdint>

#include "host/server_fixture.h"
#include "system/file_descriptor.h"

namespace {

using std::chrono::milliseconds;
using std::chrono::seconds;

/// Counts what has happened.
class Events {
public:
    int descriptor() const { return descriptor_.get(); }
    void add() const { EXPECT_EQ(::eventfd_write(descriptor_.get(), 1), 0); }
    /// How many there were since the last call; makes the descriptor unreadable.
    std::uint64_t take() const {
        eventfd_t count = 0;
        EXPECT_EQ(::eventfd_read(descriptor_.get(), &count), 0);
        return count;
    }

private:
    const sys::FileDescriptor descriptor_{::eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK)};
};

class Watched : public ServerTest {
protected:
    /// A server that does not run yet.
    void make() {
        socket.emplace(scratch.path("s"));
        services.emplace(oxa::tables(), host::CodePage("UTF-8"), "/home/of/it");
        api.emplace(*services, host::routes());
        server = std::make_unique<http::HttpServer>(socket->listen(), host::doorFor(), *api,
                                                    services->counts);
    }

    /// The numbers of events of which each call of a server with this delay learned, where ten
    /// events come one after the other, each in a turn of its own.
    std::vector<std::uint64_t> callsWithDelay(milliseconds delay) {
        constexpr std::uint64_t kEvents = 10;
        make();
        const Events events;
        const Events turns;
        std::uint64_t happened = 0;
        std::uint64_t seen = 0;
        std::vector<std::uint64_t> calls;
        server->whenReadable(turns.descriptor(), milliseconds(0), [&] {
            turns.take();
            events.add();
            if (++happened < kEvents) turns.add();
        });
        server->whenReadable(events.descriptor(), delay, [&] {
            calls.push_back(events.take());
            seen += calls.back();
            if (seen == kEvents) server->stop();
        });
        turns.add();
        server->run();
        return calls;
    }
};

TEST_F(Watched, EventsCloseTogetherCostOneCall) {
    // The ten turns take microseconds, of which the delay is a large multiple.
    EXPECT_EQ(callsWithDelay(seconds(1)), std::vector<std::uint64_t>{10});
}

TEST_F(Watched, EventsAreAttendedToAtOnceWithoutADelay) {
    EXPECT_GT(callsWithDelay(milliseconds(0)).size(), 1U);
}

TEST_F(Watched, WhatComesAfterACallGetsAnother) {
    make();
    const Events events;
    std::vector<std::uint64_t> calls;
    server->whenReadable(events.descriptor(), milliseconds(10), [&] {
        calls.push_back(events.take());
        if (calls.size() == 3) return server->stop();
        events.add();
    });
    events.add();
    server->run();
    EXPECT_EQ(calls, (std::vector<std::uint64_t>{1, 1, 1}));
}

}  // namespace
