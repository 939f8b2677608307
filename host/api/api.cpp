#include "host/api/api.h"

#include <memory>
#include <nlohmann/json.hpp>
#include <string>
#include <utility>

#include "host/api/route.h"
#include "host/api/services.h"
#include "host/depot/depot_error.h"
#include "host/guard/refusal.h"
#include "host/outcomes/task_keeper.h"
#include "host/tables/query.h"
#include "routes/bad_request.h"

namespace host {
namespace {

unsigned statusOf(DepotError::Kind kind) {
    switch (kind) {
        case DepotError::Kind::LeadsOut:
        case DepotError::Kind::WrongKind:
            return 400;
        case DepotError::Kind::Forbidden:
            return 403;
        case DepotError::Kind::NotThere:
            return 404;
        case DepotError::Kind::Failed:
            break;
    }
    return 500;
}

/// The journal that the client means; empty if it does not say.
std::string journalMeant(const Call& call) {
    if (const std::string* const parameter = call.text("journal")) return *parameter;
    if (call.route().body.empty()) return {};
    const auto member = call.body().find("journal");
    return member == call.body().end() ? std::string() : member->get<std::string>();
}

http::Answer answerTo(Services& services, Endpoint& endpoint, Call& call) {
    try {
        call.readBody();
        const std::string& own = services.journal.identity();
        const std::string meant = journalMeant(call);
        if (!meant.empty() && meant != own) {
            return http::errorReply(412, "this host's journal is " + own + ", not " + meant);
        }
        return endpoint(services, call);
    } catch (const routes::BadRequest& bad) {
        return http::errorReply(400, bad.what());
    } catch (const Refusal& refused) {
        services.refusals.at(refused.guard()).add();
        return http::guardReply(refused.httpStatus(), refused.what(), refused.guard(),
                                refused.hint());
    } catch (const DepotError& error) {
        return http::errorReply(statusOf(error.kind()), error.what());
    } catch (const NotKept& failure) {
        if (!failure.guard().empty()) services.refusals.at(failure.guard()).add();
        http::Reply reply = failure.guard().empty()
                                ? http::errorReply(503, failure.what())
                                : http::guardReply(503, failure.what(), failure.guard(), "");
        reply.fields.emplace_back("Retry-After", "5");
        return reply;
    } catch (const QueryFailed& failed) {
        return http::errorReply(failed.gone() ? 404 : 500, failed.what());
    }
}

}  // namespace

Api::Api(Services& services, std::vector<Route> routes)
    : services_(services), table_(std::move(routes), "you may only read from this host") {}

std::variant<http::Answer, http::Job> Api::handle(http::Request request) {
    return table_.dispatch(std::move(request),
                           [&services = services_](const Route& route, Call& call) {
                               return answerTo(services, *route.endpoint, call);
                           });
}

void Api::prepareForEnd() {
    services_.dispatcher.stop();
    services_.outcomes.holdAfterOutcome();
}

bool Api::quiet() const {
    return services_.watch.quiet(services_.tasks.restartsHost());
}

}  // namespace host
