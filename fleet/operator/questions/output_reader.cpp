#include "fleet/operator/questions/output_reader.h"

#include <algorithm>
#include <utility>

#include "fleet/bus/messages/document.h"
#include "fleet/bus/messages/question.h"

namespace fleet {
namespace {

/// A link answers the latest question that it has heard. The centre keeps answers no longer than
/// questions are asked in a minute and a half.
constexpr std::size_t kQuestionsKept = 16;

}  // namespace

OutputReader::OutputReader(std::string host, std::string signing, std::string position,
                           const std::optional<KeyPair>& key)
    : host_(std::move(host)),
      signing_(std::move(signing)),
      key_(key ? *key : KeyPair::make(KeyKind::User)),
      position_(std::move(position)) {}

void OutputReader::asked(const std::string& question) {
    asked_.push_back(question);
    if (asked_.size() > kQuestionsKept) asked_.pop_front();
}

bool OutputReader::isAsked(const std::string& question) const {
    return std::find(asked_.begin(), asked_.end(), question) != asked_.end();
}

/// A link that was started anew begins another stream. That goes on with this one only where this
/// one has come to; else the next question brings one that does.
bool OutputReader::belongs(const OutputNews& news) const {
    return news.stream == stream_ || news.after == position_;
}

std::optional<OutputReader::Heard> OutputReader::take(std::string_view bytes) {
    try {
        const AnswerPiece piece = readAnswer(bytes, host_, signing_);
        if (!isAsked(piece.question)) return std::nullopt;
        const std::optional<std::string> text = key_.unseal(piece.sealed);
        if (!text) return std::nullopt;
        Heard heard{readNews(*text)};
        if (!belongs(heard.news)) return std::nullopt;
        if (std::exchange(stream_, heard.news.stream) != heard.news.stream) next_ = 0;
        if (piece.place < next_) return std::nullopt;
        heard.hasGap = piece.place > next_;
        next_ = piece.place + 1;
        if (!heard.news.at.empty()) position_ = heard.news.at;
        return heard;
    } catch (const MessageError&) {
        // Somebody on the way has made it.
        return std::nullopt;
    }
}

}  // namespace fleet
