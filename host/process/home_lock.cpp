#include "host/process/home_lock.h"

#include <fcntl.h>
#include <signal.h>
#include <sys/file.h>
#include <unistd.h>

#include <cerrno>
#include <charconv>
#include <chrono>
#include <optional>
#include <system_error>
#include <thread>

#include "host/process/start_error.h"

namespace host {
namespace {

constexpr const char* kFileName = "/.zavhost.lock";
/// How long the owner may take to write its process id once it has the lock.
constexpr std::chrono::seconds kWritingTime{2};
constexpr std::chrono::milliseconds kReadPause{1};

sys::FileDescriptor openFile(const std::string& name) {
    sys::FileDescriptor file(
        ::open(name.c_str(), O_RDWR | O_CREAT | O_CLOEXEC | O_NOFOLLOW | O_NONBLOCK, 0600));
    if (!file) throw StartError("cannot make " + name, errno);
    return file;
}

bool tryLock(const sys::FileDescriptor& file, const std::string& name) {
    while (::flock(file.get(), LOCK_EX | LOCK_NB) != 0) {
        if (errno == EWOULDBLOCK) return false;
        if (errno != EINTR) throw StartError("cannot lock " + name, errno);
    }
    return true;
}

/// The process id in the file, if it is that of a process. It is not while the owner has not
/// written yet: then the file is empty or still has the id of an owner that was killed.
std::optional<pid_t> ownerIn(const sys::FileDescriptor& file) {
    char text[32];
    const ssize_t length = ::pread(file.get(), text, sizeof text, 0);
    if (length <= 0) return std::nullopt;
    pid_t pid = 0;
    const auto [rest, error] = std::from_chars(text, text + length, pid);
    const bool complete = error == std::errc() && rest != text + length && *rest == '\n' && pid > 0;
    if (!complete || (::kill(pid, 0) != 0 && errno == ESRCH)) return std::nullopt;
    return pid;
}

void writeOwner(const sys::FileDescriptor& file, const std::string& name) {
    const std::string text = std::to_string(::getpid()) + "\n";
    if (::ftruncate(file.get(), 0) != 0 ||
        ::pwrite(file.get(), text.data(), text.size(), 0) != static_cast<ssize_t>(text.size())) {
        throw StartError("cannot write to " + name, errno);
    }
}

std::string wordsFor(const std::optional<pid_t>& owner) {
    return owner ? "the host with process id " + std::to_string(*owner) : "another host";
}

}  // namespace

std::string HomeLock::ownerOf(const std::string& directory) {
    const sys::FileDescriptor file(
        ::open((directory + kFileName).c_str(), O_RDONLY | O_CLOEXEC | O_NOFOLLOW | O_NONBLOCK));
    if (!file || ::flock(file.get(), LOCK_SH | LOCK_NB) == 0 || errno != EWOULDBLOCK) return "";
    return wordsFor(ownerIn(file));
}

HomeLock::HomeLock(const std::string& directory, const std::string& what) {
    const std::string name = directory + kFileName;
    sys::FileDescriptor file = openFile(name);
    std::optional<pid_t> owner;
    const auto deadline = std::chrono::steady_clock::now() + kWritingTime;
    while (!tryLock(file, name)) {
        owner = ownerIn(file);
        if (owner || std::chrono::steady_clock::now() >= deadline) {
            throw InUse(what + ' ' + directory + " is in use by " + wordsFor(owner));
        }
        std::this_thread::sleep_for(kReadPause);
    }
    writeOwner(file, name);
    file_ = std::move(file);
}

}  // namespace host
