/// Who is at the other end of a connection, and what they may do.
#pragma once

#include <sys/types.h>

#include <string>

namespace http {

/// What a client may do, each level including the ones before it.
enum class Access {
    None,
    Read,  ///< look at things
    Act,   ///< change things on this machine
};

/// The process that opened the connection, as the kernel knows it.
struct Peer {
    pid_t process = 0;
    uid_t user = 0;
    gid_t group = 0;
    Access access = Access::None;
    std::string reason{};  ///< what gives it that access, in words; empty: nothing does
};

}  // namespace http
