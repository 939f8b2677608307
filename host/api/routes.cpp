#include "host/api/routes.h"

namespace host {

/// The endpoints. Each has a file of its own in this folder and a row below.
Endpoint getTables, postQuery, getEvents, getTasks, getTask, getDoctor, getHealth;

// clang-format off
std::vector<Route> routes() {
    return {
        {"GET", "/v1/tables", "The tables with their columns.",
         Access::Read, Runs::AtOnce, getTables},

        {"POST", "/v1/query", "Queries a table; on the request table, asks for a command.",
         Access::Read, Runs::OnWorker, postQuery, {}, Others::None,
         {{"table", Json::String, Need::Required, "the name of the table"},
          {"where", Json::Array, Need::Optional, "conditions, all of which a row satisfies"},
          {"force", Json::Boolean, Need::Optional,
           "on the request table: true sends a command for a product that is not there"}}},

        {"GET", "/v1/events", "Streams the rows of a table as they come.",
         Access::Read, Runs::OnWorker, getEvents,
         {{"table", Type::Text, Need::Required, "the name of the table"}}, Others::Columns},

        {"GET", "/v1/tasks", "Lists tasks, newest first.",
         Access::Read, Runs::OnWorker, getTasks,
         {{"state", Type::Text, Need::Optional, "only those in this state"},
          {"product", Type::Text, Need::Optional, "only those for this product"},
          {"command", Type::Text, Need::Optional, "only those with this command"},
          {"limit", Type::Number, Need::Optional, "at most so many; 100 if not given"}}},

        {"GET", "/v1/tasks/{id}", "Tells everything about one task.",
         Access::Read, Runs::OnWorker, getTask,
         {{"id", Type::Text, Need::Required, "the task's identifier, or a TRANSID"},
          {"wait", Type::Number, Need::Optional, "seconds to wait for the task's end"}}},

        {"GET", "/v1/doctor", "Checks the home and the machine.",
         Access::Read, Runs::OnWorker, getDoctor},

        {"GET", "/v1/health", "What the host says about itself.",
         Access::Read, Runs::AtOnce, getHealth},
    };
}
// clang-format on

}  // namespace host
