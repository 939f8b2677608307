#include "fleet/server/api/events/event_readers.h"

#include <algorithm>
#include <atomic>
#include <utility>

#include "routes/bad_request.h"

namespace fleet {
namespace {

constexpr std::size_t kEventsAtOnce = 64;
constexpr std::size_t kMostText = std::size_t{64} << 10;  ///< a single event may be larger

}  // namespace

/// What others know of a reader.
class EventReaders::Reader {
public:
    explicit Reader(EventReaderRight right) : right_(std::move(right)) {}

    const EventReaderRight& right() const { return right_; }
    bool isOver() const { return isOver_; }
    void end() {
        isOver_ = true;
        wake();
    }
    void onContent(std::function<void()> wake) {
        const std::lock_guard lock(mutex_);
        wake_ = std::move(wake);
    }
    void wake() const {
        std::function<void()> call;
        {
            const std::lock_guard lock(mutex_);
            call = wake_;
        }
        if (call) call();
    }

private:
    const EventReaderRight right_;
    std::atomic<bool> isOver_{false};
    mutable std::mutex mutex_;
    std::function<void()> wake_;
};

/// On the I/O thread.
class EventReaders::Source final : public http::EventSource {
public:
    Source(const EventLog& log, std::shared_ptr<Reader> reader, const std::string& after)
        : log_(log),
          reader_(std::move(reader)),
          visible_(reader_->right().selector),
          seesAll_(reader_->right().selector == "*") {
        const EventPlace newest{log_.run(), log_.last()};
        begun_ = after.empty() ? eventIdOf(newest) : after;
        if (after.empty()) {
            at_ = newest.number;
            return;
        }
        const auto place = eventPlaceIn(after);
        if (!place) {
            throw routes::BadRequest("\"" + after +
                                     "\" is not the identifier of an event: sixteen hexadecimal "
                                     "digits, \"-\" and a number");
        }
        isElsewhere_ = place->run != log_.run() || place->number > newest.number;
        at_ = isElsewhere_ ? 0 : place->number;
    }

    void start(std::function<void()> wake) override {
        reader_->onContent(wake);
        if (!empty() || over()) wake();
    }
    std::string take() override {
        std::string text;
        if (over()) return text;
        if (isFirst_) passGap(text);
        isFirst_ = false;
        while (text.empty()) {
            const auto events = log_.after(at_, kEventsAtOnce);
            if (events.empty()) break;
            isTooSlow_ = events.front().number != at_ + 1;
            if (isTooSlow_) break;
            for (const EventLog::Numbered& one : events) {
                if (text.size() >= kMostText) break;
                at_ = one.number;
                if (isVisible(*one.event)) append(text, one);
            }
        }
        return text;
    }
    bool empty() const override { return !isElsewhere_ && at_ >= log_.last(); }
    bool over() const override { return isTooSlow_ || reader_->isOver(); }
    std::string position() const override { return begun_; }

private:
    /// What happened in between is not known, or not kept any more.
    void passGap(std::string& text) {
        const std::uint64_t behind = log_.first() - 1;
        if (!isElsewhere_ && at_ >= behind) return;
        const std::string missing = isElsewhere_ ? "null" : std::to_string(behind - at_);
        http::appendEvent(text, {"{\"missing\":" + missing + "}", "gap",
                                 eventIdOf(EventPlace{log_.run(), behind})});
        isElsewhere_ = false;
        at_ = behind;
    }
    bool isVisible(const FleetEvent& event) const {
        return seesAll_ || !event.host || visible_.matches(event.host->name, event.host->labels);
    }
    void append(std::string& text, const EventLog::Numbered& one) const {
        http::appendEvent(text, {one.event->data, one.event->name,
                                 eventIdOf(EventPlace{log_.run(), one.number})});
    }

    const EventLog& log_;
    const std::shared_ptr<Reader> reader_;
    const Selector visible_;
    const bool seesAll_;
    std::string begun_;
    std::uint64_t at_ = 0;
    bool isElsewhere_ = false;  ///< the reader comes from another run of the centre
    bool isFirst_ = true;
    bool isTooSlow_ = false;
};

std::unique_ptr<http::EventSource> EventReaders::open(const EventReaderRight& right,
                                                      const std::string& after) {
    auto reader = std::make_shared<Reader>(right);
    auto source = std::make_unique<Source>(log_, reader, after);
    const std::lock_guard lock(mutex_);
    const auto others = alive();
    const auto own = std::count_if(others.begin(), others.end(), [&right](const auto& other) {
        return other->right().key == right.key;
    });
    if (others.size() >= kMost || static_cast<std::size_t>(own) >= kMostOfKey) return nullptr;
    readers_.push_back(std::move(reader));
    return source;
}

void EventReaders::wake() {
    for (const auto& reader : readers())
        reader->wake();
}

void EventReaders::endUnless(const std::function<bool(const EventReaderRight&)>& counts) {
    for (const auto& reader : readers()) {
        if (!reader->isOver() && !counts(reader->right())) reader->end();
    }
}

bool EventReaders::isEmpty() {
    return readers().empty();
}

std::vector<std::shared_ptr<EventReaders::Reader>> EventReaders::readers() {
    const std::lock_guard lock(mutex_);
    return alive();
}

/// Those whose connections are open. The caller holds the lock.
std::vector<std::shared_ptr<EventReaders::Reader>> EventReaders::alive() {
    std::vector<std::shared_ptr<Reader>> open;
    for (auto at = readers_.begin(); at != readers_.end();) {
        auto reader = at->lock();
        at = reader ? at + 1 : readers_.erase(at);
        if (reader) open.push_back(std::move(reader));
    }
    return open;
}

}  // namespace fleet
