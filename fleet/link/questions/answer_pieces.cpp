#include "fleet/link/questions/answer_pieces.h"

#include "fleet/bus/trust/sealed.h"

namespace fleet {

std::vector<std::string> answerPieces(const std::string& host, const AskedQuestion& question,
                                      const std::string& answer, const KeyPair& signing) {
    const bool isTooLong = answer.size() > kMostAnswerBytes;
    const std::string text =
        isTooLong ? R"({"error":"the answer is too long; ask for less"})" : answer;
    std::vector<std::string> pieces;
    std::size_t from = 0;
    do {
        const std::string part = text.substr(from, kMostPieceBytes);
        from += part.size();
        const AnswerPiece piece{host, question.id, pieces.size(), from >= text.size(),
                                sealFor(question.answerTo, part)};
        pieces.push_back(signAnswer(piece, signing));
    } while (from < text.size());
    return pieces;
}

}  // namespace fleet
