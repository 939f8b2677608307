/// Conditions of a query as people type them.
#pragma once

#include <string>

#include "ctl/client/condition.h"

namespace ctl {

/// Reads "COLUMN=VALUE", with != < <= > >= for other comparisons and ~ for a pattern. Throws
/// Failure(kWrongUsage) for anything else.
Condition parseCondition(const std::string& text);

}  // namespace ctl
