/// A command for the host: one request to the table KAGREQT.
#pragma once

#include <string>
#include <vector>

#include "ctl/client/condition.h"

namespace ctl {

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

    std::vector<Condition> conditions() const;
};

/// A transaction identifier that no other request has.
std::string makeTransid();

}  // namespace ctl
