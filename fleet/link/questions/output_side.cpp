#include "fleet/link/questions/output_side.h"

#include <algorithm>
#include <atomic>
#include <nlohmann/json.hpp>
#include <system_error>
#include <thread>
#include <utility>

#include "ctl/client/deadline.h"
#include "ctl/client/failure.h"
#include "ctl/client/host_client.h"
#include "ctl/client/http/event_stream.h"
#include "ctl/client/http/percent_encoding.h"
#include "ctl/client/row.h"
#include "fleet/bus/messages/document.h"
#include "fleet/bus/trust/sealed.h"
#include "fleet/link/questions/output_batch.h"

using nlohmann::json;

namespace fleet {
namespace {

using std::chrono::hours;
using std::chrono::seconds;

/// Until the host has begun to answer.
constexpr seconds kHostAnswerTime{5};
/// Around a piece's text, in the message that is published.
constexpr std::size_t kAroundPiece = 512;

/// Nobody wants a stream any more.
struct StreamEnd {};

std::string textOrNone(const json& body, const char* member) {
    return body.contains(member) ? textIn(body, member) : std::string();
}

/// Where the stream is to go on; "" at the beginning, and if the question makes no sense.
std::string positionIn(const AskedQuestion& question) {
    try {
        return textOrNone(readDocument(question.body), "after");
    } catch (const MessageError&) {
        return {};
    }
}

}  // namespace

/// One stream: what its thread reads, and the places of its pieces.
class OutputSide::Stream {
public:
    Stream(const AskedQuestion& question, std::string ofTask, bool goesOn, std::string behind)
        : id(question.id),
          task(std::move(ofTask)),
          isFollowed(goesOn),
          after(std::move(behind)),
          answerTo(question.answerTo),
          grant(question.grant),
          question_(question.id) {}
    ~Stream() {
        if (thread.joinable()) thread.join();
    }
    Stream(const Stream&) = delete;
    Stream& operator=(const Stream&) = delete;

    /// From now on the pieces answer that question.
    void answer(const std::string& question) {
        const std::lock_guard lock(mutex_);
        question_ = question;
    }
    /// Makes the next piece and has it published: places and messages are in the same order.
    void publish(OutputNews news, const std::string& host, const KeyPair& signing,
                 const Publish& publish) {
        const std::lock_guard lock(mutex_);
        news.stream = id;
        news.after = after;
        const bool isLast = news.isOver || !news.error.empty();
        const AnswerPiece piece{host, question_, place_++, isLast,
                                sealFor(answerTo, textOfNews(news))};
        publish(signAnswer(piece, signing));
    }

