/// config get: an agent's configuration.
#pragma once

#include <nlohmann/json_fwd.hpp>
#include <string>

#include "ctl/client/host_address.h"
#include "ctl/show/page.h"

namespace ctl {

/// The host's reply to a request for a configuration, with the text in its column CONTEXT. An empty
/// target means the default instance.
nlohmann::json askConfiguration(const HostAddress& host, Format format, const std::string& product,
                                const std::string& target);

Page showConfiguration(const std::string& product, const nlohmann::json& row, Format format);

/// What is said when the host could not give a configuration; `title` is the command.
Page showNoConfiguration(const std::string& title, const nlohmann::json& row);

}  // namespace ctl
