#include "fleet/server/keys/trust/operator_grant.h"

#include <array>
#include <utility>

#include "fleet/bus/messages/selector.h"
#include "fleet/server/keys/files/keys_error.h"
#include "fleet/server/keys/trust/names.h"

namespace fleet {
namespace {

constexpr std::array<std::pair<Role, const char*>, 3> kRoles = {
    {{Role::Viewer, "viewer"}, {Role::Operator, "operator"}, {Role::Admin, "admin"}}};
constexpr std::chrono::hours kLongestGrant{24 * 365 * 3};

void checkSelectorText(const std::string& selector) {
    try {
        const Selector read(selector);
    } catch (const SelectorError& error) {
        throw KeysError(error.what());
    }
}

}  // namespace

const char* textOf(Role role) {
    for (const auto& [known, text] : kRoles) {
        if (known == role) return text;
    }
    return "";
}

Role roleOf(const std::string& text) {
    for (const auto& [role, known] : kRoles) {
        if (text == known) return role;
    }
    throw KeysError("\"" + text + "\" is no role; there are viewer, operator and admin");
}

OperatorGrant completed(OperatorGrant grant) {
    checkName(grant.name);
    checkSelectorText(grant.selector);
    if (grant.valid < std::chrono::hours(1) || grant.valid > kLongestGrant) {
        throw KeysError("a certificate is good for an hour up to three years");
    }
    const bool isOperator = grant.role == Role::Operator;
    if (!isOperator && (!grant.commands.empty() || !grant.products.empty())) {
        throw KeysError("only the role operator has commands and products of its own");
    }
    if (isOperator && grant.commands.empty()) {
        throw KeysError("name the commands of this operator; one without any is a viewer");
    }
    if (grant.role == Role::Admin) grant.commands = grant.products = {"*"};
    return grant;
}

}  // namespace fleet
