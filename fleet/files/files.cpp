#include "fleet/files/files.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <system_error>

#include "fleet/files/file_error.h"
#include "system/file_descriptor.h"

namespace fleet {
namespace {

constexpr std::size_t kLongestFile = std::size_t{1} << 20;

[[noreturn]] void refuse(const std::string& path, const std::string& why) {
    throw FileError(path + ": " + why);
}

[[noreturn]] void fail(const std::string& path) {
    refuse(path, std::generic_category().message(errno));
}

void insistOnSafe(const std::string& path, const struct stat& found, Secrecy secrecy) {
    if (!S_ISREG(found.st_mode)) refuse(path, "is no plain file");
    if (found.st_uid != 0 && found.st_uid != ::geteuid()) {
        refuse(path, "belongs to another user; give it to this program's user or to root");
    }
    if ((found.st_mode & (S_IWGRP | S_IWOTH)) != 0) {
        refuse(path, "others may write to it (chmod go-w)");
    }
    if (secrecy == Secrecy::Secret && (found.st_mode & (S_IRWXG | S_IRWXO)) != 0) {
        refuse(path, "others may read it, and it is secret (chmod go=)");
    }
}

std::string readAll(const std::string& path, const sys::FileDescriptor& file) {
    std::string content(kLongestFile + 1, '\0');
    std::size_t length = 0;
    while (length < content.size()) {
        const ssize_t got = ::read(file.get(), &content[length], content.size() - length);
        if (got < 0 && errno == EINTR) continue;
        if (got < 0) fail(path);
        if (got == 0) break;
        length += static_cast<std::size_t>(got);
    }
    if (length > kLongestFile) refuse(path, "is longer than 1 MiB");
    content.resize(length);
    return content;
}

void writeAll(const std::string& path, const sys::FileDescriptor& file,
              const std::string& content) {
    std::size_t written = 0;
    while (written < content.size()) {
        const ssize_t took = ::write(file.get(), &content[written], content.size() - written);
        if (took < 0 && errno == EINTR) continue;
        if (took < 0) fail(path);
        written += static_cast<std::size_t>(took);
    }
    if (::fsync(file.get()) != 0) fail(path);
}

std::string folderOf(const std::string& path) {
    const std::size_t slash = path.rfind('/');
    if (slash == std::string::npos) return ".";
    return slash == 0 ? "/" : path.substr(0, slash);
}

void syncFolder(const std::string& folder) {
    const sys::FileDescriptor opened(::open(folder.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
    if (!opened || ::fsync(opened.get()) != 0) fail(folder);
}

}  // namespace

std::string readFile(const std::string& path, Secrecy secrecy) {
    // It is looked at when it is open, so that nobody can put another in its place in between; a
    // pipe's other end is not waited for.
    const sys::FileDescriptor file(
        ::open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK | O_NOCTTY));
    struct stat found {};
    if (!file || ::fstat(file.get(), &found) != 0) fail(path);
    insistOnSafe(path, found, secrecy);
    return readAll(path, file);
}

bool isThere(const std::string& path) {
    struct stat found {};
    if (::lstat(path.c_str(), &found) == 0) return true;
    if (errno != ENOENT) fail(path);
    return false;
}

void replaceFile(const std::string& path, const std::string& content, Secrecy secrecy) {
    // One writer at a time: the programs that use this lock their directories. What a killed one
    // left behind is written over.
    const std::string draft = path + ".new";
    ::unlink(draft.c_str());
    const mode_t mode = secrecy == Secrecy::Secret ? 0600 : 0644;
    try {
        const sys::FileDescriptor file(
            ::open(draft.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC | O_NOFOLLOW, mode));
        if (!file || ::fchmod(file.get(), mode) != 0) fail(draft);
        writeAll(draft, file, content);
        if (::rename(draft.c_str(), path.c_str()) != 0) fail(path);
    } catch (const FileError&) {
        ::unlink(draft.c_str());
        throw;
    }
    syncFolder(folderOf(path));
}

}  // namespace fleet
