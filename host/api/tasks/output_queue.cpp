#include "host/api/tasks/output_queue.h"

#include <strings.h>

#include <algorithm>
#include <nlohmann/json.hpp>

#include "host/api/schema.h"
#include "http/event_source.h"

namespace host {

Schema outputPieceSchema, outputEndSchema, taskStateSchema;

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

OutputQueue::OutputQueue(const CodePage& codePage, std::int64_t run,
                         std::optional<OutputPosition> after)
    : codePage_(codePage), run_(run), after_(after) {}

void OutputQueue::begin(const Task& task) {
    {
        const embedded::MutexLock lock(lock_);
        const Task& shown = over_ && !isOver(task.state) ? *over_ : task;
        findPlace(shown);
        for (const Command& command : shown.commands) {
            addKept(command);
            if (command.number == 0) ++unnumbered_;
        }
        if (isOver(shown.state)) held_.clear();
        for (const Held& held : std::exchange(held_, {}))
            pass({held.command, held.isError, held.text, held.end});
        begun_ = true;
        if (over_) addEnd();
    }
    wake();
}

void OutputQueue::push(const OutputPiece& piece) {
    {
        const embedded::MutexLock lock(lock_);
        if (over_) return;
        if (begun_) {
            pass(piece);
        } else {
            held_.push_back({piece.command, piece.isError, std::string(piece.text), piece.end});
        }
    }
    wake();
}

void OutputQueue::end(const Task& over) {
    {
        const embedded::MutexLock lock(lock_);
        if (over_) return;
        over_ = over;
        if (begun_) {
            // A reader who came while the last of it was on its way to the task has not got that.
            for (std::size_t i = unnumbered_; i < over.commands.size(); ++i)
                addKept(over.commands[i]);
            addEnd();
        }
    }
    wake();
}

/// A task that is not over runs, or will, in this run of the host. The journal does not keep how
/// much a command has written whose output was cut: then the reader gets what is kept.
void OutputQueue::findPlace(const Task& task) {
    position_.run = isOver(task.state) ? task.run.value_or(0) : run_;
    const auto isCut = [](const Command& command) {
        return command.number == 0 &&
               std::max(command.out.text().size(), command.err.text().size()) >= Tail::kBytes;
    };
    if (!after_ || after_->run != position_.run) return;
    if (std::any_of(task.commands.begin(), task.commands.end(), isCut)) return;
    had_ = after_->bytes;
}

void OutputQueue::addKept(const Command& command) {
    pass({command.number, false, command.out.text(), command.out.total()});
    pass({command.number, true, command.err.text(), command.err.total()});
}

/// Leaves out what has been passed on, and what the reader has had. Where a command's number is not
/// known, nothing else of it comes.
void OutputQueue::pass(const OutputPiece& piece) {
    std::uint64_t fresh = piece.end;
    if (piece.command != 0) {
        std::uint64_t& seen = seen_[{piece.command, piece.isError}];
        if (piece.end <= seen) return;
        fresh -= std::exchange(seen, piece.end);
    }
    const std::size_t output = piece.isError ? 1 : 0;
    std::uint64_t& passed = position_.bytes.at(output);
    passed += fresh;
    const std::uint64_t had = had_.at(output);
    if (passed <= had) return;
    fresh = std::min(fresh, passed - had);
    std::string_view text = piece.text;
    if (fresh < text.size()) text.remove_prefix(text.size() - static_cast<std::size_t>(fresh));
    add(piece.isError, text);
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
    OutputPosition behind = position_;
    for (std::size_t i = 0; i < cut_.size(); ++i)
        behind.bytes.at(i) = std::max(behind.bytes.at(i) - cut_.at(i).size(), had_.at(i));
    http::appendEvent(ready_, {dump(piece), {}, textOf(behind)});
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
        http::appendEvent(text, {"{\"lost\":" + std::to_string(lost) + "}", "overflow", {}});
    }
    if (begun_ && over_ && !endTaken_) {
        endTaken_ = true;
        http::appendEvent(text, {dump({{"state", nameOf(over_->state)}}), "end", {}});
    }
    return text;
}

bool OutputQueue::empty() const {
    const embedded::MutexLock lock(lock_);
    return ready_.empty() && lost_ == 0 && (!begun_ || !over_ || endTaken_);
}

bool OutputQueue::over() const {
    const embedded::MutexLock lock(lock_);
    return endTaken_;
}

nlohmann::ordered_json outputPieceSchema(Components&) {
    return shape::object("OutputPiece", "A piece of what a command writes.",
                         {{"stream", shape::oneOf("where it came", {"stdout", "stderr"})},
                          {"text", shape::text("the piece")}});
}

nlohmann::ordered_json outputEndSchema(Components& components) {
    return shape::object("OutputEnd", "Nothing more comes.",
                         {{"state", shape::about("the task's state, if it is over",
                                                 components.ref(taskStateSchema))}});
}

}  // namespace host
