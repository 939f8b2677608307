#include "fleet/operator/questions/followed_output.h"

#include <algorithm>
#include <nlohmann/json.hpp>
#include <optional>
#include <utility>
#include <vector>

#include "ctl/client/failure.h"
#include "ctl/client/http/percent_encoding.h"
#include "fleet/bus/messages/document.h"
#include "fleet/bus/messages/question.h"
#include "fleet/operator/centre/answers.h"
#include "fleet/operator/questions/made_question.h"
#include "fleet/operator/questions/output_reader.h"

using nlohmann::json;

namespace fleet {
namespace {

using std::chrono::milliseconds;

/// Between two looks: soon again while there is output, and less and less often while there is
/// none.
constexpr milliseconds kShortestPause{100};
constexpr milliseconds kLongestPause{1000};

ctl::ExitStatus statusIn(const OutputNews& news) {
    for (const ctl::ExitMeaning& meaning : ctl::kExitMeanings) {
        const bool isIt = static_cast<Number>(meaning.status) == news.status;
        if (isIt && meaning.status != ctl::kSuccess) return meaning.status;
    }
    return ctl::kHostReportedFailure;
}

/// One stream, from the first question to the end.
class FollowedOutput {
public:
    FollowedOutput(Centre& centre, const OperatorIdentity& identity, const WantedOutput& wanted,
                   const OutputPace& pace, const OutputListener& listener)
        : centre_(centre),
          identity_(identity),
          wanted_(wanted),
          pace_(pace),
          listener_(listener),
          reader_(wanted.host.key, wanted.host.signing, wanted.after, wanted.reader),
          heardAt_(pace.now()) {}

    void follow() {
        ask();
        milliseconds pause = kShortestPause;
        while (!isOver_) {
            const bool hasCome = tryTo([this] { return look(); });
            if (isOver_) return;
            insistOnTime();
            if (pace_.now() - askedAt_ >= kOutputAskedAgain) tryTo([this] { return askAgain(); });
            pause = hasCome ? kShortestPause : std::min(2 * pause, kLongestPause);
            pace_.pause(pause);
        }
    }

private:
    /// The question that begins the stream, or lets it go on.
    json questions() {
        json body = {{"task", wanted_.task},
                     {"follow", wanted_.isFollowed},
                     {"answerTo", reader_.answerTo()}};
        if (!reader_.stream().empty()) body["stream"] = reader_.stream();
        if (!reader_.position().empty()) body["after"] = reader_.position();
        const MadeQuestion made = makeQuestion(
            identity_, {wanted_.host.key, wanted_.selector, kAsksOutput, body}, wallClock());
        reader_.asked(made.id);
        ++unanswered_;
        return json::array({base64Of(made.bytes)});
    }

    void ask() {
        askedAt_ = pace_.now();
        const json reply = centre_.post("/v1/questions", {{"questions", questions()}});
        round_ = memberText(reply, "round");
        if (round_.empty()) throw senseless("it names no round of questions");
    }

    /// In the same round, so that other questions of the operator keep their places.
    bool askAgain() {
        askedAt_ = pace_.now();
        try {
            centre_.post("/v1/questions", {{"questions", questions()}, {"round", round_}});
        } catch (const ctl::Failure& failure) {
            // The round is over, or the centre that had it is.
            if (failure.status() != ctl::kWrongUsage) throw;
            ask();
        }
        return true;
    }

    /// Returns whether anything has come.
    bool look() {
        json reply;
        try {
            reply = centre_.get("/v1/questions/" + ctl::percentEncoded(round_));
        } catch (const ctl::Failure& failure) {
            if (failure.status() != ctl::kWrongUsage) throw;
            // Not at once again: an operator who asks too much at a time loses one for another.
            if (pace_.now() - askedAt_ >= kLongestPause) ask();
            return false;
        }
        bool hasCome = false;
        for (const json& message : memberList(reply, "answers")) {
            if (isOver_) break;
            std::optional<OutputReader::Heard> heard;
            try {
                heard = reader_.take(bytesOfBase64(memberText(message, "signed")));
            } catch (const MessageError&) {
                continue;
            }
            if (!heard) continue;
            hasCome = true;
            pass(*heard);
        }
        return hasCome;
    }

    void pass(const OutputReader::Heard& heard) {
        heardAt_ = pace_.now();
        unanswered_ = 0;
        trouble_.reset();
        const OutputNews& news = heard.news;
        if (heard.hasGap) listener_.gap();
        if (news.lost > 0) listener_.lost(news.lost);
        show(news.texts);
        if (!news.error.empty()) {
            throw FinalFailure({statusIn(news), wanted_.host.name + ": " + news.error});
        }
        if (!isOver_ && listener_.reached) listener_.reached(reader_.position());
        isOver_ = isOver_ || news.isOver;
    }

    void show(const std::vector<OutputText>& texts) {
        try {
            for (const OutputText& text : texts) {
                if (isOver_) break;
                isOver_ = !listener_.take(text);
            }
        } catch (const ctl::Failure& failure) {
            throw FinalFailure(failure);
        }
    }

    /// What the host itself has said, or the listener: no waiting changes it.
    class FinalFailure : public ctl::Failure {
    public:
        explicit FinalFailure(const ctl::Failure& failure) : ctl::Failure(failure) {}
    };

    /// What goes wrong on the way is borne with for as long as a silent host.
    template <typename Act>
    bool tryTo(Act act) {
        try {
            return act();
        } catch (const FinalFailure&) {
            throw;
        } catch (const ctl::Failure& failure) {
            trouble_ = failure;
            return false;
        }
    }

    void insistOnTime() const {
        if (pace_.now() >= pace_.deadline) {
            throw ctl::Failure(ctl::kNoOutcome, "no end within the time-out");
        }
        // Who was stopped for a while has not asked meanwhile.
        const bool hasAsked = unanswered_ >= kOutputGoodFor / kOutputAskedAgain;
        if (!hasAsked || pace_.now() - heardAt_ < kOutputGoodFor) return;
        if (trouble_) throwTrouble();
        throw ctl::Failure(ctl::kNoHost, wanted_.host.name + " has not answered for " +
                                             std::to_string(kOutputGoodFor.count()) + " seconds");
    }

    [[noreturn]] void throwTrouble() const {
        // Too late for a request is not too late for the command.
        const bool isLate = trouble_->status() == ctl::kNoOutcome;
        throw ctl::Failure(isLate ? ctl::kNoHost : trouble_->status(), trouble_->what(),
                           trouble_->hint());
    }

    Centre& centre_;
    const OperatorIdentity& identity_;
    const WantedOutput& wanted_;
    const OutputPace& pace_;
    const OutputListener& listener_;
    OutputReader reader_;
    std::string round_;
    OutputPace::Clock::time_point askedAt_;
    OutputPace::Clock::time_point heardAt_;
    std::chrono::seconds::rep unanswered_ = 0;  ///< questions since anything came
    std::optional<ctl::Failure> trouble_;       ///< of the way, since anything came
    bool isOver_ = false;
};

}  // namespace

void followOutput(Centre& centre, const OperatorIdentity& identity, const WantedOutput& wanted,
                  const OutputPace& pace, const OutputListener& listener) {
    insistThatMayAsk(identity, kAsksOutput, "");
    if (wanted.host.state != "here") {
        throw ctl::Failure(ctl::kNoHost, wanted.host.name + " is " + wanted.host.state);
    }
    FollowedOutput(centre, identity, wanted, pace, listener).follow();
}

}  // namespace fleet
