#include "host/depot/transfers/conversion_probe.h"

#include <fcntl.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>

#include "system/file_descriptor.h"

namespace host {

std::string conversionProblem(const std::string& temporaries, const std::string& depot) {
    const std::string name = "/.zavhost-probe-" + std::to_string(::getpid());
    const std::string made = temporaries + name;
    const std::string linked = depot + name;
    const sys::FileDescriptor file(
        ::open(made.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC, 0600));
    if (!file) return "cannot write to " + temporaries + ": " + std::strerror(errno);
    const bool works = ::link(made.c_str(), linked.c_str()) == 0;
    const int reason = errno;
    ::unlink(made.c_str());
    if (works) {
        ::unlink(linked.c_str());
        return "";
    }
    if (reason == EXDEV) {
        return "the depot " + depot + " and " + temporaries + " are on different file systems";
    }
    return "cannot link from " + temporaries + " to " + depot + ": " + std::strerror(reason);
}

}  // namespace host
