#include "fleet/server/keys/files/key_lines.h"

#include <optional>

#include "fleet/server/keys/files/keys_error.h"
#include "fleet/server/keys/files/private_file.h"

namespace fleet {

KeyLines& KeyLines::add(std::string_view name, std::string_view value) {
    text_.append(name).append(" ").append(value).append("\n");
    return *this;
}

KeyLines& KeyLines::add(std::string_view name, const KeyPair& key) {
    const SecretText seed(key.seed());
    return add(name, seed.view());
}

ReadKeyLines::ReadKeyLines(const std::string& file) : file_(file), text_(readPrivateFile(file)) {}

void ReadKeyLines::fail(std::string_view name) const {
    throw KeysError(file_ + " is damaged: its line \"" + std::string(name) +
                    "\" is missing or wrong. Put a backup in its place");
}

std::string_view ReadKeyLines::value(std::string_view name) const {
    std::string_view rest = text_.view();
    while (!rest.empty()) {
        const std::string_view line = rest.substr(0, rest.find('\n'));
        rest.remove_prefix(line.size() < rest.size() ? line.size() + 1 : line.size());
        const std::size_t blank = line.find(' ');
        if (blank != std::string_view::npos && line.substr(0, blank) == name) {
            return line.substr(blank + 1);
        }
    }
    fail(name);
}

KeyPair ReadKeyLines::key(std::string_view name, KeyKind kind) const {
    const std::optional<KeyPair> read = KeyPair::ofSeed(value(name));
    if (!read || read->kind() != kind) fail(name);
    return *read;
}

}  // namespace fleet
