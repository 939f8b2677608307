/// Answers questions by asking the host.
#pragma once

#include <atomic>
#include <functional>
#include <string>

#include "fleet/bus/messages/values.h"
#include "fleet/link/questions/question_judge.h"
#include "fleet/loop/worker.h"

namespace fleet {

/// Has a thread of its own, because a host takes its time for a configuration: orders do not wait
/// for that. One question after the other.
class QuestionSide {
public:
    /// That wait; those beyond are told so.
    static constexpr int kMostWaiting = 8;

    explicit QuestionSide(std::string socket) : socket_(std::move(socket)) {}
    /// Ends what is under way within seconds; no answer comes any more once it is over.
    ~QuestionSide();
    QuestionSide(const QuestionSide&) = delete;
    QuestionSide& operator=(const QuestionSide&) = delete;

    /// The answer, a JSON text, comes on the object's thread or at once: {"answer": ...} or
    /// {"error": "..."}. It must return soon and throw nothing. A question whose time is over when
    /// its turn comes gets none. Any thread.
    void answer(const AskedQuestion& question, Moment now,
                std::function<void(const std::string& text)> take);

private:
    std::string answerNow(const AskedQuestion& question, Moment within) const;

    const std::string socket_;
    std::atomic<bool> isEnding_{false};
    std::atomic<int> waiting_{0};
    Worker worker_;  ///< last: it uses everything above
};

}  // namespace fleet
