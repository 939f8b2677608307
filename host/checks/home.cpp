// The home as a whole, and single files in it.

#include <pwd.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstddef>
#include <filesystem>
#include <iterator>
#include <set>
#include <string>
#include <system_error>
#include <utility>
#include <vector>

#include "host/checks/check.h"
#include "host/checks/lossy_path.h"
#include "host/checks/wording.h"
#include "host/home/run_as_list.h"
#include "host/home/temporary_directory.h"
#include "host/process/system/trusted_file.h"

namespace host {
namespace {

namespace fs = std::filesystem;

/// For what the system knows of one user, in bytes.
constexpr std::size_t kRoom = std::size_t{16} << 10;
constexpr std::size_t kMostRoom = std::size_t{1} << 20;

/// Whether others than the host's user and root own the file or may write to it.
bool isLoose(const std::string& path) {
    struct stat found {};
    return ::stat(path.c_str(), &found) == 0 && !isTrusted(found);
}

/// What the host runs, reads and trusts: the home and its programs, their libraries and the
/// configuration with all their files, and the directories that the host works in.
std::set<std::string> pathsToProtect(CheckSubject& subject) {
    std::set<std::string> paths = {subject.options.home, depotOf(subject),
                                   temporaryDirectoryOf(subject.options.home),
                                   subject.options.state};
    for (const char* const folder : {"bin", "lib", "registry", "config", "config/.ConfigData"}) {
        paths.insert(subject.inHome(folder));
        std::error_code ignored;
        for (fs::directory_iterator entry(subject.inHome(folder), ignored), end; entry != end;
             entry.increment(ignored)) {
            paths.insert(entry->path().string());
        }
    }
    paths.insert(translatorPath(subject.options.home, subject.inventory()));
    return paths;
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
    if (auto loss = lossOf(home)) return *std::move(loss);
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

/// Whoever can change these has the host's rights. A directory is as good as the files in it: who
/// may write to it can put another file in a file's place.
Finding checkOwners(CheckSubject& subject) {
    std::vector<std::string> loose;
    for (const std::string& path : pathsToProtect(subject)) {
        if (isLoose(path)) loose.push_back(path);
    }
    if (loose.empty()) {
        return {Verdict::Ok,
                "programs, configuration and the host's directories belong to its user or to root",
                ""};
    }
    return {Verdict::Warning, "others own or may write to " + listed(loose),
            "give them to the host's user, and take the write permission from group and others "
            "(chmod go-w)"};
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
        // The name of the machine has changed, or that of a container, which gets a new one.
        const std::vector<std::string> foreign = foreignRunAsLists(subject.options.home);
        if (!foreign.empty()) {
            return {Verdict::Warning,
                    list.path +
                        " does not exist, so every agent runs as the host's user; there is " +
                        listed(foreign),
                    "rename the file if this host had another name before, or give the host that "
                    "name again"};
        }
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
