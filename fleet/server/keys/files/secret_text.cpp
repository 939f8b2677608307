#include "fleet/server/keys/files/secret_text.h"

#include <sodium.h>

#include <algorithm>

namespace fleet {

void wipe(std::string& secret) {
    // All that it has: something longer may have stood there.
    secret.resize(secret.capacity());
    sodium_memzero(secret.data(), secret.size());
    secret.clear();
}

SecretText::SecretText(std::string&& text) {
    append(text);
    wipe(text);
}

SecretText::~SecretText() {
    wipe(text_);
}

SecretText::SecretText(SecretText&& other) noexcept {
    *this = std::move(other);
}

SecretText& SecretText::operator=(SecretText&& other) noexcept {
    if (this == &other) return *this;
    wipe(text_);
    // A short text stands in the object itself and would stay there after a move.
    text_.swap(other.text_);
    wipe(other.text_);
    return *this;
}

SecretText& SecretText::append(std::string_view piece) {
    if (text_.size() + piece.size() > text_.capacity()) {
        std::string larger;
        larger.reserve(std::max(2 * text_.capacity(), text_.size() + piece.size()));
        larger.append(text_);
        text_.swap(larger);
        wipe(larger);
    }
    text_.append(piece);
    return *this;
}

}  // namespace fleet
