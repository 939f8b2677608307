/// Questions through the bus to a real link and its host, and the answers.
#include <gtest/gtest.h>

#include <nlohmann/json.hpp>
#include <optional>
#include <string>
#include <vector>

#include "fleet/bus/messages/question.h"
#include "fleet/operator/questions/gathered_answer.h"
#include "tests/fleet/e2e/fleet_scene.h"

namespace {

using fleet_e2e::FleetHost;
using fleet_e2e::FleetScene;
using fleet_e2e::kPatience;
using nlohmann::json;

class FleetQuestions : public testing::Test {
protected:
    FleetQuestions() {
        host->startLink();
        // The link hears of questions from then on.
        EXPECT_EQ(scene.awaitEnd(*host, scene.submit(*host, "START")), "done");
    }

    fleet::Order question(const std::string& kind, json body) {
        body["answerTo"] = reader.publicKey();
        fleet::Order asked = scene.order(*host, kind, body.dump());
        asked.expires = asked.issued + fleet::kLongestQuestion;
        return asked;
    }
    /// The answer; null if none comes.
    json answerTo(const fleet::Order& asked, std::chrono::milliseconds patience = kPatience) {
        const std::string bytes = scene.signQuestion(asked);
        fleet::QuestionDesk& desk = scene.centre().questions();
        const auto round =
            desk.ask("an operator", {{host->key(), asked.id, bytes}}, fleet::wallClock());
        if (!round) return nullptr;
        fleet::GatheredAnswer answer(host->key(), host->signing(), asked.id, reader);
        eventually(
            [&] {
                const auto pieces = desk.fetch("an operator", *round, fleet::wallClock());
                if (!pieces) return true;
                for (const auto& piece : *pieces)
                    answer.take(piece.bytes);
                return answer.isWhole();
            },
            patience);
        return answer.isWhole() ? json::parse(answer.text()) : json();
    }

    const fleet::KeyPair reader = fleet::KeyPair::make(fleet::KeyKind::User);
    FleetScene scene;
    std::unique_ptr<FleetHost> host = scene.enrol("web-1");
};

TEST_F(FleetQuestions, TellWhatAHostWasAskedFor) {
    const json answer = answerTo(question(fleet::kAsksTasks, {{"limit", 5}}));
    ASSERT_TRUE(answer.contains("answer")) << answer;
    ASSERT_EQ(answer.at("answer").at("tasks").size(), 1U);
    EXPECT_EQ(answer.at("answer").at("tasks").at(0).at("command"), "START");
}

TEST_F(FleetQuestions, ThatTheOperatorMayNotAskAreRefusedByTheHost) {
    scene.certificate().commands = {"START"};
    EXPECT_EQ(answerTo(question(fleet::kAsksTasks, json::object())),
              (json{{"error",
                     "the operator's certificate does not allow this question for this product"}}));
}

TEST_F(FleetQuestions, ThatNobodyKnowsAreToldSo) {
    EXPECT_EQ(answerTo(question("NONSENSE", json::object())),
              (json{{"error", "the host is not asked such things"}}));
}

TEST_F(FleetQuestions, AreAnsweredOnce) {
    const fleet::Order asked = question(fleet::kAsksTasks, json::object());
    EXPECT_TRUE(answerTo(asked).contains("answer"));
    // As somebody who repeats it after the centre has forgotten it.
    scene.stopCentre();
    scene.startCentre();
    ASSERT_TRUE(eventually([this] { return scene.centre().isWorking(); }, kPatience));
    EXPECT_TRUE(answerTo(asked, std::chrono::seconds(3)).is_null());
    EXPECT_TRUE(answerTo(question(fleet::kAsksTasks, json::object())).contains("answer"));
}

TEST_F(FleetQuestions, KeepConfigurationsFromBusAndCentre) {
    const std::string secret = "a-configuration-that-nobody-else-may-see";
    host->home().products({"ux"}, "printf 'a line before\\nINSTANCE=one\\nPORT=" + secret + "\\n'");
    const json answer = answerTo(question(fleet::kAsksConfiguration, {{"product", "ux"}}));
    ASSERT_TRUE(answer.contains("answer")) << answer;
    ASSERT_EQ(answer.at("answer").at("rows").size(), 1U);
    EXPECT_NE(answer.dump().find(secret), std::string::npos) << answer;
    // What was asked is not told as the outcome of an order.
    EXPECT_EQ(scene.awaitEnd(*host, scene.submit(*host, "STOP")), "done");
    scene.stopCentre();
    for (const std::string& directory : {scene.bus().server().dir().path(), scene.files().path()}) {
        const ProgramResult found = runProgram({"/bin/grep", "-r", "-l", "-a", secret, directory});
        EXPECT_EQ(found.status, 1) << found.out;
    }
}

}  // namespace
