#include "ncs/association.h"

#include <algorithm>
#include <cstring>
#include <optional>
#include <utility>

#include "platform/ras1.h"

namespace ncs {
namespace {

RAS1_UNIT traceUnit{"ncs"};

/// Contexts that one association may have.
constexpr std::size_t kMostContexts = 32;
/// With more unsent output than this, no further requests are handled.
constexpr std::size_t kOutputPause = std::size_t{256} << 10;
/// Length of the largest packet that is not a request.
constexpr std::size_t kLargestControlPacket = 8192;
constexpr std::size_t kReplyCapacity = std::size_t{64} << 10;

template <typename... Arguments>
void traceDetail(const char* function, int line, const char* format, Arguments... arguments) {
    if ((RAS1_Flags(traceUnit) & RAS1_DETAIL) == 0) return;
    const RAS1_BLOCK block{&traceUnit, function};
#pragma GCC diagnostic push
#pragma GCC diagnostic ignored "-Wformat-nonliteral"
#pragma GCC diagnostic ignored "-Wformat-security"
    RAS1_Printf(&block, RAS1_DETAIL, line, format, arguments...);
#pragma GCC diagnostic pop
}

/// Groups have no meaning here except for their number, which must not be 0.
std::uint32_t newAssociationGroup() {
    static std::atomic<std::uint32_t> last{0};
    const std::uint32_t group = ++last;
    return group != 0 ? group : ++last;
}

std::uint16_t commonMaximum(std::uint16_t clients) {
    return std::clamp(clients, kSmallestMaximum, kLargestFragment);
}

}  // namespace

Association::Association(SharedState& shared, std::string port)
    : shared_(shared), port_(std::move(port)), stub_(shared.memory) {}

Association::~Association() {
    if (watchedAs_ != 0) shared_.watch->ended(watchedAs_);
}

int Association::windows(iovec (&ranges)[2]) {
    if (directLeft_ == 0) {
        ranges[0] = {inbox_ + inboxEnd_, sizeof inbox_ - inboxEnd_};
        return 1;
    }
    if (call_.fault != 0) {
        ranges[0] = {inbox_, std::min(sizeof inbox_, directLeft_)};
        return 1;
    }
    ranges[0] = {stub_.end(), directLeft_};
    // Anything may follow the last fragment. Any other one is followed by the next fragment, of
    // which only the head is to be read here.
    ranges[1] = {inbox_, lastFragment_ ? sizeof inbox_ : kRequestHeadSize};
    return 2;
}

void Association::received(std::size_t count) {
    if (directLeft_ > 0) {
        const std::size_t direct = std::min(count, directLeft_);
        directLeft_ -= direct;
        count -= direct;
        if (call_.fault == 0) stub_.grow(direct);
        if (directLeft_ > 0) return;
        inboxStart_ = 0;
        inboxEnd_ = count;
        endFragment();
    } else {
        inboxEnd_ += count;
    }
    handle();
}

void Association::handle() {
    while (open_ && directLeft_ == 0 && output_.size() < kOutputPause && handleNext()) {
    }
    if (inboxStart_ == 0) return;
    std::memmove(inbox_, inbox_ + inboxStart_, inboxEnd_ - inboxStart_);
    inboxEnd_ -= inboxStart_;
    inboxStart_ = 0;
}

/// Handles one packet, or as much of a fragment as has arrived. False if it needs more bytes.
bool Association::handleNext() {
    const unsigned char* const pdu = inbox_ + inboxStart_;
    const std::size_t available = inboxEnd_ - inboxStart_;
    PduHeader header;
    const HeaderProblem problem = decodeHeader(pdu, available, header);
    if (problem == HeaderProblem::Incomplete) return false;
    if (problem != HeaderProblem::None) {
        refuseHeader(problem, header);
        return false;
    }
    if (header.is(PduType::Request)) return handleFragment(pdu, available, header);
    if (header.fragmentLength > kLargestControlPacket) {
        protocolError(header);
        return false;
    }
    if (available < header.fragmentLength) return false;
    handleControl(pdu, header);
    inboxStart_ += header.fragmentLength;
    return true;
}

bool Association::handleFragment(const unsigned char* pdu, std::size_t available,
                                 const PduHeader& header) {
    const std::size_t headSize = requestHeadSize(header);
    if (!bound_ || header.authLength != 0 || header.fragmentLength < headSize) {
        protocolError(header);
        return false;
    }
    if (available < headSize) return false;
    const RequestHead head = decodeRequestHead(pdu, header);
    if (!fits(header, head)) {
        protocolError(header);
        return false;
    }
    if (header.has(kFirstFragment)) startCall(header, head);
    lastFragment_ = header.has(kLastFragment);
    const std::size_t stubBytes = header.fragmentLength - headSize;
    makeRoom(stubBytes, head.allocationHint);
    const std::size_t here = std::min(available - headSize, stubBytes);
    if (call_.fault == 0 && here > 0) {
        std::memcpy(stub_.end(), pdu + headSize, here);
        stub_.grow(here);
    }
    inboxStart_ += headSize + here;
    directLeft_ = stubBytes - here;
    if (directLeft_ == 0) endFragment();
    return true;
}

/// Whether a fragment is in order: it begins a call while none is active, or continues that one.
bool Association::fits(const PduHeader& header, const RequestHead& head) const {
    if (header.has(kFirstFragment)) return !call_.active;
    return call_.active && call_.id == header.callId && call_.contextId == head.contextId &&
           call_.operation == head.operation && call_.littleEndian == header.littleEndian;
}

void Association::startCall(const PduHeader& header, const RequestHead& head) {
    call_ = Call{};
    call_.active = true;
    call_.id = header.callId;
    call_.contextId = head.contextId;
    call_.operation = head.operation;
    call_.littleEndian = header.littleEndian;
    call_.answered = !header.has(kMaybe);
    call_.fault = resolve();
}

/// Looks up the call's interface and operation. Returns 0 or the fault to answer with.
std::uint32_t Association::resolve() {
    const auto context = contexts_.find(call_.contextId);
    if (context == contexts_.end() ||
        !findInterface(context->second.interface, context->second.version, call_.interface)) {
        return rpc__s_unknown_if;
    }
    return call_.operation < call_.interface.stubs->count ? rpc__s_ok : rpc__s_op_range;
}

/// Makes room for a fragment. Without memory, the call gets a fault once it is complete.
void Association::makeRoom(std::size_t stubBytes, std::size_t hint) {
    if (call_.fault != 0) return;
    const bool isTooMuch = stubBytes > shared_.largestStub - stub_.size();
    const std::size_t expected = std::min(hint, shared_.largestStub);
    if (!isTooMuch && stub_.reserve(stubBytes, stub_.size() == 0 ? expected : 0)) return;
    call_.fault = rpc__s_no_memory;
    stub_.release();
}

void Association::endFragment() {
    if (lastFragment_) finishCall();
}

void Association::finishCall() {
    std::uint8_t faultFlags = kDidNotExecute;
    if (call_.fault == 0) {
        faultFlags = 0;
        call_.fault = execute();
    }
    if (call_.fault != 0) {
        ++shared_.faults;
        traceDetail(__func__, __LINE__, "Call %u of operation %u ends with fault %08x", call_.id,
                    call_.operation, call_.fault);
        if (call_.answered) {
            encodeFault(call_.id, call_.contextId, call_.fault, faultFlags, output_);
        }
    }
    endCall();
}

/// Calls the stub and appends its reply to the output. Returns 0 or the fault to answer with.
std::uint32_t Association::execute() {
    unsigned char replyBytes[kReplyCapacity];
    rpc__binding binding;
    const rpc__request request{&binding, stub_.data(), stub_.size(), call_.littleEndian};
    rpc__reply reply{replyBytes, sizeof replyBytes, 0};
    const std::uint32_t fault =
        shared_.watch != nullptr ? watchedCall(request, reply) : callStub(request, reply);
    if (fault != 0) return fault;
    if (call_.answered) {
        encodeResponse(call_.id, call_.contextId, replyBytes, reply.length, largestSent_, output_);
    }
    return 0;
}

/// Asks the watch first; it may have the answer.
std::uint32_t Association::watchedCall(const rpc__request& request, rpc__reply& reply) {
    if (watchedAs_ == 0) watchedAs_ = ++shared_.associations;
    const ncs::Call call{watchedAs_,      call_.interface.interface->name,
                         call_.operation, request.data,
                         request.length,  request.littleEndian};
    std::optional<std::string> answer;
    try {
        answer = shared_.watch->before(call);
    } catch (...) {
        return rpc__s_fault_unspec;
    }
    if (answer) {
        reply.length = std::min(answer->size(), reply.capacity);
        std::memcpy(reply.data, answer->data(), reply.length);
        return rpc__s_ok;
    }
    const std::uint32_t fault = callStub(request, reply);
    const std::size_t length = fault == rpc__s_ok ? reply.length : 0;
    shared_.watch->after(call, std::string(reinterpret_cast<const char*>(reply.data), length));
    return fault;
}

/// Calls the stub. If it throws, or claims more than the reply holds, against its contract, that
/// becomes a fault.
std::uint32_t Association::callStub(const rpc__request& request, rpc__reply& reply) {
    ++shared_.calls;
    const RegisteredInterface& interface = call_.interface;
    try {
        const std::uint32_t fault =
            interface.stubs->stubs[call_.operation](&request, interface.manager, &reply);
        return fault == rpc__s_ok && reply.length > reply.capacity ? rpc__s_fault_unspec : fault;
    } catch (...) {
        return rpc__s_fault_unspec;
    }
}

void Association::endCall() {
    stub_.release();
    call_ = Call{};
    ++requestsDone_;
}

void Association::handleControl(const unsigned char* pdu, const PduHeader& header) {
    if (header.is(PduType::Bind) && !bound_) {
        bind(PduType::BindAck, pdu, header);
    } else if (header.is(PduType::Bind)) {
        refuseBind(header, BindRefusal::Unspecified);
    } else if (header.is(PduType::AlterContext) && bound_ && !call_.active) {
        bind(PduType::AlterContextResponse, pdu, header);
    } else if (header.is(PduType::Orphaned)) {
        if (call_.active && call_.id == header.callId) endCall();
    } else if (!header.is(PduType::Cancel)) {
        // A cancel comes too late: a call runs as soon as it is complete.
        protocolError(header);
    }
}

void Association::bind(PduType answerType, const unsigned char* pdu, const PduHeader& header) {
    constexpr std::uint8_t kWhole = kFirstFragment | kLastFragment;
    BindRequest request;
    const bool isGood = header.authLength == 0 && (header.flags & kWhole) == kWhole &&
                        decodeBind(pdu, header.fragmentLength, header, request);
    if (!isGood && bound_) {
        protocolError(header);
        return;
    }
    if (!isGood) {
        refuseBind(header,
                   header.authLength != 0 ? BindRefusal::Authentication : BindRefusal::Unspecified);
        return;
    }
    if (!bound_) largestSent_ = commonMaximum(request.largestTaken);
    bound_ = true;
    BindAnswer answer;
    answer.largestSent = largestSent_;
    answer.largestTaken = commonMaximum(request.largestSent);
    answer.associationGroup =
        request.associationGroup != 0 ? request.associationGroup : newAssociationGroup();
    answer.port = port_;
    for (const PresentationContext& context : request.contexts) {
        answer.results.push_back(accept(context));
    }
    encodeBindAnswer(answerType, header.callId, answer, output_);
}

ContextResult Association::accept(const PresentationContext& context) {
    const std::uint32_t major = context.version & 0xFFFF;
    const std::uint32_t minor = context.version >> 16;
    RegisteredInterface known;
    ContextResult result = ContextResult::Accepted;
    if (minor != 0 || !findInterface(context.interface, major, known)) {
        result = ContextResult::UnknownInterface;
    } else if (!context.offersNdr) {
        result = ContextResult::UnknownTransferSyntax;
    } else if (contexts_.count(context.id) == 0 && contexts_.size() >= kMostContexts) {
        result = ContextResult::TooMany;
    } else {
        contexts_[context.id] = {context.interface, major};
    }
    traceDetail(__func__, __LINE__, "Context %u for interface %08x version %u.%u: result %u",
                context.id, context.interface.time_high, major, minor,
                static_cast<unsigned>(result));
    return result;
}

void Association::refuseHeader(HeaderProblem problem, const PduHeader& header) {
    if (header.is(PduType::Bind)) {
        refuseBind(header, problem == HeaderProblem::Version ? BindRefusal::Version
                                                             : BindRefusal::Unspecified);
    } else if (problem == HeaderProblem::Version) {
        open_ = false;  // the peer speaks another protocol
    } else {
        protocolError(header);
    }
}

void Association::refuseBind(const PduHeader& header, BindRefusal reason) {
    encodeBindRefusal(header.callId, reason, output_);
    open_ = false;
}

void Association::protocolError(const PduHeader& header) {
    ++shared_.faults;
    traceDetail(__func__, __LINE__, "Packet of type %u breaks the protocol", header.type);
    encodeFault(header.callId, 0, rpc__s_protocol_error, kDidNotExecute, output_);
    open_ = false;
}

}  // namespace ncs
