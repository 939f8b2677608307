/// Clients of this system's host and of other programs that run a command on request.
#pragma once

#include <cstdint>
#include <functional>
#include <string>
#include <vector>

namespace request {

/// One request and its whole answer; throws std::runtime_error when there is none.
using Exchange = std::function<std::string()>;

/// A query on a table of the host at the Unix socket `path`, as a JSON document; over a connection
/// that is opened by the first exchange and kept, or over a new one each time.
Exchange hostQuery(const std::string& path, const std::string& query, bool keep);

/// The command `name` of the NRPE server at `port`, which speaks without TLS; a new connection each
/// time, with packets of version 2.
Exchange nrpe(std::uint16_t port, const std::string& name);

/// The Zabbix agent's system.run of `command`; a new connection each time, as the agent wants it.
Exchange zabbix(std::uint16_t port, const std::string& command);

/// What a program prints, which is started anew each time.
Exchange program(const std::vector<std::string>& arguments);

}  // namespace request
