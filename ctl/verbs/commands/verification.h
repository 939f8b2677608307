/// A look at the host after a command, to see whether what it reports is so.
#pragma once

#include <nlohmann/json_fwd.hpp>
#include <string>

#include "ctl/client/address/host_address.h"
#include "ctl/client/deadline.h"
#include "ctl/client/tasks/task_request.h"
#include "ctl/client/tasks/task_result.h"

namespace ctl {

/// Whether a version as it was asked for, "6.3" or "063000000", is the one that the inventory
/// lists. What is no number, such as the name of a folder, is any version.
bool isSameVersion(const std::string& asked, const std::string& listed);

/// What the inventory says against an install that reported success; empty if nothing. `rows` are
/// the product's.
std::string doubtAboutInstall(const TaskRequest& request, const nlohmann::json& rows);

/// The same for an uninstall. A product may be installed for several platforms, and one of them
/// goes; `before` is the number of the product's rows then.
std::string doubtAboutUninstall(const TaskRequest& request, std::size_t before,
                                const nlohmann::json& rows);

/// The same for a start, a restart or a stop, by the state of the instance that it was for: one of
/// listInstances().
std::string doubtAboutState(const TaskRequest& request, const nlohmann::json& instance);

/// Made before a command is sent. Looks only at hosts that guard their users.
class Verification {
public:
    /// Nothing is looked at when it is not wanted.
    Verification(const HostAddress& host, const TaskRequest& request, bool isWanted);

    /// Fills in `doubt` or `note` of a command that reported success. Never throws Failure: a look
    /// that fails is a note.
    void check(TaskResult& result) const;

private:
    nlohmann::json inventory() const;
    void checkState(TaskResult& result) const;

    HostAddress host_;
    TaskRequest request_;
    Deadline deadline_;
    bool isWanted_;
    std::size_t before_ = 0;
    std::string fault_;  ///< why the inventory could not be taken before
};

}  // namespace ctl
