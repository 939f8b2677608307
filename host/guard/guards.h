/// All guards of requests for commands.
#pragma once

#include <string>
#include <vector>

#include "host/guard/guard.h"
#include "host/guard/last_look.h"
#include "host/outcomes/task_list.h"

namespace host {

/// Asks the guards. Any thread. What they do may run programs of the home; no lock is held
/// meanwhile.
class Guards {
public:
    /// `tasks` and what the site refers to outlive this object.
    Guards(Site site, const TaskList& tasks) : site_(std::move(site)), tasks_(tasks) {}

    /// Every guard looks at a request that is about to be handed to the plug-in. Those that look at
    /// the machine are left out while a task of the same product is unfinished, because what they
    /// would see is not what the request will find, and when admitEarly() has just looked for it.
    /// Throws Refusal; otherwise the request is as it should be handed on.
    void admit(CommandRequest& request);

    /// The same when the request comes and is to wait for its turn, where admit() is asked again.
    /// `mayChange`: what waits elsewhere will change what they would see, too.
    void admitEarly(CommandRequest& request, bool mayChange);

    /// The refusal of a column that the request table does not have.
    [[noreturn]] static void refuseUnknownColumn(const oxa::Table& table, const std::string& name);

private:
    enum class Machines { LookedAt, LeftOut };
    void ask(CommandRequest& request, Machines machines) const;

    const Site site_;
    const TaskList& tasks_;
    LastLook lastLook_;
};

/// The names of all guards that can refuse what a client asks for, wherever in the host they stand.
std::vector<std::string> refusingGuards();

/// The table of guards, in the order in which they are asked.
const std::vector<Guard>& guards();

}  // namespace host
