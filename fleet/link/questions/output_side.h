/// Shows operators what a task's commands write, while they write it.
#pragma once

#include <chrono>
#include <condition_variable>
#include <functional>
#include <memory>
#include <mutex>
#include <string>
#include <vector>

#include "fleet/bus/accounts/nkey.h"
#include "fleet/bus/messages/output_news.h"
#include "fleet/link/questions/output_leases.h"
#include "fleet/link/questions/output_rate.h"
#include "fleet/link/questions/question_judge.h"

namespace fleet {

/// Reads the host's streams, each on a thread of its own, and passes them on in pieces that are
/// sealed for who asked. What comes faster than may be shown waits at the host, which drops what it
/// has no room for and tells how much that was. Any thread.
class OutputSide {
public:
    /// Publishes a piece of an answer. It must return soon and throw nothing. Any thread.
    using Publish = std::function<void(std::string piece)>;

    /// `host` is the host's bus key, `signing` the key of its link, `socket` where zavhost listens.
    OutputSide(std::string host, const KeyPair& signing, std::string socket, Publish publish);
    /// Ends all streams within seconds; nothing is published any more once it is over.
    ~OutputSide();
    OutputSide(const OutputSide&) = delete;
    OutputSide& operator=(const OutputSide&) = delete;

    /// A question of the kind kAsksOutput: begins a stream, or lets one go on. Returns soon.
    void ask(const AskedQuestion& question);

private:
    class Stream;
    using Streams = std::vector<std::unique_ptr<Stream>>;

    void begin(const AskedQuestion& question, const std::string& task, bool isFollowed,
               const std::string& after);
    bool letGoOn(const AskedQuestion& question, const std::string& stream, const std::string& task);
    void refuse(const AskedQuestion& question, const std::string& why, int status);
    void endThoseFor(const std::string& reader);
    void forgetEnded();

    // For the streams' threads.
    Moment now() const;
    bool isWanted(const std::string& stream) const;
    /// Waits until so many bytes may go. False if the stream is not wanted any more.
    bool awaitTurn(const std::string& stream, std::size_t bytes);
    OutputNews endOf(Stream& stream);
    void show(Stream& stream);
    void passOn(Stream& stream);

    const std::string host_;
    const KeyPair signing_;
    const std::string socket_;
    const Publish publish_;

    mutable std::mutex mutex_;  ///< for all below
    std::condition_variable changed_;
    bool isEnding_ = false;
    OutputLeases leases_;
    OutputRate rate_;
    Streams streams_;
};

}  // namespace fleet
