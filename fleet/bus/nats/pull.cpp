#include "fleet/bus/nats/pull.h"

#include <algorithm>
#include <charconv>
#include <chrono>
#include <nlohmann/json.hpp>
#include <utility>

#include "fleet/bus/nats/api.h"

namespace fleet {

namespace {

std::int64_t nanoseconds(Connection::Milliseconds duration) {
    return std::chrono::nanoseconds(duration).count();
}

std::string consumerJson(const PullSettings& settings) {
    return nlohmann::json{{"stream_name", settings.stream},
                          {"config",
                           {{"durable_name", settings.name},
                            {"deliver_policy", "all"},
                            {"ack_policy", "explicit"},
                            {"ack_wait", nanoseconds(settings.acknowledgeWithin)},
                            {"max_deliver", -1},
                            {"max_ack_pending", settings.unacknowledged},
                            {"replay_policy", "instant"}}}}
        .dump();
}

/// The number behind the last dot; 0 if there is none.
std::uint64_t numberOfInbox(const std::string& subject) {
    std::uint64_t number = 0;
    const std::string token = subject.substr(subject.rfind('.') + 1);
    std::from_chars(token.data(), token.data() + token.size(), number);
    return number;
}

}  // namespace

Pull::Pull(Connection& connection, const PullSettings& settings, std::string inbox)
    : connection_(connection),
      next_("$JS.API.CONSUMER.MSG.NEXT." + settings.stream + "." + settings.name),
      inbox_(std::move(inbox)) {}

Pull::~Pull() = default;

Pull::Result Pull::open(Connection& connection, const PullSettings& settings,
                        Connection::Milliseconds deadline) {
    Result result;
    result.status =
        askStore(connection, "CONSUMER.DURABLE.CREATE." + settings.stream + "." + settings.name,
                 consumerJson(settings), deadline)
            .status;
    if (!result.status.done()) return result;
    std::unique_ptr<Pull> pull(new Pull(connection, settings, connection.newInbox()));
    auto subscribed = connection.subscribe(
        pull->inbox_ + ".*",
        [raw = pull.get()](const BusMessage& message) { raw->receive(message); }, deadline);
    result.status = std::move(subscribed.status);
    if (!result.status.done()) return result;
    pull->subscription_ = std::move(subscribed.subscription);
    result.pull = std::move(pull);
    return result;
}

void Pull::receive(const BusMessage& message) {
    {
        const std::lock_guard lock(mutex_);
        // A message carries the subject that it was stored under; what ends a request, the inbox.
        // The headers are the sender's, who may write into them what he likes.
        if (message.subject.compare(0, inbox_.size(), inbox_) == 0) {
            endedBy_ = std::max(endedBy_, numberOfInbox(message.subject));
        } else if (!message.reply.empty()) {
            received_.push_back({message.subject, message.data, message.reply});
        }
    }
    changed_.notify_all();
}

Pull::Batch Pull::fetch(int most, Connection::Milliseconds wait,
                        Connection::Milliseconds deadline) {
    most = std::max(most, 1);
    Batch batch = ask(nlohmann::json{{"batch", most}, {"no_wait", true}}.dump(),
                      static_cast<std::size_t>(most), deadline);
    if (!batch.status.done() || !batch.messages.empty() || wait.count() <= 0) return batch;
    return ask(nlohmann::json{{"batch", 1}, {"expires", nanoseconds(wait)}}.dump(), 1,
               wait + deadline);
}

Pull::Batch Pull::ask(const std::string& request, std::size_t most,
                      Connection::Milliseconds within) {
    Batch batch;
    const auto deadline = std::chrono::steady_clock::now() + within;
    const std::uint64_t number = ++asked_;
    if (!connection_.connected()) {
        batch.status = BusStatus::noAnswer("no connection to the bus");
        return batch;
    }
    batch.status = connection_.publishAsking(next_, inbox_ + "." + std::to_string(number), request);
    if (!batch.status.done()) return batch;
    std::unique_lock lock(mutex_);
    const bool heard = changed_.wait_until(
        lock, deadline, [&] { return received_.size() >= most || endedBy_ >= number; });
    if (!heard && received_.empty()) batch.status = BusStatus::noAnswer("no answer in time");
    // Those of an earlier request that came too late for it are as good.
    while (!received_.empty() && batch.messages.size() < most) {
        batch.messages.push_back(std::move(received_.front()));
        received_.pop_front();
    }
    return batch;
}

BusStatus Pull::acknowledge(const Taken& message) {
    return connection_.publish(message.acknowledgeTo, "+ACK");
}

BusStatus Pull::refuse(const Taken& message) {
    return connection_.publish(message.acknowledgeTo, "-NAK");
}

}  // namespace fleet
