/// What the endpoints of the centre's interface work with.
#pragma once

#include <algorithm>
#include <chrono>
#include <future>
#include <memory>
#include <mutex>
#include <optional>
#include <stdexcept>
#include <string>
#include <utility>

#include "fleet/server/api/files/known_fetches.h"
#include "fleet/server/api/sessions/batches.h"
#include "fleet/server/api/sessions/sessions.h"
#include "fleet/server/depot/file_depot.h"
#include "fleet/server/keys/trust/members.h"
#include "fleet/server/keys/trust/operators.h"
#include "fleet/server/service/centre_service.h"

namespace fleet {

/// The centre cannot do it now; what() is for the operator.
class Unavailable : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
};

/// Made once, and shared by all requests. Any thread. The service outlives it.
class ApiServices {
public:
    /// How long a request waits for the centre's thread.
    static constexpr std::chrono::seconds kPatience{25};

    /// Throws KeysError, DepotError and sqlite::DatabaseError.
    explicit ApiServices(CentreService& service)
        : directory(service.directory()),
          facts(directory.facts()),
          files(directory.files()),
          service_(service),
          trust_(directory.trustDatabase()),
          members_(trust_.connection()) {}

    const FleetDirectory directory;
    const FleetFacts facts;
    Sessions sessions{wallClock()};
    Batches batches;
    FileDepot files;
    KnownFetches fetches;

    bool isWorking() const { return service_.centre().isWorking(); }

    /// What `act` returns, which gets a CentreDesk and runs on the centre's thread as one
    /// transaction. Throws Unavailable, or what it throws. After a wait that was too long, what it
    /// does may still be done.
    template <typename Act>
    auto ask(Act act) {
        if (!isWorking()) {
            throw Unavailable(
                "the centre does not work now: it waits for the bus, or for another centre to end");
        }
        auto answer = service_.ask(std::move(act));
        if (answer.wait_for(kPatience) != std::future_status::ready) {
            throw Unavailable("the centre is too busy");
        }
        try {
            return answer.get();
        } catch (const std::future_error&) {
            throw Unavailable("the centre is about to end");
        }
    }

    /// What `act` returns, which gets the connection to the database of who may take part.
    template <typename Act>
    auto withTrust(Act act) {
        const std::lock_guard lock(mutex_);
        return act(trust_.connection());
    }

    /// The hosts of the fleet.
    std::shared_ptr<const Members> members() {
        const std::lock_guard lock(mutex_);
        return members_.current();
    }
    /// The bus key of the host whose link signs with this key; "" if it is none of the fleet's.
    std::string hostSigningWith(const std::string& key) {
        const auto known = members();
        const auto found = std::find_if(known->begin(), known->end(), [&](const auto& member) {
            return member.second.signing == key;
        });
        return found == known->end() ? std::string() : found->first;
    }
    bool label(const std::string& host, const Labels& labels) {
        const std::lock_guard lock(mutex_);
        return members_.label(host, labels);
    }

private:
    CentreService& service_;
    std::mutex mutex_;  ///< for both below
    TrustDatabase trust_;
    MemberList members_;
};

}  // namespace fleet
