#include "fleet/bus/messages/question.h"

#include <nlohmann/json.hpp>

#include "fleet/bus/messages/document.h"
#include "fleet/bus/trust/signed.h"

using nlohmann::json;

namespace fleet {

std::string signQuestion(const Order& question, const KeyPair& key, std::string_view certificate) {
    return signMessage(Purpose::Asking, key, textOfOrder(question), certificate);
}

bool isQuestionSignedBy(const SignedOrder& question, std::string_view key) {
    const std::optional<SignedParts> parts = partsOf(question.bytes);
    return parts && isSigned(*parts, Purpose::Asking, key);
}

std::string signAnswer(const AnswerPiece& piece, const KeyPair& key) {
    const json document = {
        {"host", piece.host}, {"order", piece.question}, {"k", piece.place}, {"end", piece.isLast}};
    return signMessage(Purpose::Answering, key, textOf(document), piece.sealed);
}

AnswerPiece readAnswer(std::string_view bytes, const std::string& host, std::string_view key) {
    const std::optional<SignedParts> parts = partsOf(bytes);
    if (!parts || !isSigned(*parts, Purpose::Answering, key)) {
        throw MessageError("the answer is not signed by its host");
    }
    const json document = readDocument(parts->text);
    AnswerPiece piece;
    piece.host = textIn(document, "host");
    if (piece.host != host) throw MessageError("the answer is another host's");
    piece.question = textIn(document, "order");
    piece.place = numberIn(document, "k");
    piece.isLast = flagIn(document, "end");
    piece.sealed = parts->carried;
    return piece;
}

std::optional<std::string> questionAnsweredBy(std::string_view bytes) {
    const std::optional<SignedParts> parts = partsOf(bytes);
    if (!parts) return std::nullopt;
    try {
        return textIn(readDocument(parts->text), "order");
    } catch (const MessageError&) {
        return std::nullopt;
    }
}

}  // namespace fleet
