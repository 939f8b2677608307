/// How a managed system name becomes the name of an instance: as the plug-in does it.
#pragma once

#include <string>

namespace host {

/// What the home makes of a managed system name.
struct Resolution {
    std::string instance;   ///< empty: none, so that the default instance would be taken
    std::string complaint;  ///< what the home's program said against the name; empty if nothing
};

/// Asks the translator, whose path is empty where there is none. Waits until it has answered,
/// within bounds.
Resolution instanceByTranslator(const std::string& translator, const std::string& product,
                                const std::string& target);

/// The instance in "INSTANCE:HOST:UA"; empty for any other name.
std::string universalAgentInstance(const std::string& target);

}  // namespace host
