#include "fleet/operator/console/browser_feed.h"

#include <utility>

namespace fleet {
namespace {

/// Of whole events that wait for the browser.
constexpr std::size_t kMostWaiting = std::size_t{256} * 1024;
/// An event that is larger ends its stream.
constexpr std::size_t kLargestEvent = std::size_t{8} * 1024 * 1024;
/// The page asks anew then, and its session is looked at again.
constexpr std::chrono::hours kLongestStream{1};
constexpr std::string_view kEventEnd = "\n\n";

class FeedSource final : public http::EventSource {
public:
    FeedSource(std::shared_ptr<BrowserFeed> feed, std::string position,
               std::function<void()> onGone)
        : feed_(std::move(feed)), position_(std::move(position)), onGone_(std::move(onGone)) {}
    ~FeedSource() override { onGone_(); }
    FeedSource(const FeedSource&) = delete;
    FeedSource& operator=(const FeedSource&) = delete;

    void start(std::function<void()> wake) override { feed_->start(wake); }
    std::string take() override { return feed_->take(); }
    bool empty() const override { return feed_->empty(); }
    bool over() const override { return feed_->over(); }
    std::string position() const override { return position_; }

private:
    const std::shared_ptr<BrowserFeed> feed_;
    const std::string position_;
    const std::function<void()> onGone_;
};

}  // namespace

bool BrowserFeed::keep(std::string_view piece) {
    std::unique_lock lock(mutex_);
    // An end may have begun in what came before.
    const std::size_t from = held_.size() > whole_ ? held_.size() - 1 : held_.size();
    held_ += piece;
    const std::size_t at = std::string_view(held_).substr(from).rfind(kEventEnd);
    if (at != std::string_view::npos) whole_ = from + at + kEventEnd.size();
    if (held_.size() - whole_ > kLargestEvent) return false;
    wakeReader(lock);
    changed_.wait(lock, [this] { return whole_ <= kMostWaiting || isCancelled_; });
    return isWanted();
}

bool BrowserFeed::pause(std::chrono::milliseconds time) {
    std::unique_lock lock(mutex_);
    changed_.wait_for(lock, time, [this] { return isCancelled_; });
    return isWanted();
}

void BrowserFeed::end() {
    std::unique_lock lock(mutex_);
    isOver_ = true;
    wakeReader(lock);
}

void BrowserFeed::cancel() {
    const std::lock_guard lock(mutex_);
    isCancelled_ = true;
    changed_.notify_all();
}

void BrowserFeed::start(const std::function<void()>& wake) {
    {
        const std::lock_guard lock(mutex_);
        wake_ = wake;
    }
    wake();
}

std::string BrowserFeed::take() {
    const std::lock_guard lock(mutex_);
    std::string taken = held_.substr(0, whole_);
    held_.erase(0, whole_);
    whole_ = 0;
    changed_.notify_all();
    return taken;
}

bool BrowserFeed::empty() const {
    const std::lock_guard lock(mutex_);
    return whole_ == 0;
}

bool BrowserFeed::over() const {
    const std::lock_guard lock(mutex_);
    return isOver_ && whole_ == 0;
}

/// With the lock.
bool BrowserFeed::isWanted() const {
    return !isCancelled_ && Clock::now() - begun_ < kLongestStream;
}

/// Who is woken may take at once.
void BrowserFeed::wakeReader(std::unique_lock<std::mutex>& lock) {
    const std::function<void()> wake = wake_;
    lock.unlock();
    if (wake) wake();
    lock.lock();
}

std::unique_ptr<http::EventSource> sourceOf(std::shared_ptr<BrowserFeed> feed, std::string position,
                                            std::function<void()> onGone) {
    return std::make_unique<FeedSource>(std::move(feed), std::move(position), std::move(onGone));
}

}  // namespace fleet
