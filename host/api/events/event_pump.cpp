#include "host/api/events/event_pump.h"

#include <chrono>
#include <condition_variable>
#include <string>
#include <utility>
#include <vector>

#include "embedded/mutex.h"
#include "host/process/log.h"

namespace host {
namespace {

constexpr std::chrono::seconds kReadRetry{1};

using Streams = std::vector<std::shared_ptr<PumpedStream>>;

/// What became of one step of all streams.
struct Step {
    bool more = false;  ///< some of them took something
    std::string fault;  ///< why one of them could not
};

Step advance(const Streams& streams) {
    Step step;
    for (const auto& stream : streams) {
        try {
            step.more = stream->advance() || step.more;
        } catch (const std::exception& error) {
            step.fault = error.what();
        }
    }
    return step;
}

}  // namespace

struct EventPump::State {
    std::mutex lock;  // around everything below
    std::condition_variable changed;
    bool work = false;
    bool ending = false;
    std::vector<std::weak_ptr<PumpedStream>> streams;

    void wake() {
        {
            const std::lock_guard<std::mutex> held(lock);
            work = true;
        }
        changed.notify_all();
    }
    /// Waits for work; at the latest for `limit` if there is one. Returns the streams that somebody
    /// still reads, or false at the end.
    bool await(Streams& found, bool limited) {
        found.clear();
        std::unique_lock<std::mutex> held(lock);
        const auto until = std::chrono::steady_clock::now() + kReadRetry;
        while (!work && !ending) {
            if (!limited) {
                changed.wait(held);
            } else if (changed.wait_until(held, until) == std::cv_status::timeout) {
                break;
            }
        }
        work = false;
        for (auto at = streams.begin(); at != streams.end();) {
            auto stream = at->lock();
            at = stream ? at + 1 : streams.erase(at);
            if (stream) found.push_back(std::move(stream));
        }
        return !ending;
    }
};

EventPump::EventPump(Journal& journal)
    : state_(std::make_shared<State>()), journal_(journal), thread_([this] { work(*state_); }) {
    journal_.whenEvents([state = state_] { state->wake(); });
}

EventPump::~EventPump() {
    journal_.whenEvents({});
    {
        const std::lock_guard<std::mutex> held(state_->lock);
        state_->ending = true;
    }
    state_->changed.notify_all();
    thread_.join();
}

void EventPump::add(const std::shared_ptr<PumpedStream>& stream) {
    {
        const std::lock_guard<std::mutex> held(state_->lock);
        state_->streams.push_back(stream);
    }
    wake();
}

void EventPump::wake() {
    state_->wake();
}

void EventPump::work(State& state) {
    Streams streams;
    Step last;
    while (state.await(streams, !last.fault.empty())) {
        Step step;
        do {
            step = advance(streams);
        } while (step.more && step.fault.empty());
        if (!step.fault.empty() && last.fault.empty()) {
            say(Priority::Warning, "events come late: " + step.fault);
        }
        last = std::move(step);
    }
}

}  // namespace host
