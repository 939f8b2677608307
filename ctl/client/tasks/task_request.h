/// A command for the host: one request to the request table.
#pragma once

#include <nlohmann/json_fwd.hpp>
#include <string>
#include <vector>

#include "ctl/client/host_client.h"

namespace ctl {

/// A query on this table acts: it carries out a command, or has it queued.
constexpr const char* kRequestTable = "KAGREQT";

/// The columns of a request. Empty ones are not sent.
struct TaskRequest {
    std::string command;
    std::string transid;
    std::string product;
    std::string context;
    std::string optional;
    std::string uaconfig;
    std::string uascript;
    std::string version;
    std::string targetmsn;
    bool isForced = false;  ///< send it although the inventory does not list the product
    /// No other request has the transaction identifier, so that the host can be asked again when
    /// its answer was lost.
    bool isUnique = false;
    /// The user may repeat the request: then the host must know the first one again.
    bool isOnce = false;

    std::vector<Condition> conditions() const;
    TableQuery query() const;
    /// The body of POST /v1/tasks.
    nlohmann::json document() const;
};

/// A transaction identifier that no other request has.
std::string makeTransid();

/// Whether an identifier is one of makeTransid(), which tells people nothing.
bool isMadeUp(const std::string& transid);

}  // namespace ctl
