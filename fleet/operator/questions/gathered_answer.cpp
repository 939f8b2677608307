#include "fleet/operator/questions/gathered_answer.h"

#include <utility>

#include "fleet/bus/messages/document.h"

namespace fleet {
namespace {

/// A link's answers have fewer.
constexpr Number kMostPieces = 64;

}  // namespace

GatheredAnswer::GatheredAnswer(std::string host, std::string signing, std::string question,
                               const KeyPair& key)
    : host_(std::move(host)),
      signing_(std::move(signing)),
      question_(std::move(question)),
      key_(key) {}

void GatheredAnswer::take(std::string_view bytes) {
    try {
        const AnswerPiece piece = readAnswer(bytes, host_, signing_);
        if (piece.question != question_ || piece.place >= kMostPieces) return;
        std::optional<std::string> text = key_.unseal(piece.sealed);
        if (!text) return;
        if (piece.isLast && !last_) last_ = piece.place;
        if (last_ && piece.place > *last_) return;
        pieces_.emplace(piece.place, std::move(*text));
    } catch (const MessageError&) {
        // Somebody on the way has made it.
    }
}

std::string GatheredAnswer::text() const {
    std::string text;
    for (const auto& [place, piece] : pieces_)
        text += piece;
    return text;
}

}  // namespace fleet
