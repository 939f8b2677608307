#include "host/outcomes/packed_row.h"

#include <algorithm>
#include <cstdint>
#include <cstring>

namespace host {
namespace {

// A packed row is a sequence of pieces: two lengths, that of a text and that of the blanks behind
// it, and the text.
using Length = std::uint32_t;
constexpr std::size_t kWorthwhile = 2 * sizeof(Length);

void appendLength(std::string& packed, std::size_t length) {
    const auto number = static_cast<Length>(length);
    packed.append(reinterpret_cast<const char*>(&number), sizeof number);
}

Length lengthAt(std::string_view packed, std::size_t at) {
    Length number = 0;
    std::memcpy(&number, packed.data() + at, sizeof number);
    return number;
}

/// Where the next run of blanks begins that is worth a piece; the end if there is none.
std::size_t nextRun(std::string_view row, std::size_t from, std::size_t& length) {
    while (true) {
        const std::size_t begin = row.find(' ', from);
        if (begin == std::string_view::npos) break;
        const std::size_t end = std::min(row.find_first_not_of(' ', begin), row.size());
        length = end - begin;
        if (length > kWorthwhile) return begin;
        from = end;
    }
    length = 0;
    return row.size();
}

}  // namespace

std::string packRow(std::string_view row) {
    std::string packed;
    for (std::size_t at = 0; at < row.size();) {
        std::size_t blanks = 0;
        const std::size_t end = nextRun(row, at, blanks);
        appendLength(packed, end - at);
        appendLength(packed, blanks);
        packed.append(row.substr(at, end - at));
        at = end + blanks;
    }
    packed.shrink_to_fit();
    return packed;
}

std::string unpackRow(std::string_view packed) {
    std::string row;
    for (std::size_t at = 0; at < packed.size();) {
        const std::size_t length = lengthAt(packed, at);
        const std::size_t blanks = lengthAt(packed, at + sizeof(Length));
        at += 2 * sizeof(Length);
        row.append(packed.substr(at, length)).append(blanks, ' ');
        at += length;
    }
    return row;
}

}  // namespace host
