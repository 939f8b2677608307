/// config get: an agent's configuration.
#pragma once

#include <cstddef>
#include <nlohmann/json.hpp>
#include <string>

#include "ctl/client/address/host_address.h"
#include "ctl/client/host_client.h"
#include "ctl/show/page.h"

namespace ctl {

/// The most bytes that the reply's column CONTEXT holds. A longer text is cut there.
constexpr std::size_t kContextBytes = 3072;

/// An agent's configuration as the host gives it.
struct Configuration {
    nlohmann::json row;   ///< the reply
    nlohmann::json full;  ///< the texts beside it, see QueryAnswer
    std::string text;     ///< as much as there is of it
    bool isWhole = true;  ///< false if it is cut, or may be
    /// What the host knows of a request that failed, see Task::record(); else null.
    nlohmann::json record = nullptr;
};

/// What an answer to a request for a configuration holds. The answer has a row.
Configuration configurationIn(const QueryAnswer& answer);

/// Asks the host for a configuration. An empty target means the default instance. An unguarded
/// host's text counts as whole, whatever its length. Ctrl-C meanwhile names the task.
Configuration askConfiguration(const HostAddress& host, Format format, const std::string& product,
                               const std::string& target);

/// A text that is cut is a failure, and is shown as far as it goes.
Page showConfiguration(const std::string& product, const Configuration& configuration,
                       Format format);

/// What is said when the host could not give a configuration: why, and the commands that it ran.
/// `title` is the command.
Page showNoConfiguration(const std::string& title, const Configuration& configuration);

}  // namespace ctl
