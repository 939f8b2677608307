/// What the endpoints of the centre's interface work with.
#pragma once

#include <algorithm>
#include <chrono>
#include <cstdint>
#include <future>
#include <map>
#include <memory>
#include <mutex>
#include <optional>
#include <stdexcept>
#include <string>
#include <utility>

#include "fleet/server/api/events/event_log.h"
#include "fleet/server/api/events/event_readers.h"
#include "fleet/server/api/files/known_fetches.h"
#include "fleet/server/api/metrics/api_counts.h"
#include "fleet/server/api/sessions/batches.h"
#include "fleet/server/api/sessions/browser_sessions.h"
#include "fleet/server/api/sessions/session_proof.h"
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

    /// `withConsole`: the centre serves the console to browsers. Throws KeysError, DepotError and
    /// sqlite::DatabaseError.
    explicit ApiServices(CentreService& service, bool withConsole = false)
        : directory(service.directory()),
          facts(directory.facts()),
          files(directory.files()),
          servesConsole(withConsole),
          service_(service),
          trust_(directory.trustDatabase()),
          members_(trust_.connection()) {}

    const FleetDirectory directory;
    const FleetFacts facts;
    Sessions sessions{wallClock()};
    Batches batches;
    FileDepot files;
    KnownFetches fetches;
    EventLog events;
    EventReaders readers{events};
    ApiCounts counts;
    BrowserSessions browsers;
    const bool servesConsole;

    QuestionDesk& questions() { return service_.centre().questions(); }
    /// The key in whose name a session was opened; nothing if it is none, or not any more.
    std::optional<std::string> keyOf(const SessionProof& proof, Moment now) const {
        return proof.isBrowsers ? browsers.keyOf(proof.token, now)
                                : sessions.keyOf(proof.token, now);
    }
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

    /// The hosts of the fleet. Where centre and host both give a label, the host's own counts: by
    /// that its link decides, so an order for hosts that were chosen by the other one would be
    /// refused there.
    std::shared_ptr<const Members> members() {
        const std::lock_guard lock(mutex_);
        const ToldLabels& told = service_.centre().toldLabels();
        const auto known = members_.current();
        const std::uint64_t version = told.version();
        if (known != known_ || version != toldVersion_) {
            labelled_ = withOwnLabels(*known, told.all());
            known_ = known;
            toldVersion_ = version;
        }
        return labelled_;
    }
    /// The bus key of the host whose link signs with this key; "" if it is not one of the fleet's.
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
    static std::shared_ptr<const Members> withOwnLabels(Members members,
                                                        const std::map<std::string, Labels>& told) {
        for (const auto& [host, labels] : told) {
            const auto member = members.find(host);
            if (member == members.end()) continue;
            for (const auto& [name, value] : labels)
                member->second.labels[name] = value;
        }
        return std::make_shared<const Members>(std::move(members));
    }

    CentreService& service_;
    std::mutex mutex_;  ///< for all below
    TrustDatabase trust_;
    MemberList members_;
    std::shared_ptr<const Members> known_;  ///< what labelled_ was made of
    std::uint64_t toldVersion_ = 0;
    std::shared_ptr<const Members> labelled_;
};

}  // namespace fleet
