/// A file that a browser sends.
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <utility>

#include "http/reply.h"
#include "system/file_descriptor.h"

namespace console {

/// The largest file that is taken.
inline constexpr std::uint64_t kLargestUpload = std::uint64_t{1} << 30;

/// Stands in a directory without a name until it has been passed on, and is gone with the object.
/// One thread at a time.
class ReceivedFile {
public:
    explicit ReceivedFile(std::string directory) : directory_(std::move(directory)) {}

    /// Appends a piece; an empty one makes an empty file. A reply tells that there is no room.
    std::optional<http::Reply> take(std::string_view piece);

    /// After the first piece.
    const sys::FileDescriptor& descriptor() const { return file_; }
    std::uintmax_t size() const { return size_; }

private:
    http::Reply noRoom(int error) const;

    const std::string directory_;
    sys::FileDescriptor file_;
    std::uintmax_t size_ = 0;
};

/// Where received files stand: $TMPDIR, or /var/tmp.
std::string receivingDirectory();

}  // namespace console
