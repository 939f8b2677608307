#include "host/outcomes/shown_request.h"

#include <algorithm>
#include <utility>

#include "host/tables/plugin_facts.h"
#include "secrets/masked.h"

namespace host {
namespace {

constexpr std::size_t kLongestValue = 4096;

/// Returns whether the value changed. Names stay as they are: tasks are found by them.
bool maskText(oxa::Predicate& condition) {
    if (!plugin::holdsFreeText(condition.column)) return false;
    std::string shown = secrets::masked(condition.value);
    if (shown == condition.value) return false;
    condition.value = std::move(shown);
    return true;
}

}  // namespace

std::string valueIn(const std::vector<oxa::Predicate>& conditions, std::string_view column) {
    std::string value;
    for (const oxa::Predicate& condition : conditions) {
        if (condition.column == column) value = condition.value;
    }
    return value;
}

bool makeKeepable(std::vector<oxa::Predicate>& conditions) {
    const bool secret = valueIn(conditions, plugin::kCommandColumn) == plugin::kSetConfiguration;
    const auto isSecret = [secret](const oxa::Predicate& condition) {
        return secret && condition.column == plugin::kContextColumn;
    };
    const auto from = std::remove_if(conditions.begin(), conditions.end(), isSecret);
    bool found = from != conditions.end();
    conditions.erase(from, conditions.end());
    for (oxa::Predicate& condition : conditions) {
        found = maskText(condition) || found;
        if (condition.value.size() > kLongestValue) condition.value.resize(kLongestValue);
        condition.value.shrink_to_fit();
    }
    return found;
}

std::vector<std::pair<std::string, std::string>> shownRequest(
    const std::vector<oxa::Predicate>& conditions) {
    std::vector<oxa::Predicate> kept = conditions;
    makeKeepable(kept);
    std::vector<std::pair<std::string, std::string>> values;
    for (const oxa::Predicate& condition : kept) {
        const auto same = std::find_if(values.begin(), values.end(), [&](const auto& value) {
            return value.first == condition.column;
        });
        if (same == values.end()) {
            values.emplace_back(condition.column, condition.value);
        } else {
            same->second = condition.value;
        }
    }
    return values;
}

}  // namespace host
