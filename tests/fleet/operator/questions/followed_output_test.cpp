/// Following output, with a centre, a host and a clock that the test moves.
#include "fleet/operator/questions/followed_output.h"

#include <gtest/gtest.h>

#include <deque>
#include <functional>
#include <nlohmann/json.hpp>
#include <string>
#include <utility>
#include <vector>

#include "fleet/bus/messages/document.h"
#include "fleet/bus/messages/question.h"
#include "fleet/bus/trust/sealed.h"
#include "tests/fleet/operator/certified.h"

namespace {

using fleet::KeyPair;
using fleet::OutputNews;
using nlohmann::json;
using operator_test::failureOf;
using operator_test::newUser;
using std::chrono::seconds;

/// What was asked of the host.
struct Asked {
    std::string id;
    json body;
    std::string round;  ///< in which it was asked; "" in another one
};

class FollowingOutput : public testing::Test, public fleet::Centre {
protected:
    using Clock = fleet::OutputPace::Clock;

    json get(const std::string& target) override {
        if (isAway_) throw ctl::Failure(ctl::kNoHost, "there is no centre");
        if (target != "/v1/questions/" + round_) {
            throw ctl::Failure(ctl::kWrongUsage, "there is no such round");
        }
        json answers = json::array();
        for (; !waiting_.empty(); waiting_.pop_front())
            answers.push_back({{"host", host_.key}, {"signed", fleet::base64Of(waiting_.front())}});
        return {{"answers", answers}};
    }
    json post(const std::string&, const json& body) override {
        if (isAway_) throw ctl::Failure(ctl::kNoHost, "there is no centre");
        const std::string round = body.value("round", "");
        if (!round.empty() && round != round_) {
            throw ctl::Failure(ctl::kWrongUsage, "there is no such round");
        }
        const std::string bytes =
            fleet::bytesOfBase64(body.at("questions").at(0).get<std::string>());
        const fleet::SignedOrder read = fleet::readOrder(bytes);
        EXPECT_EQ(read.order.kind, "OUTPUT");
        asked_.push_back({read.order.id, json::parse(read.order.body), round});
        if (round.empty()) round_ = "r" + std::to_string(asked_.size());
        if (answer_) answer_(asked_.back());
        return {{"round", round_}};
    }
    json postBytes(const std::string&, std::string) override { return {}; }

    /// The host sends the next piece.
    void send(OutputNews news) {
        news.stream = asked_.front().id;
        const std::string to = asked_.back().body.at("answerTo");
        waiting_.push_back(signAnswer({host_.key, asked_.back().id, place_++, news.isOver,
                                       fleet::sealFor(to, textOfNews(news))},
                                      signing_));
    }
    static OutputNews text(const std::string& text, bool isOver = false) {
        OutputNews news;
        news.texts = {{false, text}};
        news.isOver = isOver;
        return news;
    }
    static OutputNews error(const std::string& why, fleet::Number status) {
        OutputNews news;
        news.error = why;
        news.status = status;
        return news;
    }

    ctl::Failure follow(Clock::duration time = std::chrono::hours(1)) {
        const fleet::OutputPace pace{now_ + time, [this] { return now_; },
                                     [this](std::chrono::milliseconds pause) {
                                         now_ += pause;
                                         if (onPause_) onPause_();
                                     }};
        fleet::OutputListener listener;
        listener.take = [this](const fleet::OutputText& one) {
            text_ += one.text;
            if (one.text == "too much") throw ctl::Failure(ctl::kHostReportedFailure, "too much");
            return !isTiredOfIt_;
        };
        listener.lost = [this](fleet::Number bytes) { lost_ += bytes; };
        listener.gap = [this] { ++gaps_; };
        listener.reached = [this](const std::string& position) { text_ += '<' + position + '>'; };
        if (!showsPositions_) listener.reached = nullptr;
        return failureOf([&] {
            followOutput(*this, identity_, {host_, "*", "deploy-7", true, after_}, pace, listener);
        });
    }

