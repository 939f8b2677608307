#include "ctl/console/host/host_streams.h"

#include <array>
#include <boost/asio/executor_work_guard.hpp>
#include <boost/asio/io_context.hpp>
#include <boost/asio/local/stream_protocol.hpp>
#include <boost/asio/post.hpp>
#include <boost/asio/steady_timer.hpp>
#include <boost/beast/http/read.hpp>
#include <chrono>
#include <exception>
#include <functional>
#include <stdexcept>
#include <string_view>
#include <system_error>
#include <thread>
#include <utility>

#include "embedded/mutex.h"

namespace console {
namespace {

namespace net = boost::asio;
namespace wire = boost::beast::http;
using Error = boost::system::error_code;

constexpr std::size_t kPieceBytes = std::size_t{16} * 1024;
/// Of whole events that wait for the browser.
constexpr std::size_t kMostWaiting = std::size_t{256} * 1024;
/// An event that is larger ends its stream.
constexpr std::size_t kLargestEvent = std::size_t{8} * 1024 * 1024;
constexpr std::chrono::hours kLongestStream{1};
constexpr std::string_view kEventEnd = "\n\n";

/// Read on the carrying thread, taken from on any other.
class HostStream final : public std::enable_shared_from_this<HostStream> {
public:
    HostStream(net::io_context& io, BegunStream stream)
        : io_(io),
          socket_(io, net::local::stream_protocol(), stream.connection.release()),
          end_(io),
          buffer_(std::move(stream.buffer)),
          parser_(std::move(stream.parser)) {}

    void start(const std::function<void()>& wake) {
        {
            const embedded::MutexLock lock(lock_);
            wake_ = wake;
        }
        wake();
        net::post(io_, [self = shared_from_this()] {
            self->read();
            self->endInTime();
        });
    }

    std::string take() {
        const embedded::MutexLock lock(lock_);
        std::string taken = held_.substr(0, whole_);
        held_.erase(0, whole_);
        whole_ = 0;
        if (std::exchange(isPaused_, false)) {
            net::post(io_, [self = shared_from_this()] { self->read(); });
        }
        return taken;
    }

    bool empty() const {
        const embedded::MutexLock lock(lock_);
        return whole_ == 0;
    }
    bool over() const {
        const embedded::MutexLock lock(lock_);
        return isOver_ && whole_ == 0;
    }
    void close() {
        net::post(io_, [self = shared_from_this()] {
            Error ignored;
            self->socket_.close(ignored);
            self->end_.cancel();
        });
    }

private:
    void read() {
        if (!socket_.is_open()) return;
        parser_->get().body().data = piece_.data();
        parser_->get().body().size = piece_.size();
        parser_->get().body().more = true;
        wire::async_read_some(
            socket_, buffer_, *parser_,
            [self = shared_from_this()](Error error, std::size_t) { self->onRead(error); });
    }

    /// The page asks anew then, and its session is looked at again.
    void endInTime() {
        end_.expires_after(kLongestStream);
        end_.async_wait([self = shared_from_this()](Error error) {
            if (error) return;
            Error ignored;
            self->socket_.close(ignored);
            std::function<void()> wake;
            {
                const embedded::MutexLock lock(self->lock_);
                self->isOver_ = true;
                wake = self->wake_;
            }
            wake();
        });
    }

    void onRead(Error error) {
        if (error == wire::error::need_buffer) error = {};
        const std::size_t length = piece_.size() - parser_->get().body().size;
        bool goesOn = false;
        std::function<void()> wake;
        {
            const embedded::MutexLock lock(lock_);
            keep({piece_.data(), length});
            isOver_ = error || parser_->is_done() || held_.size() - whole_ > kLargestEvent;
            isPaused_ = !isOver_ && whole_ > kMostWaiting;
            goesOn = !isOver_ && !isPaused_;
            wake = wake_;
        }
        wake();
        if (goesOn) read();
    }

    /// What comes between two of a client's events must not come between the parts of one.
    void keep(std::string_view text) ZAV_REQUIRES(lock_) {
        // An end may have begun in what came before.
        const std::size_t from = held_.size() > whole_ ? held_.size() - 1 : held_.size();
        held_ += text;
        const std::size_t end = std::string_view(held_).substr(from).rfind(kEventEnd);
        if (end != std::string_view::npos) whole_ = from + end + kEventEnd.size();
    }

    net::io_context& io_;
    net::local::stream_protocol::socket socket_;
    net::steady_timer end_;
    boost::beast::flat_buffer buffer_;
    const std::unique_ptr<BegunStream::Parser> parser_;
    std::array<char, kPieceBytes> piece_{};

    mutable embedded::Mutex lock_;
    std::function<void()> wake_ ZAV_GUARDED_BY(lock_);
    std::string held_ ZAV_GUARDED_BY(lock_);
    std::size_t whole_ ZAV_GUARDED_BY(lock_) = 0;  ///< bytes of held_ that are whole events
    bool isPaused_ ZAV_GUARDED_BY(lock_) = false;  ///< nobody reads until something is taken
    bool isOver_ ZAV_GUARDED_BY(lock_) = false;
};

class CarriedStream final : public http::EventSource {
public:
    CarriedStream(std::shared_ptr<HostStream> stream, std::string position)
        : stream_(std::move(stream)), position_(std::move(position)) {}
    ~CarriedStream() override { stream_->close(); }
    CarriedStream(const CarriedStream&) = delete;
    CarriedStream& operator=(const CarriedStream&) = delete;

    void start(std::function<void()> wake) override { stream_->start(wake); }
    std::string take() override { return stream_->take(); }
    bool empty() const override { return stream_->empty(); }
    bool over() const override { return stream_->over(); }
    std::string position() const override { return position_; }

private:
    const std::shared_ptr<HostStream> stream_;
    const std::string position_;
};

}  // namespace

struct HostStreams::Implementation {
    Implementation() : goesOn(io.get_executor()), thread([this] { run(); }) {}
    ~Implementation() {
        io.stop();
        thread.join();
    }
    Implementation(const Implementation&) = delete;
    Implementation& operator=(const Implementation&) = delete;

    void run() {
        while (!io.stopped()) {
            try {
                io.run();
            } catch (const std::exception&) {
                // Memory ran out. What was being done for one stream stops.
            }
        }
    }

    net::io_context io{1};
    const net::executor_work_guard<net::io_context::executor_type> goesOn;
    std::thread thread;
};

HostStreams::HostStreams() try : implementation_(std::make_unique<Implementation>()) {
} catch (const std::system_error& error) {
    throw std::runtime_error(std::string("cannot start a thread: ") + error.what());
}

HostStreams::~HostStreams() = default;

std::unique_ptr<http::EventSource> HostStreams::carry(BegunStream stream) {
    std::string position = std::move(stream.position);
    return std::make_unique<CarriedStream>(
        std::make_shared<HostStream>(implementation_->io, std::move(stream)), std::move(position));
}

}  // namespace console
