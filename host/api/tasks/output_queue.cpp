#include "host/api/tasks/output_queue.h"

#include <strings.h>

#include <algorithm>
#include <nlohmann/json.hpp>

#include "host/http/event_source.h"

namespace host {
namespace {

/// How many bytes at the end are the beginning of a character in UTF-8 that goes on.
std::size_t cutBytes(std::string_view text) {
    constexpr std::size_t kLongest = 4;
    for (std::size_t back = 1; back <= std::min(kLongest, text.size()); ++back) {
        const auto byte = static_cast<unsigned char>(text[text.size() - back]);
        if ((byte & 0xC0U) == 0x80U) continue;  // inside a character
        const std::size_t length = byte >= 0xF0U ? 4 : byte >= 0xE0U ? 3 : byte >= 0xC0U ? 2 : 1;
        return length > back ? back : 0;
    }
    return 0;
}

std::string dump(const nlohmann::ordered_json& document) {
    return document.dump(-1, ' ', false, nlohmann::json::error_handler_t::replace);
}

}  // namespace

OutputQueue::OutputQueue(const CodePage& codePage) : codePage_(codePage) {}

void OutputQueue::begin(const Task& task) {
    {
        const embedded::MutexLock lock(lock_);
        std::map<std::pair<std::uint64_t, bool>, std::uint64_t> seen;
        for (const Command& command : task.commands) {
            add(false, command.out.text());
            add(true, command.err.text());
            seen[{command.number, false}] = command.out.total();
            seen[{command.number, true}] = command.err.total();
        }
        if (isOver(task.state)) held_.clear();
        for (const Held& held : std::exchange(held_, {})) {
            if (held.end > seen[{held.command, held.isError}]) add(held.isError, held.text);
        }
        begun_ = true;
        if (ended_) addEnd();
    }
    wake();
}

void OutputQueue::push(const OutputPiece& piece) {
    {
        const embedded::MutexLock lock(lock_);
        if (ended_) return;
        if (begun_) {
            add(piece.isError, piece.text);
        } else {
            held_.push_back({piece.command, piece.isError, std::string(piece.text), piece.end});
        }
    }
    wake();
}

void OutputQueue::end(TaskState state) {
    {
        const embedded::MutexLock lock(lock_);
        if (ended_) return;
        ended_ = true;
        state_ = state;
        if (begun_) addEnd();
    }
    wake();
}

/// Leaves a character that is cut for the next piece.
void OutputQueue::add(bool isError, std::string_view text) {
    std::string& cut = cut_[isError ? 1 : 0];
    std::string whole = std::exchange(cut, {}).append(text);
    if (::strcasecmp(codePage_.name().c_str(), "UTF-8") == 0) {
        const std::size_t kept = whole.size() - cutBytes(whole);
        cut = whole.substr(kept);
        whole.resize(kept);
    }
    addEvent(isError, whole);
}

void OutputQueue::addEvent(bool isError, std::string_view text) {
    if (text.empty()) return;
    if (lost_ > 0 || ready_.size() + text.size() > kMostBytes) {
        lost_ += text.size();
        return;
    }
    const nlohmann::ordered_json piece = {{"stream", isError ? "stderr" : "stdout"},
                                          {"text", codePage_.toUtf8(text)}};
    appendEvent(ready_, {dump(piece), {}, {}});
}

void OutputQueue::addEnd() {
    addEvent(false, std::exchange(cut_[0], {}));
    addEvent(true, std::exchange(cut_[1], {}));
}

void OutputQueue::onContent(std::function<void()> wake) {
    {
        const embedded::MutexLock lock(lock_);
        wake_ = std::make_shared<const std::function<void()>>(std::move(wake));
    }
    this->wake();
}

/// A reader that is woken without need finds nothing.
void OutputQueue::wake() {
    std::shared_ptr<const std::function<void()>> call;
    {
        const embedded::MutexLock lock(lock_);
        call = wake_;
    }
    if (call) (*call)();
}

std::string OutputQueue::take() {
    const embedded::MutexLock lock(lock_);
    std::string text = std::exchange(ready_, {});
    if (const std::size_t lost = std::exchange(lost_, 0)) {
        appendEvent(text, {"{\"lost\":" + std::to_string(lost) + "}", "overflow", {}});
    }
    if (begun_ && ended_ && !endTaken_) {
        endTaken_ = true;
        appendEvent(text, {dump({{"state", nameOf(state_)}}), "end", {}});
    }
    return text;
}

bool OutputQueue::empty() const {
    const embedded::MutexLock lock(lock_);
    return ready_.empty() && lost_ == 0 && (!begun_ || !ended_ || endTaken_);
}

bool OutputQueue::over() const {
    const embedded::MutexLock lock(lock_);
    return endTaken_;
}

}  // namespace host
