/// Texts in which secret values are replaced by "***".
#pragma once

#include <string>
#include <string_view>
#include <utility>

#include "secrets/value_reader.h"

namespace secrets {

/// A text that comes in pieces. One thread at a time.
class Masker {
public:
    /// The piece as it may be shown. A value is recognised wherever the text is cut.
    std::string feed(std::string_view piece) {
        Sink sink{{}, state_.inValue && state_.begun};
        sink.out.reserve(piece.size());
        ValueReader<Sink>(state_, piece, sink).read();
        return std::move(sink.out);
    }

private:
    struct Sink {
        std::string out;
        bool goesOn;  ///< the value that comes first has got its mask in an earlier piece
        void show(std::string_view text) {
            out += text;
            goesOn = goesOn && text.empty();
        }
        void mask() {
            if (!std::exchange(goesOn, false)) out += kMask;
        }
    };
    Carried state_{};
};

/// The whole text as it may be shown.
inline std::string masked(std::string_view text) {
    return Masker().feed(text);
}

}  // namespace secrets
