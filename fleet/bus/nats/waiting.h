/// Requests that wait for their answers.
#pragma once

#include <chrono>
#include <condition_variable>
#include <cstdint>
#include <map>
#include <memory>
#include <mutex>
#include <optional>
#include <string>

#include "fleet/bus/nats/status.h"

namespace fleet {

/// Who waits for which answer. All operations may be called from any thread.
class Waiting {
public:
    using Deadline = std::chrono::steady_clock::time_point;

    /// A new request on that subject; its number is the last token of the subject for the answer.
    std::uint64_t begin(const std::string& subject);
    /// Waits for its answer, or for why there is none. Ends it.
    BusStatus await(std::uint64_t number, Deadline deadline, BusMessage& answer);
    /// Forgets it: it was never sent.
    void drop(std::uint64_t number);

    /// An answer has come; one of no request is ignored. Only who waits for this one is woken.
    void answer(std::uint64_t number, BusMessage message);
    /// Ends those on that subject.
    void fail(const std::string& subject, const BusStatus& status);
    /// Ends all of them.
    void failAll(const BusStatus& status);
    /// Ends all of them, and each that begins later: no answer comes until answersComeAgain().
    void answersDoNotCome(const BusStatus& status);
    void answersComeAgain();

private:
    struct Request {
        std::string subject;
        std::optional<BusMessage> answer;
        std::optional<BusStatus> failure;
        bool isAwaited = false;
    };

    std::mutex mutex_;
    std::condition_variable changed_;
    std::uint64_t next_ = 0;
    std::map<std::uint64_t, Request> requests_;
    std::optional<BusStatus> noAnswers_;  ///< why none comes to any request
};

}  // namespace fleet
