/// Decides whether a question is answered.
#pragma once

#include <functional>
#include <map>
#include <optional>
#include <string>
#include <string_view>

#include "fleet/bus/messages/certificate.h"
#include "fleet/bus/messages/question.h"
#include "fleet/link/judge.h"

namespace fleet {

struct AskedQuestion {
    std::string id;
    std::string kind;
    std::string body;      ///< JSON
    std::string answerTo;  ///< the key for which the answer is sealed
    Moment expires{};
    std::string refusal;  ///< why it is not answered otherwise; "" if it is
    Certificate grant;    ///< what its operator may
};

/// The question, if an operator of this fleet asks this host now. Nothing for everything else: to
/// whom it does not owe an answer, a host says nothing. `isRevoked` knows keys of operators that
/// count no longer.
std::optional<AskedQuestion> judgeQuestion(
    std::string_view bytes, const Trust& trust, Moment now,
    const std::function<bool(const std::string& key)>& isRevoked);

/// Remembers questions until they expire, so that each is answered once. One thread at a time.
class QuestionBook {
public:
    static constexpr std::size_t kMost = 1024;

    /// False for one that is known, and while there are kMost others.
    bool enter(const std::string& id, Moment expires, Moment now);

private:
    std::map<std::string, Moment> known_;
};

}  // namespace fleet
