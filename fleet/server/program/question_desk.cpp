#include "fleet/server/program/question_desk.h"

#include "fleet/bus/messages/order.h"
#include "fleet/bus/messages/question.h"

namespace fleet {
namespace {

/// One reply to the operator has no more than that, and one answer.
constexpr std::size_t kMostFetched = std::size_t{1} << 20;
/// A link's answers are shorter.
constexpr std::size_t kLongestAnswer = std::size_t{256} * 1024;

}  // namespace

void QuestionDesk::open(Publish publish) {
    const std::lock_guard lock(mutex_);
    publish_ = std::move(publish);
}

void QuestionDesk::close() {
    const std::lock_guard lock(mutex_);
    publish_ = nullptr;
    rounds_.clear();
    roundOf_.clear();
    bytes_ = 0;
}

void QuestionDesk::endRound(Rounds::iterator round) {
    for (const auto& [place, until] : round->second.asked)
        roundOf_.erase(place);
    bytes_ -= round->second.bytes;
    rounds_.erase(round);
}

void QuestionDesk::endOver(Moment now) {
    for (auto round = rounds_.begin(); round != rounds_.end();) {
        const auto next = std::next(round);
        if (round->second.until <= now) endRound(round);
        round = next;
    }
}

/// Ends the operator's oldest round if they have too many.
void QuestionDesk::makeRoomFor(const std::string& operatorKey) {
    std::size_t count = 0;
    auto oldest = rounds_.end();
    for (auto round = rounds_.begin(); round != rounds_.end(); ++round) {
        if (round->second.operatorKey != operatorKey) continue;
        ++count;
        if (oldest == rounds_.end() || round->second.until < oldest->second.until) oldest = round;
    }
    if (count >= kMostOfOperator) endRound(oldest);
}

std::optional<std::string> QuestionDesk::ask(const std::string& operatorKey,
                                             const std::vector<Asked>& asked, Moment now) {
    const std::lock_guard lock(mutex_);
    endOver(now);
    makeRoomFor(operatorKey);
    if (!publish_ || rounds_.size() >= kMostRounds || asked.size() > kMostHosts) {
        return std::nullopt;
    }
    const auto made = rounds_.emplace(makeOrderId(), Round()).first;
    made->second.operatorKey = operatorKey;
    publish(made, asked, now);
    return made->first;
}

bool QuestionDesk::askAgain(const std::string& operatorKey, const std::string& round,
                            const std::vector<Asked>& asked, Moment now) {
    const std::lock_guard lock(mutex_);
    endOver(now);
    const auto found = rounds_.find(round);
    const bool isOwn = found != rounds_.end() && found->second.operatorKey == operatorKey;
    if (!publish_ || !isOwn) return false;
    forgetOldQuestions(found->second, now);
    if (found->second.asked.size() + asked.size() > kMostHosts) return false;
    publish(found, asked, now);
    return true;
}

void QuestionDesk::publish(Rounds::iterator round, const std::vector<Asked>& asked, Moment now) {
    round->second.until = now + kRoundTime;
    for (const Asked& one : asked) {
        const Place place(one.host, one.question);
        // A question that is repeated stays with the round that asked it first.
        if (!roundOf_.emplace(place, round->first).second) continue;
        round->second.asked.emplace(place, round->second.until);
        publish_(one.host, one.bytes);
    }
}

void QuestionDesk::forgetOldQuestions(Round& round, Moment now) {
    for (auto one = round.asked.begin(); one != round.asked.end();) {
        const bool isOld = one->second <= now;
        if (isOld) roundOf_.erase(one->first);
        one = isOld ? round.asked.erase(one) : std::next(one);
    }
}

void QuestionDesk::hear(const std::string& host, const std::string& bytes, Moment now) {
    if (bytes.size() > kLongestAnswer) return;
    const std::optional<std::string> question = questionAnsweredBy(bytes);
    if (!question) return;
    const std::lock_guard lock(mutex_);
    endOver(now);
    const auto place = roundOf_.find({host, *question});
    if (place == roundOf_.end()) return;
    Round& round = rounds_.at(place->second);
    const bool hasRoom =
        round.bytes + bytes.size() <= kMostBytesOfRound && bytes_ + bytes.size() <= kMostBytes;
    if (!hasRoom) return;
    round.bytes += bytes.size();
    bytes_ += bytes.size();
    round.answers.push_back({host, bytes});
}

std::optional<std::vector<QuestionDesk::Answer>> QuestionDesk::fetch(const std::string& operatorKey,
                                                                     const std::string& round,
                                                                     Moment now) {
    const std::lock_guard lock(mutex_);
    endOver(now);
    const auto found = rounds_.find(round);
    if (found == rounds_.end() || found->second.operatorKey != operatorKey) return std::nullopt;
    Round& own = found->second;
    std::vector<Answer> answers;
    for (std::size_t bytes = 0; !own.answers.empty() && bytes < kMostFetched;) {
        bytes += own.answers.front().bytes.size();
        answers.push_back(std::move(own.answers.front()));
        own.answers.pop_front();
        own.bytes -= answers.back().bytes.size();
        bytes_ -= answers.back().bytes.size();
    }
    return answers;
}

}  // namespace fleet
