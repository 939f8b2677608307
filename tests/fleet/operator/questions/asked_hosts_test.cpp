/// Asking many hosts, with a centre and hosts whose answers the test writes.
#include "fleet/operator/questions/asked_hosts.h"

#include <gtest/gtest.h>

#include <functional>
#include <map>
#include <nlohmann/json.hpp>
#include <string>
#include <utility>
#include <vector>

#include "fleet/bus/messages/document.h"
#include "fleet/bus/messages/question.h"
#include "fleet/bus/trust/sealed.h"
#include "tests/fleet/operator/certified.h"

namespace {

using fleet::AnswerPiece;
using fleet::HostAnswer;
using fleet::Inquiry;
using fleet::KeyPair;
using nlohmann::json;
using operator_test::failureOf;
using operator_test::newUser;

/// Gives each question to a host, and the host's pieces back, some at a time.
class AnsweringCentre : public fleet::Centre {
public:
    /// A host's signed pieces for a question, with the key for which they are to be sealed.
    using Host = std::function<std::vector<std::string>(const fleet::Order& question,
                                                        const std::string& answerTo)>;
    std::map<std::string, Host> hosts;  ///< by their keys
    std::size_t rounds = 0;

    json get(const std::string& target) override {
        EXPECT_EQ(target, "/v1/questions/r" + std::to_string(rounds));
        json answers = json::array();
        if (!waiting_.empty()) {
            answers.push_back({{"host", waiting_.back().first},
                               {"signed", fleet::base64Of(waiting_.back().second)}});
            waiting_.pop_back();  // the last piece comes first
        }
        return {{"answers", answers}};
    }
    json post(const std::string& target, const json& body) override {
        EXPECT_EQ(target, "/v1/questions");
        ++rounds;
        for (const json& text : body.at("questions")) {
            const std::string bytes = fleet::bytesOfBase64(text.get<std::string>());
            const fleet::SignedOrder read = fleet::readOrder(bytes);
            const json asked = json::parse(read.order.body);
            const std::string answerTo = asked.at("answerTo");
            EXPECT_LE(read.order.expires - read.order.issued, fleet::kLongestQuestion);
            for (std::string& piece : hosts.at(read.order.host)(read.order, answerTo))
                waiting_.emplace_back(read.order.host, std::move(piece));
        }
        return {{"round", "r" + std::to_string(rounds)}};
    }
    json postBytes(const std::string&, std::string) override { return {}; }

private:
    std::vector<std::pair<std::string, std::string>> waiting_;
};

class AskedHosts : public testing::Test {
protected:
    /// A host that answers with these texts, a piece each.
    std::string addHost(const std::string& name, const std::vector<std::string>& texts,
                        const std::string& state = "here") {
        const KeyPair signing = newUser();
        const std::string key = newUser().publicKey();
        choice_.hosts.push_back({key, name, state, signing.publicKey()});
        centre_.hosts[key] = [=](const fleet::Order& question, const std::string& answerTo) {
            std::vector<std::string> pieces;
            for (const std::string& text : texts) {
                const bool isLast = pieces.size() + 1 == texts.size();
                pieces.push_back(signAnswer(
                    {key, question.id, pieces.size(), isLast, fleet::sealFor(answerTo, text)},
                    signing));
            }
            return pieces;
        };
        return key;
    }
    std::vector<HostAnswer> ask() {
        return askOnce({std::chrono::steady_clock::now() + std::chrono::minutes(5), [] {}});
    }
    std::vector<HostAnswer> askOnce(const fleet::AskingPace& pace) {
        return askHosts(centre_, identity_, choice_, Inquiry{"TASKS", {{"limit", 3}}}, pace);
    }

