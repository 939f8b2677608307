#include "host/process/children/pipe_writers.h"

#include <poll.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <csignal>
#include <cstdlib>
#include <filesystem>
#include <map>
#include <string>
#include <system_error>
#include <vector>

#include "host/process/children/pidfd.h"
#include "host/process/children/process_table.h"

namespace host {
namespace {

namespace fs = std::filesystem;

/// The pipes that a process has open so, and a descriptor of each; S_IRUSR or S_IWUSR.
std::map<ino_t, int> pipesOf(const std::string& process, mode_t way) {
    std::map<ino_t, int> pipes;
    std::error_code ended;
    for (fs::directory_iterator entry("/proc/" + process + "/fd", ended), end;
         !ended && entry != end; entry.increment(ended)) {
        const std::string path = entry->path().string();
        struct stat link {};
        struct stat file {};
        // The link's mode says for what the descriptor is open.
        if (::lstat(path.c_str(), &link) != 0 || (link.st_mode & way) == 0) continue;
        if (::stat(path.c_str(), &file) != 0 || !S_ISFIFO(file.st_mode)) continue;
        pipes.emplace(file.st_ino, std::atoi(entry->path().filename().c_str()));
    }
    return pipes;
}

std::set<ino_t> numbersOf(const std::map<ino_t, int>& pipes) {
    std::set<ino_t> numbers;
    for (const auto& [number, descriptor] : pipes)
        numbers.insert(number);
    return numbers;
}

bool writesTo(pid_t process, const std::set<ino_t>& pipes) {
    const std::set<ino_t> open = pipesToWrite(process);
    return std::any_of(open.begin(), open.end(),
                       [&pipes](ino_t pipe) { return pipes.count(pipe) != 0; });
}

bool kill(const sys::FileDescriptor& process) {
#ifdef SYS_pidfd_send_signal
    constexpr long kCall = SYS_pidfd_send_signal;
#else
    constexpr long kCall = 424;
#endif
    return ::syscall(kCall, process.get(), SIGKILL, nullptr, 0) == 0;
}

}  // namespace

std::set<ino_t> pipesToWrite(pid_t process) {
    return numbersOf(pipesOf(std::to_string(process), S_IWUSR));
}

bool haveWriters(const std::set<ino_t>& pipes) {
    for (const auto& [number, descriptor] : pipesOf("self", S_IRUSR)) {
        if (pipes.count(number) == 0) continue;
        pollfd end{descriptor, 0, 0};
        if (::poll(&end, 1, 0) >= 0 && (end.revents & (POLLHUP | POLLNVAL)) == 0) return true;
    }
    return false;
}

std::size_t killWritersTo(const std::set<ino_t>& pipes) {
    if (pipes.empty()) return 0;
    std::size_t killed = 0;
    for (const ProcessEntry& process : readProcesses()) {
        if (!process.isAlive || process.pid == ::getpid()) continue;
        // Opened before the look at its files: its number may be another one's afterwards.
        const sys::FileDescriptor handle = openPidfd(process.pid);
        if (handle && writesTo(process.pid, pipes) && kill(handle)) ++killed;
    }
    return killed;
}

}  // namespace host
