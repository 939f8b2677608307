#include "soak/load/garbage.h"

#include "ctl/client/transfer/rpc_wire.h"
#include "soak/load/http_text.h"

namespace soak {
namespace {

std::string text(const std::vector<unsigned char>& bytes) {
    return {bytes.begin(), bytes.end()};
}

std::string mutated(Chance& chance, std::string bytes) {
    for (std::size_t i = chance.between(1, 6); i > 0; --i)
        bytes[chance.below(bytes.size())] = static_cast<char>(chance.below(256));
    return bytes;
}

/// None of these may turn into a command that the host accepts.
std::string badRequest(Chance& chance) {
    const std::string valid = postRequest("/v1/query", queryBody("KAGDYST", {{"COMMAND", "x"}}));
    switch (chance.below(12)) {
        case 0:
            return chance.bytes(chance.between(1, 5000));
        case 1:
            return valid.substr(0, chance.below(valid.size()));
        case 2:
            return "GET / HTTP/1.1\r\nX: " + std::string(chance.between(10'000, 900'000), 'h') +
                   "\r\n\r\n";
        case 3:
            return "POST /v1/query HTTP/1.1\r\nContent-Length: " +
                   chance.of<std::string>(
                       {"-1", "99999999999999999999", "2000000", "x", "10\r\nContent-Length: 11"}) +
                   "\r\n\r\n{}";
        case 4:
            return postRequest("/v1/query", std::string(chance.between(1'000'000, 1'200'000), ' '));
        case 5:
            return postRequest("/v1/query", std::string(chance.between(1, 2000), '['));
        case 6:
            return postRequest(
                "/v1/query",
                chance.of<std::string>(
                    {"", "{", "[]", "{\"table\":3}", "{\"table\":\"NOPE\"}",
                     R"({"table":"KAGREQT","where":1})",
                     R"({"table":"KAGREQT","where":[{"column":"nope","op":"=","value":"x"}]})",
                     R"({"table":"KAGREQT","where":[{"column":"COMMAND","op":"~","value":"x"}]})",
                     R"({"table":"KAGREQT","where":[{"column":"RETVAL","op":"=","value":"x"}]})"}));
        case 7:
            return "POST /v1/query HTTP/1.1\r\nHost: x\r\nTransfer-Encoding: chunked\r\n\r\n" +
                   chance.of<std::string>({"zz\r\n", "FFFFFFFFFFFFFFFFF\r\n", "5\r\n{}"}) +
                   chance.bytes(20);
        case 8:
            return mutated(chance, valid);
        case 9:
            return getRequest(
                "/v1/events?table=KAGDYST&" +
                chance.of<std::string>({"nope=1", "transid=x", "TRANSID=%zz", "table=x"}));
        case 10: {
            std::string many;
            for (std::size_t i = chance.between(50, 300); i > 0; --i)
                many += getRequest("/v1/tables");
            return many;
        }
        default:
            return getRequest("/v1/" + std::string(chance.between(1, 20'000), 'u'));
    }
}

std::string badPacket(Chance& chance) {
    const std::string bind = text(ctl::rpc::bindPacket(1));
    const std::vector<unsigned char> head =
        ctl::rpc::transferHead("garbage", true, static_cast<std::uint16_t>(chance.below(1000)));
    const std::string stub = text(head) + chance.bytes(chance.below(5000));
    const auto header = ctl::rpc::requestHeader(2, static_cast<std::uint8_t>(chance.below(4)),
                                                stub.size(), stub.size());
    const std::string request = std::string(header.begin(), header.end()) + stub;
    switch (chance.below(6)) {
        case 0:
            return chance.bytes(chance.between(1, 3000));
        case 1:
            return bind.substr(0, chance.below(bind.size()));
        case 2:
            return mutated(chance, bind) + request;
        case 3:
            return bind + request.substr(0, chance.below(request.size()));
        case 4:
            return bind + mutated(chance, request.substr(0, 24)) + stub;
        default:
            return request;
    }
}

}  // namespace

GarbageClient::GarbageClient(World& world, Socket socket)
    : Client(world, socket == Socket::Requests ? "garbage" : "transfer garbage",
             socket == Socket::Requests ? world.home.socket() : world.home.transferSocket()),
      socket_(socket) {}

bool GarbageClient::begin() {
    Chance& chance = world_.chance;
    world_.tally.count(kind());
    connection_.send(socket_ == Socket::Requests ? badRequest(chance) : badPacket(chance));
    dropBytes_ = chance.oneIn(4) ? chance.between(1, 40) : 0;
    mayEndSending_ = chance.oneIn(3);
    // Now and then one waits until the host loses its patience, which takes it 30 s.
    leavesAt_ = now() + (chance.oneIn(12) ? 40 : chance.oneIn(3) ? 0 : chance.seconds(0.05, 3));
    if (dropBytes_ == 0 && !connection_.flush()) leavesAt_ = now() + 1;
    wakeIn(dropBytes_ > 0 ? 0.05 : leavesAt_ - now());
    return true;
}

bool GarbageClient::proceed(bool readable, bool writable) {
    if (dropBytes_ > 0 && now() >= wakeAt() && connection_.hasUnsent()) {
        wakeIn(0.05);
        if (!connection_.flush(dropBytes_)) return false;
    } else if (writable && dropBytes_ == 0 && !connection_.flush()) {
        readable = true;
    }
    if (mayEndSending_ && !connection_.hasUnsent()) {
        connection_.endSending();
        mayEndSending_ = false;
    }
    if (readable) {
        const bool open = connection_.fill(std::size_t{1} << 16);
        checkAnswer();
        if (!open) return false;
    }
    if (world_.draining && leavesAt_ > now() + 1) leavesAt_ = now();
    if (dropBytes_ == 0 || !connection_.hasUnsent()) wakeIn(leavesAt_ - now());
    return now() < leavesAt_;
}

void GarbageClient::checkAnswer() {
    if (checked_ || socket_ == Socket::Transfers) return;
    const auto answer = takeAnswer(connection_.in());
    if (!answer) return;
    checked_ = true;
    world_.tally.count(answer->status < 400 ? "garbage that made sense" : "garbage refused");
    if (answer->status < 200 || answer->status > 505) {
        world_.tally.fault("garbage was answered with status " + std::to_string(answer->status));
    }
}

Squatter::Squatter(World& world, double stays)
    : Client(world, "squatting", world.home.socket()), stays_(stays) {}

bool Squatter::begin() {
    world_.tally.count("squatters");
    leavesAt_ = now() + stays_;
    wakeIn(stays_);
    connection_.send(getRequest("/v1/health"));
    connection_.flush();
    return true;
}

bool Squatter::proceed(bool readable, bool) {
    if (readable) {
        const bool open = connection_.fill();
        if (const auto answer = takeAnswer(connection_.in())) {
            answered_ = true;
            if (answer->status == 503) {
                world_.tally.count("503 answers");
                return false;
            }
            if (answer->status != 200) world_.tally.fault("a squatter was refused otherwise");
        }
        if (!open) {
            if (!answered_) world_.tally.count("turned away without an answer");
            return false;
        }
    }
    return now() < leavesAt_ && !world_.draining;
}

}  // namespace soak
