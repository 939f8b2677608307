/// Conditions as they are typed.
#pragma once

#include <string>

#include "ctl/client/host_client.h"

namespace ctl {

/// "COLUMN=VALUE", with != < <= > >= for the other comparisons and ~ for a pattern. Throws
/// Failure(kWrongUsage) for anything else.
Condition parseCondition(const std::string& text);

}  // namespace ctl
