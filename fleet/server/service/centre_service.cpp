#include "fleet/server/service/centre_service.h"

#include <unistd.h>

#include <array>
#include <chrono>
#include <optional>
#include <thread>
#include <utility>

#include "fleet/bus/messages/certificate.h"
#include "fleet/bus/messages/numbered_order.h"
#include "fleet/log/log.h"
#include "fleet/server/keys/trust/host_enrolment.h"
#include "fleet/server/keys/trust/revocations.h"
#include "fleet/server/service/store_register.h"

namespace fleet {
namespace {

constexpr std::chrono::seconds kToldWithin{10};
constexpr std::chrono::milliseconds kToldLook{20};

/// For another centre that finds the lease taken.
std::string holderName() {
    std::array<char, 256> host{};
    if (::gethostname(host.data(), host.size() - 1) != 0) return "a centre";
    return std::string(host.data()) + ", process " + std::to_string(::getpid());
}

void sayAlarm(const Alarm& alarm) {
    say(Priority::Error, "host " + alarm.host + ": " + alarm.text);
}

}  // namespace

CentreService::CentreService(const ServiceOptions& options)
    : directory_(options.directory),
      facts_(directory_.facts()),
      key_(directory_.centre()),
      trust_(directory_.trustDatabase()),
      centre_(std::make_unique<CentreProgram>(settings(options))) {}

CentreService::~CentreService() = default;

ConnectionOptions CentreService::busOptions() const {
    ConnectionOptions options;
    options.urls = facts_.busUrls;
    options.tls = TlsOptions{directory_.authorityFile(), facts_.names.front()};
    options.name = "zavfleetd";
    // There is one centre, and its lease does not wait.
    options.reconnectWait = std::chrono::milliseconds(500);
    options.reconnectJitter = std::chrono::milliseconds(50);
    return options;
}

CentreSettings CentreService::settings(const ServiceOptions& options) {
    CentreSettings settings{directory_.orders(), busOptions(), key_.key,
                            StreamLimits{options.tasksBytes, options.replicas}, holderName()};
    const BusUser user = directory_.bus().centre;
    settings.bus.credentials =
        UserToken{[token = user.token] { return token; },
                  [key = user.key](std::string_view nonce) { return key.sign(nonce); }};
    // A restored database adopts what earlier keys have numbered.
    for (const std::string& certificate : facts_.centres) {
        settings.earlierKeys.push_back(readCertificate(certificate, facts_.root, facts_.fleet).key);
    }
    settings.revoked = [this] { return revoked_; };
    settings.alarm = sayAlarm;
    settings.storeAway = [this] { accounts_->tellAgain(); };
    settings.attend = [this](CentreParts& parts, Moment now) { return attend(parts, now); };
    settings.putBack = [this](CentreParts& parts, Moment now) {
        begin(parts);
        rollouts_->restored(now);
    };
    return settings;
}

CentreProgram::End CentreService::run() {
    // The accounts are up to date whether or not this centre has the lease: a stolen key waits for
    // nobody.
    accounts_ = std::make_unique<AccountKeeper>(directory_.path(), busOptions());
    // A server that loads an account for a connection while it is told another one of that name may
    // lose the account's store. So the centre connects when the bus has been told, or is away.
    const auto patience = std::chrono::steady_clock::now() + kToldWithin;
    while (accounts_->rounds() == 0 && !isEnding_ && std::chrono::steady_clock::now() < patience)
        std::this_thread::sleep_for(kToldLook);
    const CentreProgram::End end = centre_->run();
    accounts_.reset();
    return end;
}

/// Between two letters of the centre's.
bool CentreService::attend(CentreParts& parts, Moment now) {
    if (!rollouts_) begin(parts);
    revoked_ = RevokedKeys(trust_.connection()).operators(now);
    rollouts_->pauseThoseOf(revoked_, now);
    const bool isMoreToEnd = endOrdersOfRevoked(parts);
    return rollouts_->tick(now) || isMoreToEnd;
}

/// How the open orders of a host that was revoked or replaced ended, nobody will tell. Some at a
/// time; returns whether there may be more.
bool CentreService::endOrdersOfRevoked(CentreParts& parts) {
    constexpr std::size_t kMostEnded = 64;
    const RevokedKeys keys(trust_.connection());
    const std::int64_t count = keys.count();
    if (count == endedFor_) return false;
    std::size_t ended = 0;
    for (const auto& [host, since] : keys.hosts()) {
        const auto open = parts.store.open(host, 1, kHighestNumber, kMostEnded - ended);
        for (const OpenOrder& order : open)
            parts.centre.hear({host, order.number, order.order, "", kUnknown, ""});
        ended += open.size();
        if (ended == kMostEnded) return true;
    }
    endedFor_ = count;
    return false;
}

void CentreService::begin(CentreParts& parts) {
    // It may have been killed after a host had joined and before the orders' database knew of it.
    StoreRegister hosts(parts.store);
    HostEnrolment(trust_.connection()).tell(hosts);
    rolloutStore_ = std::make_unique<SqliteRolloutStore>(parts.database);
    Centre& centre = parts.centre;
    rollouts_ = std::make_unique<Rollouts>(
        *rolloutStore_,
        [this, &centre](const std::string& host, const std::string& order,
                        const std::string& bytes) -> std::optional<Number> {
            // It will never take an order; nothing shall wait for it.
            if (RevokedKeys(trust_.connection()).isRevoked(host)) return std::nullopt;
            return centre.submit(host, order, [&](Number number) {
                return signNumber(host, number, order, bytes, key_.key);
            });
        });
}

}  // namespace fleet
