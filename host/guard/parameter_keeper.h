/// The guard of the universal agent's start-up parameters: a copy of them is there for as long as a
/// task may rewrite them.
#pragma once

#include <memory>
#include <string>

#include "embedded/mutex.h"
#include "host/guard/command_request.h"
#include "host/home/parameter_copy.h"
#include "host/outcomes/outcome_feed.h"
#include "host/outcomes/task_list.h"

namespace host {

/// Any thread may call.
class ParameterKeeper {
public:
    /// `feed` and `tasks` outlive this object. `tasks` subscribed to the feed before.
    ParameterKeeper(const std::string& home, OutcomeFeed& feed, const TaskList& tasks);
    ParameterKeeper(const ParameterKeeper&) = delete;
    ParameterKeeper& operator=(const ParameterKeeper&) = delete;

    /// A request that may rewrite them, while it is being handed to the plug-in.
    class Hold {
    public:
        explicit Hold(ParameterKeeper& keeper) : keeper_(keeper) {}
        ~Hold() { keeper_.letGo(); }
        Hold(const Hold&) = delete;
        Hold& operator=(const Hold&) = delete;

    private:
        ParameterKeeper& keeper_;
    };

    /// Makes sure that there is a copy before the plug-in gets the request. The hold ends once the
    /// request has been answered. Null for a request that does not rewrite them. Throws Refusal
    /// when no copy can be made.
    std::unique_ptr<Hold> hold(const CommandRequest& request);

private:
    void letGo();
    void onOutcome();
    bool isNeeded() const ZAV_REQUIRES(lock_);
    void drop() ZAV_REQUIRES(lock_);

    const ParameterCopy copy_;
    const TaskList& tasks_;

    embedded::Mutex lock_;
    int held_ ZAV_GUARDED_BY(lock_) = 0;
    bool saved_ ZAV_GUARDED_BY(lock_) = false;

    std::unique_ptr<OutcomeFeed::Subscription> outcomes_;  ///< last, so that it ends first
};

}  // namespace host