    const operator_test::Root root_;
    fleet::OperatorIdentity identity_ =
        root_.certified({"OUTPUT"}, {}, "*", fleet::wallClock() * 2);
    const KeyPair signing_ = newUser();
    fleet::ChosenHost host_{newUser().publicKey(), "web-1", "here", signing_.publicKey()};
    Clock::time_point now_ = Clock::now();
    std::function<void(const Asked&)> answer_;
    std::function<void()> onPause_;
    std::vector<Asked> asked_;
    std::deque<std::string> waiting_;
    std::string round_;
    bool isAway_ = false;
    bool isTiredOfIt_ = false;
    bool showsPositions_ = false;
    std::string after_;
    fleet::Number place_ = 0;
    std::string text_;
    fleet::Number lost_ = 0;
    int gaps_ = 0;
};

TEST_F(FollowingOutput, ShowsItUntilItIsOver) {
    answer_ = [this](const Asked&) {
        send(text("a"));
        send(text("b", true));
    };
    EXPECT_EQ(follow().status(), ctl::kSuccess);
    EXPECT_EQ(text_, "ab");
    ASSERT_EQ(asked_.size(), 1U);
    EXPECT_EQ(asked_[0].body.at("task"), "deploy-7");
    EXPECT_EQ(asked_[0].body.at("follow"), true);
    EXPECT_FALSE(asked_[0].body.contains("stream"));
}

TEST_F(FollowingOutput, AsksAgainEveryTenSecondsInTheSameRound) {
    answer_ = [this](const Asked&) {
        OutputNews news = text(".", asked_.size() == 4);
        news.at = "1-" + std::to_string(asked_.size()) + "-0";
        send(news);
    };
    const auto begun = now_;
    EXPECT_EQ(follow().status(), ctl::kSuccess);
    EXPECT_EQ(text_, "....");
    ASSERT_EQ(asked_.size(), 4U);
    EXPECT_GE(now_ - begun, seconds(30));
    EXPECT_LE(now_ - begun, seconds(36));
    EXPECT_EQ(asked_[3].round, "r1");
    EXPECT_EQ(asked_[3].body.at("stream"), asked_[0].id);
    EXPECT_EQ(asked_[3].body.at("after"), "1-3-0");
    EXPECT_EQ(asked_[3].body.at("answerTo"), asked_[0].body.at("answerTo"));
}

TEST_F(FollowingOutput, GoesOnBehindAPosition) {
    after_ = "1-2-0";
    answer_ = [this](const Asked& asked) {
        OutputNews elsewhere = text("x");
        elsewhere.after = "1-1-0";
        send(elsewhere);
        place_ = 0;
        OutputNews news = text("c", asked.body.value("after", "") == after_);
        news.after = after_;
        send(news);
    };
    EXPECT_EQ(follow().status(), ctl::kSuccess);
    EXPECT_EQ(text_, "c");
}

TEST_F(FollowingOutput, TellsThePositionsThatItReaches) {
    showsPositions_ = true;
    answer_ = [this](const Asked&) {
        OutputNews begun;
        begun.at = "1-0-0";
        send(begun);
        OutputNews two = text("a");
        two.texts.push_back({true, "b"});
        two.at = "1-2-0";
        send(two);
        send({});
        send(error("it went away", 3));
    };
    EXPECT_EQ(follow().status(), ctl::kNoHost);
    EXPECT_EQ(text_, "<1-0-0>ab<1-2-0><1-2-0>");
}

TEST_F(FollowingOutput, TellsWhatWasLost) {
    answer_ = [this](const Asked&) {
        send(text("a"));
        ++place_;
        OutputNews news = text("c", true);
        news.lost = 100;
        send(news);
    };
    EXPECT_EQ(follow().status(), ctl::kSuccess);
    EXPECT_EQ(text_, "ac");
    EXPECT_EQ(gaps_, 1);
    EXPECT_EQ(lost_, 100U);
}

TEST_F(FollowingOutput, EndsAsTheHostSays) {
    answer_ = [this](const Asked&) { send(error("there is no task \"deploy-7\"", 2)); };
    const ctl::Failure none = follow();
    EXPECT_EQ(none.status(), ctl::kWrongUsage);
    EXPECT_STREQ(none.what(), "web-1: there is no task \"deploy-7\"");
}

TEST_F(FollowingOutput, EndsAsItsListenerSays) {
    answer_ = [this](const Asked&) {
        send(text("a"));
        send(text("too much"));
        send(text("b", true));
    };
    const ctl::Failure ended = follow();
    EXPECT_STREQ(ended.what(), "too much");
    EXPECT_EQ(text_, "atoo much");
}

TEST_F(FollowingOutput, TakesNoSuccessForAHostsError) {
    answer_ = [this](const Asked&) { send(error("no", 0)); };
    EXPECT_EQ(follow().status(), ctl::kHostReportedFailure);
}

TEST_F(FollowingOutput, GivesUpAHostThatSaysNothingForThirtySeconds) {
    answer_ = [this](const Asked&) {
        if (asked_.size() == 1) send(text("a"));
    };
    const auto begun = now_;
    const ctl::Failure silent = follow();
    EXPECT_EQ(silent.status(), ctl::kNoHost);
    EXPECT_STREQ(silent.what(), "web-1 has not answered for 30 seconds");
    EXPECT_LE(now_ - begun, seconds(35));
    EXPECT_GE(asked_.size(), 3U);
}

TEST_F(FollowingOutput, GoesOnAfterItWasStoppedForAWhile) {
    answer_ = [this](const Asked&) { send(text(".", asked_.size() == 3)); };
    const auto begun = now_;
    onPause_ = [this, begun] {
        if (now_ - begun < seconds(2)) now_ += seconds(60);
    };
    EXPECT_EQ(follow().status(), ctl::kSuccess);
    EXPECT_EQ(text_, "...");
}

TEST_F(FollowingOutput, DoesNotAskAHostThatIsAway) {
    host_.state = "away";
    const ctl::Failure away = follow();
    EXPECT_EQ(away.status(), ctl::kNoHost);
    EXPECT_STREQ(away.what(), "web-1 is away");
    EXPECT_TRUE(asked_.empty());
}

TEST_F(FollowingOutput, EndsAtItsDeadline) {
    answer_ = [this](const Asked&) { send(text(".")); };
    const ctl::Failure late = follow(seconds(60));
    EXPECT_EQ(late.status(), ctl::kNoOutcome);
    EXPECT_STREQ(late.what(), "no end within the time-out");
}

TEST_F(FollowingOutput, BearsWithACentreThatIsAwayForAWhile) {
    answer_ = [this](const Asked&) { send(text(".", asked_.size() == 3)); };
    const auto begun = now_;
    onPause_ = [this, begun] { isAway_ = now_ - begun > seconds(5) && now_ - begun < seconds(20); };
    EXPECT_EQ(follow().status(), ctl::kSuccess);
    EXPECT_EQ(text_, "...");
}

TEST_F(FollowingOutput, BeginsAnotherRoundAtACentreThatHasForgottenIt) {
    answer_ = [this](const Asked&) { send(text(".", asked_.size() == 2)); };
    const auto begun = now_;
    onPause_ = [this, begun] {
        if (now_ - begun > seconds(3) && asked_.size() == 1) round_ = "none";
    };
    EXPECT_EQ(follow().status(), ctl::kSuccess);
    EXPECT_EQ(text_, "..");
    ASSERT_EQ(asked_.size(), 2U);
    EXPECT_EQ(asked_[1].round, "");
    EXPECT_EQ(asked_[1].body.at("stream"), asked_[0].id) << "the host shows it already";
}

TEST_F(FollowingOutput, SaysThatTheCentreStaysAway) {
    answer_ = [this](const Asked&) {
        send(text("a"));
        isAway_ = false;
    };
    onPause_ = [this] { isAway_ = true; };
    const ctl::Failure gone = follow();
    EXPECT_EQ(gone.status(), ctl::kNoHost);
    EXPECT_STREQ(gone.what(), "there is no centre");
}

TEST_F(FollowingOutput, EndsWhenNobodyWantsMore) {
    isTiredOfIt_ = true;
    answer_ = [this](const Asked&) {
        send(text("a"));
        send(text("b"));
    };
    EXPECT_EQ(follow().status(), ctl::kSuccess);
    EXPECT_EQ(text_, "a");
}

TEST_F(FollowingOutput, IsNotForThoseWhoseCertificateDoesNotAllowIt) {
    identity_ = root_.certified({"START", "TASKS"}, {"*"}, "*", fleet::wallClock() * 2);
    EXPECT_EQ(follow().status(), ctl::kHostReportedFailure);
    EXPECT_TRUE(asked_.empty());
}

}  // namespace
