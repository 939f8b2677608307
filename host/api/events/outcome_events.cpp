#include "host/api/events/outcome_events.h"

#include <algorithm>
#include <array>
#include <atomic>
#include <optional>
#include <utility>

#include "embedded/mutex.h"
#include "host/api/events/event_pump.h"
#include "host/api/schema.h"
#include "host/api/services.h"
#include "host/api/tasks/task_document.h"
#include "host/tables/masked_row.h"
#include "host/tables/plugin_facts.h"
#include "host/tables/table_documents.h"
#include "routes/bad_request.h"

namespace host {

Schema gapSchema;

namespace {

/// Bytes of text that wait for a reader; a single event may be larger.
constexpr std::size_t kMostText = std::size_t{64} << 10;
constexpr std::size_t kBatch = 64;

constexpr std::array<std::string_view, 4> kColumnsOfTasks = {
    plugin::kTransidColumn, plugin::kCommandColumn, plugin::kTargetColumn,
    plugin::kOriginNodeColumn};

bool isOfTasks(const oxa::Predicate& condition) {
    return std::find(kColumnsOfTasks.begin(), kColumnsOfTasks.end(), condition.column) !=
           kColumnsOfTasks.end();
}

std::size_t sizeOfRows(const oxa::Table& table) {
    int size = 0;
    for (const oxa::Column& column : table.columns)
        size = std::max(size, column.offset + column.length);
    return static_cast<std::size_t>(size);
}

/// A row that may have been kept when the table's rows were shorter.
std::string whole(std::string row, const oxa::Table& table) {
    row.resize(std::max(row.size(), sizeOfRows(table)), ' ');
    return row;
}

/// The outcome that the task would have had, as far as tasks and outcomes have columns in common.
std::string rowLike(const Task& task, const oxa::Table& table) {
    std::string row(sizeOfRows(table), ' ');
    for (const oxa::Column& column : table.columns) {
        if (column.type == OXA_TYPE_INTEGER) continue;
        const std::string value = column.name == plugin::kTransidColumn ? task.transid
                                  : column.name == plugin::kOriginNodeColumn
                                      ? oxa::originNode()
                                      : std::string(task.value(column.name));
        const auto length = static_cast<std::size_t>(column.length);
        row.replace(static_cast<std::size_t>(column.offset), std::min(length, value.size()),
                    value.substr(0, length));
    }
    return row;
}

/// What a reader gets, on its way from the journal.
class OutcomeStream final : public PumpedStream {
public:
    /// Behind this position, the reader's own; where it is not one of this journal's, from the
    /// oldest event on.
    OutcomeStream(Services& services, const oxa::Table& table, const OutcomeWish& wish,
                  const EventPosition& position)
        : services_(services),
          table_(table),
          tasks_(wish.tasks),
          outputs_(wish.outputs),
          tasksWithoutRow_(std::all_of(wish.where.begin(), wish.where.end(), isOfTasks)),
          lost_(position.journal != services.journal.identity() ||
                position.number > services.journal.lastEvent().number),
          position_(lost_ ? 0 : position.number),
          scanned_(position_) {}

    /// Before it is filled. False when the table makes no filter.
    bool filter(const std::vector<oxa::Predicate>& where) {
        if (where.empty()) return true;
        filter_ = oxa::makeFilter(table_.name, where);
        return filter_ != nullptr;
    }
    void onContent(std::function<void()> wake) {
        embedded::MutexLock lock(lock_);
        wake_ = std::move(wake);
        const std::function<void()> call = text_.empty() ? nullptr : wake_;
        lock.unlock();
        if (call) call();
    }
    std::string take() {
        std::string text;
        {
            const embedded::MutexLock lock(lock_);
            text.swap(text_);
        }
        if (!text.empty()) services_.events.wake();
        return text;
    }
    bool empty() const {
        const std::int64_t last = services_.journal.lastEvent().number;
        const embedded::MutexLock lock(lock_);
        return text_.empty() && scanned_ >= last;
    }

