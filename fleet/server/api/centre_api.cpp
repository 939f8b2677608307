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
std::optional<Visit> visitOf(ApiServices& services, const SessionProof& proof) {
    const auto key = services.keyOf(proof, wallClock());
    if (!key) return std::nullopt;
    auto grant = services.withTrust(
        [&](sqlite::Database& database) { return Operators(database).grantOf(*key, wallClock()); });
    if (!grant) return std::nullopt;
    return Visit{services, *key, std::move(*grant), proof};
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
    } catch (const TooMany& full) {
        return later(kTooMany, full.what());
    } catch (const DepotError& error) {
        if (error.kind() == DepotError::Kind::Failed) throw;
        return http::errorReply(error.kind() == DepotError::Kind::Full ? kNoRoom : 400,
                                error.what());
    } catch (const Unavailable& unavailable) {
        return later(503, unavailable.what());
    }
}

/// Why whoever makes the request may not act; empty if they may.
const char* whyNoAct(const Visit& visit) {
    if (visit.session.isBrowsers) return "a browser's session only reads";
    return visit.grant.role == Role::Viewer ? "a viewer changes nothing" : "";
}

http::Answer answerTo(ApiServices& services, const ApiRoute& route, Call& call,
                      const SessionProof& proof) {
    try {
        if (route.access == http::Access::None) {
            Visit anybody{services, {}, {}};
            return answerIn(anybody, *route.endpoint, call);
        }
        std::optional<Visit> visit = visitOf(services, proof);
        if (!visit) return unauthorized();
        const std::string_view refusal = route.access == http::Access::Act ? whyNoAct(*visit) : "";
        if (!refusal.empty()) return http::errorReply(403, refusal);
        return answerIn(*visit, *route.endpoint, call);
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
    : services_(services), table_(std::move(routes), ""), watch_(services) {}

std::variant<http::Answer, http::Job> CentreApi::handle(http::Request request) {
    SessionProof proof{std::string(tokenIn(request.authorization))};
    return dispatch(std::move(request), std::move(proof));
}

std::variant<http::Answer, http::Job> CentreApi::handleForBrowser(http::Request request,
                                                                  std::string token) {
    // Some routes that anybody may ask take what is signed, or sessions of hosts.
    if (request.method != "GET" && request.method != "HEAD") {
        http::Answer refusal(http::errorReply(403, "a browser only reads"));
        services_.counts.noteAnswer(refusal);
        return refusal;
    }
    request.authorization.clear();
    return dispatch(std::move(request), {std::move(token), true});
}

std::variant<http::Answer, http::Job> CentreApi::dispatch(http::Request request,
                                                          SessionProof proof) {
    auto handled = table_.dispatch(
        std::move(request),
        [&services = services_, proof = std::move(proof)](const ApiRoute& route, Call& call) {
            return answerTo(services, route, call, proof);
        });
    if (const auto* const answer = std::get_if<http::Answer>(&handled)) {
        services_.counts.noteAnswer(*answer);
        return handled;
    }
    return http::Job([job = std::get<http::Job>(std::move(handled)), &counts = services_.counts] {
        http::Answer answer = job();
        counts.noteAnswer(answer);
        return answer;
    });
}

}  // namespace fleet
