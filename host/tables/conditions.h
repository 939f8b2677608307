/// Conditions of a request, checked against the table's columns.
#pragma once

#include <nlohmann/json_fwd.hpp>
#include <string>
#include <utility>

#include "embedded/oxa_host.h"
#include "host/tables/code_page.h"
#include "routes/bad_request.h"

namespace host {

/// There is no such column.
class UnknownColumn : public routes::BadRequest {
public:
    UnknownColumn(const oxa::Table& table, std::string name)
        : routes::BadRequest("table " + table.name + " has no column \"" + name + "\""),
          name_(std::move(name)) {}
    /// The name that was given.
    const std::string& name() const { return name_; }

private:
    std::string name_;
};

/// Makes conditions on one table. Every member throws UnknownColumn when there is no such column
/// (names are compared exactly), and routes::BadRequest when its type does not go with the operator
/// or the value.
class ConditionReader {
public:
    /// Both outlive the reader.
    ConditionReader(const oxa::Table& table, const CodePage& codePage)
        : table_(table), codePage_(codePage) {}

    /// Reads {"column": ..., "op": ..., "value": ...}. The value is a string; for an integer column
    /// it is a number or a string of decimal digits.
    oxa::Predicate fromJson(const nlohmann::json& condition) const;
    /// The condition that the column equals the text.
    oxa::Predicate equality(const std::string& column, const std::string& text) const;

private:
    const oxa::Column& columnOf(const std::string& name) const;
    std::string textValue(const oxa::Column& column, const std::string& text) const;
    std::string numberValue(const oxa::Column& column, const nlohmann::json& value) const;

    const oxa::Table& table_;
    const CodePage& codePage_;
};

}  // namespace host
