#include "fleet/server/api/centre_api.h"

#include <memory>
#include <optional>
#include <string_view>
#include <utility>

#include "fleet/bus/messages/document.h"
#include "fleet/log/log.h"
#include "fleet/server/keys/files/keys_error.h"
#include "fleet/server/keys/trust/join_refused.h"
#include "fleet/server/rollouts/rollout_error.h"

namespace fleet {
namespace {

constexpr unsigned kUnauthorized = 401;
constexpr unsigned kTooMany = 429;
constexpr unsigned kNoRoom = 507;

unsigned statusOf(RolloutError::Kind kind) {
    switch (kind) {
        case RolloutError::Kind::Invalid:
            return 400;
        case RolloutError::Kind::NotFound:
            return 404;
        case RolloutError::Kind::Conflict:
            break;
    }
    return 409;
}

http::Reply unauthorized() {
    http::Reply reply =
        http::errorReply(kUnauthorized, "this needs a session, which an operator's key opens");
    reply.fields.emplace_back("WWW-Authenticate", "Bearer");
    return reply;
}

http::Reply later(unsigned status, const std::string& text) {
    http::Reply reply = http::errorReply(status, text);
    reply.fields.emplace_back("Retry-After", "5");
    return reply;
}

/// The token in "Bearer TOKEN".
std::string_view tokenIn(std::string_view authorization) {
    constexpr std::string_view kScheme = "Bearer ";
    if (authorization.substr(0, kScheme.size()) != kScheme) return {};
    return authorization.substr(kScheme.size());
}

/// Who makes the request, if they have a session and their key counts still.
std::optional<Visit> visitOf(ApiServices& services, const Call& call) {
    const auto key = sessionKey(services, call);
    if (!key) return std::nullopt;
    auto grant = services.withTrust(
        [&](sqlite::Database& database) { return Operators(database).grantOf(*key, wallClock()); });
    if (!grant) return std::nullopt;
    return Visit{services, *key, std::move(*grant)};
}

http::Answer answerIn(Visit& visit, ApiEndpoint& endpoint, Call& call) {
    try {
        call.readBody();
        return endpoint(visit, call);
    } catch (const routes::BadRequest& bad) {
        return http::errorReply(400, bad.what());
    } catch (const MessageError& bad) {
        return http::errorReply(400, bad.what());
    } catch (const SelectorError& bad) {
        return http::errorReply(400, bad.what());
    } catch (const JoinRefused& refused) {
        return http::errorReply(403, refused.what());
    } catch (const Forbidden& refused) {
        return http::errorReply(403, refused.what());
    } catch (const NothingThere& nothing) {
        return http::errorReply(404, nothing.what());
    } catch (const RolloutError& error) {
        return http::errorReply(statusOf(error.kind()), error.what());
    } catch (const BatchesFull& full) {
        return later(kTooMany, full.what());
    } catch (const DepotError& error) {
        if (error.kind() == DepotError::Kind::Failed) throw;
        return http::errorReply(error.kind() == DepotError::Kind::Full ? kNoRoom : 400,
                                error.what());
    } catch (const Unavailable& unavailable) {
        return later(503, unavailable.what());
    }
}

http::Answer answerTo(ApiServices& services, const ApiRoute& route, Call& call) {
    try {
        Visit visit{services, {}, {}};
        if (route.access != http::Access::None) {
            std::optional<Visit> known = visitOf(services, call);
            if (!known) return unauthorized();
            if (route.access == http::Access::Act && known->grant.role == Role::Viewer) {
                return http::errorReply(403, "a viewer changes nothing");
            }
            visit.key = std::move(known->key);
            visit.grant = std::move(known->grant);
        }
        return answerIn(visit, *route.endpoint, call);
    } catch (const std::exception& error) {
        // A database or a disk. The details are the administrator's.
        say(Priority::Error, std::string(route.method) + " " + route.path + ": " + error.what());
        return http::errorReply(500, "the centre could not do this; its log says why");
    }
}

}  // namespace

std::optional<std::string> sessionKey(ApiServices& services, const Call& call) {
    return services.sessions.keyOf(tokenIn(call.authorization()), wallClock());
}

CentreApi::CentreApi(ApiServices& services, std::vector<ApiRoute> routes)
    : services_(services), table_(std::move(routes), "") {}

std::variant<http::Answer, http::Job> CentreApi::handle(http::Request request) {
    return table_.dispatch(std::move(request),
                           [&services = services_](const ApiRoute& route, Call& call) {
                               return answerTo(services, route, call);
                           });
}

}  // namespace fleet
