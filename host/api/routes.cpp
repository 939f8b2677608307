#include "host/api/routes.h"

namespace host {

/// The endpoints. Each has a file of its own in this folder and a row below.
Endpoint getTables, postQuery, getEvents, getDoctor, getHealth, getReady, getMetrics, getTaskOutput;
Endpoint getWhoami;
Endpoint postTask, getTasks, getTask, cancelTask;
Endpoint getDepot, deleteDepot, getDepotSum, getDepotCheck;

// clang-format off
std::vector<Route> routes() {
    return {
        {"GET", "/v1/tables", "The tables with their columns.",
         Access::Read, Runs::AtOnce, getTables},

        {"POST", "/v1/query", "Queries a table; on the request table, asks for a command.",
         Access::Read, Runs::OnWorker, postQuery, {}, Others::None,
         {{"table", JsonType::String, Need::Required, "the name of the table"},
          {"where", JsonType::Array, Need::Optional, "conditions, all of which a row satisfies"},
          {"force", JsonType::Boolean, Need::Optional,
           "on the request table: true sends a command for a product that is not there"},
          {"journal", JsonType::String, Need::Optional, "the journal that must be this host's"}}},

        {"GET", "/v1/events", "Streams the rows of a table as they come.",
         Access::Read, Runs::OnWorker, getEvents,
         {{"table", Type::Text, Need::Required, "the name of the table"},
          {"after", Type::Text, Need::Optional, "of outcomes: the event after which to continue"},
          {"tasks", Type::Flag, Need::Optional, "of outcomes: 1 sends the ends of tasks, too"}},
         Others::Columns},

        {"POST", "/v1/tasks", "Accepts a command for its turn.",
         Access::Act, Runs::OnWorker, postTask, {}, Others::None,
         {{"command", JsonType::String, Need::Optional, "the command; needed unless refused"},
          {"product", JsonType::String, Need::Optional, "a column of the request table"},
          {"version", JsonType::String, Need::Optional, "another one"},
          {"targetmsn", JsonType::String, Need::Optional, "another one"},
          {"optional", JsonType::String, Need::Optional, "another one"},
          {"context", JsonType::String, Need::Optional, "another one"},
          {"uaconfig", JsonType::String, Need::Optional, "another one"},
          {"uascript", JsonType::String, Need::Optional, "another one"},
          {"transid", JsonType::String, Need::Optional, "the requester's name for it; else made up"},
          {"once", JsonType::Boolean, Need::Optional,
           "true: a repetition with the same transid gets the first one's task"},
          {"force", JsonType::Boolean, Need::Optional,
           "true sends a command for a product that is not there"},
          {"expires", JsonType::String, Need::Optional, "it must have begun by then"},
          {"journal", JsonType::String, Need::Optional, "the journal that must be this host's"},
          {"refused", JsonType::String, Need::Optional, "why this never runs; recorded only"}}},

        {"GET", "/v1/tasks", "Lists tasks, newest first.",
         Access::Read, Runs::OnWorker, getTasks,
         {{"state", Type::Text, Need::Optional, "only those in this state"},
          {"product", Type::Text, Need::Optional, "only those for this product"},
          {"command", Type::Text, Need::Optional, "only those with this command"},
          {"since", Type::Text, Need::Optional, "only those accepted at this time or later"},
          {"after", Type::Number, Need::Optional, "only those behind this cursor"},
          {"limit", Type::Number, Need::Optional, "at most so many; 100 if not given"},
          {"journal", Type::Text, Need::Optional, "the journal that must be this host's"}}},

        {"GET", "/v1/tasks/{id}", "Tells everything about one task.",
         Access::Read, Runs::OnWorker, getTask,
         {{"id", Type::Text, Need::Required, "the task's identifier, or a TRANSID"},
          {"wait", Type::Number, Need::Optional, "seconds to wait for the task's end"},
          {"journal", Type::Text, Need::Optional, "the journal that must be this host's"}}},

        // What commands write may hold anything.
        {"GET", "/v1/tasks/{id}/output", "Streams what a task's commands write.",
         Access::Act, Runs::OnWorker, getTaskOutput,
         {{"id", Type::Text, Need::Required, "the task's identifier, or a TRANSID"},
          {"follow", Type::Flag, Need::Optional, "1: goes on until the task is over"},
          {"journal", Type::Text, Need::Optional, "the journal that must be this host's"}}},

        {"POST", "/v1/tasks/{id}/cancel", "Cancels a task.",
         Access::Act, Runs::OnWorker, cancelTask,
         {{"id", Type::Text, Need::Required, "the task's identifier, or a TRANSID"},
          {"journal", Type::Text, Need::Optional, "the journal that must be this host's"}}},

        {"GET", "/v1/doctor", "Checks the home and the machine.",
         Access::Read, Runs::OnWorker, getDoctor},

        {"GET", "/v1/health", "What the host says about itself.",
         Access::Read, Runs::AtOnce, getHealth},

        {"GET", "/v1/ready", "Whether the host takes and carries out commands, and why not.",
         Access::Read, Runs::OnWorker, getReady},

        {"GET", "/v1/whoami", "Who the client is to the host, and what he may do.",
         Access::Read, Runs::OnWorker, getWhoami},

        {"GET", "/v1/metrics", "What the host counts, for a monitoring system.",
         Access::Read, Runs::OnWorker, getMetrics},

        {"GET", "/v1/depot", "What the depot holds.",
         Access::Read, Runs::OnWorker, getDepot,
         {{"path", Type::Text, Need::Optional, "a directory or file; the depot if not given"}}},

        {"DELETE", "/v1/depot", "Removes a file or a directory of the depot.",
         Access::Act, Runs::OnWorker, deleteDepot,
         {{"path", Type::Text, Need::Required, "what is to be removed"},
          {"recursive", Type::Flag, Need::Optional, "1: a directory with everything in it"}}},

        {"GET", "/v1/depot/sum", "The SHA-256 of files of the depot.",
         Access::Read, Runs::AtOnce, getDepotSum,
         {{"path", Type::Texts, Need::Required, "a file; may be given several times"}}},

        {"GET", "/v1/depot/check", "Whether the host would take files.",
         Access::Read, Runs::OnWorker, getDepotCheck,
         {{"path", Type::Texts, Need::Required, "the name to be; may be given several times"},
          {"bytes", Type::Number, Need::Optional, "the size of all of them together"}}},
    };
}
// clang-format on

}  // namespace host
