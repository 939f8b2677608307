// GET /v1/tasks/{id}/output
//
// Each piece is one event, "data: {"stream": "stdout", "text": "..."}" with a position as its
// "id:". At its end comes one event "event: end" with the task's state, and the stream ends. For a
// reader that is too slow, "event: overflow" with "data: {"lost": N}" stands in the place of N
// bytes.

#include "host/api/route.h"
#include "host/api/services.h"
#include "host/api/tasks/output_queue.h"
#include "routes/bad_request.h"

namespace host {
namespace {

class TaskOutput final : public http::EventSource {
public:
    /// `services` outlive the source.
    TaskOutput(Services& services, std::optional<OutputPosition> after)
        : services_(services),
          queue_(std::make_shared<OutputQueue>(services.codePage, services.journal.run(), after)) {}
    ~TaskOutput() override {
        services_.tasks.unfollow(follower_);
        services_.tasks.cancel(waiter_);
    }

    /// What is kept.
    void show(const Task& task) {
        queue_->begin(task);
        queue_->end(task);
    }
    /// What is kept, and what comes until the task is over.
    void follow(const Task& task) {
        follower_ = services_.tasks.follow(
            task.number, [queue = queue_](const OutputPiece& piece) { queue->push(piece); });
        waiter_ = services_.tasks.awaitEnd(
            task.id, [queue = queue_](const Task& over) { queue->end(over); });
        queue_->begin(services_.tasks.find(task.id).value_or(task));
    }

    void start(std::function<void()> wake) override { queue_->onContent(std::move(wake)); }
    std::string take() override { return queue_->take(); }
    bool empty() const override { return queue_->empty(); }
    bool over() const override { return queue_->over(); }

private:
    Services& services_;
    const std::shared_ptr<OutputQueue> queue_;
    std::uint64_t follower_ = 0;
    std::uint64_t waiter_ = 0;
};

std::optional<OutputPosition> wantedPosition(const Call& call) {
    const std::string text = call.after();
    if (text.empty()) return std::nullopt;
    const std::optional<OutputPosition> position = outputPositionIn(text);
    if (!position) throw routes::BadRequest("\"" + text + "\" is no position in a task's output");
    return position;
}

}  // namespace

Endpoint getTaskOutput;

http::Answer getTaskOutput(Services& services, const Call& call) {
    const std::string& given = call.required("id");
    const std::string name = services.codePage.fromUtf8(given).value_or(given);
    const std::optional<OutputPosition> after = wantedPosition(call);
    const std::optional<Task> task = services.tasks.find(name);
    if (!task) return http::errorReply(404, "there is no task \"" + given + '"');
    auto source = std::make_unique<TaskOutput>(services, after);
    if (call.flag("follow")) {
        source->follow(*task);
    } else {
        source->show(*task);
    }
    return http::Answer(std::move(source));
}

}  // namespace host
