/// The form of files with keys: lines of a name, a blank and a value.
#pragma once

#include <string>
#include <string_view>

#include "fleet/bus/accounts/nkey.h"
#include "fleet/server/keys/files/secret_text.h"

namespace fleet {

/// Puts such a file together. JSON is not used where secrets are: its library leaves copies behind.
class KeyLines {
public:
    /// The value holds no line end.
    KeyLines& add(std::string_view name, std::string_view value);
    KeyLines& add(std::string_view name, const KeyPair& key);
    std::string_view text() const { return text_.view(); }

private:
    SecretText text_;
};

/// Reads such a file.
class ReadKeyLines {
public:
    /// Throws KeysError as readPrivateFile() does.
    explicit ReadKeyLines(const std::string& file);

    /// The value, as long as the object lasts. Throws KeysError, which names the file, if there is
    /// none.
    std::string_view value(std::string_view name) const;
    /// The key pair whose seed the value is. Throws KeysError if it is not one of that kind.
    KeyPair key(std::string_view name, KeyKind kind) const;

private:
    [[noreturn]] void fail(std::string_view name) const;

    const std::string file_;
    const SecretText text_;
};

}  // namespace fleet