    const operator_test::Root root_;
    fleet::OperatorIdentity identity_ = root_.certified({"TASKS"}, {}, "*", fleet::wallClock() * 2);
    AnsweringCentre centre_;
    fleet::Choice choice_{"*", {}};
};

TEST_F(AskedHosts, AnswerInPiecesThatComeInAnyOrder) {
    addHost("web-1", {R"({"answer":)", R"([1,2)", "]}"});
    addHost("web-2", {R"({"answer":7})"});
    const auto answers = ask();
    ASSERT_EQ(answers.size(), 2U);
    EXPECT_EQ(answers[0].host.name, "web-1");
    EXPECT_EQ(answers[0].answer, (json{1, 2})) << answers[0].trouble;
    EXPECT_EQ(answers[1].answer, 7);
    EXPECT_EQ(centre_.rounds, 1U);
}

TEST_F(AskedHosts, ThatAreAwayAreNotAsked) {
    addHost("web-1", {R"({"answer":7})"}, "away");
    const auto answers = ask();
    EXPECT_EQ(answers[0].trouble, "it is away");
    EXPECT_EQ(centre_.rounds, 0U);
}

TEST_F(AskedHosts, SayWhyTheyDoNotAnswer) {
    addHost("web-1", {R"({"error":"no such thing"})"});
    addHost("web-2", {"nonsense"});
    const auto answers = ask();
    EXPECT_EQ(answers[0].trouble, "no such thing");
    EXPECT_EQ(answers[1].trouble, "its answer makes no sense");
}

TEST_F(AskedHosts, AreNotWaitedForWithoutEndAndGapsAreSeen) {
    addHost("web-1", {});
    const std::string key = addHost("web-2", {"{", "}"});
    const auto whole = centre_.hosts[key];
    centre_.hosts[key] = [whole](const fleet::Order& question, const std::string& answerTo) {
        auto pieces = whole(question, answerTo);
        pieces.erase(pieces.begin());
        return pieces;
    };
    fleet::AskingPace pace{std::chrono::steady_clock::now() + std::chrono::milliseconds(300),
                           [] {}};
    const auto answers = askOnce(pace);
    EXPECT_EQ(answers[0].trouble, "it has not answered");
    EXPECT_EQ(answers[1].trouble, "a part of the answer was lost");
}

TEST_F(AskedHosts, AreBelievedOnlyWithTheirOwnSignature) {
    const std::string key = addHost("web-1", {});
    const KeyPair forger = newUser();
    centre_.hosts[key] = [=](const fleet::Order& question, const std::string& answerTo) {
        return std::vector<std::string>{
            signAnswer({key, question.id, 0, true, fleet::sealFor(answerTo, R"({"answer":7})")},
                       forger),
            "nothing of the kind"};
    };
    fleet::AskingPace pace{std::chrono::steady_clock::now() + std::chrono::milliseconds(300),
                           [] {}};
    EXPECT_EQ(askOnce(pace)[0].trouble, "it has not answered");
}

TEST_F(AskedHosts, AreAskedInRoundsThatTheCentreTakes) {
    for (int i = 0; i < 201; ++i)
        addHost("web-" + std::to_string(i), {R"({"answer":7})"});
    fleet::AskingPace pace{std::chrono::steady_clock::now() + std::chrono::minutes(5), [] {}};
    for (const HostAnswer& answer : askOnce(pace))
        EXPECT_EQ(answer.answer, 7) << answer.trouble;
    EXPECT_EQ(centre_.rounds, 2U);
}

TEST_F(AskedHosts, AreNotAskedWhatTheCertificateDoesNotAllow) {
    addHost("web-1", {R"({"answer":7})"});
    identity_ = root_.certified({"START"}, {"*"}, "*", fleet::wallClock() * 2);
    EXPECT_EQ(failureOf([&] { ask(); }).status(), ctl::kHostReportedFailure);
    identity_ = root_.certified({"*"}, {"*"}, "*", fleet::Moment(1));
    EXPECT_EQ(failureOf([&] { ask(); }).status(), ctl::kHostReportedFailure);
    EXPECT_EQ(centre_.rounds, 0U);
}

}  // namespace
