#include "fleet/server/api/routes.h"

namespace fleet {

/// The endpoints. Each has a file of its own below this folder and a row here.
ApiEndpoint getCentreHealth, postEnrolment, postLogin, postSession, getOperator;
ApiEndpoint getHosts, getInventory, getHost, getHostOrders, postLabels, postRetire;
ApiEndpoint postBatch, postBatchOrders, postRollout, getRollouts, getRollout;
ApiEndpoint getRolloutHosts, getRolloutFailures, getToSign;
ApiEndpoint postQuestions, getAnswers;
ApiEndpoint getFile, postFile, getFileContent;
ApiEndpoint postPause, postResume, postAbort, postRetryFailed;

namespace {

using http::Access;
using routes::JsonType;
using routes::Need;
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
                                "the orders themselves, signed, in base64"};

}  // namespace

// clang-format off
std::vector<ApiRoute> apiRoutes() {
    constexpr auto kWorker = Runs::OnWorker;
    constexpr auto kNone = Others::None;
    return {
        {"GET", "/v1/health", "Whether the centre works.",
         Access::None, Runs::AtOnce, getCentreHealth, {{200, "how it is", nullptr}}},
        {"POST", "/v1/enrolments", "A host joins.",
         Access::None, kWorker, postEnrolment, {{200, "what it needs to know", nullptr}}},
        {"POST", "/v1/logins", "An operator's key asks for its certificate.",
         Access::None, kWorker, postLogin, {{200, "the certificate, or nothing yet", nullptr}}},
        {"POST", "/v1/sessions", "An operator's key opens a session.",
         Access::None, kWorker, postSession, {{200, "the session", nullptr}}},
        {"GET", "/v1/whoami", "Who one is to the centre.",
         Access::Read, kWorker, getOperator, {{200, "the operator", nullptr}}},

        {"GET", "/v1/hosts", "The hosts of the fleet.",
         Access::Read, kWorker, getHosts, {{200, "a page of them", nullptr}},
         {{"selector", Type::Text, Need::Optional, "which ones"},
          {"after", Type::Text, Need::Optional, "the last one of the page before"}, kLimit}},
        {"GET", "/v1/inventory", "What the hosts of the fleet have told about themselves.",
         Access::Read, kWorker, getInventory, {{200, "a page of hosts", nullptr}},
         {{"selector", Type::Text, Need::Optional, "which ones"},
          {"after", Type::Text, Need::Optional, "the last one of the page before"}, kLimit}},
        {"GET", "/v1/hosts/{host}", "A host.",
         Access::Read, kWorker, getHost, {{200, "the host", nullptr}}, {kHost}},
        {"GET", "/v1/hosts/{host}/orders", "A host's latest orders.",
         Access::Read, kWorker, getHostOrders, {{200, "the newest ones first", nullptr}},
         {kHost, kLimit}},
        {"POST", "/v1/hosts/{host}/labels", "Gives a host other labels.",
         Access::Act, kWorker, postLabels, {{200, "the host", nullptr}}, {kHost}, kNone,
         {{"labels", JsonType::Object, Need::Required, "all of them"}}},

        {"POST", "/v1/hosts/{host}/retire", "Takes a host out of the fleet for ever.",
         Access::Act, kWorker, postRetire, {{200, "the orders whose ends nobody tells", nullptr}},
         {kHost}},

        {"POST", "/v1/questions", "Asks hosts something, now.",
         Access::Act, kWorker, postQuestions, {{201, "the round of questions", nullptr}}, {}, kNone,
         {{"questions", JsonType::Array, Need::Required, "the questions, signed, in base64"}}},
        {"GET", "/v1/questions/{round}", "What hosts have answered since the last look.",
         Access::Act, kWorker, getAnswers, {{200, "pieces of answers, as sealed", nullptr}},
         {{"round", Type::Text, Need::Required, "the round's identifier"}}},

        {"GET", "/v1/files/{sha256}", "How far a file is.",
         Access::Act, kWorker, getFile, {{200, "the file", nullptr}}, {kSum, kSize}},
        {"POST", "/v1/files/{sha256}", "Brings a piece of a file.",
         Access::Act, kWorker, postFile, {{200, "how far the file is now", nullptr}},
         {kSum, kSize, {"from", Type::Number, Need::Required, "where the piece begins"}}},
        // Its own check: the session is a host's, and those of operators do not count.
        {"GET", "/v1/files/{sha256}/content", "A host fetches what its order needs.",
         Access::None, kWorker, getFileContent, {{206, "a piece of it", nullptr}}, {kSum}},

        {"POST", "/v1/batches", "Makes a place for signed orders.",
         Access::Act, kWorker, postBatch, {{201, "the batch", nullptr}}},
        {"POST", "/v1/batches/{batch}/orders", "Adds orders to a batch.",
         Access::Act, kWorker, postBatchOrders, {{200, "how many there are", nullptr}},
         {{"batch", Type::Text, Need::Required, "the batch's identifier"}}, kNone,
         {{"orders", JsonType::Array, Need::Required, "the orders, signed, in base64"}}},

        {"POST", "/v1/rollouts", "Makes a roll-out.",
         Access::Act, kWorker, postRollout, {{201, "the roll-out", nullptr}}, {}, kNone,
         {{"id", JsonType::String, Need::Optional, "its identifier, made up by who asks"},
          {"waves", JsonType::String, Need::Optional, "such as 1,10%,100%"},
          {"maxFailures", JsonType::String, Need::Optional, "more pause it: a number or a share"},
          {"pause", JsonType::Number, Need::Optional, "seconds between two waves"},
          {"wait", JsonType::Number, Need::Optional, "seconds after which a wave ends"},
          {"parallel", JsonType::Number, Need::Optional, "hosts at a time"}, kBatch, kOrders}},
        {"GET", "/v1/rollouts", "The roll-outs.",
         Access::Read, kWorker, getRollouts, {{200, "the newest ones first", nullptr}},
         {{"before", Type::Text, Need::Optional, "the last one of the page before"}, kLimit}},
        {"GET", "/v1/rollouts/{id}", "A roll-out.",
         Access::Read, kWorker, getRollout, {{200, "the roll-out", nullptr}}, {kRollout}},
        {"GET", "/v1/rollouts/{id}/hosts", "A roll-out's hosts.",
         Access::Read, kWorker, getRolloutHosts, {{200, "their parts in it", nullptr}},
         {kRollout, kFrom, kLimit}},
        {"GET", "/v1/rollouts/{id}/failures", "The hosts that failed.",
         Access::Read, kWorker, getRolloutFailures, {{200, "those that count first", nullptr}},
         {kRollout, kLimit}},
        {"GET", "/v1/rollouts/{id}/to-sign", "The hosts that need other orders.",
         Access::Act, kWorker, getToSign, {{200, "with the orders that they have", nullptr}},
         {kRollout, {"for", Type::Text, Need::Required, "resume, abort or retry-failed"},
          {"force", Type::Flag, Need::Optional, "1: also those whose end nobody knows"},
          kFrom, kLimit}},
        {"POST", "/v1/rollouts/{id}/pause", "Pauses a roll-out.",
         Access::Act, kWorker, postPause, {{200, "the roll-out", nullptr}}, {kRollout}},
        {"POST", "/v1/rollouts/{id}/resume", "Goes on with a roll-out.",
         Access::Act, kWorker, postResume, {{200, "the roll-out", nullptr}}, {kRollout}, kNone,
         {kBatch, kOrders}},
        {"POST", "/v1/rollouts/{id}/abort", "Ends a roll-out.",
         Access::Act, kWorker, postAbort, {{200, "the roll-out", nullptr}}, {kRollout}, kNone,
         {kBatch, kOrders}},
        {"POST", "/v1/rollouts/{id}/retry-failed", "Tries hosts that failed again.",
         Access::Act, kWorker, postRetryFailed, {{200, "the roll-out", nullptr}}, {kRollout}, kNone,
         {kBatch, kOrders,
          {"force", JsonType::Boolean, Need::Optional, "also those whose end nobody knows"}}},
    };
}
// clang-format on

}  // namespace fleet
