// The programs that a home, and the machine, must offer.

#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <string>
#include <system_error>

#include "host/checks/check.h"
#include "host/tables/plugin_facts.h"

namespace host {
namespace {

/// What is wrong with a program; "" if it can be executed.
std::string programFault(const std::string& path) {
    struct stat found {};
    if (::stat(path.c_str(), &found) != 0) {
        return errno == ENOENT ? path + " is missing"
                               : path + ": " + std::generic_category().message(errno);
    }
    if (!S_ISREG(found.st_mode)) return path + " is not a file";
    // For root the kernel asks only that somebody may execute it, and so does this.
    if (::access(path.c_str(), X_OK) != 0) return path + " is not executable";
    return "";
}

std::string remedyFor(const std::string& path, const std::string& source) {
    struct stat found {};
    if (::stat(path.c_str(), &found) == 0 && S_ISREG(found.st_mode)) return "chmod +x " + path;
    return "restore it from " + source;
}

constexpr const char* kStarterHome = "the starter home or a backup";

Finding look(const std::string& path, Verdict ifFaulty, const std::string& purpose,
             const char* source = kStarterHome) {
    const std::string fault = programFault(path);
    if (fault.empty()) return {Verdict::Ok, path, ""};
    return {ifFaulty, fault + "; " + purpose, remedyFor(path, source)};
}

}  // namespace

CheckFunction checkAgentScript, checkInventory, checkTranslator, checkUninstaller, checkConsole,
    checkShell;

Finding checkAgentScript(CheckSubject& subject) {
    return look(subject.inHome("bin/TovrinAgent"), Verdict::Error, "no agent can start or stop");
}

Finding checkInventory(CheckSubject& subject) {
    const std::string path = subject.inHome("bin/cinfo");
    Finding finding = look(path, Verdict::Error, "nobody knows what is installed");
    if (finding.verdict != Verdict::Ok) return finding;
    const Inventory& inventory = subject.inventory();
    if (!inventory.result.succeeded()) {
        return {Verdict::Warning, path + " -d " + endInWords(inventory.result),
                "run it by hand and mend what it complains about"};
    }
    return {Verdict::Ok, path + ": " + std::to_string(inventory.products.size()) + " entries", ""};
}

/// The translator comes with the shared component, which may be installed by a request to the host.
/// So it is an error only when the inventory says that the component is there.
Finding checkTranslator(CheckSubject& subject) {
    const std::string path = translatorPath(subject.options.home, subject.inventory());
    const std::string purpose = "no configuration can be read or changed";
    if (path.empty()) {
        return {Verdict::Warning, "the shared component ax is not installed; " + purpose,
                "install it"};
    }
    return look(path, Verdict::Error, purpose, "the bundle of the shared component ax");
}

Finding checkUninstaller(CheckSubject& subject) {
    return look(subject.inHome("bin/uninstall.sh"), Verdict::Error, "no product can be removed");
}

/// Only requests about the universal agent run the console. On a home without that agent nobody
/// misses it.
Finding checkConsole(CheckSubject& subject) {
    if (!subject.inventory().has("um")) {
        return {Verdict::Ok, "only the universal agent um needs it, which is not installed", ""};
    }
    return look(subject.inHome("bin/um_console"), Verdict::Error,
                "the universal agent cannot be configured");
}

/// A request that looks at the machine's architecture is the only one that runs it.
Finding checkShell(CheckSubject&) {
    const std::string path(plugin::kProbeShell);
    const std::string fault = programFault(path);
    if (fault.empty()) return {Verdict::Ok, path, ""};
    return {Verdict::Warning, fault + "; the inventory cannot tell the system and its architecture",
            "install a Korn shell that is found there, such as the package mksh"};
}

}  // namespace host
