/// One association: the protocol between a client and the runtime, without the connection that
/// carries it. Bytes go in, calls are made, bytes come out.
#pragma once

#include <sys/uio.h>

#include <atomic>
#include <cstddef>
#include <cstdint>
#include <map>
#include <string>

#include "embedded/ncs_host.h"
#include "ncs/pdu.h"
#include "ncs/registry.h"
#include "ncs/stub_buffer.h"
#include "platform/ncs.h"

/// Represents a caller while its call runs. It has no properties that a manager could ask for.
struct rpc__binding {};

namespace ncs {

/// Shared by all associations of a server.
struct SharedState {
    SharedState(std::size_t stubLimit, std::size_t totalLimit, CallWatch* callWatch = nullptr)
        : largestStub(stubLimit), watch(callWatch), memory(totalLimit) {}

    const std::size_t largestStub;               ///< bytes of one call's parameters
    CallWatch* const watch;                      ///< null when nobody watches
    std::atomic<std::uint64_t> associations{0};  ///< that made calls while somebody watched
    MemoryBudget memory;
    std::atomic<std::uint64_t> calls{0};   ///< that reached a stub
    std::atomic<std::uint64_t> faults{0};  ///< that were answered
};

/// Not thread-safe; one thread at a time feeds it.
class Association {
public:
    /// `port` is the TCP port that the client connected to, in decimal; empty for a Unix socket.
    Association(SharedState& shared, std::string port);
    /// Tells the watch.
    ~Association();
    Association(const Association&) = delete;
    Association& operator=(const Association&) = delete;

    /// Gives one or two ranges for the client's next bytes, to be filled in order, and returns
    /// their number. A fragment's stub data goes straight to its place after the fragments before
    /// it. To be called when handle() has nothing left to do. There is room for at least one byte.
    int windows(iovec (&ranges)[2]);
    /// Accepts `count` bytes that were put there and handles everything that is complete.
    void received(std::size_t count);
    /// Resumes with bytes that were left over because output() had grown too large, if there are
    /// any.
    void handle();

    /// Bytes to send; the sender removes them.
    std::string& output() { return output_; }
    /// False if the connection is to be closed after the output.
    bool isOpen() const { return open_; }

    bool isBound() const { return bound_; }
    /// Whether a packet or a request has begun but is not complete.
    bool isMidRequest() const { return call_.active || directLeft_ > 0 || inboxEnd_ > 0; }
    /// The number of requests that are complete, answered or not.
    std::uint64_t requestsDone() const { return requestsDone_; }

private:
    struct Context {
        uuid__t interface {};
        std::uint32_t version = 0;
    };
    struct Call {
        bool active = false;
        std::uint32_t id = 0;
        std::uint16_t contextId = 0;
        std::uint16_t operation = 0;
        bool littleEndian = true;
        RegisteredInterface interface;
        bool answered = true;     ///< false when the caller wants no answer
        std::uint32_t fault = 0;  ///< if not 0, the answer; the rest of the request is discarded
    };

    bool handleNext();
    bool handleFragment(const unsigned char* pdu, std::size_t available, const PduHeader& header);
    void handleControl(const unsigned char* pdu, const PduHeader& header);
    bool fits(const PduHeader& header, const RequestHead& head) const;
    void startCall(const PduHeader& header, const RequestHead& head);
    void makeRoom(std::size_t stubBytes, std::size_t hint);
    void endFragment();
    void finishCall();
    std::uint32_t resolve();
    std::uint32_t execute();
    std::uint32_t watchedCall(const rpc__request& request, rpc__reply& reply);
    std::uint32_t callStub(const rpc__request& request, rpc__reply& reply);
    void endCall();

    void bind(PduType answerType, const unsigned char* pdu, const PduHeader& header);
    ContextResult accept(const PresentationContext& context);
    void refuseHeader(HeaderProblem problem, const PduHeader& header);
    void refuseBind(const PduHeader& header, BindRefusal reason);
    void protocolError(const PduHeader& header);

    SharedState& shared_;
    const std::string port_;
    bool open_ = true;
    bool bound_ = false;
    std::uint16_t largestSent_ = kSmallestMaximum;
    std::map<std::uint16_t, Context> contexts_;
    std::uint64_t requestsDone_ = 0;
    std::uint64_t watchedAs_ = 0;  ///< the number that the watch knows; 0 before the first call
    std::string output_;

    Call call_;
    StubBuffer stub_;
    std::size_t directLeft_ = 0;  ///< bytes of this fragment's stub data that are still to come
    bool lastFragment_ = false;

    /// Bytes that are not handled yet: heads, packets other than requests, and requests small
    /// enough that several come with one read. Untouched memory costs nothing, so it may be
    /// generous.
    unsigned char inbox_[std::size_t{64} << 10];
    std::size_t inboxStart_ = 0;
    std::size_t inboxEnd_ = 0;
};

}  // namespace ncs
