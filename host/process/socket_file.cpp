#include "host/process/socket_file.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <unistd.h>

#include <cerrno>
#include <chrono>
#include <filesystem>
#include <thread>
#include <utility>

#include "host/process/start_error.h"

namespace host {
namespace {

/// A child of a host that was killed has that host's descriptors until it executes its program.
constexpr std::chrono::seconds kChildHolds{2};
constexpr std::chrono::milliseconds kChildPause{5};

[[noreturn]] void failInUse(const std::string& path) {
    throw StartError("socket " + path + " is in use by a live host");
}

sockaddr_un addressOf(const std::string& path) {
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    if (path.size() >= sizeof address.sun_path) {
        throw StartError("socket name " + path + " is longer than " +
                         std::to_string(sizeof address.sun_path - 1) + " bytes");
    }
    path.copy(address.sun_path, path.size());
    return address;
}

const sockaddr* generic(const sockaddr_un& address) {
    return reinterpret_cast<const sockaddr*>(&address);
}

sys::FileDescriptor newSocket(const std::string& path) {
    sys::FileDescriptor made(::socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0));
    if (!made) throw StartError("socket " + path, errno);
    return made;
}

/// Whether the open file is still the one with this name. The last owner removes it, and a lock on
/// a file that nobody else can find protects nothing.
bool isStill(int descriptor, const std::string& name) {
    struct stat opened {};
    struct stat named {};
    return ::fstat(descriptor, &opened) == 0 && ::lstat(name.c_str(), &named) == 0 &&
           opened.st_dev == named.st_dev && opened.st_ino == named.st_ino;
}

/// The locked file; none if somebody else has locked it.
sys::FileDescriptor lockedFile(const std::string& name) {
    while (true) {
        sys::FileDescriptor lock(
            ::open(name.c_str(), O_RDWR | O_CREAT | O_CLOEXEC | O_NOFOLLOW | O_NONBLOCK, 0600));
        if (!lock) throw StartError("cannot make " + name, errno);
        if (::flock(lock.get(), LOCK_EX | LOCK_NB) != 0) {
            if (errno == EWOULDBLOCK) return {};
            if (errno == EINTR) continue;
            throw StartError("cannot lock " + name, errno);
        }
        if (isStill(lock.get(), name)) return lock;
    }
}

sys::FileDescriptor takeLock(const std::string& path) {
    const auto until = std::chrono::steady_clock::now() + kChildHolds;
    while (true) {
        if (sys::FileDescriptor lock = lockedFile(path + ".lock")) return lock;
        if (std::chrono::steady_clock::now() >= until) failInUse(path);
        std::this_thread::sleep_for(kChildPause);
    }
}

/// `sticky`: the sticky bit makes up for others' permission to write.
std::string faultOfFolder(const std::string& socketPath, bool sticky) {
    const std::string parent = std::filesystem::path(socketPath).parent_path().string();
    const std::string folder = parent.empty() ? "." : parent;
    struct stat found {};
    if (::stat(folder.c_str(), &found) != 0) return "";  // making the socket says why
    if (found.st_uid != ::geteuid() && found.st_uid != 0) {
        return "its directory " + folder + " belongs to another user, " +
               std::to_string(found.st_uid) + ", who could replace it";
    }
    const bool others = (found.st_mode & (S_IWGRP | S_IWOTH)) != 0;
    if (!others || (sticky && (found.st_mode & S_ISVTX) != 0)) return "";
    return "others may write to its directory " + folder + " and could replace it";
}

}  // namespace

std::string folderFaultOf(const std::string& socketPath) {
    return faultOfFolder(socketPath, true);
}

std::string sharedFolderFaultOf(const std::string& socketPath) {
    const std::string fault = faultOfFolder(socketPath, false);
    if (fault.empty() || !folderFaultOf(socketPath).empty()) return fault;
    return "everybody is to connect to it, and others may write to its directory " +
           std::filesystem::path(socketPath).parent_path().string();
}

void SocketFile::takePath() {
    const std::string fault =
        connects_ == Connects::Everybody ? sharedFolderFaultOf(path_) : folderFaultOf(path_);
    if (!fault.empty()) throw StartError("socket " + path_ + ": " + fault);
    addressOf(path_);  // throws before a lock file is made for an impossible name
    lock_ = takeLock(path_);
}

SocketFile::SocketFile(const std::string& path, Connects connects, sys::FileDescriptor passed)
    : path_(path), connects_(connects) {
    takePath();
    socket_ = std::move(passed);
}

SocketFile::SocketFile(const std::string& path, Connects connects)
    : path_(path), connects_(connects) {
    takePath();
    try {
        replaceStale();
        bind();
    } catch (...) {
        remove();
        throw;
    }
}

SocketFile::~SocketFile() {
    remove();
}

void SocketFile::replaceStale() const {
    struct stat found {};
    if (::lstat(path_.c_str(), &found) != 0) {
        if (errno == ENOENT) return;
        throw StartError("socket " + path_, errno);
    }
    if (!S_ISSOCK(found.st_mode)) throw StartError(path_ + " exists and is not a socket");
    const sockaddr_un address = addressOf(path_);
    const sys::FileDescriptor probe = newSocket(path_);
    // EAGAIN: a process listens, but is too busy to accept.
    if (::connect(probe.get(), generic(address), sizeof address) == 0 || errno == EAGAIN) {
        failInUse(path_);
    }
    if (errno == ENOENT) return;
    if (errno != ECONNREFUSED) throw StartError("socket " + path_ + " is in use", errno);
    if (::unlink(path_.c_str()) != 0 && errno != ENOENT) {
        throw StartError("cannot remove the stale socket " + path_, errno);
    }
}

void SocketFile::bind() {
    const sockaddr_un address = addressOf(path_);
    const mode_t mode = connects_ == Connects::Everybody ? 0666 : 0600;
    socket_ = newSocket(path_);
    // bind() gives the file the mode of the socket. So the file is never more open than it should
    // be, without changing the process's umask, which other threads would see.
    if (::fchmod(socket_.get(), mode) != 0) throw StartError("socket " + path_, errno);
    if (::bind(socket_.get(), generic(address), sizeof address) != 0) {
        throw StartError("cannot bind the socket " + path_, errno);
    }
    struct stat made {};
    if (::lstat(path_.c_str(), &made) != 0) throw StartError("socket " + path_, errno);
    device_ = made.st_dev;
    inode_ = made.st_ino;
    // The umask may have removed bits that are needed.
    if (::chmod(path_.c_str(), mode) != 0) throw StartError("socket " + path_, errno);
}

int SocketFile::listen() {
    if (::listen(socket_.get(), SOMAXCONN) != 0)
        throw StartError("cannot listen on " + path_, errno);
    return socket_.get();
}

void SocketFile::remove() {
    if (!lock_) return;
    struct stat found {};
    if (inode_ != 0 && ::lstat(path_.c_str(), &found) == 0 && found.st_dev == device_ &&
        found.st_ino == inode_) {
        ::unlink(path_.c_str());
    }
    socket_.reset();
    ::unlink((path_ + ".lock").c_str());
    lock_.reset();
}

}  // namespace host
