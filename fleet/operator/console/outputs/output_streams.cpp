#include "fleet/operator/console/outputs/output_streams.h"

#include <chrono>
#include <exception>
#include <memory>
#include <optional>
#include <string>
#include <utility>

#include "ctl/client/failure.h"
#include "ctl/console/refusals.h"
#include "fleet/operator/console/browser_feed.h"
#include "fleet/operator/console/outputs/output_centre.h"
#include "fleet/operator/console/outputs/output_events.h"
#include "fleet/operator/questions/followed_output.h"
#include "fleet/operator/verbs/looks/fleet_task_output.h"
#include "http/responder.h"

namespace fleet {
namespace {

/// A silent host is found to be one before that, and the page waits for longer.
constexpr std::chrono::seconds kLongestBegin = kOutputGoodFor + std::chrono::seconds{6};

constexpr std::size_t kMostReaders = 64;

/// Nobody wants more.
struct StreamEnd {};

http::Reply tooMany() {
    return http::errorReply(429, "the output of as many tasks as can be is shown already");
}

}  // namespace

/// One stream: the thread that follows the output, and who waits for its beginning. Any thread.
class OutputStreams::Run : public std::enable_shared_from_this<OutputStreams::Run> {
public:
    Run(const OperatorIdentity& identity, CentreSession& session,
        std::chrono::milliseconds answerTime, OutputRequest request, KeyPair reader)
        : identity_(identity),
          session_(session),
          answerTime_(answerTime),
          request_(std::move(request)),
          reader_(std::move(reader)),
          client_(centreClient(identity)) {}

    /// Until the output is over, or nobody wants it, on the stream's thread.
    void follow() {
        try {
            pass();
            feed_->keep(outputEnd());
        } catch (const StreamEnd&) {
        } catch (const ctl::Failure& failure) {
            fail(failure);
        } catch (const std::exception& error) {
            fail(ctl::Failure(ctl::kNoHost, error.what()));
        }
        feed_->end();
        // Who has not begun to get it goes without: they have gone themselves.
        if (!hasBegun_) answer(http::errorReply(503, "the output is not wanted any more"));
        disconnect();
    }

    /// Ends it soon.
    void stop() {
        {
            const std::lock_guard lock(mutex_);
            if (client_) client_->cancel();
        }
        feed_->cancel();
    }
    const std::string& host() const { return request_.host; }
    const KeyPair& reader() const { return reader_; }

    void answerTo(const http::Responder& responder) {
        std::optional<http::Answer> answer;
        {
            const std::lock_guard lock(mutex_);
            responder_ = responder;
            answer = std::exchange(answer_, std::nullopt);
        }
        if (answer) responder(std::move(*answer));
    }

private:
    void pass() {
        OutputCentre centre(session_, *client_, answerTime_);
        WantedOutput wanted = taskOnHost(centre, request_.host, request_.task);
        wanted.isFollowed = true;
        wanted.after = request_.after;
        wanted.reader = reader_;
        followOutput(centre, identity_, wanted, pace(), listener());
    }

    OutputPace pace() {
        using Clock = OutputPace::Clock;
        const auto pause = [this](std::chrono::milliseconds time) {
            if (!feed_->pause(time)) throw StreamEnd{};
        };
        return {Clock::time_point::max(), [] { return Clock::now(); }, pause};
    }

    OutputListener listener() {
        OutputListener listener;
        listener.take = [this](const OutputText& text) {
            events_.add(text);
            return true;
        };
        listener.lost = [this](Number bytes) { events_.addLost(bytes); };
        listener.gap = [this] { events_.addGap(); };
        listener.reached = [this](const std::string& position) { reach(position); };
        return listener;
    }

    /// The host may be a bad one, and say what is no position.
    void reach(const std::string& told) {
        const std::string position = isOutputPosition(told) ? told : "";
        const std::string events = events_.upTo(position);
        // Who has got the head has not got the events that come with it.
        if (!hasBegun_) begin(events.empty() ? position : request_.after);
        if (!events.empty() && !feed_->keep(events)) throw StreamEnd{};
    }

    void begin(const std::string& position) {
        hasBegun_ = true;
        // The answer may be kept here, and must not keep this alive.
        answer(sourceOf(feed_, position, stopperOf(shared_from_this())));
    }

    void fail(const ctl::Failure& failure) {
        if (hasBegun_) {
            feed_->keep(outputBreak(failure));
            return;
        }
        hasBegun_ = true;
        answer(console::replyTo(failure));
    }

    /// This may be kept for long after its end, the connection is not.
    void disconnect() {
        const std::lock_guard lock(mutex_);
        client_.reset();
    }

    void answer(http::Answer answer) {
        std::optional<http::Responder> responder;
        {
            const std::lock_guard lock(mutex_);
            responder = responder_;
            if (!responder) answer_ = std::move(answer);
        }
        if (responder) (*responder)(std::move(answer));
    }

    const OperatorIdentity& identity_;
    CentreSession& session_;
    const std::chrono::milliseconds answerTime_;
    const OutputRequest request_;
    const KeyPair reader_;
    const std::shared_ptr<BrowserFeed> feed_ = std::make_shared<BrowserFeed>();
    OutputEvents events_;    ///< of the stream's thread
    bool hasBegun_ = false;  ///< likewise: it has answered

    std::mutex mutex_;
    std::unique_ptr<HttpsClient> client_;  ///< until the end; changed with the lock
    std::optional<http::Responder> responder_;
    std::optional<http::Answer> answer_;  ///< until somebody waits for it
};

OutputStreams::OutputStreams(const OperatorIdentity& identity, CentreSession& session,
                             std::chrono::milliseconds answerTime)
    : identity_(identity), session_(session), answerTime_(answerTime) {}

OutputStreams::~OutputStreams() = default;

http::Answer OutputStreams::begin(OutputRequest request) {
    const std::lock_guard lock(mutex_);
    removeEnded();
    if (runs_.size() >= kMost) return tooMany();
    KeyPair reader = readerFor(request.host);
    const auto run = std::make_shared<Run>(identity_, session_, answerTime_, std::move(request),
                                           std::move(reader));
    runs_.start(run, [](Run& started) { started.follow(); });
    const auto stop = stopperOf(run);
    const auto giveUp = [stop]() -> http::Answer {
        stop();
        return http::errorReply(504, "the host has not begun to show the output");
    };
    return http::Later{[run](const http::Responder& responder) { run->answerTo(responder); },
                       kLongestBegin, giveUp, stop};
}

void OutputStreams::stopAll() {
    const std::lock_guard lock(mutex_);
    runs_.stopAll();
}

void OutputStreams::removeEnded() {
    for (const std::shared_ptr<Run>& ended : runs_.removeEnded()) {
        if (readers_.size() >= kMostReaders) readers_.clear();
        readers_.emplace(ended->host(), ended->reader());
    }
}

KeyPair OutputStreams::readerFor(const std::string& host) {
    const auto left = readers_.find(host);
    if (left == readers_.end()) return KeyPair::make(KeyKind::User);
    KeyPair reader = left->second;
    readers_.erase(left);
    return reader;
}

}  // namespace fleet
