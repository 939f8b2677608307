/// The parameters of a file transfer as a client marshals them.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "embedded/ncs_host.h"

namespace host_test {

struct Parameters {
    std::string name = "file";
    std::uint32_t firstBatch = 1;
    std::vector<std::uint32_t> chunks = {1};  ///< their lengths
    std::uint32_t lastIndex = 0xFFFF'FFFE;    ///< the last chunk unless it is set
    std::uint64_t association = 1;
    bool littleEndian = true;

    std::string bytes() const {
        std::string data;
        const auto length = static_cast<std::uint32_t>(name.size() + 1);
        for (const std::uint32_t number : {0U, length, 0U, length})
            put(data, number, 4);
        data += name + '\0';
        const auto count = static_cast<std::uint32_t>(chunks.size());
        put(data, 0, 4);
        put(data, firstBatch, 4);
        put(data, lastIndex == 0xFFFF'FFFE ? count - 1 : lastIndex, 4);
        put(data, count, 2);
        for (const std::uint32_t chunk : chunks) {
            put(data, chunk, 4);
            data.append(4096, 'x');
        }
        return data;
    }

    /// Valid until the next call of this function.
    ncs::Call call() {
        marshalled_ = bytes();
        ncs::Call made;
        made.association = association;
        made.interface = "QVS_Agent_v1";
        made.data = reinterpret_cast<const unsigned char*>(marshalled_.data());
        made.length = marshalled_.size();
        made.littleEndian = littleEndian;
        return made;
    }

private:
    void put(std::string& data, std::uint32_t value, std::size_t size) const {
        while (data.size() % size != 0)
            data += '\0';
        for (std::size_t i = 0; i < size; ++i) {
            const std::size_t byte = littleEndian ? i : size - 1 - i;
            data += static_cast<char>(value >> (8 * byte) & 0xFFU);
        }
    }

    std::string marshalled_;
};

}  // namespace host_test
