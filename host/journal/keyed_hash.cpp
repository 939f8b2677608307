#include "host/journal/keyed_hash.h"

#include <array>
#include <cstdint>

namespace host {
namespace {

constexpr std::size_t kHalf = 16;

std::uint64_t littleEndian(std::string_view bytes) {
    std::uint64_t value = 0;
    for (std::size_t i = 0; i < bytes.size() && i < 8; ++i)
        value |= std::uint64_t{static_cast<unsigned char>(bytes[i])} << (8 * i);
    return value;
}

std::uint64_t rotated(std::uint64_t value, unsigned bits) {
    return (value << bits) | (value >> (64 - bits));
}

class SipHash {
public:
    explicit SipHash(std::string_view key) {
        const std::uint64_t first = littleEndian(key.substr(0, 8));
        const std::uint64_t second = littleEndian(key.substr(8, 8));
        state_ = {first ^ 0x736f6d6570736575U, second ^ 0x646f72616e646f6dU,
                  first ^ 0x6c7967656e657261U, second ^ 0x7465646279746573U};
    }
    std::uint64_t of(std::string_view text) {
        const std::uint64_t length = std::uint64_t{text.size()} << 56;
        while (text.size() >= 8) {
            add(littleEndian(text.substr(0, 8)));
            text.remove_prefix(8);
        }
        add(littleEndian(text) | length);
        state_[2] ^= 0xFFU;
        for (int i = 0; i < 4; ++i)
            round();
        return state_[0] ^ state_[1] ^ state_[2] ^ state_[3];
    }

private:
    void add(std::uint64_t word) {
        state_[3] ^= word;
        round();
        round();
        state_[0] ^= word;
    }
    void round() {
        auto& [a, b, c, d] = state_;
        a += b;
        b = rotated(b, 13) ^ a;
        a = rotated(a, 32);
        c += d;
        d = rotated(d, 16) ^ c;
        a += d;
        d = rotated(d, 21) ^ a;
        c += b;
        b = rotated(b, 17) ^ c;
        c = rotated(c, 32);
    }

    std::array<std::uint64_t, 4> state_{};
};

}  // namespace

std::string keyedHash(std::string_view key, std::string_view text) {
    std::string hash;
    for (const std::size_t from : {std::size_t{0}, kHalf}) {
        const std::uint64_t value = SipHash(key.substr(from, kHalf)).of(text);
        for (unsigned i = 0; i < 8; ++i)
            hash.push_back(static_cast<char>((value >> (8 * i)) & 0xFFU));
    }
    return hash;
}

}  // namespace host
