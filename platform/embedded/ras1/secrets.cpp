#include "ras1/secrets.h"

#include <cstring>
#include <string_view>

namespace ras1 {
namespace {

using secrets::Carried;
using std::string_view;

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

struct Counter {
    std::size_t length = 0;
    bool masked = false;
    void show(string_view text) { length += text.size(); }
    void mask() {
        show(secrets::kMask);
        masked = true;
    }
};

struct Writer {
    char* at;
    void show(string_view text) {
        std::memcpy(at, text.data(), text.size());
        at += text.size();
    }
    void mask() { show(secrets::kMask); }
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
        length_ = shown_ + secrets::kMask.size();
        return;
    }
    Carried* const carried = carriedOf(unit, whole, shown_);
    if (carried != nullptr) before_ = *carried;
    Carried state = before_;
    Counter counter;
    secrets::ValueReader<Counter>(state, whole.substr(shown_), counter).read();
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
    secrets::ValueReader<Writer>(state, string_view(text_ + shown_, textLength_ - shown_), writer)
        .read();
}

}  // namespace ras1
