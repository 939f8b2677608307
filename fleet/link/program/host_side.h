/// A link's connection to the host on its machine.
#pragma once

#include <atomic>
#include <functional>
#include <set>
#include <string>
#include <thread>
#include <vector>

#include "fleet/link/program/host_answers.h"
#include "fleet/loop/worker.h"

namespace fleet {

/// Asks the host over its Unix socket, one request after the other, and follows the ends of its
/// tasks. Answers and events come on threads of its own; they may be called for from any thread.
class HostSide {
public:
    /// Each must return soon and throw nothing.
    struct Events {
        /// A host answers: its journal, and the fleet's orders that are not over.
        std::function<void(const std::string& journal, std::set<std::string> unfinished)> isThere;
        std::function<void()> isAway;
        std::function<void(Outcome)> ended;
        /// Something was told about a task, the fleet's or not.
        std::function<void()> tasksChanged;
    };

    HostSide(std::string socket, Events events);
    /// Ends what is under way within seconds; no event or answer comes any more once it is over.
    ~HostSide();
    HostSide(const HostSide&) = delete;
    HostSide& operator=(const HostSide&) = delete;

    void handOver(const HandOver& action, std::function<void(HandOverAnswer)> answer);
    void enter(const EnterEnd& action, std::function<void(HandOverAnswer)> answer);
    void cancel(const std::string& order, const std::string& journal,
                std::function<void(CancelAnswer)> answer);
    void lookUp(const std::string& order, const std::string& journal,
                std::function<void(LookUpAnswer)> answer);
    /// The fleet's orders in this journal, newest first, as many as a hello can tell; nothing if
    /// the host does not answer.
    void listOrders(const std::string& journal,
                    std::function<void(std::optional<std::vector<std::string>>)> answer);
    /// Looks at the journal and at what is unfinished once more, and tells isThere.
    void lookAgain();

private:
    struct View {
        std::string journal;
        std::set<std::string> unfinished;
    };

    HostAnswer request(bool isPost, const std::string& target, const std::string& body) const;
    HandOverAnswer post(const std::string& order, const std::string& journal,
                        const std::string& body) const;
    std::string journalNow() const;
    /// Calls `each` for the tasks of a state, or of all if it is "", until it returns false.
    void eachTask(const std::string& state, const std::string& journal,
                  const std::function<bool(const std::string& transid)>& each) const;
    View view() const;
    void follow();
    void followOnce(std::string& journal, std::string& position);

    const std::string socket_;
    const Events events_;
    std::atomic<bool> isEnding_{false};
    Worker worker_;
    std::thread follower_;  ///< last: it uses everything above
};

}  // namespace fleet
