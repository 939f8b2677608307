/// Questions on their way to hosts, and answers on their way back.
#pragma once

#include <cstddef>
#include <deque>
#include <functional>
#include <map>
#include <mutex>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "fleet/bus/messages/values.h"

namespace fleet {

/// A round is what one operator asks some hosts at the same time. Answers are sealed for who asked;
/// they are in memory until that one fetches them, or the round ends, and nowhere else. What has no
/// room is dropped, and seen as lost by its place. Any thread.
class QuestionDesk {
public:
    static constexpr std::size_t kMostOfOperator = 8;  ///< rounds; an older one ends
    static constexpr std::size_t kMostRounds = 64;
    static constexpr std::size_t kMostHosts = 500;  ///< of a round
    static constexpr std::size_t kMostBytesOfRound = std::size_t{16} << 20;
    static constexpr std::size_t kMostBytes = std::size_t{64} << 20;
    static constexpr Moment kRoundTime{90 * 1000};

    struct Asked {
        std::string host;      ///< its bus key
        std::string question;  ///< the identifier
        std::string bytes;     ///< as its operator has signed it
    };
    struct Answer {
        std::string host;
        std::string bytes;  ///< signed by the host, which nobody has looked at
    };
    using Publish = std::function<void(const std::string& host, const std::string& bytes)>;

    /// From now on questions go out by this, until close() returns.
    void open(Publish publish);
    void close();

    /// The identifier of the round; nothing if there are too many, or the desk is closed.
    std::optional<std::string> ask(const std::string& operatorKey, const std::vector<Asked>& asked,
                                   Moment now);
    /// Asks further questions in a round, which lasts longer by that: its older questions may still
    /// be answered for kRoundTime. False if the operator has no such round, or with these it would
    /// have more than kMostHosts of them.
    bool askAgain(const std::string& operatorKey, const std::string& round,
                  const std::vector<Asked>& asked, Moment now);
    /// A host has answered. It counts only if it was asked that.
    void hear(const std::string& host, const std::string& bytes, Moment now);
    /// What has come since the last call, as much as fits into one reply; nothing if the operator
    /// has no such round.
    std::optional<std::vector<Answer>> fetch(const std::string& operatorKey,
                                             const std::string& round, Moment now);

private:
    using Place = std::pair<std::string, std::string>;  ///< a host and a question
    struct Round {
        std::string operatorKey;
        Moment until{};
        std::map<Place, Moment> asked;  ///< until when an answer counts
        std::deque<Answer> answers;
        std::size_t bytes = 0;
    };
    using Rounds = std::map<std::string, Round>;
    void publish(Rounds::iterator round, const std::vector<Asked>& asked, Moment now);
    void forgetOldQuestions(Round& round, Moment now);
    void endRound(Rounds::iterator round);
    void endOver(Moment now);
    void makeRoomFor(const std::string& operatorKey);

    std::mutex mutex_;
    Publish publish_;
    Rounds rounds_;
    std::map<Place, std::string> roundOf_;
    std::size_t bytes_ = 0;
};

}  // namespace fleet
