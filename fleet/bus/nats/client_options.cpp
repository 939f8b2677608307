#include "fleet/bus/nats/client_options.h"

#include <sodium.h>

#include <algorithm>
#include <climits>
#include <cstdlib>
#include <cstring>
#include <exception>
#include <vector>

#include "fleet/bus/nats/system_authorities.h"

namespace fleet {

namespace {

constexpr int kPingsUnanswered = 2;
constexpr std::int64_t kWriteDeadlineMs = 10'000;
constexpr std::size_t kSignatureLength = 64;
constexpr int kMostDoublings = 4;

/// Runs the steps until one of them fails.
template <typename... Step>
natsStatus inTurn(Step... steps) {
    natsStatus result = NATS_OK;
    static_cast<void>((((result = steps()) == NATS_OK) && ...));
    return result;
}

char* copyForLibrary(const std::string& text) {
    return ::strdup(text.c_str());
}

const Signer& signerOf(const Credentials& credentials) {
    if (const auto* key = std::get_if<UserKey>(&credentials)) return key->sign;
    return std::get<UserToken>(credentials).sign;
}

}  // namespace

NatsOptions Identity::makeOptions(std::string& why) {
    if (options_.urls.empty()) {
        why = "no server is named";
        return nullptr;
    }
    natsOptions* made = nullptr;
    natsStatus result = natsOptions_Create(&made);
    NatsOptions options(made);
    if (result == NATS_OK) {
        result = inTurn([&] { return setCredentials(made); }, [&] { return setTls(made); },
                        [&] { return setReconnecting(made); }, [&] { return setRest(made); });
    }
    if (result == NATS_OK) return options;
    const char* more = nats_GetLastError(nullptr);
    why =
        std::string(natsStatus_GetText(result)) + (more == nullptr ? "" : ": " + std::string(more));
    return nullptr;
}

natsStatus Identity::setCredentials(natsOptions* options) {
    if (const auto* user = std::get_if<UserPassword>(&options_.credentials)) {
        return natsOptions_SetUserInfo(options, user->user.c_str(), user->password.c_str());
    }
    if (const auto* key = std::get_if<UserKey>(&options_.credentials)) {
        return natsOptions_SetNKey(options, key->publicKey.c_str(), &Identity::sign, this);
    }
    if (std::holds_alternative<UserToken>(options_.credentials)) {
        return natsOptions_SetUserCredentialsCallbacks(options, &Identity::giveToken, this,
                                                       &Identity::sign, this);
    }
    return NATS_OK;
}

natsStatus Identity::setTls(natsOptions* options) const {
    const auto* tls = std::get_if<TlsOptions>(&options_.tls);
    if (tls == nullptr) return NATS_OK;
    // Without an expected name any certificate of the same authority would do.
    if (tls->caFile.empty() || tls->serverName.empty()) return NATS_INVALID_ARG;
    const std::uint64_t withheld = withheldSystemAuthorities();
    return inTurn(
        [&] { return natsOptions_SetSecure(options, true); },
        // If it had got the system's authorities after all, it would trust too many.
        [&] { return withheldSystemAuthorities() > withheld ? NATS_OK : NATS_SSL_ERROR; },
        [&] { return natsOptions_LoadCATrustedCertificates(options, tls->caFile.c_str()); },
        [&] { return natsOptions_SetExpectedHostname(options, tls->serverName.c_str()); });
}

natsStatus Identity::setReconnecting(natsOptions* options) {
    // A buffer of 0 would be the library's default; publish() sees to that case.
    const auto buffer = static_cast<int>(std::clamp<std::uint32_t>(
        options_.reconnectBuffer, 1, static_cast<std::uint32_t>(INT_MAX)));
    // It gives up after 60 attempts if it is told nothing.
    return inTurn(
        [&] { return natsOptions_SetMaxReconnect(options, INT_MAX); },
        [&] { return natsOptions_SetReconnectBufSize(options, buffer); },
        [&] { return natsOptions_SetCustomReconnectDelay(options, &Identity::delay, this); });
}

natsStatus Identity::setRest(natsOptions* options) const {
    std::vector<const char*> urls;
    for (const std::string& url : options_.urls)
        urls.push_back(url.c_str());
    return inTurn(
        [&] { return natsOptions_SetServers(options, urls.data(), static_cast<int>(urls.size())); },
        [&] { return natsOptions_SetName(options, options_.name.c_str()); },
        [&] { return natsOptions_SetCustomInboxPrefix(options, options_.inboxPrefix.c_str()); },
        [&] { return natsOptions_SetTimeout(options, options_.connectTimeout.count()); },
        [&] { return natsOptions_SetPingInterval(options, options_.pingInterval.count()); },
        [&] { return natsOptions_SetMaxPingsOut(options, kPingsUnanswered); },
        [&] { return natsOptions_SetWriteDeadline(options, kWriteDeadlineMs); },
        // Without it a thread of each connection's own collects what is sent, and each question
        // waits for it.
        [&] { return natsOptions_SetSendAsap(options, true); },
        [&] { return natsOptions_UseGlobalMessageDelivery(options, options_.sharesThreads); });
}

natsStatus Identity::giveToken(char** token, char** error, void* identity) {
    try {
        const auto* self = static_cast<const Identity*>(identity);
        *token = copyForLibrary(std::get<UserToken>(self->options_.credentials).token());
        return *token == nullptr ? NATS_NO_MEMORY : NATS_OK;
    } catch (const std::exception& reason) {
        *error = copyForLibrary(reason.what());
        return NATS_ERR;
    }
}

natsStatus Identity::sign(char** error, unsigned char** signature, int* length, const char* nonce,
                          void* identity) {
    try {
        auto* self = static_cast<Identity*>(identity);
        const std::string made = signerOf(self->options_.credentials)(nonce);
        if (made.size() != kSignatureLength) {
            *error = copyForLibrary("a signature has 64 bytes");
            return NATS_ERR;
        }
        // The library loses a first byte of 0 on the way to the server. That would count as a wrong
        // key, and two in a row would end the connection. The next attempt gets another nonce.
        if (made.front() == '\0') {
            ++self->unsendable_;
            *error = copyForLibrary("the client library cannot send this signature");
            return NATS_ERR;
        }
        *signature = static_cast<unsigned char*>(std::malloc(made.size()));
        if (*signature == nullptr) return NATS_NO_MEMORY;
        std::memcpy(*signature, made.data(), made.size());
        *length = static_cast<int>(made.size());
        return NATS_OK;
    } catch (const std::exception& reason) {
        *error = copyForLibrary(reason.what());
        return NATS_ERR;
    }
}

std::int64_t Identity::delay(natsConnection*, int attempt, void* identity) {
    auto* self = static_cast<Identity*>(identity);
    ++self->failedReconnects_;
    return pauseBefore(self->options_, attempt).count();
}

std::chrono::milliseconds pauseBefore(const ConnectionOptions& options, int attempt) {
    const int doublings = std::clamp(attempt - 1, 0, kMostDoublings);
    const auto once = std::clamp<std::int64_t>(options.reconnectJitter.count(), 0, INT_MAX);
    const auto jitter = std::min<std::int64_t>(once << doublings, INT_MAX);
    return options.reconnectWait +
           std::chrono::milliseconds(randombytes_uniform(static_cast<std::uint32_t>(jitter) + 1));
}

}  // namespace fleet
