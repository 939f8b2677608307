// Kills the host at random moments while it gets work in both ways, and compares afterwards what
// the journal says with what the tasks themselves wrote down.
//
//   ZAV_CRASH_KILLS=1000 ZAV_CRASH_SEED=17 build/native/bin/crash_threaded_tests
//
// Without these variables it kills three times, with a seed of its own, which is printed.
// ctest-label: threaded

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <atomic>
#include <iostream>
#include <map>
#include <mutex>
#include <nlohmann/json.hpp>
#include <random>
#include <thread>
#include <utility>

#include "crash/killed_host.h"
#include "crash/variable_or.h"

namespace {

using nlohmann::json;

class RandomKills : public KilledHost {};

/// Follows all events, rows and ends of tasks, over the host's deaths. Each event is its identifier
/// and the rest of its text.
class EventReader {
public:
    /// Behind this event. The socket is the one of a host that may come and go.
    EventReader(std::string socket, std::string after)
        : socket_(std::move(socket)), position_(std::move(after)), thread_([this] { read(); }) {}
    ~EventReader() { stop(); }

    void stop() {
        ending_ = true;
        if (thread_.joinable()) thread_.join();
    }
    std::string position() const {
        const std::lock_guard<std::mutex> lock(lock_);
        return position_;
    }
    /// After stop().
    const std::vector<std::pair<std::string, std::string>>& events() const { return events_; }

private:
    void read() {
        while (!ending_) {
            RawClient client(socket_);
            if (client.connected()) follow(client);
            std::this_thread::sleep_for(std::chrono::milliseconds(5));  // the host may be dead
        }
    }
    void follow(RawClient& client) {
        client.send("GET /v1/events?table=KAGDYST&tasks=1 HTTP/1.1\r\nLast-Event-ID: " +
                    position() + "\r\n\r\n");
        if (client.readUntil("\r\n\r\n").find("HTTP/1.1 200") != 0) return;
        while (!ending_) {
            const std::string text = client.readUntil("\n\n", std::chrono::milliseconds(200));
            partial_ += text;
            if (partial_.size() >= 2 && partial_.substr(partial_.size() - 2) == "\n\n") {
                take(std::exchange(partial_, {}));
            } else if (client.isClosed(std::chrono::milliseconds(0))) {
                break;
            }
        }
        partial_.clear();  // the event comes again as a whole
    }
    void take(const std::string& text) {
        if (text.rfind("id: ", 0) != 0) return;  // a sign of life
        const std::size_t end = text.find('\n');
        const std::lock_guard<std::mutex> lock(lock_);
        position_ = text.substr(4, end - 4);
        events_.emplace_back(position_, text.substr(end + 1));
    }

    const std::string socket_;
    mutable std::mutex lock_;
    std::string position_;
    std::vector<std::pair<std::string, std::string>> events_;
    std::string partial_;
    std::atomic<bool> ending_{false};
    std::thread thread_;
};

/// Whoever followed the events has them all, in their order, without a repetition; each task that
/// is done had one row, and each that is over one end.
void expectAllEventsOnce(const EventReader& reader, const std::string& journal,
                         const std::map<std::string, json>& tasks) {
    std::map<std::string, int> rows;
    std::map<std::string, int> ends;
    int number = 0;
    for (const auto& [id, text] : reader.events()) {
        EXPECT_EQ(id, journal + '-' + std::to_string(++number));
        const bool isEnd = text.rfind("event: task\n", 0) == 0;
        const json data = json::parse(text.substr(text.find("data: ") + 6));
        ++(isEnd ? ends : rows)[data[isEnd ? "transid" : "TRANSID"]];
    }
    for (const auto& [name, task] : tasks) {
        EXPECT_EQ(ends[name], 1) << name;
        EXPECT_EQ(rows[name], task["state"] == "done" ? 1 : 0) << name;
    }
}

TEST_F(RandomKills, LoseNothingAndRepeatNothing) {
    const unsigned kills = variableOr("ZAV_CRASH_KILLS", 3);
    const unsigned seed = variableOr("ZAV_CRASH_SEED", std::random_device()());
    std::cout << kills << " kills with the seed " << seed << std::endl;
    std::mt19937 random(seed);
    std::uniform_int_distribution<int> delays(0, 300'000);
    const std::string journal = get("/v1/health")["journal"];
    EventReader reader(host->socket(), journal + "-0");
    for (unsigned round = 0; round < kills; ++round)
        loadAndKill(static_cast<int>(round), std::chrono::microseconds(delays(random)));
    ASSERT_TRUE(eventually([this] { return isIdle(); }, std::chrono::minutes(1 + kills)));
    EXPECT_THAT(faults(), testing::IsEmpty());
    ASSERT_TRUE(eventually([&] { return reader.position() == lastEvent(); }));
    reader.stop();
    std::vector<std::string> twice;
    expectAllEventsOnce(reader, journal, allTasks(twice));
}

TEST_F(RandomKills, NoStopMattersEither) {
    const unsigned stops = variableOr("ZAV_CRASH_KILLS", 3);
    const unsigned seed = variableOr("ZAV_CRASH_SEED", std::random_device()());
    std::cout << stops << " stops with the seed " << seed << std::endl;
    std::mt19937 random(seed);
    std::uniform_int_distribution<int> delays(0, 300'000);
    for (unsigned round = 0; round < stops; ++round) {
        loadAndStop(static_cast<int>(round), std::chrono::microseconds(delays(random)),
                    std::chrono::microseconds(delays(random)));
    }
    ASSERT_TRUE(eventually([this] { return isIdle(); }, std::chrono::minutes(1 + stops)));
    EXPECT_THAT(faults(), testing::IsEmpty());
    EXPECT_EQ(accepted.size(), 2U * stops * kTasksPerRound);
    EXPECT_EQ(get("/v1/tasks?state=interrupted")["tasks"].size(), 0U);
}

}  // namespace
