#include "fleet/server/api/routes.h"

#include "fleet/server/api/schema.h"
#include "routes/description/description.h"

namespace fleet {

/// The endpoints. Each has a file of its own below this folder and a row here.
ApiEndpoint getCentreHealth, postEnrolment, postLogin, postSession, getOperator, postConsoleLink;
ApiEndpoint getHosts, getInventory, getHost, getHostOrders, getOrder, postLabels, postRetire;
ApiEndpoint postBatch, postBatchOrders, postRollout, getRollouts, getRollout;
ApiEndpoint getRolloutHosts, getRolloutFailures, getToSign;
ApiEndpoint postQuestions, getAnswers;
ApiEndpoint getFile, postFile, getFileContent;
ApiEndpoint postPause, postResume, postAbort, postRetryFailed;
ApiEndpoint getCentreOpenapi, getFleetEvents;

/// The documents, each described beside the code that makes them.
Schema centreHealthSchema, enrolmentSchema, loginSchema, sessionSchema, operatorSchema;
Schema consoleLinkSchema;
Schema hostListSchema, hostOrdersSchema, retiredSchema, labelsSchema;
Schema batchSchema, batchSizeSchema, rolloutListSchema, partListSchema, toSignSchema;
Schema questionsSchema, roundSchema, answersSchema, fileSchema;
Schema hostEventSchema, orderEventSchema, fleetGapSchema;

namespace {

using http::Access;
using routes::JsonType;
using routes::Others;
using routes::Parameter;
using routes::Runs;
using routes::Type;

const Parameter kHost = {"host", Type::Text, Need::Required, "the host's bus key or its name"};
const Parameter kRollout = {"id", Type::Text, Need::Required, "the roll-out's identifier"};
const Parameter kLimit = {"limit", Type::Number, Need::Optional, "how many at most"};
const Parameter kFrom = {"from", Type::Number, Need::Optional, "the first place, from 0"};

const Parameter kSum = {"sha256", Type::Text, Need::Required, "the file's SHA-256"};
const Parameter kSize = {"size", Type::Number, Need::Required, "the whole file's size in bytes"};

const routes::Member kBatch = {"batch", JsonType::String, Need::Optional,
                               "the batch that has the orders"};
const routes::Member kOrders = {"orders", JsonType::Array, Need::Optional,
                                "the orders themselves, signed", ordersSchema};

constexpr const char* kBytes = "application/octet-stream";

}  // namespace

// clang-format off
std::vector<ApiRoute> apiRoutes() {
    constexpr auto kWorker = Runs::OnWorker;
    constexpr auto kNone = Others::None;
    return {
        {"GET", "/v1/health", "Whether the centre works.",
         Access::None, Runs::AtOnce, getCentreHealth, {{200, "how it is", centreHealthSchema}}},
        {"GET", "/v1/openapi.json", "This interface, described for machines.",
         Access::None, Runs::AtOnce, getCentreOpenapi,
         {{200, "the description", routes::descriptionSchema}}},
        {"POST", "/v1/enrolments", "A host joins.",
         Access::None, kWorker, postEnrolment, {{200, "what it needs to know", enrolmentSchema}},
         {}, kNone, {}, {403}},
        {"POST", "/v1/logins", "An operator's key asks for its certificate.",
         Access::None, kWorker, postLogin,
         {{200, "the certificate, or nothing yet", loginSchema}}, {}, kNone, {}, {403}},
        {"POST", "/v1/sessions", "An operator's key opens a session.",
         Access::None, kWorker, postSession, {{200, "the session", sessionSchema}},
         {}, kNone, {}, {403}},
        {"GET", "/v1/whoami", "Who one is to the centre.",
         Access::Read, kWorker, getOperator, {{200, "the operator", operatorSchema}}},
        {"POST", "/v1/console-links", "Makes a link that opens the console in a browser, once.",
         Access::Read, kWorker, postConsoleLink, {{201, "the link", consoleLinkSchema}},
         {}, kNone, {}, {404}},

        {"GET", "/v1/events", "Streams what happens in the fleet.",
         Access::Read, kWorker, getFleetEvents,
         {{200, "the events, until somebody ends the connection or the session is over", nullptr,
           {{"host", hostEventSchema}, {"order", orderEventSchema}, {"rollout", rolloutSchema},
            {"gap", fleetGapSchema}}}},
         {{"after", Type::Text, Need::Optional, "the event after which to continue"}},
         kNone, {}, {429}},

        {"GET", "/v1/hosts", "The hosts of the fleet.",
         Access::Read, kWorker, getHosts, {{200, "a page of them", hostListSchema}},
         {{"selector", Type::Text, Need::Optional, "which ones"},
          {"after", Type::Text, Need::Optional, "the last one of the page before"}, kLimit}},
        {"GET", "/v1/inventory", "What the hosts of the fleet have told about themselves.",
         Access::Read, kWorker, getInventory, {{200, "a page of hosts", hostListSchema}},
         {{"selector", Type::Text, Need::Optional, "which ones"},
          {"after", Type::Text, Need::Optional, "the last one of the page before"}, kLimit}},
        {"GET", "/v1/hosts/{host}", "A host.",
         Access::Read, kWorker, getHost, {{200, "the host", hostSchema}}, {kHost},
         kNone, {}, {404}},
        {"GET", "/v1/hosts/{host}/orders", "A host's latest orders.",
         Access::Read, kWorker, getHostOrders, {{200, "the newest ones first", hostOrdersSchema}},
         {kHost, kLimit}, kNone, {}, {404}},
        {"GET", "/v1/orders/{order}", "An order.",
         Access::Read, kWorker, getOrder, {{200, "the order", orderSchema}},
         {{"order", Type::Text, Need::Required, "the order's identifier"}}, kNone, {}, {404}},
        {"POST", "/v1/hosts/{host}/labels", "Gives a host other labels.",
         Access::Act, kWorker, postLabels, {{200, "the host", hostSchema}}, {kHost}, kNone,
         {{"labels", JsonType::Object, Need::Required, "all of them", labelsSchema}}, {403, 404}},

        {"POST", "/v1/hosts/{host}/retire", "Takes a host out of the fleet for ever.",
         Access::Act, kWorker, postRetire,
         {{200, "the orders whose ends nobody tells", retiredSchema}}, {kHost},
         kNone, {}, {403, 404}},

        {"POST", "/v1/questions", "Asks hosts something, now.",
         Access::Act, kWorker, postQuestions, {{201, "the round of questions", roundSchema}}, {},
         kNone,
         {{"questions", JsonType::Array, Need::Required, "the questions", questionsSchema},
          {"round", JsonType::String, Need::Optional,
           "the round that they go on with; without it another one begins"}},
         {403, 404, 429}},
        {"GET", "/v1/questions/{round}", "What hosts have answered since the last look.",
         Access::Act, kWorker, getAnswers, {{200, "pieces of answers, as sealed", answersSchema}},
         {{"round", Type::Text, Need::Required, "the round's identifier"}},
         kNone, {}, {403, 404}},

        {"GET", "/v1/files/{sha256}", "How far a file is.",
         Access::Act, kWorker, getFile, {{200, "the file", fileSchema}}, {kSum, kSize},
         kNone, {}, {403, 404, 507}},
        {"POST", "/v1/files/{sha256}", "Brings a piece of a file.",
         Access::Act, kWorker, postFile, {{200, "how far the file is now", fileSchema}},
         {kSum, kSize, {"from", Type::Number, Need::Required, "where the piece begins"}},
         kNone, {}, {403, 507}},
        // Its own check: the session is a host's, and those of operators do not count.
        {"GET", "/v1/files/{sha256}/content", "A host fetches what its order needs.",
         Access::None, kWorker, getFileContent,
         {{200, "nothing, of an empty file", nullptr, {}, kBytes},
          {206, "a piece of it", nullptr, {}, kBytes}}, {kSum}, kNone, {}, {401, 403, 404, 416}},

        {"POST", "/v1/batches", "Makes a place for signed orders.",
         Access::Act, kWorker, postBatch, {{201, "the batch", batchSchema}},
         {}, kNone, {}, {403, 429}},
        {"POST", "/v1/batches/{batch}/orders", "Adds orders to a batch.",
         Access::Act, kWorker, postBatchOrders, {{200, "how many there are", batchSizeSchema}},
         {{"batch", Type::Text, Need::Required, "the batch's identifier"}}, kNone,
         {{"orders", JsonType::Array, Need::Required, "the orders, signed", ordersSchema}},
         {403, 404, 429}},

        {"POST", "/v1/rollouts", "Makes a roll-out.",
         Access::Act, kWorker, postRollout, {{201, "the roll-out", rolloutSchema}}, {}, kNone,
         {{"id", JsonType::String, Need::Optional, "its identifier, made up by who asks"},
          {"waves", JsonType::String, Need::Optional, "such as 1,10%,100%"},
          {"maxFailures", JsonType::String, Need::Optional, "more pause it: a number or a share"},
          {"pause", JsonType::Number, Need::Optional, "seconds between two waves"},
          {"wait", JsonType::Number, Need::Optional, "seconds after which a wave ends"},
          {"parallel", JsonType::Number, Need::Optional, "hosts at a time"}, kBatch, kOrders},
         {403, 404, 409, 429}},
        {"GET", "/v1/rollouts", "The roll-outs.",
         Access::Read, kWorker, getRollouts, {{200, "the newest ones first", rolloutListSchema}},
         {{"before", Type::Text, Need::Optional, "the last one of the page before"}, kLimit},
         kNone, {}, {404}},
        {"GET", "/v1/rollouts/{id}", "A roll-out.",
         Access::Read, kWorker, getRollout, {{200, "the roll-out", rolloutSchema}}, {kRollout},
         kNone, {}, {404}},
        {"GET", "/v1/rollouts/{id}/hosts", "A roll-out's hosts.",
         Access::Read, kWorker, getRolloutHosts, {{200, "their parts in it", partListSchema}},
         {kRollout, kFrom, kLimit}, kNone, {}, {404}},
        {"GET", "/v1/rollouts/{id}/failures", "The hosts that failed.",
         Access::Read, kWorker, getRolloutFailures,
         {{200, "those that count first", partListSchema}}, {kRollout, kLimit}, kNone, {}, {404}},
        {"GET", "/v1/rollouts/{id}/to-sign", "The hosts that need other orders.",
         Access::Act, kWorker, getToSign, {{200, "with the orders that they have", toSignSchema}},
         {kRollout, {"for", Type::Text, Need::Required, "resume, abort or retry-failed"},
          {"force", Type::Flag, Need::Optional, "1: also those whose end nobody knows"},
          kFrom, kLimit}, kNone, {}, {403, 404}},
        {"POST", "/v1/rollouts/{id}/pause", "Pauses a roll-out.",
         Access::Act, kWorker, postPause, {{200, "the roll-out", rolloutSchema}}, {kRollout},
         kNone, {}, {403, 404, 409}},
        {"POST", "/v1/rollouts/{id}/resume", "Goes on with a roll-out.",
         Access::Act, kWorker, postResume, {{200, "the roll-out", rolloutSchema}}, {kRollout},
         kNone, {kBatch, kOrders}, {403, 404, 409, 429}},
        {"POST", "/v1/rollouts/{id}/abort", "Ends a roll-out.",
         Access::Act, kWorker, postAbort, {{200, "the roll-out", rolloutSchema}}, {kRollout},
         kNone, {kBatch, kOrders}, {403, 404, 409, 429}},
        {"POST", "/v1/rollouts/{id}/retry-failed", "Tries hosts that failed again.",
         Access::Act, kWorker, postRetryFailed, {{200, "the roll-out", rolloutSchema}}, {kRollout},
         kNone,
         {kBatch, kOrders,
          {"force", JsonType::Boolean, Need::Optional, "also those whose end nobody knows"}},
         {403, 404, 409, 429}},
    };
}
// clang-format on

}  // namespace fleet
