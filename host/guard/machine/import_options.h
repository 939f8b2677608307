/// The options of a universal agent's import, as the plug-in reads them from CONTEXT.
#pragma once

#include <string>
#include <vector>

namespace host {

/// The texts that are given as port, in their order; the plug-in takes the last one.
std::vector<std::string> portsIn(const std::string& context);

/// The number from 1 to 65535 that the text is, or 0.
int portNumber(const std::string& text);

/// The instance, other than `instance`, whose start-up parameters name the port: "" when there is
/// none, "the default instance" for the one without a name. `parameters` is the file's text.
std::string holderOfPort(const std::string& parameters, int port, const std::string& instance);

}  // namespace host
