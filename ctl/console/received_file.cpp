#include "ctl/console/received_file.h"

#include <fcntl.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <system_error>

namespace console {
namespace {

/// None, with errno, if there is no way.
sys::FileDescriptor unnamedFile(const std::string& directory) {
    std::string path = directory + "/zavctl-console-XXXXXX";
    sys::FileDescriptor file(::mkostemp(path.data(), O_CLOEXEC));
    if (file) ::unlink(path.c_str());
    return file;
}

}  // namespace

std::optional<http::Reply> ReceivedFile::take(std::string_view piece) {
    if (!file_) file_ = unnamedFile(directory_);
    if (!file_) return noRoom(errno);
    while (!piece.empty()) {
        const ssize_t written = ::write(file_.get(), piece.data(), piece.size());
        if (written < 0 && errno == EINTR) continue;
        if (written < 0) return noRoom(errno);
        piece.remove_prefix(static_cast<std::size_t>(written));
        size_ += static_cast<std::uintmax_t>(written);
    }
    return std::nullopt;
}

http::Reply ReceivedFile::noRoom(int error) const {
    return http::errorReply(507, "the file does not fit into " + directory_ +
                                     " here: " + std::generic_category().message(error));
}

std::string receivingDirectory() {
    const char* const named = std::getenv("TMPDIR");
    return named != nullptr && *named != '\0' ? named : "/var/tmp";
}

}  // namespace console
