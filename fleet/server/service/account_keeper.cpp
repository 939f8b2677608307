#include "fleet/server/service/account_keeper.h"

#include <algorithm>
#include <chrono>
#include <exception>
#include <memory>
#include <utility>

#include "fleet/bus/nats/claims.h"
#include "fleet/log/log.h"
#include "fleet/server/keys/trust/account_tokens.h"
#include "fleet/server/keys/trust/revocations.h"
#include "fleet/server/keys/trust/trust_database.h"
#include "fleet/server/program/answer_time.h"

namespace fleet {
namespace {

using std::chrono::seconds;

constexpr seconds kLookPause{1};

TokenTime secondNow() {
    return std::chrono::duration_cast<TokenTime>(
        std::chrono::system_clock::now().time_since_epoch());
}

}  // namespace

AccountKeeper::AccountKeeper(const std::string& directory, ConnectionOptions options)
    : directory_(directory), options_(std::move(options)) {
    worker_.add([this] { work(); });
}

AccountKeeper::~AccountKeeper() {
    worker_.await();
}

void AccountKeeper::work() {
    std::string lastTrouble;
    std::unique_ptr<Connection> connection;
    // It looks for damage when it is opened, which is too much for each look.
    std::unique_ptr<TrustDatabase> trust;
    do {
        try {
            if (!trust) trust = std::make_unique<TrustDatabase>(directory_.trustDatabase());
            if (RevokedKeys(trust->connection()).count() == told_) continue;
            if (!connection) {
                const BusUser user = directory_.bus().system;
                ConnectionOptions options = options_;
                options.credentials =
                    UserToken{[token = user.token] { return token; },
                              [key = user.key](std::string_view nonce) { return key.sign(nonce); }};
                Connection::Result result = Connection::connect(options);
                if (!result.connection) throw std::runtime_error(result.text);
                connection = std::move(result.connection);
            }
            if (!tell(*connection)) connection.reset();
        } catch (const std::exception& error) {
            trust.reset();
            if (std::exchange(lastTrouble, error.what()) != error.what()) {
                say(Priority::Warning,
                    std::string("the bus's accounts cannot be brought up to date: ") +
                        error.what());
            }
        }
    } while (worker_.pause(kLookPause));
}

/// False if the bus has not taken all of it.
bool AccountKeeper::tell(Connection& connection) {
    TrustDatabase trust(directory_.trustDatabase());
    const RevokedKeys revoked(trust.connection());
    const std::int64_t count = revoked.count();
    const BusKeys bus = directory_.bus();
    // The bus takes a later token in the place of an earlier one only.
    last_ = std::max(secondNow(), last_ + seconds(1));
    for (const std::string& token :
         accountTokens(directory_.facts(), bus, revoked.hosts(), last_)) {
        const BusStatus status =
            updateAccount(connection, token, bus.accountSigner.publicKey(), kAnswerTime);
        if (!status.done()) {
            say(Priority::Warning, "the bus does not take an account: " + status.text);
            return false;
        }
    }
    told_ = count;
    ++rounds_;
    return true;
}

}  // namespace fleet
