#include <arpa/inet.h>

#include <boost/crc.hpp>
#include <cstring>
#include <stdexcept>

#include "request/clients.h"
#include "request/connection.h"

namespace request {

namespace {

/// Numbers in network order; the checksum is that of the packet with 0 in its place.
struct Packet {
    std::uint16_t version;
    std::uint16_t type;
    std::uint32_t checksum;
    std::uint16_t result;
    char text[1024];
    char padding[2];
};
static_assert(sizeof(Packet) == 1036, "the packet's size is fixed");

std::string queryPacket(const std::string& name) {
    constexpr std::uint16_t kVersion = 2;
    constexpr std::uint16_t kQuery = 1;
    Packet packet{};
    if (name.size() >= sizeof packet.text) throw std::runtime_error("name too long");
    packet.version = htons(kVersion);
    packet.type = htons(kQuery);
    std::memcpy(packet.text, name.c_str(), name.size());
    boost::crc_32_type checksum;
    checksum.process_bytes(&packet, sizeof packet);
    packet.checksum = htonl(checksum.checksum());
    return std::string(reinterpret_cast<const char*>(&packet), sizeof packet);
}

}  // namespace

Exchange nrpe(std::uint16_t port, const std::string& name) {
    return [port, query = queryPacket(name)] {
        Connection connection(port);
        connection.send(query);
        const std::string answer = connection.receiveAll();
        Packet packet;
        if (answer.size() < sizeof packet) throw std::runtime_error("the answer is cut");
        std::memcpy(&packet, answer.data(), sizeof packet);
        return std::string(packet.text, ::strnlen(packet.text, sizeof packet.text));
    };
}

}  // namespace request
