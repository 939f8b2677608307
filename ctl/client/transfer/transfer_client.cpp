#include "ctl/client/transfer/transfer_client.h"

#include <poll.h>
#include <sys/socket.h>
#include <sys/time.h>
#include <sys/uio.h>
#include <sys/un.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstring>

#include "ctl/client/address/no_host.h"
#include "ctl/client/address/peer.h"
#include "ctl/client/failure.h"
#include "ctl/client/transfer/interruption.h"

namespace ctl {
namespace {

constexpr int kFragmentsAtATime = 16;
/// Requests up to this size wait for company: a system call and a wake-up of the host for each
/// would cost as much as what the host does with it.
constexpr std::size_t kHeldBack = std::size_t{64} << 10;
/// Bytes on their way to the host. With the usual 208 KiB the client would stand still while the
/// host writes what it has got of a batch; the kernel gives less if the system's limit is lower.
constexpr int kSendBuffer = 2 << 20;

Failure late() {
    return {kNoOutcome, "the host did not take the file within the time-out"};
}

Failure broken() {
    if (errno == EAGAIN || errno == EWOULDBLOCK) return late();
    return {kNoHost, std::string("the connection to the host broke: ") + std::strerror(errno)};
}

void setTimeout(int descriptor, std::chrono::milliseconds timeout) {
    // A time-out of 0 would mean to wait without end.
    timeout = std::max(timeout, std::chrono::milliseconds(1));
    timeval limit{};
    limit.tv_sec = static_cast<time_t>(timeout.count() / 1000);
    limit.tv_usec = static_cast<suseconds_t>(timeout.count() % 1000 * 1000);
    ::setsockopt(descriptor, SOL_SOCKET, SO_RCVTIMEO, &limit, sizeof limit);
    ::setsockopt(descriptor, SOL_SOCKET, SO_SNDTIMEO, &limit, sizeof limit);
}

void setSendBuffer(int descriptor) {
    ::setsockopt(descriptor, SOL_SOCKET, SO_SNDBUF, &kSendBuffer, sizeof kSendBuffer);
}

/// Sends all bytes of the pieces. Changes the pieces on the way.
void sendPieces(int descriptor, std::vector<iovec>& pieces) {
    std::size_t at = 0;
    while (at < pieces.size()) {
        msghdr message{};
        message.msg_iov = &pieces[at];
        message.msg_iovlen = pieces.size() - at;
        const ssize_t sent = ::sendmsg(descriptor, &message, MSG_NOSIGNAL);
        if (sent == -1 && errno == EINTR) continue;
        if (sent == -1) throw broken();
        auto bytes = static_cast<std::size_t>(sent);
        while (at < pieces.size() && pieces[at].iov_len <= bytes)
            bytes -= pieces[at++].iov_len;
        if (at == pieces.size()) break;
        pieces[at].iov_base = static_cast<char*>(pieces[at].iov_base) + bytes;
        pieces[at].iov_len -= bytes;
    }
}

/// The data of a request, which stands in two places: its head and the chunks.
class RequestData {
public:
    RequestData(const std::vector<unsigned char>& head, const ChunkBatch& batch)
        : parts_{{const_cast<unsigned char*>(head.data()), head.size()},
                 {const_cast<unsigned char*>(batch.data()), batch.size()}} {}

    std::size_t total() const { return parts_[0].iov_len + parts_[1].iov_len; }

    /// Adds pieces for the next `length` bytes.
    void take(std::size_t length, std::vector<iovec>& pieces) {
        while (length > 0) {
            iovec& part = parts_[0].iov_len > 0 ? parts_[0] : parts_[1];
            const std::size_t count = std::min(length, part.iov_len);
            pieces.push_back({part.iov_base, count});
            part.iov_base = static_cast<char*>(part.iov_base) + count;
            part.iov_len -= count;
            length -= count;
        }
    }

private:
    iovec parts_[2];
};

}  // namespace

TransferClient::TransferClient(const std::string& socketPath, std::chrono::milliseconds timeout)
    : descriptor_(::socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0)) {
    if (descriptor_ == -1) throw broken();
    try {
        limitWaits(timeout);
        setSendBuffer(descriptor_);
        connect(socketPath);
        Interruption::watch(descriptor_);
        bind();
    } catch (...) {
        close();
        throw;
    }
}

TransferClient::~TransferClient() {
    close();
}

void TransferClient::close() {
    Interruption::forget(descriptor_);
    ::close(descriptor_);
}

void TransferClient::stopSending(std::chrono::milliseconds timeout) {
    heldBack_.clear();
    limitWaits(timeout);
    ::shutdown(descriptor_, SHUT_WR);
}

void TransferClient::limitWaits(std::chrono::milliseconds timeout) {
    timeout_ = timeout;
    setTimeout(descriptor_, timeout);
}

void TransferClient::connect(const std::string& path) {
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    if (path.size() >= sizeof address.sun_path) {
        throw Failure(kWrongUsage, "the socket's path is too long: " + path);
    }
    std::memcpy(address.sun_path, path.c_str(), path.size());
    if (::connect(descriptor_, reinterpret_cast<const sockaddr*>(&address), sizeof address) != 0) {
        throw noHost(path, errno);
    }
    refuseStranger(descriptor_, path);
}

