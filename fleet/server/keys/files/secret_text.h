/// A text that is wiped from memory when it is no longer needed.
#pragma once

#include <string>
#include <string_view>

namespace fleet {

/// Wipes a text that holds a secret, and empties it.
void wipe(std::string& secret);

/// It grows without leaving copies behind. One thread at a time.
class SecretText {
public:
    SecretText() = default;
    /// Takes over a text; the one that was given is wiped.
    explicit SecretText(std::string&& text);
    ~SecretText();
    SecretText(SecretText&& other) noexcept;
    SecretText& operator=(SecretText&& other) noexcept;
    SecretText(const SecretText&) = delete;
    SecretText& operator=(const SecretText&) = delete;

    SecretText& append(std::string_view piece);
    std::string_view view() const { return text_; }

private:
    std::string text_;
};

}  // namespace fleet
