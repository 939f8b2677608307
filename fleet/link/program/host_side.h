/// The host of a link, as its program uses it.
#pragma once

#include <functional>
#include <optional>
#include <set>
#include <string>
#include <vector>

#include "fleet/link/core/actions.h"
#include "fleet/link/core/answers.h"
#include "fleet/link/facts/facts_teller.h"

namespace fleet {

/// Carries out what a link wants of its host. Answers and events may come on any thread, also
/// before a function returns. Each function may be called from any thread, and returns soon.
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

    /// Ends what is under way within seconds; no event or answer comes any more once it is over.
    virtual ~HostSide() = default;

    virtual void handOver(const HandOver& action, std::function<void(HandOverAnswer)> answer) = 0;
    virtual void enter(const EnterEnd& action, std::function<void(HandOverAnswer)> answer) = 0;
    virtual void cancel(const std::string& order, const std::string& journal,
                        std::function<void(CancelAnswer)> answer) = 0;
    virtual void lookUp(const std::string& order, const std::string& journal,
                        std::function<void(LookUpAnswer)> answer) = 0;
    /// The fleet's orders in this journal, newest first, as many as a hello can tell; nothing if
    /// the host does not answer.
    virtual void listOrders(
        const std::string& journal,
        std::function<void(std::optional<std::vector<std::string>>)> answer) = 0;
    /// Looks at the journal and at what is unfinished once more, and tells isThere.
    virtual void lookAgain() = 0;
    /// What the host is and what is installed there; nothing if it does not answer.
    virtual void look(std::function<void(std::optional<HostLook>)> answer) = 0;
};

}  // namespace fleet
