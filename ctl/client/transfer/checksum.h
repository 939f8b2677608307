/// SHA-256 of what is sent.
#pragma once

#include <cstddef>
#include <memory>
#include <string>

namespace ctl {

/// Takes bytes piece by piece.
class Checksum {
public:
    Checksum();
    ~Checksum();
    Checksum(const Checksum&) = delete;
    Checksum& operator=(const Checksum&) = delete;

    void add(const unsigned char* data, std::size_t length);
    /// 64 lower-case hexadecimal digits. Nothing may be added afterwards.
    std::string finish();

private:
    struct State;
    const std::unique_ptr<State> state_;
};

}  // namespace ctl
