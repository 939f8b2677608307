#include "support/process/child_role.h"

#include <dirent.h>
#include <fcntl.h>
#include <pthread.h>
#include <signal.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <cstring>

namespace {

constexpr const char* kVariable = "ZAV_TEST_CHILD_ROLE";

void printSignals() {
    sigset_t blocked;
    ::pthread_sigmask(SIG_BLOCK, nullptr, &blocked);
    for (int signal = 1; signal < NSIG; ++signal) {
        if (::sigismember(&blocked, signal) == 1) std::printf("blocked %d\n", signal);
        struct sigaction action {};
        if (::sigaction(signal, nullptr, &action) == 0 && action.sa_handler == SIG_IGN) {
            std::printf("ignored %d\n", signal);
        }
    }
}

bool play() {
    const char* const role = std::getenv(kVariable);
    if (role == nullptr) return false;
    if (std::strcmp(role, "descriptors") == 0) {
        for (const int fd : child_role::openDescriptors(true))
            std::printf("%d\n", fd);
    } else if (std::strcmp(role, "signals") == 0) {
        printSignals();
    }
    std::fflush(stdout);
    ::_exit(0);
}

}  // namespace

namespace child_role {

std::string program() {
    char path[4096];
    const ssize_t length = ::readlink("/proc/self/exe", path, sizeof path);
    return length > 0 ? std::string(path, static_cast<std::size_t>(length)) : std::string();
}

std::string environmentEntry(const std::string& role) {
    return std::string(kVariable) + "=" + role;
}

std::set<int> openDescriptors(bool inheritedOnly) {
    std::set<int> found;
    DIR* const directory = ::opendir("/proc/self/fd");
    while (const dirent* entry = ::readdir(directory)) {
        if (entry->d_name[0] == '.') continue;
        const int fd = std::atoi(entry->d_name);
        const bool inherited = (::fcntl(fd, F_GETFD) & FD_CLOEXEC) == 0;
        if (fd != ::dirfd(directory) && (inherited || !inheritedOnly)) found.insert(fd);
    }
    ::closedir(directory);
    return found;
}

}  // namespace child_role

namespace {

/// Before main, so that no test runs; the platform library has been set up by then, because
/// libraries come before the program.
[[maybe_unused]] const bool played = play();

}  // namespace
