/// status: how the host is.
#pragma once

#include <nlohmann/json_fwd.hpp>

#include "ctl/show/page.h"

namespace ctl {

struct Invocation;

/// The host's health document.
nlohmann::json askStatus(const Invocation& invocation);
/// Throws Failure when it is no such document.
Page showStatus(const nlohmann::json& health, Format format);

}  // namespace ctl
