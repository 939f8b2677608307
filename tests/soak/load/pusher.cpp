#include "soak/load/pusher.h"

#include <algorithm>
#include <cstdio>
#include <cstring>

#include "ctl/client/transfer/rpc_wire.h"

namespace soak {
namespace {

namespace rpc = ctl::rpc;

constexpr std::size_t kChunkData = 4096;
constexpr double kPatience = 60;

template <typename Bytes>
std::string text(const Bytes& bytes) {
    return {bytes.begin(), bytes.end()};
}

/// Length and data of each chunk.
std::string chunksOf(const std::string& content, std::size_t at, std::size_t count) {
    std::string made;
    made.reserve(count * (kChunkData + 4));
    for (std::size_t i = 0; i < count; ++i) {
        const std::size_t begin = std::min(content.size(), at + i * kChunkData);
        const std::size_t length = std::min(kChunkData, content.size() - begin);
        for (unsigned shift = 0; shift < 32; shift += 8)
            made += static_cast<char>(length >> shift & 0xFFU);
        made.append(content, begin, length);
        made.append(kChunkData - length, '\0');
    }
    return made;
}

/// The whole packet at the beginning of `in`, when it is there.
std::string takePacket(std::string& in, bool& sound) {
    sound = true;
    if (in.size() < rpc::kCommonHeader) return {};
    unsigned char bytes[rpc::kCommonHeader];
    std::memcpy(bytes, in.data(), sizeof bytes);
    rpc::CommonHeader header;
    sound = rpc::parseCommonHeader(bytes, header);
    if (!sound || in.size() < header.fragmentLength) return {};
    const std::string packet = in.substr(0, header.fragmentLength);
    in.erase(0, header.fragmentLength);
    return packet;
}

std::uint32_t numberAt(const std::string& packet, std::size_t at) {
    unsigned char bytes[4];
    std::memcpy(bytes, packet.data() + at, sizeof bytes);
    return rpc::number32(bytes, true);
}

}  // namespace

Pusher::Pusher(World& world) : Client(world, "pushing", world.home.transferSocket()) {
    Chance& chance = world.chance;
    const std::uint64_t number = world.tally.of("pushes");
    world.tally.count("pushes");
    converted_ = chance.oneIn(5);
    const std::string separator = chance.of<std::string>({"/", "\\"});
    name_ = SoakHome::kPushDirectory + separator + std::to_string(number % 10) + separator +
            (converted_ ? "install.sh" : "file") + std::to_string(number);
    content_ = chance.bytes(chance.oneIn(4) ? chance.below(600'000) : chance.below(20'000));
    gone_ = chance.oneIn(6) ? chance.between(1, content_.size() + 300) : 0;
}

bool Pusher::begin() {
    waitsUntil_ = now() + kPatience;
    wakeIn(kPatience);
    connection_.send(text(rpc::bindPacket(call_++)));
    return connection_.flush();
}

bool Pusher::proceed(bool readable, bool writable) {
    if (writable && !connection_.flush()) readable = true;
    if (readable) {
        const bool open = connection_.fill();
        if (!takePackets()) return false;
        if (!open) {
            if (world_.hostIsDead) {
                world_.tally.count("pushes cut off");
            } else if (stage_ == Stage::Binding) {
                world_.tally.count("pushes turned away");
            } else {
                world_.tally.fault("the host ended a transfer of " + name_);
            }
            return false;
        }
    }
    if (gone_ > 0 && connection_.sentBytes() >= gone_) {
        world_.tally.count("pushes broken off");
        return false;
    }
    if (now() < waitsUntil_) return true;
    world_.tally.fault("no answer to a transfer of " + name_);
    return false;
}

bool Pusher::takePackets() {
    for (;;) {
        bool sound = true;
        const std::string packet = takePacket(connection_.in(), sound);
        if (!sound) world_.tally.fault("a packet that is none");
        if (packet.empty()) return sound;
        if (!(stage_ == Stage::Binding ? onBound(packet) : onAnswer(packet))) return false;
    }
}

bool Pusher::onBound(const std::string& packet) {
    const std::vector<unsigned char> body(packet.begin() + rpc::kCommonHeader, packet.end());
    if (packet[2] != rpc::kBindAck || !rpc::parseBindAck(body, true, largestFragment_)) {
        world_.tally.fault("a transfer was not accepted");
        return false;
    }
    stage_ = Stage::Sending;
    sendBatch();
    return true;
}

void Pusher::sendBatch() {
    const std::size_t left = (content_.size() - at_ + kChunkData - 1) / kChunkData;
    const std::size_t most = world_.chance.between(1, 250);
    const std::size_t count = std::max<std::size_t>(1, std::min(left, most));
    const std::string stub =
        text(rpc::transferHead(name_, at_ == 0, static_cast<std::uint16_t>(count))) +
        chunksOf(content_, at_, count);
    at_ = std::min(content_.size(), at_ + count * kChunkData);
    const std::size_t largest = world_.chance.between(1000, largestFragment_ - rpc::kRequestHeader);
    const std::uint32_t call = call_++;
    for (std::size_t done = 0; done < stub.size();) {
        const std::size_t length = std::min(largest, stub.size() - done);
        unsigned flags = 0;
        if (done == 0) flags |= rpc::kFirstFragment;
        if (done + length == stub.size()) flags |= rpc::kLastFragment;
        connection_.send(
            text(rpc::requestHeader(call, static_cast<std::uint8_t>(flags), length, stub.size())) +
            stub.substr(done, length));
        done += length;
    }
    waitsUntil_ = now() + kPatience;
    wakeIn(kPatience);
    connection_.flush();
}

bool Pusher::onAnswer(const std::string& packet) {
    if (packet[2] != rpc::kResponse || packet.size() < 28) {
        world_.tally.fault("a transfer of " + name_ + " was answered with packet type " +
                           std::to_string(packet[2]));
        return false;
    }
    if (numberAt(packet, 12) != call_ - 1) world_.tally.fault("an answer to another call");
    const std::uint32_t status = numberAt(packet, 24);
    if (status != 0) {
        world_.tally.fault("a transfer of " + name_ + " ended with status " +
                           std::to_string(status));
        return false;
    }
    if (at_ >= content_.size()) return complete();
    sendBatch();
    return true;
}

std::string Pusher::expected() const {
    std::string kept = content_;
    if (converted_) {
        kept.erase(std::remove_if(kept.begin(), kept.end(),
                                  [](char c) { return c == '\r' || c == '\x1a'; }),
                   kept.end());
    }
    return kept;
}

bool Pusher::complete() {
    std::string relative = name_;
    std::replace(relative.begin(), relative.end(), '\\', '/');
    const std::string path = world_.home.depot() + "/" + relative;
    world_.tally.count("pushes complete");
    world_.tally.count("KiB pushed", content_.size() / 1024);
    if (contentOf(path) != expected()) {
        world_.tally.fault("the pushed file " + relative + " has another content");
    } else if (std::remove(path.c_str()) != 0) {
        world_.tally.fault("the pushed file " + relative + " cannot be removed");
    }
    return false;
}

}  // namespace soak
