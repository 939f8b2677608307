// The machine and the process: sockets, time-out, locale, Java, clock, limits.

#include <langinfo.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <clocale>
#include <cstddef>
#include <ctime>
#include <filesystem>
#include <optional>
#include <string>
#include <system_error>

#include "host/checks/check.h"
#include "host/depot/depot_directory.h"
#include "host/process/children/run_command.h"
#include "host/process/configuration/task_timeout.h"
#include "host/process/socket_file.h"
#include "host/process/start_error.h"

namespace host {
namespace {

namespace fs = std::filesystem;

/// What would keep the host from making a socket, or lets others replace the one that it has made;
/// "" if nothing does.
std::string socketFault(const std::string& path, bool shared) {
    if (path.size() >= sizeof(sockaddr_un::sun_path)) {
        return path + " is longer than " + std::to_string(sizeof(sockaddr_un::sun_path) - 1) +
               " bytes";
    }
    const std::string fault = shared ? sharedFolderFaultOf(path) : folderFaultOf(path);
    if (!fault.empty()) return path + ": " + fault;
    struct stat found {};
    if (::lstat(path.c_str(), &found) == 0) {
        return S_ISSOCK(found.st_mode) ? "" : path + " exists and is not a socket";
    }
    const std::string directory = fs::absolute(path).parent_path().string();
    if (::access(directory.c_str(), W_OK | X_OK) == 0) return "";
    return directory + ": " + std::generic_category().message(errno);
}

std::optional<std::size_t> softLimit(int resource) {
    struct rlimit limit {};
    if (::getrlimit(static_cast<__rlimit_resource_t>(resource), &limit) != 0 ||
        limit.rlim_cur == RLIM_INFINITY) {
        return std::nullopt;
    }
    return static_cast<std::size_t>(limit.rlim_cur);
}

/// Whether a directory holds Java archives. Looks at the first levels and at a bounded number of
/// names, because depots can be large.
bool holdsJava(const std::string& directory) {
    constexpr int kDepth = 4;
    std::size_t left = 20'000;
    std::error_code error;
    fs::recursive_directory_iterator entry(directory, fs::directory_options::skip_permission_denied,
                                           error);
    for (; !error && entry != fs::recursive_directory_iterator(); entry.increment(error)) {
        if (left-- == 0) return false;
        if (entry.depth() >= kDepth) entry.disable_recursion_pending();
        if (entry->path().extension() == ".jar") return true;
    }
    return false;
}

bool isJavaHome(const std::string& directory) {
    return !directory.empty() && ::access((directory + "/bin/java").c_str(), X_OK) == 0;
}

std::string firstLine(const std::string& text) {
    return text.substr(0, text.find_first_of("\r\n"));
}

/// The search that the plug-in makes: the home's script, then the variables.
std::string findJava(CheckSubject& subject) {
    constexpr CommandLimits kLimits{std::chrono::seconds(10), std::size_t{64} << 10};
    const CommandResult asked = runCommand({subject.inHome("bin/TovrinGetJavaHome")}, kLimits);
    for (const std::string& directory :
         {firstLine(asked.out), subject.variable("JAVA_HOME"), subject.variable("JAVAHOME")}) {
        if (isJavaHome(directory)) return directory;
    }
    return "";
}

/// Seconds since the epoch at the beginning of 2024: no host of this version ran before.
constexpr std::time_t kEarliest = 1704067200;

}  // namespace

CheckFunction checkSockets, checkTimeout, checkLocale, checkJava, checkClock, checkDescriptors,
    checkProcesses;

Finding checkSockets(CheckSubject& subject) {
    const HostOptions& options = subject.options;
    for (const std::string& path : {options.socket, options.rpcSocket}) {
        const std::string fault = socketFault(path, options.groups.any());
        if (fault.empty()) continue;
        return {
            Verdict::Warning, "the socket cannot be used: " + fault,
            "name another path with --socket or --rpc-socket, or take the directory from others"};
    }
    return {Verdict::Ok, options.socket + " and " + options.rpcSocket, ""};
}

Finding checkTimeout(CheckSubject& subject) {
    if (subject.options.taskTimeout) {
        return {Verdict::Ok, std::to_string(*subject.options.taskTimeout) + " seconds", ""};
    }
    const std::string set = subject.variable(kTimeoutVariable);
    if (set.empty()) return {Verdict::Ok, "300 seconds, because TIMEOUT is not set", ""};
    try {
        return {Verdict::Ok,
                std::to_string(taskTimeoutOf(kTimeoutVariable, set)) + " seconds, from TIMEOUT",
                ""};
    } catch (const StartError& error) {
        return {Verdict::Error,
                std::string(error.what()) + "; every command would be given up at once",
                "correct TIMEOUT, unset it, or give --task-timeout"};
    }
}

Finding checkLocale(CheckSubject&) {
    const char* const locale = std::setlocale(LC_CTYPE, nullptr);
    const std::string codePage = ::nl_langinfo(CODESET);
    const std::string text =
        std::string(locale == nullptr ? "C" : locale) + ", code page " + codePage;
    if (codePage != "ANSI_X3.4-1968") return {Verdict::Ok, text, ""};
    return {Verdict::Warning, text + ": text outside ASCII cannot be handled",
            "set LC_ALL to a locale that the system has, such as C.UTF-8"};
}

/// The plug-in itself needs no Java; a product that comes as Java archives does.
Finding checkJava(CheckSubject& subject) {
    const std::string named = subject.variable(kDepotVariable);
    const std::string depot =
        depotDirectoryOf(subject.options.home, named.empty() ? nullptr : named.c_str(),
                         subject.options.guarded)
            .path;
    const bool isNeeded = holdsJava(subject.inHome("agtqvs6")) || holdsJava(depot);
    if (!isNeeded) return {Verdict::Ok, "no product and no bundle needs it", ""};
    const std::string found = findJava(subject);
    if (!found.empty()) return {Verdict::Ok, found, ""};
    return {Verdict::Warning, "a product or bundle holds .jar files, but there is no Java",
            "install one, or name its directory in JAVA_HOME"};
}

Finding checkClock(CheckSubject& subject) {
    const std::time_t now = std::time(nullptr);
    if (now < kEarliest) {
        return {Verdict::Warning, "the clock is years behind", "set it, by NTP if possible"};
    }
    constexpr std::time_t kTolerance = 60;
    for (const char* const name : {"config", "registry", "logs"}) {
        struct stat found {};
        if (::stat(subject.inHome(name).c_str(), &found) != 0) continue;
        if (found.st_mtime <= now + kTolerance) continue;
        return {Verdict::Warning,
                subject.inHome(name) + " was changed in the future; the clock was set back",
                "set it, by NTP if possible"};
    }
    return {Verdict::Ok, "not behind the home's files", ""};
}

Finding checkDescriptors(CheckSubject&) {
    constexpr std::size_t kEnough = 1'024;
    const auto limit = softLimit(RLIMIT_NOFILE);
    if (!limit) return {Verdict::Ok, "unlimited", ""};
    const std::string text = std::to_string(*limit) + " open files";
    if (*limit >= kEnough) return {Verdict::Ok, text, ""};
    return {Verdict::Warning, text + " are few: clients may be refused and commands may fail",
            "raise the limit to " + std::to_string(kEnough) + " (ulimit -n)"};
}

Finding checkProcesses(CheckSubject&) {
    constexpr std::size_t kEnough = 256;
    const auto limit = softLimit(RLIMIT_NPROC);
    if (!limit) return {Verdict::Ok, "unlimited", ""};
    const std::string text = std::to_string(*limit) + " processes for this user";
    if (*limit >= kEnough || ::geteuid() == 0) return {Verdict::Ok, text, ""};
    return {Verdict::Warning, text + " are few: commands may not start",
            "raise the limit to " + std::to_string(kEnough) + " (ulimit -u)"};
}

}  // namespace host
