#include "ras1/secrets.h"

#include <algorithm>
#include <cstring>
#include <string_view>

namespace ras1 {
namespace {

using std::string_view;

constexpr string_view kMask = "***";

/// Names whose value is secret. They are recognised at the end of a longer name as well, such as
/// "apikey" or "DB_PASSWORD", and in any case of letters.
constexpr string_view kSecretNames[] = {"password", "passwd", "pwd", "secret", "token", "key"};

// ---- Texts that are secret as a whole
// ------------------------------------------------------------

/// A line that says whose text the next lines of the same thread show: that of a configuration if
/// one of the words is in it.
struct Announcement {
    string_view unit;
    string_view beginning;
    string_view words[2];
};
constexpr Announcement kAnnouncements[] = {
    {"zavutil", "Command to run is \"", {"/zav_xa -g ", "/zav_xa -p "}},
    {"zavutil", "Return code (", {"/zav_xa -g ", "/zav_xa -p "}},
    {"zavutil", "Bad return code (", {"/zav_xa -g ", "/zav_xa -p "}},
    {"zav01agt", "\t\tcommand=\"", {"\"GETCONFIG\"", "\"SETCONFIG\""}},
};

/// A line that shows such a text, and what precedes it there.
struct Showing {
    string_view unit;
    string_view beginning;
    string_view before;
    enum { kAlways, kWhenAnnounced } secret;
};
constexpr Showing kShowings[] = {
    {"zavutil", "outbuf: ", "outbuf: ", Showing::kWhenAnnounced},
    {"zavutil", "STDOUT [", " is: ", Showing::kWhenAnnounced},
    {"zav01agt", "\t\tcontext=\"", "=\"", Showing::kWhenAnnounced},
    {"zavtasks", "Context [", "Context [", Showing::kAlways},
};

/// Texts that come in pieces, each piece a line of its own.
struct Pieces {
    string_view unit;
    string_view beginning;
};
constexpr Pieces kPieces[] = {{"zavutil", "outbuf: "}, {"zavutil", "errbuf: "}};
constexpr std::size_t kPieceKinds = sizeof kPieces / sizeof *kPieces;

/// What a thread has shown so far. In memory that every thread has from its start: no allocation
/// when it is first touched.
struct Shown {
    bool configuration;
    Carried pieces[kPieceKinds];
};
[[gnu::tls_model("initial-exec")]] thread_local Shown shown{};

bool beginsWith(string_view text, string_view beginning) {
    return text.substr(0, beginning.size()) == beginning;
}

bool contains(string_view text, string_view word) {
    return text.find(word) != string_view::npos;
}

void noteAnnouncement(string_view unit, string_view text) {
    for (const Announcement& known : kAnnouncements) {
        if (known.unit != unit || !beginsWith(text, known.beginning)) continue;
        shown.configuration = contains(text, known.words[0]) || contains(text, known.words[1]);
        // Another command or row begins: what was cut before does not go on.
        for (Carried& carried : shown.pieces)
            carried = {};
    }
}

/// The length of what precedes a text that is secret as a whole; npos when there is none.
std::size_t wholeSecretAt(string_view unit, string_view text) {
    for (const Showing& known : kShowings) {
        if (known.unit != unit || !beginsWith(text, known.beginning)) continue;
        if (known.secret == Showing::kWhenAnnounced && !shown.configuration) continue;
        const std::size_t at = text.find(known.before);
        if (at != string_view::npos) return at + known.before.size();
    }
    return string_view::npos;
}

// ---- Values that follow a name
// -------------------------------------------------------------------

bool isBlank(char c) {
    return c == ' ' || c == '\t';
}

bool isQuote(char c) {
    return c == '"' || c == '\'';
}

char lower(char c) {
    return c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c;
}

/// A text behind what preceded it, read backwards.
class Backwards {
public:
    Backwards(const Carried& before, string_view text, std::size_t end)
        : before_(before), text_(text), left_(before.length + end) {}

