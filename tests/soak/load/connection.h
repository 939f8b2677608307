/// A non-blocking connection to a Unix socket with what is to be sent and what has come.
#pragma once

#include <cstddef>
#include <string>

namespace soak {

class Connection {
public:
    enum class Opening { Done, Later, Refused };

    Connection() = default;
    ~Connection() { close(); }
    Connection(const Connection&) = delete;
    Connection& operator=(const Connection&) = delete;

    /// Later: as many wait to be accepted as may wait.
    Opening open(const std::string& path);
    void close();
    bool isOpen() const { return descriptor_ >= 0; }
    int descriptor() const { return descriptor_; }

    void send(std::string bytes) { out_ += std::move(bytes); }
    bool hasUnsent() const { return sent_ < out_.size(); }
    /// Bytes that have been handed to the system so far.
    std::size_t sentBytes() const { return total_; }
    /// Sends at most `most` bytes of what waits, as far as it goes; false when the other side takes
    /// no more.
    bool flush(std::size_t most = static_cast<std::size_t>(-1));
    /// Ends the sending side.
    void endSending() const;

    /// Reads what is there, at most `most` bytes; false when the other side has ended.
    bool fill(std::size_t most = kAtOnce);
    /// What has been read and not been taken yet.
    std::string& in() { return in_; }

private:
    static constexpr std::size_t kAtOnce = std::size_t{1} << 20;

    int descriptor_ = -1;
    std::string out_;
    std::size_t sent_ = 0;
    std::size_t total_ = 0;
    std::string in_;
};

}  // namespace soak
