#include "host/guard/command_request.h"

#include <algorithm>

#include "host/tables/plugin_facts.h"

namespace host {
namespace {

bool isUniversalAgent(std::string product) {
    std::transform(product.begin(), product.end(), product.begin(),
                   [](char c) { return c >= 'A' && c <= 'Z' ? static_cast<char>(c + 32) : c; });
    return product == plugin::kUniversalAgent;
}

}  // namespace

const std::string& CommandRequest::value(std::string_view column) const {
    static const std::string none;
    const auto found =
        std::find_if(conditions_.rbegin(), conditions_.rend(),
                     [column](const oxa::Predicate& each) { return each.column == column; });
    return found == conditions_.rend() ? none : found->value;
}

void CommandRequest::setValue(std::string_view column, std::string value, _IntfOper op) {
    const auto found =
        std::find_if(conditions_.rbegin(), conditions_.rend(),
                     [column](const oxa::Predicate& each) { return each.column == column; });
    if (found == conditions_.rend()) return;
    found->value = std::move(value);
    found->op = op;
}

const std::string& CommandRequest::command() const {
    return value(plugin::kCommandColumn);
}

const std::string& CommandRequest::product() const {
    return value(plugin::kProductColumn);
}

const std::string& CommandRequest::target() const {
    return value(plugin::kTargetColumn);
}

bool CommandRequest::configuresUniversalAgent() const {
    return command() == plugin::kSetConfiguration && isUniversalAgent(product());
}

bool CommandRequest::targetIsInstance() const {
    return command() == plugin::kStart &&
           value(plugin::kOptionalColumn) == plugin::kTargetIsInstance;
}

}  // namespace host
