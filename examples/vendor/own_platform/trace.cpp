// Traces go to the system's log, as datagrams to its socket. What syslog(3) would do takes a lock
// and may allocate; a trace must also work in a child between fork and exec. A line is cut at 1024
// bytes, which is what every log daemon takes.

#include "own_platform/trace.h"

#include <sys/socket.h>
#include <sys/un.h>
#include <syslog.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdarg>
#include <cstdio>
#include <cstring>

#include "platform/ras1.h"

std::atomic<unsigned> RAS1_Generation{1};

namespace {

constexpr unsigned kAll = RAS1_DETAIL | RAS1_FLOW | RAS1_ERROR;

int openSocket() {
    return ::socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC, 0);
}

const int logSocket = openSocket();
sockaddr_un logAddress{AF_UNIX, "/dev/log"};
std::atomic<unsigned> selected{RAS1_ERROR};

/// A line in memory of its own: no call here allocates.
class Line {
public:
    Line(unsigned level, const RAS1_BLOCK& block, int line) {
        add(level == RAS1_ERROR ? LOG_USER | LOG_ERR : LOG_USER | LOG_DEBUG, '<', '>');
        add("vendor-agent: ");
        add(block.unit->name);
        add(line, ':', ' ');
        add(block.function);
        add(": ");
    }
    void add(const char* text) {
        const std::size_t length = std::min(std::strlen(text), sizeof text_ - length_);
        std::memcpy(text_ + length_, text, length);
        length_ += length;
    }
    void add(long number, char before = '\0', char after = '\0') {
        char digits[32];
        char* at = digits + sizeof digits - 1;
        *at = '\0';
        if (after != '\0') *--at = after;
        const bool isNegative = number < 0;
        unsigned long left = isNegative ? 0UL - static_cast<unsigned long>(number)
                                        : static_cast<unsigned long>(number);
        do
            *--at = static_cast<char>('0' + left % 10);
        while ((left /= 10) > 0);
        if (isNegative) *--at = '-';
        if (before != '\0') *--at = before;
        add(at);
    }
    void send() const {
        const int before = errno;
        while (::sendto(logSocket, text_, length_, MSG_NOSIGNAL,
                        reinterpret_cast<const sockaddr*>(&logAddress), sizeof logAddress) == -1 &&
               errno == EINTR) {
        }
        errno = before;
    }

private:
    char text_[1024];
    std::size_t length_ = 0;
};

}  // namespace

void vendor::setTrace(const std::string& path, bool everything) {
    const std::size_t length = std::min(path.size(), sizeof logAddress.sun_path - 1);
    std::memset(logAddress.sun_path, 0, sizeof logAddress.sun_path);
    std::memcpy(logAddress.sun_path, path.data(), length);
    selected = everything ? kAll : unsigned{RAS1_ERROR};
    if (++RAS1_Generation == 0) ++RAS1_Generation;
}

unsigned RAS1_Sync(RAS1_UNIT* unit) {
    const unsigned generation = RAS1_Generation;
    const unsigned flags = selected;
    unit->flags.store(flags, std::memory_order_relaxed);
    unit->generation.store(generation, std::memory_order_release);
    return flags;
}

void RAS1_Entry(const RAS1_BLOCK* block, int line) {
    Line entry(RAS1_FLOW, *block, line);
    entry.add("Entry");
    entry.send();
}

void RAS1_Exit(const RAS1_BLOCK* block, int line) {
    Line exit(RAS1_FLOW, *block, line);
    exit.add("Exit");
    exit.send();
}

void RAS1_ExitValue(const RAS1_BLOCK* block, int line, long value) {
    Line exit(RAS1_FLOW, *block, line);
    exit.add("Exit ");
    exit.add(value);
    exit.send();
}

void RAS1_Printf(const RAS1_BLOCK* block, unsigned level, int line, const char* format, ...) {
    Line text(level, *block, line);
    std::va_list arguments;
    va_start(arguments, format);
    if (std::strcmp(format, "%s") == 0) {
        const char* const given = va_arg(arguments, const char*);
        text.add(given != nullptr ? given : "(null)");
    } else {
        char formatted[1024];
        std::vsnprintf(formatted, sizeof formatted, format, arguments);
        text.add(formatted);
    }
    va_end(arguments);
    text.send();
}
