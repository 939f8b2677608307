// The home as a whole, and single files in it.

#include <sys/stat.h>
#include <sys/utsname.h>
#include <unistd.h>

#include <algorithm>
#include <cstddef>
#include <filesystem>
#include <string>
#include <system_error>
#include <vector>

#include "host/checks/check.h"
#include "host/checks/xml_file.h"

namespace host {
namespace {

namespace fs = std::filesystem;

constexpr std::size_t kMostNames = 5;

/// The first names of a list, for a line of text.
std::string listed(std::vector<std::string> names) {
    std::sort(names.begin(), names.end());
    std::string text;
    for (std::size_t i = 0; i < std::min(names.size(), kMostNames); ++i) {
        text += (i == 0 ? "" : ", ") + names[i];
    }
    if (names.size() > kMostNames) {
        text += " and " + std::to_string(names.size() - kMostNames) + " more";
    }
    return text;
}

bool isTrusted(const struct stat& found) {
    return (found.st_uid == ::geteuid() || found.st_uid == 0) && (found.st_mode & S_IWOTH) == 0;
}

/// Whether others than the host's user and root own the file or may write to it.
bool isLoose(const std::string& path) {
    struct stat found {};
    return ::stat(path.c_str(), &found) == 0 && !isTrusted(found);
}

std::string runAsFile(CheckSubject& subject) {
    struct utsname names {};
    if (::uname(&names) != 0) return "";
    const std::string node = names.nodename;
    return subject.inHome("config/" + node.substr(0, node.find('.')) + "_zavrunas.cfg");
}

}  // namespace

CheckFunction checkHome, checkOwners, checkRunAs, checkLeftovers;

Finding checkHome(CheckSubject& subject) {
    const std::string& home = subject.options.home;
    const std::size_t odd = home.find_first_of(" \t\n'\"|\\");
    if (odd != std::string::npos) {
        return {Verdict::Warning,
                home +
                    " holds a blank, a quote, a backslash or a |; the plug-in splits its "
                    "command lines there",
                "move the home to a plain path"};
    }
    std::vector<std::string> missing;
    for (const char* const name : {"bin", "config", "logs"}) {
        std::error_code ignored;
        if (!fs::is_directory(subject.inHome(name), ignored)) missing.emplace_back(name);
    }
    if (missing.empty()) return {Verdict::Ok, home, ""};
    return {Verdict::Warning, home + " lacks the directories " + listed(missing),
            "make the home with prepare-home, or make them by hand"};
}

/// The host runs these programs, so whoever can change them has the host's rights.
Finding checkOwners(CheckSubject& subject) {
    std::vector<std::string> loose;
    for (const char* const name : {"", "bin", "config", "bin/TovrinAgent", "bin/cinfo",
                                   "bin/uninstall.sh", "bin/um_console", "bin/TovrinGetJavaHome"}) {
        const std::string path = *name == '\0' ? subject.options.home : subject.inHome(name);
        if (isLoose(path)) loose.push_back(path);
    }
    const std::string translator = translatorPath(subject.options.home, subject.inventory());
    if (!translator.empty() && isLoose(translator)) loose.push_back(translator);
    if (loose.empty()) {
        return {Verdict::Ok, "programs and configuration belong to the host's user or to root", ""};
    }
    return {Verdict::Warning, "others own or may write to " + listed(loose),
            "give them to the host's user and take the write permission from others"};
}

Finding checkRunAs(CheckSubject& subject) {
    const std::string path = runAsFile(subject);
    std::error_code ignored;
    if (!fs::exists(path, ignored)) {
        return {Verdict::Ok, path + " does not exist; every agent runs as the host's user", ""};
    }
    const std::string fault = xmlFaultOf(path);
    if (fault.empty()) return {Verdict::Ok, path, ""};
    return {Verdict::Error,
            path + ": " + fault + "; agents would run as the host's user instead of their own",
            "correct the file, or remove it"};
}

/// A change of the universal agent's configuration leaves these when its last step fails.
Finding checkLeftovers(CheckSubject& subject) {
    std::vector<std::string> found;
    for (const char* const folder : {"config", "config/.ConfigData"}) {
        std::error_code ignored;
        for (fs::directory_iterator entry(subject.inHome(folder), ignored), end; entry != end;
             entry.increment(ignored)) {
            if (entry->path().extension() == ".copy") found.push_back(entry->path().string());
        }
    }
    if (found.empty()) return {Verdict::Ok, "no change of a configuration was interrupted", ""};
    return {Verdict::Warning, "an interrupted change of a configuration left " + listed(found),
            "compare it with the file without .copy, keep the right one and remove the other"};
}

}  // namespace host
