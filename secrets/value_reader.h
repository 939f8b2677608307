/// Finds secret values in text: what follows a name such as "password" and "=", ":", "=>" or ":=".
///
/// Nothing here allocates, takes a lock or touches errno, so that a child may use it between vfork
/// and exec.
#pragma once

#include <algorithm>
#include <cstddef>
#include <iterator>
#include <string_view>

namespace secrets {

/// What stands in the place of a secret.
inline constexpr std::string_view kMask = "***";

/// Names whose value is secret. They are recognised at the end of a longer name as well, such as
/// "apikey" or "DB_PASSWORD", and in any case of letters.
inline constexpr std::string_view kNames[] = {"password", "passwd", "pwd",
                                              "secret",   "token",  "key"};

/// What is known of a text that comes in pieces, at the end of one of them. A name or a value that
/// is cut there is still recognised in the next piece. All zeros before the first piece.
struct Carried {
    char tail[32];             ///< the last bytes before, blanks at their end counted as one
    std::size_t length;        ///< how many there are
    bool inValue;              ///< the piece ended before or within a value
    bool begun;                ///< of which there was at least one byte
    char quote;                ///< the quotation mark that is open in it, or 0
    std::size_t quoteEscapes;  ///< the backslashes before that mark
    std::size_t escapes;       ///< the backslashes at the end of the piece
};

/// Backslashes before the quotation mark behind a name: those of four texts, one within the other.
/// With a name, a mark and a blank they find room in the tail.
inline constexpr std::size_t kMostEscapes = 15;

inline bool isBlank(char c) {
    return c == ' ' || c == '\t';
}

inline bool isQuote(char c) {
    return c == '"' || c == '\'';
}

/// Whether it may stand between a name and its value, behind the first "=" or ":".
inline bool isSeparator(char c) {
    return c == '=' || c == ':' || c == '>' || isBlank(c);
}

inline char lower(char c) {
    return c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c;
}

/// A text behind what preceded it, read backwards.
class Backwards {
public:
    Backwards(const Carried& before, std::string_view text, std::size_t end)
        : before_(before), text_(text), left_(before.length + end) {}

    /// The byte before, or 0 at the beginning.
    char peek() const { return left_ == 0 ? '\0' : at(left_ - 1); }
    void skip() { left_ -= left_ > 0 ? 1 : 0; }

    bool endsWith(std::string_view name) const {
        if (name.size() > left_) return false;
        for (std::size_t i = 0; i < name.size(); ++i) {
            if (lower(at(left_ - name.size() + i)) != name[i]) return false;
        }
        return true;
    }

private:
    char at(std::size_t i) const {
        return i < before_.length ? before_.tail[i] : text_[i - before_.length];
    }

    const Carried& before_;
    const std::string_view text_;
    std::size_t left_;
};

/// Whether one of the names ends before the separator at `end`, perhaps in quotation marks. They
/// may have backslashes before them, as in a text within another one.
inline bool isNamedSecret(const Carried& before, std::string_view text, std::size_t end) {
    Backwards rest(before, text, end);
    while (isBlank(rest.peek()))
        rest.skip();
    if (isQuote(rest.peek())) {
        rest.skip();
        for (std::size_t i = 0; i < kMostEscapes && rest.peek() == '\\'; ++i)
            rest.skip();
    }
    return std::any_of(std::begin(kNames), std::end(kNames),
                       [&](std::string_view name) { return rest.endsWith(name); });
}

/// Goes through a piece of a text and tells the sink in order what of it may be shown, with show(),
/// and where something may not, with mask(). `state` is that of the text, before and afterwards.
template <typename Sink>
class ValueReader {
public:
    ValueReader(Carried& state, std::string_view text, Sink& sink)
        : state_(state), before_(state), text_(text), sink_(sink) {}

    void read() {
        while (at_ < text_.size())
            state_.inValue ? skipValue() : showText();
        keepTail();
    }

private:
    /// Up to and with the separator behind a secret name, or to the end.
    void showText() {
        const std::size_t begin = at_;
        while (at_ < text_.size() && !state_.inValue) {
            const char c = text_[at_];
            state_.inValue = (c == '=' || c == ':') && isNamedSecret(before_, text_, at_);
            ++at_;
        }
        sink_.show(text_.substr(begin, at_ - begin));
        state_.begun = false;
        state_.quote = '\0';
        state_.escapes = 0;
    }

    /// What else separates the value from its name is shown. The value ends at a blank outside
    /// quotation marks that no backslash makes part of it, or with its line.
    void skipValue() {
        const std::size_t separators = at_;
        while (!state_.begun && at_ < text_.size() && isSeparator(text_[at_]))
            ++at_;
        sink_.show(text_.substr(separators, at_ - separators));
        const std::size_t begin = at_;
        while (at_ < text_.size() && state_.inValue) {
            state_.inValue = goesOn(text_[at_]);
            at_ += state_.inValue ? 1 : 0;
        }
        if (at_ == begin) return;
        state_.begun = true;
        sink_.mask();
    }

    bool goesOn(char c) {
        if (c == '\n' || c == '\r') return false;
        const bool isEscaped = state_.escapes % 2 == 1;
        if (state_.quote == '\0' && isBlank(c) && !isEscaped) return false;
        if (state_.quote == c && closes()) {
            state_.quote = '\0';
        } else if (state_.quote == '\0' && isQuote(c)) {
            state_.quote = c;
            state_.quoteEscapes = state_.escapes;
        }
        state_.escapes = c == '\\' ? state_.escapes + 1 : 0;
        return true;
    }

    /// Whether a mark like the open one ends what that one began. It does with as many backslashes
    /// or fewer, which end a text around it. With more it is part of the value, unless they are
    /// pairs that stand for backslashes.
    bool closes() const {
        const std::size_t level = state_.quoteEscapes + 1;
        return state_.escapes < level || state_.escapes % (2 * level) == level - 1;
    }

    /// However many blanks stand behind a name, it must not be lost: one stands for them all.
    void keepTail() {
        const std::size_t blanks = trailingBlanks();
        const std::size_t length = before_.length + text_.size() - blanks;
        const std::size_t kept = std::min(length, sizeof state_.tail - 1);
        for (std::size_t i = 0; i < kept; ++i)
            state_.tail[i] = at(length - kept + i);
        if (blanks > 0) state_.tail[kept] = ' ';
        state_.length = kept + (blanks > 0 ? 1 : 0);
    }

    /// Of what is known of the text.
    std::size_t trailingBlanks() const {
        const std::size_t length = before_.length + text_.size();
        std::size_t count = 0;
        while (count < length && isBlank(at(length - count - 1)))
            ++count;
        return count;
    }

    /// A byte of what is known of the text.
    char at(std::size_t i) const {
        return i < before_.length ? before_.tail[i] : text_[i - before_.length];
    }

    Carried& state_;
    const Carried before_;
    const std::string_view text_;
    Sink& sink_;
    std::size_t at_ = 0;
};

}  // namespace secrets
