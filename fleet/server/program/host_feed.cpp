#include "fleet/server/program/host_feed.h"

#include <chrono>
#include <memory>
#include <utility>

#include "fleet/log/log.h"
#include "fleet/server/program/answer_time.h"

namespace fleet {
namespace {

using std::chrono::milliseconds;
using std::chrono::seconds;

/// How long the bus waits for the first message of a batch; also how long an end takes.
constexpr seconds kPatience{1};
constexpr int kBatch = 256;

}  // namespace

HostFeed::HostFeed(Connection& connection, Source source, Take take)
    : connection_(connection),
      source_(std::move(source)),
      take_(std::move(take)),
      thread_([this] { work(); }) {}

HostFeed::~HostFeed() {
    isEnding_ = true;
    thread_.join();
}

/// Null at the end.
std::unique_ptr<Pull> HostFeed::opened() {
    std::string last;
    while (!isEnding_) {
        Pull::Result result =
            Pull::open(connection_, {source_.stream, "centre", seconds(30), 1000}, kAnswerTime);
        if (result.pull) return std::move(result.pull);
        if (std::exchange(last, result.status.text) != result.status.text) {
            say(Priority::Warning,
                source_.what + " cannot be taken from the bus: " + result.status.text);
        }
        std::this_thread::sleep_for(milliseconds(200));
    }
    return nullptr;
}

void HostFeed::work() {
    std::unique_ptr<Pull> pull;
    while (!isEnding_) {
        if (!pull) pull = opened();
        if (!pull) return;
        const Pull::Batch batch = pull->fetch(kBatch, kPatience, kAnswerTime);
        if (!batch.messages.empty()) handOn(*pull, batch.messages);
        // A bus that has lost its disk has lost the consumer, too.
        if (!batch.status.done()) pull.reset();
    }
}

void HostFeed::handOn(Pull& pull, const std::vector<Pull::Taken>& messages) {
    std::vector<Told> told;
    for (const Pull::Taken& message : messages) {
        if (message.subject.rfind(source_.subject, 0) != 0) continue;
        told.push_back({message.subject.substr(source_.subject.size()), message.bytes});
    }
    const bool isTaken = take_(std::move(told));
    // What cannot be kept now is not asked for again at once.
    if (!isTaken && !isEnding_) std::this_thread::sleep_for(kPatience);
    for (const Pull::Taken& message : messages) {
        static_cast<void>(isTaken ? pull.acknowledge(message) : pull.refuse(message));
    }
}

}  // namespace fleet
