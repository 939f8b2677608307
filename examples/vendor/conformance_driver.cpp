// The conformance kit's way to this vendor's platform. There is no RPC transport, so there is no
// call() here either, and the kit says so.

#include <poll.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <atomic>
#include <condition_variable>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <mutex>
#include <stdexcept>
#include <thread>
#include <utility>

#include "conformance/driver.h"
#include "own_platform/tables.h"
#include "own_platform/trace.h"

namespace {

using namespace conformance;

vendor::Conditions conditions(const Conditions& where) {
    vendor::Conditions all;
    for (const Condition& condition : where)
        all.push_back({condition.column, condition.op, condition.value});
    return all;
}

class Live final : public Subscription {
public:
    explicit Live(std::unique_ptr<vendor::Subscription> live) : live_(std::move(live)) {}

private:
    const std::unique_ptr<vendor::Subscription> live_;
};

/// Stands in for the log daemon: receives its datagrams on a thread, because who traces waits until
/// there is room for them.
class LogCapture final : public TraceCapture {
public:
    explicit LogCapture(bool everything) {
        path_ = (std::filesystem::temp_directory_path() / "vendor-log.XXXXXX").string();
        if (::mkdtemp(path_.data()) == nullptr) throw std::runtime_error("no scratch directory");
        address_.sun_family = AF_UNIX;
        const std::string name = path_ + "/log";
        if (name.size() >= sizeof address_.sun_path) throw std::runtime_error("path too long");
        std::memcpy(address_.sun_path, name.c_str(), name.size() + 1);
        socket_ = ::socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC, 0);
        if (::bind(socket_, reinterpret_cast<const sockaddr*>(&address_), sizeof address_) == -1) {
            throw std::runtime_error("the log socket cannot be bound");
        }
        receiver_ = std::thread([this] { receive(); });
        vendor::setTrace(name, everything);
    }
    ~LogCapture() override {
        vendor::setTrace("/dev/log", false);
        flush();
        isOver_ = true;
        send("");
        receiver_.join();
        ::close(socket_);
        std::error_code ignored;
        std::filesystem::remove_all(path_, ignored);
    }
    std::vector<std::string> lines() override {
        flush();
        const std::lock_guard<std::mutex> guard(lock_);
        return lines_;
    }

private:
    void send(const std::string& text) {
        const int sender = ::socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC, 0);
        ::sendto(sender, text.data(), text.size(), 0, reinterpret_cast<const sockaddr*>(&address_),
                 sizeof address_);
        ::close(sender);
    }
    /// Waits until everything that was sent before has been received.
    void flush() {
        std::unique_lock<std::mutex> guard(lock_);
        const unsigned mine = ++flushes_;
        guard.unlock();
        send("");
        guard.lock();
        changed_.wait(guard, [&] { return flushed_ >= mine; });
    }
    void receive() {
        while (!isOver_) {
            char text[8192];
            const ssize_t count = ::recv(socket_, text, sizeof text, 0);
            const std::lock_guard<std::mutex> guard(lock_);
            if (count > 0) lines_.emplace_back(text, static_cast<std::size_t>(count));
            if (count == 0) ++flushed_;
            changed_.notify_all();
        }
    }

    std::string path_;
    sockaddr_un address_{};
    int socket_ = -1;
    std::thread receiver_;
    std::atomic<bool> isOver_{false};
    std::mutex lock_;  ///< guards what follows
    std::condition_variable changed_;
    std::vector<std::string> lines_;
    unsigned flushes_ = 0;
    unsigned flushed_ = 0;
};

class VendorDriver final : public Driver {
public:
    Answer query(const std::string& table, const Conditions& where) override {
        Answer answer;
        answer.status = vendor::query(table, conditions(where), answer.rows);
        return answer;
    }
    std::unique_ptr<Subscription> subscribe(const std::string& table, const Conditions& where,
                                            Sink sink) override {
        auto live = vendor::subscribe(table, conditions(where), std::move(sink));
        return live ? std::make_unique<Live>(std::move(live)) : nullptr;
    }
    std::unique_ptr<TraceCapture> captureTrace(Selection selection) override {
        return std::make_unique<LogCapture>(selection == Selection::Everything);
    }
};

}  // namespace

std::unique_ptr<Driver> conformance::makeDriver() {
    return std::make_unique<VendorDriver>();
}
