// Connection-oriented DCE/RPC 5.0, little-endian. Every packet begins with 16 bytes: version (5,
// 0), type, flags, byte order (4 bytes), length (2), length of authentication (2), call (4).

#include "conformance/embedded/dce_client.h"

#include <netinet/in.h>
#include <sys/socket.h>
#include <unistd.h>

#include <algorithm>
#include <stdexcept>

namespace {

constexpr std::size_t kHeader = 16;
constexpr std::size_t kResponseHeader = 24;
constexpr std::size_t kLargestPart = 4096;  // of stub data in a fragment

enum PacketType : unsigned char { kRequest = 0, kResponse = 2, kFault = 3, kBind = 11, kAck = 12 };
enum PacketFlag : unsigned char { kFirst = 1, kLast = 2 };

constexpr uuid__t kNdr = {0x8A885D04, 0x1CEB, 0x11C9, 0x9F, {0xE8, 8, 0, 0x2B, 0x10, 0x48, 0x60}};

/// Appends a number of so many bytes.
void put(std::string& out, std::uint32_t value, unsigned bytes) {
    for (unsigned i = 0; i < bytes; ++i)
        out += static_cast<char>(value >> (8 * i) & 0xFF);
}

void put(std::string& out, const uuid__t& id) {
    put(out, id.time_high, 4);
    put(out, id.time_low, 2);
    put(out, id.reserved, 2);
    put(out, id.family, 1);
    for (const std::uint8_t byte : id.host)
        put(out, byte, 1);
}

std::uint32_t get(const std::string& bytes, std::size_t at, unsigned count) {
    if (bytes.size() < at + count) throw std::runtime_error("a packet is too short");
    std::uint32_t value = 0;
    for (unsigned i = 0; i < count; ++i)
        value |= std::uint32_t{static_cast<unsigned char>(bytes[at + i])} << (8 * i);
    return value;
}

std::string packet(PacketType type, unsigned flags, const std::string& body) {
    std::string out("\x05\x00", 2);
    put(out, type, 1);
    put(out, flags, 1);
    put(out, 0x10, 4);  // little-endian, ASCII, IEEE
    put(out, static_cast<std::uint32_t>(kHeader + body.size()), 2);
    put(out, 0, 2);
    put(out, 1, 4);
    return out + body;
}

std::string bindPacket(const uuid__t& interface, std::uint32_t version) {
    std::string body;
    put(body, 65528, 2);  // the largest fragments that are sent and taken
    put(body, 65528, 2);
    put(body, 0, 4);  // a group of its own
    put(body, 1, 4);  // one context, number 0, with one transfer syntax
    put(body, 0, 2);
    put(body, 1, 2);
    put(body, interface);
    put(body, version, 4);
    put(body, kNdr);
    put(body, 2, 4);
    return packet(kBind, kFirst | kLast, body);
}

/// Whether an answer to a bind accepts its one context. The result follows the server's address, a
/// text with its length before it, and is aligned to 4.
bool isAccepted(const std::string& answer) {
    if (get(answer, 2, 1) != kAck) return false;
    const std::size_t address = get(answer, 24, 2);
    const std::size_t results = (26 + address + 3) / 4 * 4;
    return get(answer, results + 4, 2) == 0;
}

int connectTo(std::uint16_t port) {
    const int made = ::socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
    sockaddr_in address{};
    address.sin_family = AF_INET;
    address.sin_port = htons(port);
    address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    if (made == -1 ||
        ::connect(made, reinterpret_cast<const sockaddr*>(&address), sizeof address) == -1) {
        ::close(made);
        throw std::runtime_error("the RPC server cannot be reached");
    }
    return made;
}

}  // namespace

DceClient::DceClient(std::uint16_t port, const uuid__t& interface, std::uint32_t version)
    : socket_(connectTo(port)) {
    try {
        send(bindPacket(interface, version));
        bound_ = isAccepted(receive());
    } catch (...) {
        ::close(socket_);
        throw;
    }
}

DceClient::~DceClient() {
    ::close(socket_);
}

conformance::CallResult DceClient::call(std::uint16_t operation, const std::string& parameters) {
    if (!bound_) return {rpc__s_unknown_if, {}};
    std::size_t at = 0;
    do {
        const std::string part = parameters.substr(at, kLargestPart);
        std::string body;
        put(body, static_cast<std::uint32_t>(parameters.size()), 4);
        put(body, 0, 2);
        put(body, operation, 2);
        const unsigned first = at == 0 ? kFirst : 0;
        at += part.size();
        const unsigned last = at == parameters.size() ? kLast : 0;
        send(packet(kRequest, first | last, body + part));
    } while (at < parameters.size());

    conformance::CallResult result;
    unsigned flags = 0;
    while ((flags & kLast) == 0) {
        const std::string answer = receive();
        if (get(answer, 2, 1) == kFault) return {get(answer, kResponseHeader, 4), {}};
        if (get(answer, 2, 1) != kResponse || answer.size() < kResponseHeader) {
            throw std::runtime_error("the answer is no response");
        }
        flags = get(answer, 3, 1);
        result.results += answer.substr(kResponseHeader);
    }
    return result;
}

void DceClient::send(const std::string& bytes) {
    for (std::size_t at = 0; at < bytes.size();) {
        const ssize_t count = ::send(socket_, bytes.data() + at, bytes.size() - at, MSG_NOSIGNAL);
        if (count <= 0) throw std::runtime_error("the RPC server takes no more");
        at += static_cast<std::size_t>(count);
    }
}

std::string DceClient::receive() {
    std::string answer = receiveBytes(kHeader);
    const std::size_t length = get(answer, 8, 2);
    return answer + receiveBytes(std::max(length, kHeader) - kHeader);
}

std::string DceClient::receiveBytes(std::size_t count) {
    std::string bytes(count, '\0');
    for (std::size_t at = 0; at < count;) {
        const ssize_t got = ::recv(socket_, bytes.data() + at, count - at, 0);
        if (got <= 0) throw std::runtime_error("the RPC server closed the connection");
        at += static_cast<std::size_t>(got);
    }
    return bytes;
}
