/// What an administrator lets an operator do.
#pragma once

#include <chrono>
#include <string>
#include <vector>

namespace fleet {

/// Viewer: gives no orders, and sees the hosts of the selector. Operator: gives the orders with
/// these commands for these products to the hosts of the selector. Admin: all commands and
/// products, and what only the centre does: labels, retiring hosts, taking back others' orders.
///
/// Links know nothing of roles. They look at the certificate's commands, products and selector,
/// which are empty for a viewer. The role itself decides at the centre only, so it is kept there
/// and not certified: a centre that lies about it can do no more than it can do anyway.
enum class Role { Viewer, Operator, Admin };

const char* textOf(Role role);
/// Throws KeysError.
Role roleOf(const std::string& text);

struct OperatorGrant {
    std::string name;
    Role role = Role::Viewer;
    std::vector<std::string> commands;  ///< of an operator only; * stands for any characters
    std::vector<std::string> products;  ///< of an operator only
    std::string selector = "*";
    std::chrono::milliseconds valid = std::chrono::hours(24 * 365);  ///< of the certificate
};

/// The grant with what its role brings. Throws KeysError if it makes no sense: an operator without
/// commands, a viewer with some, a selector that is none, more than 3 years.
OperatorGrant completed(OperatorGrant grant);

}  // namespace fleet
