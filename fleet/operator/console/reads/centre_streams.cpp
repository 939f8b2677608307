#include "fleet/operator/console/reads/centre_streams.h"

#include <condition_variable>
#include <cstddef>
#include <exception>
#include <optional>
#include <string>
#include <string_view>
#include <utility>

#include "ctl/client/failure.h"
#include "fleet/operator/console/browser_feed.h"

namespace fleet {
namespace {

constexpr std::size_t kMostStreams = 8;

}  // namespace

/// Reads on a thread of its own. Any thread.
class CentreStreams::Reader {
public:
    explicit Reader(std::unique_ptr<HttpsClient> client) : client_(std::move(client)) {}

    /// Until the stream is over.
    void run(const Read& read) {
        try {
            HttpsAnswer answer = read(
                *client_, [this](std::string_view piece) { return feed_->keep(piece); },
                [this](const std::string& position) { begin(position); });
            end(std::move(answer), nullptr);
        } catch (...) {
            end({}, std::current_exception());
        }
    }

    /// Ends it soon.
    void stop() {
        client_->cancel();
        feed_->cancel();
    }

    /// Waits until it has begun: nothing then, and else the answer in its place.
    std::optional<HttpsAnswer> awaitBegin() {
        std::unique_lock lock(mutex_);
        changed_.wait(lock, [this] { return hasBegun_ || isOver_; });
        if (hasBegun_) return std::nullopt;
        if (failure_) std::rethrow_exception(failure_);
        return answer_;
    }

    const std::shared_ptr<BrowserFeed>& feed() const { return feed_; }
    std::string position() const {
        const std::lock_guard lock(mutex_);
        return position_;
    }

private:
    void begin(const std::string& position) {
        const std::lock_guard lock(mutex_);
        hasBegun_ = true;
        position_ = position;
        changed_.notify_all();
    }

    void end(HttpsAnswer answer, std::exception_ptr failure) {
        {
            const std::lock_guard lock(mutex_);
            isOver_ = true;
            answer_ = std::move(answer);
            failure_ = std::move(failure);
            changed_.notify_all();
        }
        feed_->end();
    }

    const std::unique_ptr<HttpsClient> client_;
    const std::shared_ptr<BrowserFeed> feed_ = std::make_shared<BrowserFeed>();

    mutable std::mutex mutex_;
    std::condition_variable changed_;
    std::string position_;
    HttpsAnswer answer_;
    std::exception_ptr failure_;
    bool hasBegun_ = false;
    bool isOver_ = false;
};

CentreStreams::CentreStreams() = default;

CentreStreams::~CentreStreams() = default;

CentreStreams::Opened CentreStreams::open(std::unique_ptr<HttpsClient> client, Read read) {
    const std::shared_ptr<Reader> reader = start(std::move(client), std::move(read));
    std::optional<HttpsAnswer> answer = reader->awaitBegin();
    if (answer) return std::move(*answer);
    return sourceOf(reader->feed(), reader->position(), stopperOf(reader));
}

std::shared_ptr<CentreStreams::Reader> CentreStreams::start(std::unique_ptr<HttpsClient> client,
                                                            Read read) {
    const std::lock_guard lock(mutex_);
    readers_.removeEnded();
    if (readers_.size() >= kMostStreams) {
        throw ctl::Failure(ctl::kHostReportedFailure, "as many streams as can be are open already");
    }
    const auto reader = std::make_shared<Reader>(std::move(client));
    readers_.start(reader, [read = std::move(read)](Reader& started) { started.run(read); });
    return reader;
}

}  // namespace fleet
