/// A request for a command before the plug-in sees it.
#pragma once

#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "embedded/oxa_host.h"

namespace host {

/// The conditions of a query on the request table, in their order, with values in the tables' code
/// page. Guards look at it and may change it; what is left is handed on. A value: copies share
/// nothing.
class CommandRequest {
public:
    /// `force` passes the guard that knows the inventory.
    CommandRequest(std::vector<oxa::Predicate> conditions, bool force)
        : conditions_(std::move(conditions)), force_(force) {}

    const std::vector<oxa::Predicate>& conditions() const { return conditions_; }
    bool force() const { return force_; }

    /// The value of the column as the plug-in takes it: that of its last condition, whatever the
    /// operator. Empty when there is none.
    const std::string& value(std::string_view column) const;
    /// Replaces the value of the column's last condition, and its operator; without one nothing
    /// happens. The plug-in takes the value whatever the operator is, which only says whether the
    /// row that answers is wanted.
    void setValue(std::string_view column, std::string value, _IntfOper op = OPER_EQ);

    const std::string& command() const;
    const std::string& product() const;
    /// The managed system name.
    const std::string& target() const;
    /// Whether the plug-in takes the product for the universal agent when it is configured.
    bool configuresUniversalAgent() const;
    /// Whether the target of a START is the name of an instance itself.
    bool targetIsInstance() const;

private:
    std::vector<oxa::Predicate> conditions_;
    bool force_;
};

}  // namespace host