    const std::string id;
    const std::string task;
    const bool isFollowed;
    const std::string after;
    const std::string answerTo;
    const Certificate grant;
    std::atomic<bool> hasEnded{false};
    std::thread thread;

private:
    std::mutex mutex_;
    std::string question_;
    Number place_ = 0;
};

OutputSide::OutputSide(std::string host, const KeyPair& signing, std::string socket,
                       Publish publish)
    : host_(std::move(host)),
      signing_(signing),
      socket_(std::move(socket)),
      publish_(std::move(publish)) {}

OutputSide::~OutputSide() {
    Streams ending;
    {
        const std::lock_guard lock(mutex_);
        isEnding_ = true;
        ending = std::move(streams_);
    }
    changed_.notify_all();
    ending.clear();
}

Moment OutputSide::now() const {
    return std::chrono::duration_cast<Moment>(std::chrono::steady_clock::now().time_since_epoch());
}

void OutputSide::ask(const AskedQuestion& question) {
    if (!question.refusal.empty()) {
        return refuse(question, question.refusal, ctl::kHostReportedFailure);
    }
    try {
        const json body = readDocument(question.body);
        const std::string task = textIn(body, "task");
        const bool isFollowed = flagIn(body, "follow");
        forgetEnded();
        if (letGoOn(question, textOrNone(body, "stream"), task)) return;
        begin(question, task, isFollowed, textOrNone(body, "after"));
    } catch (const MessageError& error) {
        refuse(question, error.what(), ctl::kWrongUsage);
    } catch (const std::system_error& error) {
        refuse(question, error.what(), ctl::kHostReportedFailure);
    }
}

bool OutputSide::letGoOn(const AskedQuestion& question, const std::string& stream,
                         const std::string& task) {
    const std::lock_guard lock(mutex_);
    const auto found = std::find_if(streams_.begin(), streams_.end(), [&](const auto& one) {
        return one->id == stream && one->answerTo == question.answerTo && one->task == task &&
               !one->hasEnded;
    });
    if (found == streams_.end() || !leases_.renew(stream, now())) return false;
    (*found)->answer(question.id);
    (*found)->publish({}, host_, signing_, publish_);
    return true;
}

void OutputSide::begin(const AskedQuestion& question, const std::string& task, bool isFollowed,
                       const std::string& after) {
    endThoseFor(question.answerTo);
    auto stream = std::make_unique<Stream>(question, task, isFollowed, after);
    Stream& begun = *stream;
    {
        const std::lock_guard lock(mutex_);
        // Those that have just been ended take a second to do so.
        if (streams_.size() < 2 * OutputLeases::kMost && leases_.begin(question.id, now())) {
            begun.thread = std::thread([this, &begun] { show(begun); });
            streams_.push_back(std::move(stream));
            return;
        }
    }
    refuse(question,
           "the host shows the output of " + std::to_string(OutputLeases::kMost) +
               " tasks at a time, and no more",
           ctl::kHostReportedFailure);
}

void OutputSide::refuse(const AskedQuestion& question, const std::string& why, int status) {
    OutputNews news;
    news.error = why;
    news.status = static_cast<Number>(status);
    Stream(question, "", false, positionIn(question))
        .publish(std::move(news), host_, signing_, publish_);
}

/// Who begins another stream reads no earlier one.
void OutputSide::endThoseFor(const std::string& reader) {
    const std::lock_guard lock(mutex_);
    for (const auto& stream : streams_) {
        if (stream->answerTo == reader) leases_.end(stream->id);
    }
}

void OutputSide::forgetEnded() {
    Streams ended;  // their threads are waited for without the lock
    const std::lock_guard lock(mutex_);
    const auto isOver = std::stable_partition(streams_.begin(), streams_.end(),
                                              [](const auto& one) { return !one->hasEnded; });
    std::move(isOver, streams_.end(), std::back_inserter(ended));
    streams_.erase(isOver, streams_.end());
}

bool OutputSide::isWanted(const std::string& stream) const {
    const std::lock_guard lock(mutex_);
    return !isEnding_ && leases_.isWanted(stream, now());
}

bool OutputSide::awaitTurn(const std::string& stream, std::size_t bytes) {
    std::unique_lock lock(mutex_);
    const Moment pause = rate_.pauseBefore(bytes, now());
    changed_.wait_for(lock, pause, [this] { return isEnding_; });
    return !isEnding_ && leases_.isWanted(stream, now());
}

/// Passes on what there is; returns why there is no more, if that is to be told.
OutputNews OutputSide::endOf(Stream& stream) {
    OutputNews end;
    try {
        passOn(stream);
    } catch (const StreamEnd&) {
    } catch (const ctl::Failure& failure) {
        end.error = failure.what();
        end.status = static_cast<Number>(failure.status());
    } catch (const std::exception& error) {
        end.error = error.what();
        end.status = ctl::kNoHost;
    }
    return end;
}

void OutputSide::show(Stream& stream) {
    try {
        OutputNews end = endOf(stream);
        if (!end.error.empty() && isWanted(stream.id)) {
            stream.publish(std::move(end), host_, signing_, publish_);
        }
    } catch (const std::exception&) {
        // Who asked learns it from the silence.
    }
    const std::lock_guard lock(mutex_);
    leases_.end(stream.id);
    stream.hasEnded = true;
}

/// Returns at the end of the output. Throws StreamEnd when nobody wants more.
void OutputSide::passOn(Stream& stream) {
    const std::string path = "/v1/tasks/" + ctl::percentEncoded(stream.task);
    const json task = ctl::HostClient(socket_).get(path, ctl::deadlineIn(kHostAnswerTime));
    if (!allows(stream.grant, kAsksOutput, ctl::textOf(task, "product"))) {
        throw ctl::Failure(ctl::kHostReportedFailure,
                           "the operator's certificate does not allow this question for the "
                           "product of that task");
    }
    std::string target = path + "/output?follow=" + (stream.isFollowed ? "1" : "0");
    if (!stream.after.empty()) target += "&after=" + ctl::percentEncoded(stream.after);
    ctl::EventStream events(socket_, target, ctl::deadlineIn(kHostAnswerTime));
    OutputBatch batch(events.position());
    const ctl::Ticker tick = [&] {
        if (!isWanted(stream.id)) throw StreamEnd{};
    };
    // A task may be silent for long, and who asks wants to know whether anybody is there.
    OutputNews begun;
    begun.at = events.position();
    stream.publish(std::move(begun), host_, signing_, publish_);
    for (bool isOver = false; !isOver;) {
        ctl::ServerEvent event;
        const auto result = events.next(ctl::deadlineIn(hours(24)), event, tick);
        if (result != ctl::EventStream::Result::Event) {
            throw ctl::Failure(ctl::kNoHost, "the host went away");
        }
        batch.add(event);
        if (events.hasNext() && !batch.isFull()) continue;
        while (!batch.isEmpty()) {
            OutputNews news = batch.take();
            isOver = news.isOver;
            if (!awaitTurn(stream.id, textOfNews(news).size() + kAroundPiece)) throw StreamEnd{};
            stream.publish(std::move(news), host_, signing_, publish_);
        }
    }
}

}  // namespace fleet
