#include "host/depot/install_result.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <charconv>
#include <string_view>

#include "system/file_descriptor.h"

namespace host {
namespace {

/// A number with blanks around it, as the plug-in reads it.
bool isNumber(std::string_view text) {
    constexpr const char* kBlanks = " \t\r\n";
    const std::size_t begin = text.find_first_not_of(kBlanks);
    if (begin == std::string_view::npos) return false;
    text = text.substr(begin, text.find_last_not_of(kBlanks) + 1 - begin);
    int number = 0;
    const char* const end = text.data() + text.size();
    const auto [rest, error] = std::from_chars(text.data(), end, number);
    return error == std::errc() && rest == end;
}

}  // namespace

InstallResult::InstallResult(const std::string& depot) : path_(depot + "/rc.txt") {}

InstallResult::Content InstallResult::look() const {
    const sys::FileDescriptor file(
        ::open(path_.c_str(), O_RDONLY | O_NONBLOCK | O_NOFOLLOW | O_CLOEXEC));
    if (!file) return errno == ENOENT ? Content::Missing : Content::Other;
    struct stat found {};
    if (::fstat(file.get(), &found) != 0 || !S_ISREG(found.st_mode)) return Content::Other;
    std::array<char, 64> text{};
    const ssize_t length = ::read(file.get(), text.data(), text.size());
    const bool number = length > 0 && isNumber({text.data(), static_cast<std::size_t>(length)});
    return number ? Content::Number : Content::Other;
}

bool InstallResult::remove() const {
    if (::unlink(path_.c_str()) == 0) return true;
    // A file system that is read-only says so whether or not the file is there.
    const int fault = errno;
    struct stat found {};
    if (::lstat(path_.c_str(), &found) != 0 && (errno == ENOENT || errno == ENOTDIR)) return true;
    errno = fault;
    return false;
}

}  // namespace host
