/// Conditions of a request, checked against the table's columns.
#pragma once

#include <nlohmann/json_fwd.hpp>
#include <stdexcept>
#include <string>

#include "embedded/oxa_host.h"
#include "host/tables/code_page.h"

namespace host {

/// A request that makes no sense; what() is the sentence for the client.
class BadRequest : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
};

/// Makes conditions on one table. Everything throws BadRequest when the column is unknown (names
/// are compared exactly) or its type does not go with operator or value.
class ConditionReader {
public:
    /// Both outlive the reader.
    ConditionReader(const oxa::Table& table, const CodePage& codePage)
        : table_(table), codePage_(codePage) {}

    /// {"column": ..., "op": ..., "value": ...}; the value is a string, for an integer column a
    /// number or a string of decimal digits.
    oxa::Predicate fromJson(const nlohmann::json& condition) const;
    /// Column = text.
    oxa::Predicate equality(const std::string& column, const std::string& text) const;

private:
    const oxa::Column& columnOf(const std::string& name) const;
    std::string textValue(const oxa::Column& column, const std::string& text) const;
    std::string numberValue(const oxa::Column& column, const nlohmann::json& value) const;

    const oxa::Table& table_;
    const CodePage& codePage_;
};

}  // namespace host
