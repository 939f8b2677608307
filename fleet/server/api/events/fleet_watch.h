/// Makes events of what changes in the fleet.
#pragma once

#include <atomic>
#include <map>
#include <memory>
#include <string>
#include <vector>

#include "fleet/loop/worker.h"
#include "fleet/server/api/api_services.h"
#include "fleet/server/api/events/watched_hosts.h"
#include "fleet/server/store/change_notes.h"

namespace fleet {

/// A thread that looks some times a second at what the centre's database has noted, in steps so
/// short that the centre's thread is not held up: ten thousand hosts that come back at once are
/// some hundred at a time. What changes often between two looks is told once.
class FleetWatch {
public:
    /// The services outlive it.
    explicit FleetWatch(ApiServices& services);
    ~FleetWatch();
    FleetWatch(const FleetWatch&) = delete;
    FleetWatch& operator=(const FleetWatch&) = delete;

private:
    /// What one step on the centre's thread has found.
    struct Found {
        Changes changes;
        std::map<std::string, HostFace> faces;  ///< without names and labels
    };

    void work();
    void look();
    void endReaders();
    void tell();
    void learnMembers();
    bool learnChanges();
    std::map<std::string, HostFace> facesOf(const std::vector<std::string>& hosts);
    void noteHosts(const Members& members, const std::map<std::string, HostFace>& faces,
                   const std::vector<std::string>& told);
    void noteOrders(const std::vector<ChangedOrder>& orders);
    void showRollouts(Moment now);

    ApiServices& services_;
    std::atomic<bool> isEnding_{false};
    // Of the worker's thread alone, from here on.
    WatchedHosts hosts_;
    bool isBegun_ = false;  ///< the hosts are known; what changes from now on is told
    std::shared_ptr<const Members> members_;  ///< null before they are known
    std::vector<FleetEvent> events_;          ///< that are yet to be told
    Moment lastLook_{};                       ///< for those that have gone away
    std::map<std::string, Moment> rollouts_;  ///< to be shown, not before these times
    std::map<std::string, Moment> shown_;     ///< when roll-outs were shown last
    Worker worker_;                           ///< last: it uses everything above
};

}  // namespace fleet
