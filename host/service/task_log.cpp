#include "host/service/task_log.h"

#include <algorithm>
#include <chrono>
#include <cstddef>
#include <optional>
#include <string_view>
#include <utility>
#include <vector>

#include "host/service/task_status.h"

namespace host {
namespace {

constexpr std::size_t kEventsAtOnce = 256;

std::string endWords(TaskState state) {
    switch (state) {
        case TaskState::Done:
            return "is done";
        case TaskState::Failed:
            return "has failed";
        case TaskState::Refused:
            return "was refused";
        case TaskState::Cancelled:
            return "was cancelled";
        case TaskState::Expired:
            return "has expired";
        case TaskState::Interrupted:
            return "was interrupted";
        case TaskState::Queued:
        case TaskState::Running:
            break;
    }
    return "goes on";
}

std::string timeTaken(const Task& task) {
    if (!task.started || !task.ended) return "";
    const std::int64_t time =
        std::chrono::duration_cast<std::chrono::seconds>(*task.ended - *task.started).count();
    return " after " + std::to_string(std::max<std::int64_t>(0, time)) + " s";
}

}  // namespace

TaskLog::TaskLog(Journal& journal, Say say)
    : journal_(journal), say_(std::move(say)), position_(journal.lastEvent().number) {}

void TaskLog::look() {
    tellEnds();
    for (const Task& task : journal_.running())
        tellBegin(task);
}

void TaskLog::tellEnds() {
    for (;;) {
        const std::vector<JournalEvent> events = journal_.eventsAfter(position_, kEventsAtOnce);
        for (const JournalEvent& event : events) {
            const std::optional<Task> task =
                event.kind == EventKind::TaskEnd ? journal_.byNumber(event.task) : std::nullopt;
            if (task && task->started) tellBegin(*task);
            if (task) tellEnd(*task);
            position_ = event.number;
        }
        if (events.size() < kEventsAtOnce) return;
    }
}

void TaskLog::tellBegin(const Task& task) {
    if (!begun_.insert(task.number).second) return;
    say_(Priority::Info,
         "task " + task.id + " begins: " + wordsForTask(task) +
             (task.asker.empty() ? "" : ", asked for by " + task.asker),
         task.id);
}

void TaskLog::tellEnd(const Task& task) {
    begun_.erase(task.number);
    say_(task.state == TaskState::Done ? Priority::Info : Priority::Warning,
         "task " + task.id + " " + endWords(task.state) + timeTaken(task) + ": " +
             wordsForTask(task) + (task.reason.empty() ? "" : "; " + task.reason),
         task.id);
}

}  // namespace host
