/// What an operator asks one host about, and what comes back: "rp.ask.HOST" and "ans.HOST".
///
/// A question has the form of an order, with another purpose: neither counts as the other. Its body
/// names a key that was made up for it as "answerTo", for which each piece of the answer is sealed.
#pragma once

#include <cstddef>
#include <optional>
#include <string>
#include <string_view>

#include "fleet/bus/accounts/nkey.h"
#include "fleet/bus/messages/order.h"
#include "fleet/bus/messages/values.h"

namespace fleet {

/// A question is good for so long at most.
constexpr Moment kLongestQuestion{60 * 1000};

// The kinds of questions.
/// What the host was asked to do, and how it ended: body "limit", "state", "product".
constexpr const char* kAsksTasks = "TASKS";
/// A configuration: body "product" and "target".
constexpr const char* kAsksConfiguration = "GETCONFIG";
/// What a task's commands write: body "task", "follow", and of who asks again "stream", the
/// identifier of the question that has begun it, and "after", the position behind which it would go
/// on if it had to begin anew. See output_news.h for the pieces of the answer.
constexpr const char* kAsksOutput = "OUTPUT";
/// What the host's checks of its home and machine find.
constexpr const char* kAsksDoctor = "DOCTOR";

/// Signs a question and adds the operator's certificate.
std::string signQuestion(const Order& question, const KeyPair& key, std::string_view certificate);
/// Whether the holder of the key has signed what readOrder() has read as a question.
bool isQuestionSignedBy(const SignedOrder& question, std::string_view key);

/// A piece of an answer.
struct AnswerPiece {
    std::string host;      ///< the bus key of the host that answers
    std::string question;  ///< the question's identifier
    Number place = 0;      ///< 0, 1, 2...; who misses one has lost it
    bool isLast = false;
    std::string sealed;  ///< for the question's key
};

/// Of a piece before it is sealed.
constexpr std::size_t kMostPieceBytes = std::size_t{128} * 1024;

/// Signed by the link's key.
std::string signAnswer(const AnswerPiece& piece, const KeyPair& key);
/// A piece from that host, which its link has signed. Throws MessageError for all else.
AnswerPiece readAnswer(std::string_view bytes, const std::string& host, std::string_view key);
/// The identifier of the question that a piece answers, whoever has signed it; nothing if it is no
/// such message.
std::optional<std::string> questionAnsweredBy(std::string_view bytes);

}  // namespace fleet
