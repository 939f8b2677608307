#include "host/tables/conditions.h"

#include <charconv>
#include <cstdint>
#include <limits>
#include <nlohmann/json.hpp>
#include <optional>
#include <utility>

namespace host {
namespace {

using nlohmann::json;

constexpr std::pair<const char*, _IntfOper> kOperators[] = {
    {"=", OPER_EQ}, {"!=", OPER_NE}, {"<", OPER_LT},      {"<=", OPER_LE},
    {">", OPER_GT}, {">=", OPER_GE}, {"like", OPER_LIKE},
};

_IntfOper operatorOf(const std::string& text) {
    for (const auto& [name, op] : kOperators) {
        if (text == name) return op;
    }
    throw routes::BadRequest("unknown operator \"" + text + "\": there are = != < <= > >= like");
}

const std::string& stringMember(const json& condition, const char* name) {
    const auto found = condition.find(name);
    if (found == condition.end()) {
        throw routes::BadRequest(std::string("a condition lacks its \"") + name + "\"");
    }
    if (!found->is_string()) {
        throw routes::BadRequest(std::string("\"") + name + "\" of a condition is not a string");
    }
    return found->get_ref<const std::string&>();
}

void checkMembers(const json& condition) {
    if (!condition.is_object()) throw routes::BadRequest("a condition is not an object");
    for (const auto& member : condition.items()) {
        const std::string& name = member.key();
        if (name != "column" && name != "op" && name != "value") {
            throw routes::BadRequest("unknown member \"" + name + "\" in a condition");
        }
    }
    if (!condition.contains("value")) throw routes::BadRequest("a condition lacks its \"value\"");
}

std::optional<std::int32_t> decimal(const std::string& text) {
    std::int32_t value = 0;
    const char* const end = text.data() + text.size();
    const auto [stop, error] = std::from_chars(text.data(), end, value);
    return error == std::errc() && stop == end ? std::optional<std::int32_t>(value) : std::nullopt;
}

std::optional<std::int32_t> integerOf(const json& value) {
    using Limits = std::numeric_limits<std::int32_t>;
    if (value.is_string()) return decimal(value.get_ref<const std::string&>());
    if (value.is_number_unsigned()) {
        const auto number = value.get<std::uint64_t>();
        if (number > static_cast<std::uint64_t>(Limits::max())) return std::nullopt;
        return static_cast<std::int32_t>(number);
    }
    if (!value.is_number_integer()) return std::nullopt;
    const auto number = value.get<std::int64_t>();
    if (number < Limits::min() || number > Limits::max()) return std::nullopt;
    return static_cast<std::int32_t>(number);
}

}  // namespace

oxa::Predicate ConditionReader::fromJson(const json& condition) const {
    checkMembers(condition);
    const oxa::Column& column = columnOf(stringMember(condition, "column"));
    const _IntfOper op = operatorOf(stringMember(condition, "op"));
    const json& value = condition.at("value");
    if (column.type != OXA_TYPE_INTEGER) {
        if (!value.is_string()) {
            throw routes::BadRequest("the value of column " + column.name + " is not a string");
        }
        return {column.name, op, textValue(column, value.get_ref<const std::string&>())};
    }
    if (op == OPER_LIKE) {
        throw routes::BadRequest("column " + column.name +
                                 " is an integer; \"like\" compares characters");
    }
    return {column.name, op, numberValue(column, value)};
}

oxa::Predicate ConditionReader::equality(const std::string& column, const std::string& text) const {
    const oxa::Column& known = columnOf(column);
    return {
        known.name, OPER_EQ,
        known.type == OXA_TYPE_INTEGER ? numberValue(known, json(text)) : textValue(known, text)};
}

const oxa::Column& ConditionReader::columnOf(const std::string& name) const {
    const oxa::Column* column = table_.find(name);
    if (column == nullptr) throw UnknownColumn(table_, name);
    return *column;
}

std::string ConditionReader::textValue(const oxa::Column& column, const std::string& text) const {
    if (text.find('\0') != std::string::npos) {
        throw routes::BadRequest("the value of column " + column.name + " holds the character 0");
    }
    std::optional<std::string> local = codePage_.fromUtf8(text);
    if (!local) {
        throw routes::BadRequest("the value of column " + column.name +
                                 " holds what the host's code page " + codePage_.name() + " lacks");
    }
    return std::move(*local);
}

std::string ConditionReader::numberValue(const oxa::Column& column, const json& value) const {
    const std::optional<std::int32_t> number = integerOf(value);
    if (!number) {
        throw routes::BadRequest("the value of column " + column.name +
                                 " is not a whole number of 32 bits");
    }
    return std::to_string(*number);
}

}  // namespace host
