#include "host/api/routes.h"

#include "routes/description/description.h"

namespace host {

/// The endpoints. Each has a file of its own in this folder and a row below.
Endpoint getTables, postQuery, getEvents, getDoctor, getHealth, getReady, getMetrics, getTaskOutput;
Endpoint getWhoami, getInstances, getOpenapi;
Endpoint postTask, getTasks, getTask, cancelTask;
Endpoint getDepot, deleteDepot, getDepotSum, getDepotCheck;

/// The documents, each described beside the code that makes it.
Schema tablesSchema, conditionsSchema, queryAnswerSchema, rowSchema, gapSchema, overflowSchema;
Schema timeSchema, taskStateSchema, taskSchema, taskListSchema, outputPieceSchema, outputEndSchema;
Schema doctorSchema, instancesSchema, healthSchema, readySchema, whoamiSchema;
Schema depotListingSchema, depotRemovalSchema, depotSumsSchema, depotCheckSchema;

// clang-format off
std::vector<Route> routes() {
    return {
        {"GET", "/v1/tables", "The tables with their columns.",
         http::Access::Read, Runs::AtOnce, getTables,
         {{200, "the tables", tablesSchema}}},

        {"POST", "/v1/query", "Queries a table; on the request table, asks for a command.",
         http::Access::Read, Runs::OnWorker, postQuery,
         {{200, "what the table answered", queryAnswerSchema}}, {}, Others::None,
         {{"table", JsonType::String, Need::Required, "the name of the table"},
          {"where", JsonType::Array, Need::Optional, "conditions, all of which a row satisfies",
           conditionsSchema},
          {"force", JsonType::Boolean, Need::Optional,
           "on the request table: true sends a command for a product that is not there"},
          {"journal", JsonType::String, Need::Optional, "the journal that must be this host's"}},
         {404, 409}},

        {"GET", "/v1/events", "Streams the rows of a table as they come.",
         http::Access::Read, Runs::OnWorker, getEvents,
         {{200, "the events, until somebody ends the connection", nullptr,
           {{"message", rowSchema}, {"task", taskSchema}, {"gap", gapSchema},
            {"overflow", overflowSchema}}}},
         {{"table", Type::Text, Need::Required, "the name of the table"},
          {"after", Type::Text, Need::Optional, "of outcomes: the event after which to continue"},
          {"tasks", Type::Flag, Need::Optional, "of outcomes: 1 sends the ends of tasks, too"}},
         Others::Columns, {}, {404}},

        {"POST", "/v1/tasks", "Accepts a command for its turn.",
         http::Access::Act, Runs::OnWorker, postTask,
         {{202, "the task, which is on disk", taskSchema}}, {}, Others::None,
         {{"command", JsonType::String, Need::Optional, "the command; needed unless only recorded"},
          {"product", JsonType::String, Need::Optional, "the product's code"},
          {"version", JsonType::String, Need::Optional, "the product's version"},
          {"targetmsn", JsonType::String, Need::Optional, "the managed system"},
          {"optional", JsonType::String, Need::Optional, "the command's option"},
          {"context", JsonType::String, Need::Optional, "its text"},
          {"uaconfig", JsonType::String, Need::Optional, "the universal agent's metafile"},
          {"uascript", JsonType::String, Need::Optional, "its scripts"},
          {"transid", JsonType::String, Need::Optional, "the requester's name for it; else made up"},
          {"once", JsonType::Boolean, Need::Optional,
           "true: a repetition with the same transid gets the first one's task"},
          {"force", JsonType::Boolean, Need::Optional,
           "true sends a command for a product that is not there"},
          {"expires", JsonType::String, Need::Optional, "it must have begun by then", timeSchema},
          {"journal", JsonType::String, Need::Optional, "the journal that must be this host's"},
          {"refused", JsonType::String, Need::Optional, "why this never runs; recorded only"},
          {"cancelled", JsonType::String, Need::Optional, "the same for one that was cancelled"},
          {"expired", JsonType::String, Need::Optional, "the same for one that came too late"},
          {"done", JsonType::String, Need::Optional, "what was done without the plug-in"}},
         {404, 409, 429}},

        {"GET", "/v1/tasks", "Lists tasks, newest first.",
         http::Access::Read, Runs::OnWorker, getTasks,
         {{200, "the tasks", taskListSchema}},
         {{"state", Type::Text, Need::Optional, "only those in this state", taskStateSchema},
          {"product", Type::Text, Need::Optional, "only those for this product"},
          {"command", Type::Text, Need::Optional, "only those with this command"},
          {"since", Type::Text, Need::Optional, "only those accepted at this time or later",
           timeSchema},
          {"after", Type::Number, Need::Optional, "only those behind this cursor"},
          {"limit", Type::Number, Need::Optional, "at most so many; 100 if not given"},
          {"journal", Type::Text, Need::Optional, "the journal that must be this host's"}}},

        {"GET", "/v1/tasks/{id}", "Tells everything about one task.",
         http::Access::Read, Runs::OnWorker, getTask,
         {{200, "the task", taskSchema}},
         {{"id", Type::Text, Need::Required, "the task's identifier, or a TRANSID"},
          {"wait", Type::Number, Need::Optional, "seconds to wait for the task's end"},
          {"journal", Type::Text, Need::Optional, "the journal that must be this host's"}},
         Others::None, {}, {404}},

        // What commands write may hold anything.
        {"GET", "/v1/tasks/{id}/output", "Streams what a task's commands write.",
         http::Access::Act, Runs::OnWorker, getTaskOutput,
         {{200, "the output, piece by piece", nullptr,
           {{"message", outputPieceSchema}, {"overflow", overflowSchema},
            {"end", outputEndSchema}}}},
         {{"id", Type::Text, Need::Required, "the task's identifier, or a TRANSID"},
          {"follow", Type::Flag, Need::Optional, "1: goes on until the task is over"},
          {"after", Type::Text, Need::Optional, "the event after which to continue"},
          {"journal", Type::Text, Need::Optional, "the journal that must be this host's"}},
         Others::None, {}, {404}},

        {"POST", "/v1/tasks/{id}/cancel", "Cancels a task.",
         http::Access::Act, Runs::OnWorker, cancelTask,
         {{200, "the task, which is cancelled", taskSchema},
          {202, "the task, whose commands have not ended yet", taskSchema}},
         {{"id", Type::Text, Need::Required, "the task's identifier, or a TRANSID"},
          {"journal", Type::Text, Need::Optional, "the journal that must be this host's"}},
         Others::None, {}, {404, 409}},

        {"GET", "/v1/doctor", "Checks the home and the machine.",
         http::Access::Read, Runs::OnWorker, getDoctor,
         {{200, "what was found", doctorSchema}}},

        {"GET", "/v1/instances", "Which instances of agents run, and which should.",
         http::Access::Read, Runs::OnWorker, getInstances,
         {{200, "the instances", instancesSchema}}, {}, Others::None, {}, {404}},

        {"GET", "/v1/health", "What the host says about itself.",
         http::Access::Read, Runs::AtOnce, getHealth,
         {{200, "the host is alive", healthSchema}}},

        {"GET", "/v1/ready", "Whether the host takes and carries out commands, and why not.",
         http::Access::Read, Runs::OnWorker, getReady,
         {{200, "it does", readySchema}, {503, "it does not", readySchema}}},

        {"GET", "/v1/whoami", "Who the client is to the host, and what he may do.",
         http::Access::Read, Runs::OnWorker, getWhoami,
         {{200, "the client", whoamiSchema}}},

        {"GET", "/v1/metrics", "What the host counts, for a monitoring system.",
         http::Access::Read, Runs::OnWorker, getMetrics,
         {{200, "the figures, in Prometheus' text format 0.0.4", nullptr}}},

        {"GET", "/v1/openapi.json", "This interface, described for machines.",
         http::Access::Read, Runs::OnWorker, getOpenapi,
         {{200, "the description", routes::descriptionSchema}}},

        {"GET", "/v1/depot", "What the depot holds.",
         http::Access::Read, Runs::OnWorker, getDepot,
         {{200, "the entries", depotListingSchema}},
         {{"path", Type::Text, Need::Optional, "a directory or file; the depot if not given"}},
         Others::None, {}, {404}},

        {"DELETE", "/v1/depot", "Removes a file or a directory of the depot.",
         http::Access::Act, Runs::OnWorker, deleteDepot,
         {{200, "it is gone", depotRemovalSchema}},
         {{"path", Type::Text, Need::Required, "what is to be removed"},
          {"recursive", Type::Flag, Need::Optional, "1: a directory with everything in it"}},
         Others::None, {}, {404, 409}},

        {"GET", "/v1/depot/sum", "The SHA-256 of files of the depot.",
         http::Access::Read, Runs::AtOnce, getDepotSum,
         {{200, "a row for each file", depotSumsSchema}},
         {{"path", Type::Texts, Need::Required, "a file; may be given several times"}}},

        {"GET", "/v1/depot/check", "Whether the host would take files.",
         http::Access::Read, Runs::OnWorker, getDepotCheck,
         {{200, "a row for each file", depotCheckSchema}},
         {{"path", Type::Texts, Need::Required, "the name to be; may be given several times"},
          {"bytes", Type::Number, Need::Optional, "the size of all of them together"}}},
    };
}
// clang-format on

}  // namespace host
