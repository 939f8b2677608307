/// One client of a front.
#pragma once

#include <openssl/ssl.h>

#include <memory>
#include <string>
#include <string_view>

#include "fleet/https/front/front_core.h"
#include "fleet/https/front/server_identity.h"
#include "system/file_descriptor.h"

namespace fleet {

/// First the handshake, then two lanes: "inward" goes from the client to the server, "outward"
/// back. Each lane holds at most one piece, and reads no further before that has been taken.
///
/// The server closes its end when it likes; what it has sent by then still reaches the client. A
/// client that ends without saying so, or speaks no TLS, loses its connection at once.
///
/// Lives on the front's thread, and in the front's books from begin() until it is over.
class FrontConnection final : public std::enable_shared_from_this<FrontConnection> {
public:
    /// `tls` uses the client's connection.
    FrontConnection(FrontCore& core, sys::FileDescriptor client, TlsSession tls,
                    std::string origin);

    void begin();
    /// Closes both ends at once.
    void drop();
    bool isInHandshake() const { return !server_.is_open(); }

private:
    using Step = void (FrontConnection::*)();
    enum class Sent { All, Part, Gone };

    void await(FrontDescriptor& end, FrontDescriptor::wait_type kind, Step next);
    void awaitClient(int result, Step next);
    void limitTime(std::chrono::milliseconds time);

    void shakeHands();
    void connectServer();
    void limitEnd();

    void readClient();
    void passInward(std::string_view piece);
    void passRestInward() { passInward(inward_); }
    void endInward();
    Sent sendToServer(std::string_view& piece);

    void readServer();
    void passOutward(std::string_view piece);
    void passRestOutward() { passOutward(outward_); }
    void endOutward();
    void endIfBothAreOver();

    FrontCore& core_;
    FrontDescriptor client_;
    FrontDescriptor server_;
    const TlsSession tls_;  ///< not used any more once the client's end is closed
    const std::string origin_;
    FrontTimer timer_;
    std::string inward_;          ///< what the server has not taken yet
    std::string outward_;         ///< what the client has not taken yet
    bool isOpen_ = false;         ///< in the books
    bool isInwardOver_ = false;   ///< the client sends no more
    bool isOutwardOver_ = false;  ///< the server sends no more, and the client has it all
    bool isServerGone_ = false;   ///< it takes no more: what the client sends is dropped
    bool isEndLimited_ = false;
};

}  // namespace fleet
