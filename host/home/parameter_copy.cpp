#include "host/home/parameter_copy.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <optional>
#include <system_error>
#include <vector>

#include "system/file_descriptor.h"

namespace host {
namespace {

constexpr std::string_view kMarker = "|DATAPROVIDER|";
/// Far more than the file ever holds. What is larger is none of it.
constexpr off_t kMostBytes = 1024 * 1024;

[[noreturn]] void fail(const std::string& what) {
    throw std::system_error(errno, std::generic_category(), what);
}

struct Content {
    std::string text;
    struct stat status {};
};

/// Nothing if there is no such regular file.
std::optional<Content> contentOf(const std::string& path) {
    const sys::FileDescriptor file(
        ::open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NOFOLLOW | O_NONBLOCK));
    if (!file && (errno == ENOENT || errno == ENOTDIR || errno == ELOOP)) return std::nullopt;
    if (!file) fail("cannot read " + path);
    Content content;
    if (::fstat(file.get(), &content.status) != 0) fail("cannot read " + path);
    if (!S_ISREG(content.status.st_mode) || content.status.st_size > kMostBytes) {
        return std::nullopt;
    }
    content.text.resize(static_cast<std::size_t>(content.status.st_size));
    std::size_t length = 0;
    while (length < content.text.size()) {
        const ssize_t count =
            ::read(file.get(), content.text.data() + length, content.text.size() - length);
        if (count < 0 && errno == EINTR) continue;
        if (count < 0) fail("cannot read " + path);
        if (count == 0) break;
        length += static_cast<std::size_t>(count);
    }
    content.text.resize(length);
    return content;
}

void writeAll(int descriptor, std::string_view text, const std::string& path) {
    while (!text.empty()) {
        const ssize_t count = ::write(descriptor, text.data(), text.size());
        if (count < 0 && errno == EINTR) continue;
        if (count < 0) fail("cannot write " + path);
        text.remove_prefix(static_cast<std::size_t>(count));
    }
}

/// A new file with this content, on the disk.
void writeFile(const std::string& path, const Content& content) {
    ::unlink(path.c_str());  // of a host that was killed here
    const sys::FileDescriptor file(
        ::open(path.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC | O_NOFOLLOW, 0600));
    if (!file) fail("cannot make " + path);
    writeAll(file.get(), content.text, path);
    // Only root can give a file away. For others it is their own already.
    if (::fchown(file.get(), content.status.st_uid, content.status.st_gid) != 0 && errno != EPERM) {
        fail("cannot give " + path + " its owner");
    }
    if (::fchmod(file.get(), content.status.st_mode & 07777U) != 0 || ::fsync(file.get()) != 0) {
        fail("cannot write " + path);
    }
}

/// Of a file or a directory, if it is there.
void syncIfThere(const std::string& path) {
    const sys::FileDescriptor opened(
        ::open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NOFOLLOW | O_NONBLOCK));
    if (opened && ::fsync(opened.get()) != 0 && errno != EINVAL) fail("cannot write " + path);
}

void removeIfThere(const std::string& path) {
    if (::unlink(path.c_str()) != 0 && errno != ENOENT) fail("cannot remove " + path);
}

/// Takes the next line off the text; `ended` tells whether it has its line feed.
std::string_view takeLine(std::string_view& text, bool& ended) {
    const std::size_t end = text.find('\n');
    ended = end != std::string_view::npos;
    const std::string_view line = text.substr(0, end);
    text.remove_prefix(ended ? end + 1 : text.size());
    return line;
}

std::vector<std::string_view> linesOf(std::string_view text) {
    std::vector<std::string_view> lines;
    for (bool ended = true; !text.empty();) {
        const std::string_view line = takeLine(text, ended);
        if (!line.empty()) lines.push_back(line);
    }
    return lines;
}

bool holds(std::string_view text, std::string_view part) {
    return text.find(part) != std::string_view::npos;
}

/// Whether the plug-in may have written this line in the place of the old one.
bool isRewritten(std::string_view line, std::string_view old) {
    const std::size_t at = line.find(kMarker);
    if (at == std::string_view::npos || line.back() != '|') return false;
    const std::string_view marked = line.substr(0, at + kMarker.size());
    return line.size() > marked.size() && holds(old, marked);
}

}  // namespace

std::string startUpParametersOf(const std::string& home) {
    return home + "/config/.ConfigData/kumenv";
}

bool isCutOff(std::string_view now, std::string_view before) {
    if (now == before) return false;
    const std::vector<std::string_view> old = linesOf(before);
    std::size_t at = 0;
    while (!now.empty()) {
        if (at == old.size()) return false;
        bool ended = false;
        const std::string_view line = takeLine(now, ended);
        const bool isWhole = line == old[at] || isRewritten(line, old[at]);
        if (!isWhole) {
            const bool isPart = old[at].substr(0, line.size()) == line || holds(old[at], kMarker);
            return !ended && isPart;
        }
        ++at;
    }
    return at < old.size();
}

ParameterCopy::ParameterCopy(const std::string& home)
    : folder_(home + "/config/.ConfigData"),
      file_(startUpParametersOf(home)),
      copy_(folder_ + "/.kumenv.saved") {}

void ParameterCopy::save() const {
    const std::optional<Content> content = contentOf(file_);
    if (!content) return removeIfThere(copy_);
    const std::string written = copy_ + ".new";
    writeFile(written, *content);
    if (::rename(written.c_str(), copy_.c_str()) != 0) fail("cannot make " + copy_);
    syncIfThere(folder_);
}

void ParameterCopy::sync() const {
    syncIfThere(file_);
    syncIfThere(folder_);
}

void ParameterCopy::drop() const {
    sync();
    removeIfThere(copy_);
}

bool ParameterCopy::restore() const {
    removeIfThere(copy_ + ".new");
    const std::optional<Content> copy = contentOf(copy_);
    if (!copy) return false;
    const std::optional<Content> now = contentOf(file_);
    if (now && !isCutOff(now->text, copy->text)) {
        drop();
        return false;
    }
    if (::rename(copy_.c_str(), file_.c_str()) != 0) fail("cannot restore " + file_);
    sync();
    return true;
}

}  // namespace host
