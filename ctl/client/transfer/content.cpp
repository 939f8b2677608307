#include "ctl/client/transfer/content.h"

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <fstream>
#include <utility>
#include <vector>

#include "ctl/client/failure.h"

namespace ctl {
namespace {

constexpr char kCtrlZ = 26;

/// Text in any code page: everything from the blank up, and what moves the cursor.
bool isTextByte(char c) {
    const auto byte = static_cast<unsigned char>(c);
    const bool movesCursor = byte >= 8 && byte <= 13;
    return byte >= 0x20 || movesCursor || c == kCtrlZ || byte == 27;
}

void look(const char* data, std::size_t length, Content& content) {
    const char* const end = data + length;
    content.isText = content.isText && std::all_of(data, end, isTextByte);
    content.changes =
        content.changes || std::any_of(data, end, [](char c) { return c == '\r' || c == kCtrlZ; });
}

}  // namespace

Content contentOf(const std::string& path) {
    std::ifstream in(path, std::ios::binary);
    std::vector<char> piece(std::size_t{1} << 16);
    Content content;
    while (in) {
        in.read(piece.data(), static_cast<std::streamsize>(piece.size()));
        look(piece.data(), static_cast<std::size_t>(in.gcount()), content);
    }
    if (!in.eof()) {
        throw Failure(kWrongUsage, "cannot read " + path + ": " + std::strerror(errno));
    }
    return content;
}

std::string unconvertedName(std::string name) {
    const std::pair<std::string, std::string> marks[] = {
        {"install.sh", "install_sh"}, {"DeployLnk.sh", "DeployLnk_sh"}, {".mdl", "_mdl"}};
    for (const auto& [mark, other] : marks) {
        for (std::size_t at = 0; (at = name.find(mark, at)) != std::string::npos;)
            name.replace(at, mark.size(), other);
    }
    return name;
}

}  // namespace ctl