    /// The byte before, or 0 at the beginning.
    char peek() const { return left_ == 0 ? '\0' : at(left_ - 1); }
    void skip() { left_ -= left_ > 0 ? 1 : 0; }

    bool endsWith(string_view name) const {
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
    const string_view text_;
    std::size_t left_;
};

/// Whether one of the names, perhaps in quotation marks, ends before the separator at `end`.
bool isNamedSecret(const Carried& before, string_view text, std::size_t end) {
    Backwards rest(before, text, end);
    while (isBlank(rest.peek()))
        rest.skip();
    if (isQuote(rest.peek())) rest.skip();
    return std::any_of(std::begin(kSecretNames), std::end(kSecretNames),
                       [&](string_view name) { return rest.endsWith(name); });
}

/// Goes through a text and tells what of it may be shown, in order.
template <typename Sink>
class Reader {
public:
    Reader(Carried& state, string_view text, Sink& sink)
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
    }

    /// Blanks before the value are shown. It ends at a blank outside quotation marks, or with its
    /// line.
    void skipValue() {
        const std::size_t blanks = at_;
        while (!state_.begun && at_ < text_.size() && isBlank(text_[at_]))
            ++at_;
        sink_.show(text_.substr(blanks, at_ - blanks));
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
        if (state_.quote == '\0' && isBlank(c)) return false;
        if (state_.quote == c) {
            state_.quote = '\0';
        } else if (state_.quote == '\0' && isQuote(c)) {
            state_.quote = c;
        }
        return true;
    }

    void keepTail() {
        constexpr std::size_t kRoom = sizeof state_.tail;
        const std::size_t fromText = std::min(text_.size(), kRoom);
        const std::size_t kept = std::min(before_.length, kRoom - fromText);
        std::memcpy(state_.tail, before_.tail + before_.length - kept, kept);
        std::memcpy(state_.tail + kept, text_.data() + text_.size() - fromText, fromText);
        state_.length = kept + fromText;
    }

    Carried& state_;
    const Carried before_;
    const string_view text_;
    Sink& sink_;
    std::size_t at_ = 0;
};

struct Counter {
    std::size_t length = 0;
    bool masked = false;
    void show(string_view text) { length += text.size(); }
    void mask() {
        show(kMask);
        masked = true;
    }
};

struct Writer {
    char* at;
    void show(string_view text) {
        std::memcpy(at, text.data(), text.size());
        at += text.size();
    }
    void mask() { show(kMask); }
};

/// Where the thread keeps what it must know of the next piece; null when the text is no piece.
Carried* carriedOf(string_view unit, string_view text, std::size_t& begin) {
    for (std::size_t i = 0; i < kPieceKinds; ++i) {
        if (kPieces[i].unit != unit || !beginsWith(text, kPieces[i].beginning)) continue;
        begin = kPieces[i].beginning.size();
        return &shown.pieces[i];
    }
    return nullptr;
}

}  // namespace

Masking::Masking(const char* unit, const char* text, std::size_t length)
    : text_(text), textLength_(length), shown_(0) {
    const string_view whole(text, length);
    noteAnnouncement(unit, whole);
    const std::size_t secret = wholeSecretAt(unit, whole);
    if (secret != string_view::npos) {
        whole_ = changes_ = true;
        shown_ = secret;
        length_ = shown_ + kMask.size();
        return;
    }
    Carried* const carried = carriedOf(unit, whole, shown_);
    if (carried != nullptr) before_ = *carried;
    Carried state = before_;
    Counter counter;
    Reader<Counter>(state, whole.substr(shown_), counter).read();
    if (carried != nullptr) *carried = state;
    length_ = shown_ + counter.length;
    changes_ = counter.masked;
}

void Masking::put(char* out) const {
    Writer writer{out};
    writer.show(string_view(text_, shown_));
    if (whole_) {
        writer.mask();
        return;
    }
    Carried state = before_;
    Reader<Writer>(state, string_view(text_ + shown_, textLength_ - shown_), writer).read();
}

}  // namespace ras1
