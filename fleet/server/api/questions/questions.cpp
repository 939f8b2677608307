// POST /v1/questions, GET /v1/questions/{round}: questions of an operator to hosts, and their
// answers.

#include <nlohmann/json.hpp>

#include "fleet/bus/messages/certificate.h"
#include "fleet/bus/messages/document.h"
#include "fleet/bus/messages/question.h"
#include "fleet/server/api/documents/host_sight.h"
#include "fleet/server/api/schema.h"

using nlohmann::json;

namespace fleet {

ApiEndpoint postQuestions, getAnswers;
Schema roundSchema, answersSchema, questionsSchema;

namespace {

/// Operators' clocks differ from the centre's.
constexpr Moment kMostClockDifference = std::chrono::minutes(5);

/// A question of the visitor's own for a host that they may see. The host looks at it anew.
QuestionDesk::Asked questionOf(const Visit& visit, const Members& members, const json& text,
                               Moment now) {
    if (!text.is_string()) throw MessageError("a question is a text, in base64");
    QuestionDesk::Asked asked;
    asked.bytes = bytesOfBase64(text.get_ref<const std::string&>());
    const SignedOrder read = readOrder(asked.bytes);
    const FleetFacts& facts = visit.services.facts;
    const Certificate certificate = readCertificate(read.certificate, facts.root, facts.fleet);
    if (certificate.key != visit.key || !isQuestionSignedBy(read, visit.key)) {
        throw MessageError("a question is not signed by who brings it");
    }
    if (read.order.expires > now + kLongestQuestion + kMostClockDifference) {
        throw MessageError("a question is good for 60 seconds at most");
    }
    const auto member = members.find(read.order.host);
    if (member == members.end() || !maySee(visit, member->second)) {
        throw NothingThere("there is no host \"" + read.order.host + "\"");
    }
    asked.host = read.order.host;
    asked.question = read.order.id;
    return asked;
}

NothingThere noSuchRound() {
    return NothingThere("there are no such questions; their time may be over");
}

}  // namespace

http::Answer postQuestions(Visit& visit, const Call& call) {
    const json& questions = call.body().at("questions");
    if (questions.empty() || questions.size() > QuestionDesk::kMostHosts) {
        throw routes::BadRequest("from 1 to " + std::to_string(QuestionDesk::kMostHosts) +
                                 " questions at once");
    }
    const auto members = visit.services.members();
    const Moment now = wallClock();
    std::vector<QuestionDesk::Asked> asked;
    for (const json& text : questions)
        asked.push_back(questionOf(visit, *members, text, now));
    QuestionDesk& desk = visit.services.questions();
    const std::string again = call.body().value("round", "");
    if (!again.empty()) {
        if (!desk.askAgain(visit.key, again, asked, now)) throw noSuchRound();
        return http::jsonReply(201, textOf({{"round", again}}));
    }
    const auto round = desk.ask(visit.key, asked, now);
    if (!round) throw BatchesFull("too many questions are under way, or the centre does not work");
    return http::jsonReply(201, textOf({{"round", *round}}));
}

http::Answer getAnswers(Visit& visit, const Call& call) {
    const auto answers =
        visit.services.questions().fetch(visit.key, call.required("round"), wallClock());
    if (!answers) throw noSuchRound();
    json document = {{"answers", json::array()}};
    for (const QuestionDesk::Answer& answer : *answers) {
        document["answers"].push_back({{"host", answer.host}, {"signed", base64Of(answer.bytes)}});
    }
    return http::jsonReply(200, textOf(document));
}

nlohmann::ordered_json questionsSchema(Components&) {
    nlohmann::ordered_json questions =
        shape::listOf("Questions to hosts.", shape::text("signed by who brings it, in base64"));
    questions["title"] = "Questions";
    return questions;
}

nlohmann::ordered_json roundSchema(Components&) {
    return shape::object("Round", "Questions that are under way.",
                         {{"round", shape::text("the identifier, to fetch answers with")}});
}

nlohmann::ordered_json answersSchema(Components&) {
    const shape::Json piece = shape::object(
        "Answer", "A piece of a host's answer.",
        {{"host", shape::text("the host's bus key")},
         {"signed", shape::text("signed by the host and sealed for who has asked, in base64")}});
    return shape::object("Answers", "What hosts have answered since the last look.",
                         {{"answers", shape::listOf("in the order in which they came", piece)}});
}

}  // namespace fleet
