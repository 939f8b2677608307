#include "ctl/client/whole_file.h"

#include <fcntl.h>
#include <unistd.h>

#include <cerrno>

#include "ctl/client/failure.h"

namespace ctl {

std::string readFile(const std::string& path) {
    const int descriptor = ::open(path.c_str(), O_RDONLY | O_CLOEXEC);
    if (descriptor == -1) throw Failure(kWrongUsage, "cannot read " + path);
    try {
        std::string text = readDescriptor(descriptor, path);
        ::close(descriptor);
        return text;
    } catch (...) {
        ::close(descriptor);
        throw;
    }
}

std::string readDescriptor(int descriptor, const std::string& name) {
    std::string text;
    char piece[16384];
    for (;;) {
        const ssize_t length = ::read(descriptor, piece, sizeof piece);
        if (length == 0) return text;
        if (length > 0) text.append(piece, static_cast<std::size_t>(length));
        if (length == -1 && errno != EINTR) throw Failure(kWrongUsage, "cannot read " + name);
    }
}

bool writeDescriptor(int descriptor, const std::string& text) {
    std::size_t done = 0;
    while (done < text.size()) {
        const ssize_t length = ::write(descriptor, text.data() + done, text.size() - done);
        if (length > 0) done += static_cast<std::size_t>(length);
        if (length == -1 && errno != EINTR) return false;
    }
    return true;
}

}  // namespace ctl
