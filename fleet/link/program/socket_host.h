/// A link's connection to the host on its machine.
#pragma once

#include <atomic>
#include <functional>
#include <optional>
#include <set>
#include <string>
#include <thread>
#include <vector>

#include "fleet/link/facts/inventory_side.h"
#include "fleet/link/program/host_answers.h"
#include "fleet/link/program/host_side.h"
#include "fleet/loop/worker.h"

namespace fleet {

/// Asks the host over its Unix socket, one request after the other, and follows the ends of its
/// tasks. Answers and events come on threads of its own.
class SocketHost : public HostSide {
public:
    SocketHost(std::string socket, Events events);
    ~SocketHost() override;
    SocketHost(const SocketHost&) = delete;
    SocketHost& operator=(const SocketHost&) = delete;

    void handOver(const HandOver& action, std::function<void(HandOverAnswer)> answer) override;
    void enter(const EnterEnd& action, std::function<void(HandOverAnswer)> answer) override;
    void cancel(const std::string& order, const std::string& journal,
                std::function<void(CancelAnswer)> answer) override;
    void lookUp(const std::string& order, const std::string& journal,
                std::function<void(LookUpAnswer)> answer) override;
    void listOrders(const std::string& journal,
                    std::function<void(std::optional<std::vector<std::string>>)> answer) override;
    void lookAgain() override;
    void look(std::function<void(std::optional<HostLook>)> answer) override;

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
    InventorySide inventory_;
    Worker worker_;
    std::thread follower_;  ///< last: it uses everything above
};

}  // namespace fleet
