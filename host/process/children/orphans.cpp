#include "host/process/children/orphans.h"

#include <fcntl.h>
#include <sys/prctl.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <charconv>
#include <string>
#include <system_error>

#include "host/process/start_error.h"
#include "host/process/system/directory_stream.h"
#include "system/file_descriptor.h"

namespace host {
namespace {

/// The numbers in a text, which blanks separate.
std::vector<pid_t> numbersIn(const std::string& text) {
    std::vector<pid_t> numbers;
    const char* at = text.data();
    const char* const end = at + text.size();
    while (at != end) {
        pid_t number = 0;
        const auto [rest, error] = std::from_chars(at, end, number);
        if (error == std::errc()) numbers.push_back(number);
        at = error == std::errc() ? rest : at + 1;
    }
    return numbers;
}

/// The list of the children of a thread of this process; no descriptor when there is none.
sys::FileDescriptor openChildren(pid_t thread) {
    const std::string path = "/proc/self/task/" + std::to_string(thread) + "/children";
    return sys::FileDescriptor(::open(path.c_str(), O_RDONLY | O_CLOEXEC));
}

/// All that a file holds.
std::string textOf(const sys::FileDescriptor& file) {
    std::string text;
    std::array<char, 4096> piece{};
    ssize_t length = 0;
    while (file && (length = ::pread(file.get(), piece.data(), piece.size(),
                                     static_cast<off_t>(text.size()))) > 0) {
        text.append(piece.data(), static_cast<std::size_t>(length));
    }
    return text;
}

/// Of this process.
std::vector<pid_t> threads() {
    std::vector<pid_t> threads;
    const DirectoryStream directory(::opendir("/proc/self/task"));
    while (const dirent* const entry = directory ? ::readdir(directory.get()) : nullptr) {
        const std::vector<pid_t> number = numbersIn(entry->d_name);
        threads.insert(threads.end(), number.begin(), number.end());
    }
    return threads;
}

}  // namespace

void adoptOrphans() {
    if (::prctl(PR_SET_CHILD_SUBREAPER, 1, 0, 0, 0) != 0) {
        throw StartError("cannot adopt orphans: " + std::generic_category().message(errno));
    }
}

void reapOrphans() {
    for (;;) {
        // Looks first and leaves the process as it is, so that only this very one is reaped.
        siginfo_t ended{};
        const int looked = ::waitid(P_ALL, 0, &ended, WEXITED | WNOHANG | WNOWAIT | __WNOTHREAD);
        if (looked != 0 && errno == EINTR) continue;
        if (looked != 0 || ended.si_pid == 0) return;
        ::waitpid(ended.si_pid, nullptr, WNOHANG | __WNOTHREAD);
    }
}

bool adoptsOrphans() {
    int adopts = 0;
    return ::prctl(PR_GET_CHILD_SUBREAPER, &adopts, 0, 0, 0) == 0 && adopts != 0;
}

std::vector<pid_t> orphans() {
    // Asked for before each command, and opening it costs the most. The kernel makes the list anew
    // for whoever reads from its beginning.
    static const sys::FileDescriptor list = openChildren(::getpid());
    static const pid_t opener = ::getpid();
    if (!adoptsOrphans()) return {};
    return opener == ::getpid() ? numbersIn(textOf(list)) : childrenOf(::getpid());
}

std::vector<pid_t> commands() {
    std::vector<pid_t> children;
    for (const pid_t thread : threads()) {
        if (thread == ::getpid()) continue;
        const std::vector<pid_t> more = childrenOf(thread);
        children.insert(children.end(), more.begin(), more.end());
    }
    return children;
}

std::vector<pid_t> childrenOf(pid_t thread) {
    return numbersIn(textOf(openChildren(thread)));
}

}  // namespace host
