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

#include "host/process/file_descriptor.h"
#include "host/process/start_error.h"

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

std::vector<pid_t> orphans() {
    int adopts = 0;
    if (::prctl(PR_GET_CHILD_SUBREAPER, &adopts, 0, 0, 0) != 0 || adopts == 0) return {};
    return childrenOf(::getpid());
}

std::vector<pid_t> childrenOf(pid_t thread) {
    const std::string path = "/proc/self/task/" + std::to_string(thread) + "/children";
    const FileDescriptor file(::open(path.c_str(), O_RDONLY | O_CLOEXEC));
    std::string text;
    std::array<char, 4096> piece{};
    ssize_t length = 0;
    while (file && (length = ::read(file.get(), piece.data(), piece.size())) > 0) {
        text.append(piece.data(), static_cast<std::size_t>(length));
    }
    return numbersIn(text);
}

}  // namespace host
