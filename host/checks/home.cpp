// The home as a whole, and single files in it.

#include <pwd.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstddef>
#include <filesystem>
#include <iterator>
#include <string>
#include <system_error>
#include <vector>

#include "host/checks/check.h"
#include "host/checks/wording.h"
#include "host/home/run_as_list.h"

namespace host {
namespace {

namespace fs = std::filesystem;

/// For what the system knows of one user, in bytes.
constexpr std::size_t kRoom = std::size_t{16} << 10;
constexpr std::size_t kMostRoom = std::size_t{1} << 20;

bool isTrusted(const struct stat& found) {
    return (found.st_uid == ::geteuid() || found.st_uid == 0) && (found.st_mode & S_IWOTH) == 0;
}

/// Whether others than the host's user and root own the file or may write to it.
bool isLoose(const std::string& path) {
    struct stat found {};
    return ::stat(path.c_str(), &found) == 0 && !isTrusted(found);
}

/// Whether certainly nobody of that name is known here.
bool isNobody(const std::string& name) {
    struct passwd entry {};
    struct passwd* found = nullptr;
    std::vector<char> room(kRoom);
    while (true) {
        const int error = ::getpwnam_r(name.c_str(), &entry, room.data(), room.size(), &found);
        if (error != ERANGE || room.size() >= kMostRoom) return error == 0 && found == nullptr;
        room.resize(room.size() * 2);
    }
}

std::vector<std::string> unknownUsersOf(const RunAsList& list) {
    std::vector<std::string> unknown;
    std::copy_if(list.users.begin(), list.users.end(), std::back_inserter(unknown), isNobody);
    return unknown;
}

}  // namespace

CheckFunction checkHome, checkOwners, checkRunAs;

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
    const RunAsList list = readRunAsList(subject.options.home);
    if (!list.fault.empty()) {
        return {Verdict::Error,
                list.path + ": " + list.fault +
                    "; agents would run as the host's user instead of their own",
                "correct the file, or remove it"};
    }
    if (!list.isThere) {
        return {Verdict::Ok, list.path + " does not exist; every agent runs as the host's user",
                ""};
    }
    const std::vector<std::string> unknown = unknownUsersOf(list);
    if (unknown.empty()) return {Verdict::Ok, list.path, ""};
    return {Verdict::Warning,
            list.path + " names users who do not exist here: " + listed(unknown) +
                "; their agents cannot be started",
            "make these users, or correct the file"};
}

}  // namespace host
