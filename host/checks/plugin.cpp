// Whether the plug-in can be loaded and is one.

#include <string>
#include <vector>

#include "host/checks/check.h"
#include "host/process/plugin_loader.h"
#include "host/process/start_error.h"

namespace host {

CheckFunction checkPlugin;

/// The host itself needs the start-up function alone, and a plug-in without it does not load. The
/// other names are for those who link the plug-in.
Finding checkPlugin(CheckSubject& subject) {
    try {
        const Plugin plugin(subject.options.plugin);
        const std::string text = plugin.file() + ", " + plugin.libraryName();
        const std::vector<std::string> missing = plugin.missingExports();
        if (missing.empty()) return {Verdict::Ok, text, ""};
        return {
            Verdict::Warning,
            text + " does not export " + missing.front() +
                (missing.size() > 1 ? " and " + std::to_string(missing.size() - 1) + " other names"
                                    : ""),
            "install the plug-in that came with this host"};
    } catch (const StartError& error) {
        return {Verdict::Error, error.what(),
                "name the plug-in with --plugin, or install it again"};
    }
}

}  // namespace host
