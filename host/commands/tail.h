/// The end of a text that comes in pieces.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>

namespace host {

/// Keeps the last bytes, whatever comes.
class Tail {
public:
    static constexpr std::size_t kBytes = 4096;

    void append(std::string_view piece) {
        total_ += piece.size();
        if (piece.size() >= kBytes) {
            text_.assign(piece.substr(piece.size() - kBytes));
            return;
        }
        if (text_.size() + piece.size() > kBytes) {
            text_.erase(0, text_.size() + piece.size() - kBytes);
        }
        text_.append(piece);
    }
    const std::string& text() const { return text_; }
    /// How many bytes have come.
    std::uint64_t total() const { return total_; }
    void clear() { std::string().swap(text_); }

private:
    std::string text_;
    std::uint64_t total_ = 0;
};

}  // namespace host
