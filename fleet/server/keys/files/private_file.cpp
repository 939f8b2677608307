#include "fleet/server/keys/files/private_file.h"

#include <fcntl.h>
#include <sodium.h>
#include <sys/stat.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <filesystem>
#include <system_error>
#include <utility>

#include "fleet/server/keys/files/keys_error.h"
#include "system/file_descriptor.h"

namespace fleet {
namespace {

constexpr std::size_t kLargestPrivateFile = 4U << 20U;

KeysError keysErrorOf(const std::string& what) {
    return KeysError(what + ": " + std::generic_category().message(errno));
}

void writeAll(int descriptor, std::string_view content, const std::string& file) {
    while (!content.empty()) {
        const ssize_t written = ::write(descriptor, content.data(), content.size());
        if (written < 0 && errno == EINTR) continue;
        if (written < 0) throw keysErrorOf("cannot write " + file);
        content.remove_prefix(static_cast<std::size_t>(written));
    }
    if (::fsync(descriptor) != 0) throw keysErrorOf("cannot sync " + file);
}

/// Makes the file, which must not be there yet. What cannot be completed is removed.
void writeNew(const std::string& file, std::string_view content) {
    const sys::FileDescriptor made(
        ::open(file.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC | O_NOFOLLOW, 0600));
    if (!made) throw keysErrorOf("cannot make " + file);
    try {
        writeAll(made.get(), content, file);
    } catch (const KeysError&) {
        ::unlink(file.c_str());
        throw;
    }
}

void syncDirectoryOf(const std::string& file) {
    const std::string parent = std::filesystem::absolute(file).parent_path().string();
    const sys::FileDescriptor folder(::open(parent.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
    if (!folder || ::fsync(folder.get()) != 0) throw keysErrorOf("cannot sync " + parent);
}

bool isPrivate(const struct stat& found) {
    return found.st_uid == ::geteuid() && (found.st_mode & 077U) == 0;
}

}  // namespace

Replacement::Replacement(std::string file, std::string_view content)
    : file_(std::move(file)), written_(file_ + ".new") {
    // What a process has left that was killed.
    if (::unlink(written_.c_str()) != 0 && errno != ENOENT) {
        throw keysErrorOf("cannot remove " + written_);
    }
    writeNew(written_, content);
}

Replacement::~Replacement() {
    if (!isCommitted_) ::unlink(written_.c_str());
}

void Replacement::commit() {
    if (::rename(written_.c_str(), file_.c_str()) != 0)
        throw keysErrorOf("cannot replace " + file_);
    isCommitted_ = true;
    syncDirectoryOf(file_);
}

void writePrivateFile(const std::string& file, std::string_view content) {
    Replacement(file, content).commit();
}

void writeNewPrivateFile(const std::string& file, std::string_view content) {
    writeNew(file, content);
    syncDirectoryOf(file);
}

void putInPlace(const std::string& complete, const std::string& file) {
    {
        const sys::FileDescriptor opened(
            ::open(complete.c_str(), O_RDONLY | O_CLOEXEC | O_NOFOLLOW));
        if (!opened || ::fsync(opened.get()) != 0) {
            throw keysErrorOf("cannot sync " + complete);
        }
    }
    if (::rename(complete.c_str(), file.c_str()) != 0) throw keysErrorOf("cannot replace " + file);
    syncDirectoryOf(file);
}

SecretText readPrivateFile(const std::string& file) {
    const sys::FileDescriptor opened(
        ::open(file.c_str(), O_RDONLY | O_CLOEXEC | O_NOFOLLOW | O_NONBLOCK));
    if (!opened) throw keysErrorOf("cannot read " + file);
    struct stat found {};
    if (::fstat(opened.get(), &found) != 0) throw keysErrorOf("cannot read " + file);
    if (!S_ISREG(found.st_mode)) throw KeysError(file + " is no file");
    if (!isPrivate(found)) {
        throw KeysError(file +
                        " may be used by others; make it your own, with mode 0600, and "
                        "think about who has read it");
    }
    SecretText content;
    std::array<char, 4096> piece{};
    for (;;) {
        const ssize_t length = ::read(opened.get(), piece.data(), piece.size());
        if (length < 0 && errno == EINTR) continue;
        if (length < 0) throw keysErrorOf("cannot read " + file);
        if (length == 0) break;
        content.append({piece.data(), static_cast<std::size_t>(length)});
        if (content.view().size() > kLargestPrivateFile) throw KeysError(file + " is too large");
    }
    sodium_memzero(piece.data(), piece.size());
    return content;
}

void makePrivateDirectory(const std::string& path) {
    if (::mkdir(path.c_str(), 0700) != 0 && errno != EEXIST) {
        throw keysErrorOf("cannot make " + path);
    }
    requirePrivateDirectory(path);
}

void requirePrivateDirectory(const std::string& path) {
    struct stat found {};
    if (::stat(path.c_str(), &found) != 0) throw keysErrorOf(path);
    if (!S_ISDIR(found.st_mode)) throw KeysError(path + " is no directory");
    if (!isPrivate(found)) {
        throw KeysError(path + " may be used by others; make it your own, with mode 0700");
    }
}

}  // namespace fleet
