/// Who comes in.
#pragma once

#include <functional>
#include <string>

#include "http/peer.h"

namespace http {

struct Door {
    /// Who is at the other end of this connection, which has just been accepted and stays the
    /// server's. I/O thread; must not block.
    std::function<Peer(int connection)> peerOf;
    /// What somebody without any access is told: a sentence.
    std::string refusal;
};

}  // namespace http
