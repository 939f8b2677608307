/// What the runtime's threads wait for: sources of epoll events.
#pragma once

#include <unistd.h>

#include <utility>

namespace ncs {

/// Owns a file descriptor.
class Descriptor {
public:
    explicit Descriptor(int descriptor) : descriptor_(descriptor) {}
    Descriptor(Descriptor&& other) noexcept : descriptor_(std::exchange(other.descriptor_, -1)) {}
    ~Descriptor() {
        if (descriptor_ != -1) ::close(descriptor_);
    }
    Descriptor(const Descriptor&) = delete;
    Descriptor& operator=(const Descriptor&) = delete;
    int get() const { return descriptor_; }

private:
    int descriptor_;
};

/// Something that is registered with the epoll descriptor.
struct Source {
    enum class Kind { Listener, Connection, Timer, Stop };
    explicit Source(Kind sourceKind) : kind(sourceKind) {}
    const Kind kind;
};

}  // namespace ncs