    bool advance() override {
        {
            const embedded::MutexLock lock(lock_);
            if (text_.size() >= kMostText) return false;
        }
        const std::int64_t last = services_.journal.lastEvent().number;
        std::string text;
        const auto events = services_.journal.eventsAfter(position_, kBatch);
        for (const JournalEvent& event : events) {
            if (text.size() >= kMostText) break;
            passTo(event.number - 1, text);
            append(event, text);
            position_ = event.number;
        }
        if (events.empty()) passTo(std::max(last, position_), text);
        hand(std::move(text));
        return !events.empty();
    }

private:
    std::string idOf(std::int64_t number) const {
        return textOf({services_.journal.identity(), number});
    }
    /// Events up to this one are not kept, unless they have been read.
    void passTo(std::int64_t number, std::string& text) {
        if (!lost_ && number == position_) return;
        const std::string missing = lost_ ? "null" : std::to_string(number - position_);
        http::appendEvent(text, {"{\"missing\":" + missing + "}", "gap", idOf(number)});
        lost_ = false;
        position_ = number;
    }
    void append(const JournalEvent& event, std::string& text) {
        if (event.kind == EventKind::Row) {
            if (filter_ && !filter_->takes(whole(event.row, table_).data())) return;
            const std::string seen =
                outputs_ == Outputs::Shown ? event.row : rowForReaders(table_, event.row);
            http::appendEvent(
                text, {rowDocument(table_, seen, services_.codePage), {}, idOf(event.number)});
        } else if (tasks_) {
            const std::optional<Task> task = services_.journal.byNumber(event.task);
            if (!task || !wants(*task)) return;
            http::appendEvent(
                text, {taskDocument(*task, services_, outputs_), "task", idOf(event.number)});
        }
    }
    bool wants(const Task& task) {
        if (!filter_) return true;
        if (!task.outcomes.empty()) {
            return filter_->takes(whole(task.outcomes.back(), table_).data());
        }
        return tasksWithoutRow_ && filter_->takes(rowLike(task, table_).data());
    }
    void hand(std::string text) {
        std::function<void()> call;
        {
            const embedded::MutexLock lock(lock_);
            if (text_.empty() && !text.empty()) call = wake_;
            text_ += text;
            scanned_ = position_;
        }
        if (call) call();
    }

    Services& services_;
    const oxa::Table& table_;
    const bool tasks_;
    const Outputs outputs_;
    const bool tasksWithoutRow_;
    // Of the pump's thread alone.
    std::unique_ptr<oxa::Filter> filter_;  ///< null: takes every row
    bool lost_;                            ///< how much the reader has missed is not known
    std::int64_t position_;

    mutable embedded::Mutex lock_;
    std::string text_ ZAV_GUARDED_BY(lock_);
    std::int64_t scanned_ ZAV_GUARDED_BY(lock_);
    std::function<void()> wake_ ZAV_GUARDED_BY(lock_);
};

class OutcomeEvents final : public http::EventSource {
public:
    OutcomeEvents(std::shared_ptr<OutcomeStream> stream, std::string position)
        : stream_(std::move(stream)), position_(std::move(position)) {}

    void start(std::function<void()> wake) override { stream_->onContent(std::move(wake)); }
    std::string take() override { return stream_->take(); }
    bool empty() const override { return stream_->empty(); }
    std::string position() const override { return position_; }

private:
    const std::shared_ptr<OutcomeStream> stream_;
    const std::string position_;
};

EventPosition positionOf(const std::string& text) {
    const std::optional<EventPosition> position = positionIn(text);
    if (!position) {
        throw routes::BadRequest("\"" + text +
                                 "\" is not the identifier of an event: a journal, \"-\" and "
                                 "a number");
    }
    return *position;
}

}  // namespace

std::unique_ptr<http::EventSource> outcomeEvents(Services& services, const oxa::Table& table,
                                                 const OutcomeWish& wish) {
    const EventPosition position =
        wish.after.empty() ? services.journal.lastEvent() : positionOf(wish.after);
    const auto stream = std::make_shared<OutcomeStream>(services, table, wish, position);
    if (!stream->filter(wish.where)) return nullptr;
    services.events.add(stream);
    return std::make_unique<OutcomeEvents>(stream, textOf(position));
}

nlohmann::ordered_json gapSchema(Components&) {
    return shape::object(
        "Gap", "Events that the host does not keep any more.",
        {{"missing", shape::orNull(shape::wholeNumber("how many; null if that is not known", 1))}});
}

}  // namespace host