void TransferClient::bind() {
    std::vector<unsigned char> request = rpc::bindPacket(nextCall_++);
    std::vector<iovec> pieces = {{request.data(), request.size()}};
    sendPieces(descriptor_, pieces);
    const Packet answer = readPacket();
    std::uint16_t largestFragment = 0;
    if (answer.header.type != rpc::kBindAck ||
        !rpc::parseBindAck(answer.body, answer.header.littleEndian, largestFragment)) {
        throw Failure(kNoHost, "the host does not offer file transfer");
    }
    largestData_ = std::min(largestFragment, rpc::kLargestFragment) - rpc::kRequestHeader;
}

void TransferClient::send(const std::string& name, bool firstBatch, const ChunkBatch& batch) {
    const std::vector<unsigned char> head = rpc::transferHead(name, firstBatch, batch.count());
    const std::size_t total = head.size() + batch.size();
    const std::size_t whole = rpc::kRequestHeader + total;
    const bool isLarge = total > largestData_ || whole > kHeldBack;
    if (isLarge || heldBack_.size() + whole > kHeldBack) sendHeldBack();
    if (isLarge) {
        sendFragments(head, batch);
        return;
    }
    const auto header =
        rpc::requestHeader(nextCall_++, rpc::kFirstFragment | rpc::kLastFragment, total, total);
    heldBack_.insert(heldBack_.end(), header.begin(), header.end());
    heldBack_.insert(heldBack_.end(), head.begin(), head.end());
    heldBack_.insert(heldBack_.end(), batch.data(), batch.data() + batch.size());
}

void TransferClient::sendHeldBack() {
    if (heldBack_.empty()) return;
    std::vector<iovec> pieces = {{heldBack_.data(), heldBack_.size()}};
    sendPieces(descriptor_, pieces);
    heldBack_.clear();
}

/// Sends a request in as many fragments as it needs.
void TransferClient::sendFragments(const std::vector<unsigned char>& head,
                                   const ChunkBatch& batch) {
    RequestData data(head, batch);
    const std::size_t total = data.total();
    const std::uint32_t call = nextCall_++;
    std::array<std::array<unsigned char, rpc::kRequestHeader>, kFragmentsAtATime> headers{};
    for (std::size_t at = 0; at < total;) {
        std::vector<iovec> pieces;
        for (std::size_t i = 0; i < headers.size() && at < total; ++i) {
            const std::size_t length = std::min(largestData_, total - at);
            std::uint8_t flags = 0;
            if (at == 0) flags |= rpc::kFirstFragment;
            if (at + length == total) flags |= rpc::kLastFragment;
            headers[i] = rpc::requestHeader(call, flags, length, total);
            pieces.push_back({headers[i].data(), headers[i].size()});
            data.take(length, pieces);
            at += length;
        }
        sendPieces(descriptor_, pieces);
    }
}

TransferAnswer TransferClient::receive() {
    sendHeldBack();
    const Packet packet = readPacket();
    TransferAnswer answer;
    // Behind the common header stand the allocation hint, context and cancel count: 8 bytes; then
    // the result of a response or the status of a fault.
    if (packet.body.size() < 12) throw Failure(kNoHost, "the host's answer makes no sense");
    const std::uint32_t value = rpc::number32(packet.body.data() + 8, packet.header.littleEndian);
    if (packet.header.type == rpc::kResponse) {
        answer.status = static_cast<std::int32_t>(value);
    } else if (packet.header.type == rpc::kFault) {
        answer.fault = value;
    } else {
        throw Failure(kNoHost, "the host's answer makes no sense");
    }
    return answer;
}

TransferClient::Packet TransferClient::readPacket() {
    packetDeadline_ = deadlineIn(timeout_);
    packetBegun_ = false;
    unsigned char bytes[rpc::kCommonHeader];
    readAll(bytes, sizeof bytes);
    Packet packet;
    if (!rpc::parseCommonHeader(bytes, packet.header)) {
        throw Failure(kNoHost, "the host's answer makes no sense");
    }
    packet.body.resize(packet.header.fragmentLength - rpc::kCommonHeader);
    readAll(packet.body.data(), packet.body.size());
    return packet;
}

void TransferClient::readAll(unsigned char* data, std::size_t length) {
    while (length > 0) {
        if (at_ == end_) readMore();
        const std::size_t count = std::min(length, end_ - at_);
        std::memcpy(data, received_ + at_, count);
        at_ += count;
        data += count;
        length -= count;
    }
}

/// Waits for bytes; takes all that have come.
void TransferClient::readMore() {
    // The socket's own time-out limits the wait for the first bytes, but begins anew with each.
    if (packetBegun_) awaitRestOfPacket();
    for (;;) {
        const ssize_t got = ::recv(descriptor_, received_, sizeof received_, 0);
        if (got == -1 && errno == EINTR) continue;
        if (got == -1) throw broken();
        if (got == 0) throw Failure(kNoHost, "the host closed the connection");
        at_ = 0;
        end_ = static_cast<std::size_t>(got);
        packetBegun_ = true;
        return;
    }
}

void TransferClient::awaitRestOfPacket() const {
    for (;;) {
        const auto left = std::chrono::ceil<std::chrono::milliseconds>(
            packetDeadline_ - std::chrono::steady_clock::now());
        if (left.count() <= 0) throw late();
        constexpr long long kMost = 3'600'000;  // fits poll's int
        pollfd input{descriptor_, POLLIN, 0};
        const int ready =
            ::poll(&input, 1, static_cast<int>(std::min<long long>(left.count(), kMost)));
        if (ready > 0) return;
        if (ready == -1 && errno != EINTR) throw broken();
    }
}

}  // namespace ctl
