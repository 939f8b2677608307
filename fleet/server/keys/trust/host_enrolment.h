/// How hosts join: an administrator invites, the host comes with the invitation's token.
#pragma once

#include <chrono>
#include <optional>
#include <string>
#include <string_view>

#include "fleet/bus/messages/enrolment.h"
#include "fleet/server/keys/directory/fleet_directory.h"
#include "fleet/server/keys/trust/host_register.h"
#include "sqlite/database.h"

namespace fleet {

/// What an administrator says of a host that is to come.
struct HostInvitation {
    std::string name;
    Labels labels;
    bool replaces = false;  ///< a host of that name is there; its key counts no longer once this
                            ///< one has come
    std::chrono::milliseconds valid = std::chrono::hours(1);
};

/// Works on a connection of a TrustDatabase, which outlives it. One thread at a time for each
/// object, and any number of objects and processes. Throws sqlite::DatabaseError; then nothing was
/// changed.
class HostEnrolment {
public:
    explicit HostEnrolment(sqlite::Database& database) : database_(database) {}

    /// Returns the token, which is kept nowhere. An earlier invitation in that name that was not
    /// used is withdrawn. Throws KeysError if the name is none, or that of a host in the fleet
    /// which is not to be replaced, or if the time is not between a minute and 30 days.
    std::string invite(const HostInvitation& invitation, Moment now);

    /// Whether there ever was an invitation with this token.
    bool knows(std::string_view token) const;

    /// A host comes with its request, in the bytes of signEnrolment(). The token counts for the
    /// first who brings it; that host may repeat the request and gets the same answer, in case one
    /// was lost. The register has the host before it gets an answer. Throws MessageError if the
    /// bytes are no request, and JoinRefused for everything that is wrong with what it asks.
    EnrolmentAnswer redeem(std::string_view request, const FleetDirectory& directory,
                           HostRegister& hosts, Moment now);

    /// Tells the register of every host whose key counts. At the centre's start: it may have been
    /// killed between the two databases, or the other one is an older copy.
    void tell(HostRegister& hosts) const;

private:
    struct Row;
    std::optional<Row> rowOf(std::string_view token) const;
    Row take(const EnrolmentRequest& request, const std::string& fleet, Moment now);
    bool isFresh(const EnrolmentRequest& request) const;
    bool isCounting(const std::string& host) const;
    bool hasCountingHost(const std::string& name) const;

    sqlite::Database& database_;
};

}  // namespace fleet
