// ctest-label: threaded
#include "ctl/client/tasks/run_task.h"

#include <gtest/gtest.h>

#include <functional>
#include <utility>
#include <vector>

#include "ctl/client/canned_host.h"
#include "ctl/client/failure.h"

namespace {

using ctl::Await;
using ctl::TaskResult;
using ctl::TaskWatch;
using ctl_test::CannedHost;
using ctl_test::Peer;
using nlohmann::json;
using End = TaskResult::End;

/// What a host does with one connection.
using Turn = std::function<void(const Peer&)>;

/// A host that takes these turns, one connection each, and notes the requests.
class TurnHost {
public:
    explicit TurnHost(std::vector<Turn> turns)
        : host_([this, turns = std::move(turns)](const CannedHost& self) {
              for (const Turn& turn : turns) {
                  const Peer peer = self.accept();
                  requests_.push_back(peer.request());
                  turn(peer);
              }
          }) {}

    ctl::HostAddress address(std::chrono::milliseconds time = std::chrono::seconds(20)) const {
        return {host_.path(), host_.path() + ".rpc", time};
    }
    /// The first lines of all requests. After the last turn.
    std::vector<std::string> targets() {
        host_.join();
        std::vector<std::string> lines;
        for (const std::string& request : requests_)
            lines.push_back(request.substr(0, request.find(" HTTP/")));
        return lines;
    }
    json body(std::size_t number) {
        host_.join();
        const std::string& request = requests_.at(number);
        return json::parse(request.substr(request.find("\r\n\r\n")));
    }

private:
    std::vector<std::string> requests_;
    CannedHost host_;
};

Turn answers(int status, const json& document) {
    return [=](const Peer& peer) { peer.answer(status, document.dump()); };
}

/// The request comes, and nothing goes back.
Turn breaksOff() {
    return [](const Peer&) {};
}

Turn asksLater(int status) {
    return [=](const Peer& peer) {
        peer.send(
            "HTTP/1.1 " + std::to_string(status) +
            " Reason\r\nRetry-After: 0\r\nContent-Length: 20\r\n\r\n{\"error\": \"no room\"}");
    };
}

const json kReply = {{"TRANSID", "T"}, {"RETVAL", 0}};
const json kRow = {{"TRANSID", "T"}, {"RETVAL", 0}, {"RETMSGID", ""}};

json task(const char* state, const json& reply = nullptr, const json& events = json::array()) {
    return {
        {"id", "j-1"}, {"transid", "T"}, {"state", state}, {"reply", reply}, {"events", events}};
}

const json kQueued = task("queued");
const json kDone = task("done", kReply, json::array({kRow}));

ctl::TaskRequest request() {
    ctl::TaskRequest made;
    made.command = "START";
    made.transid = "T";
    made.product = "ux";
    made.isUnique = true;
    return made;
}

ctl::TaskRequest restartingInstall() {
    ctl::TaskRequest made = request();
    made.command = "INSTALL";
    made.optional = "REQUIRES_RESTART";
    return made;
}

/// Status and text of the failure that a command ends with.
std::pair<int, std::string> failureOf(const TurnHost& host, const ctl::TaskRequest& asked,
                                      Await await = Await::End) {
    try {
        ctl::runTask(host.address(), asked, await);
    } catch (const ctl::Failure& failure) {
        return {failure.status(), failure.what()};
    }
    return {0, ""};
}

// ---- Being accepted -----------------------------------------------------------------------------

TEST(RunTask, HasTheHostAcceptTheTaskAndWaitsForItsEnd) {
    TurnHost host({answers(202, kQueued), answers(200, kDone)});
    const TaskResult result = ctl::runTask(host.address(), request(), Await::End);
    EXPECT_EQ(result.end, End::Outcome);
    EXPECT_EQ(result.reply, kReply);
    EXPECT_EQ(result.events, json::array({kRow}));
    EXPECT_EQ(result.record, kDone);
    EXPECT_EQ(host.targets(),
              (std::vector<std::string>{"POST /v1/tasks", "GET /v1/tasks/j-1?wait=1"}));
    EXPECT_EQ(host.body(0),
              (json{{"command", "START"}, {"product", "ux"}, {"transid", "T"}, {"once", true}}));
}

TEST(RunTask, AsksOnceOnlyWhereTheIdentifierIsItsOwnOrTheUserWantsIt) {
    for (const auto& [isUnique, isOnce] : {std::pair{false, false}, {true, false}, {false, true}}) {
        TurnHost host({answers(202, kDone)});
        ctl::TaskRequest asked = request();
        asked.isUnique = isUnique;
        asked.isOnce = isOnce;
        ctl::runTask(host.address(), asked, Await::End);
        EXPECT_EQ(host.body(0).contains("once"), isUnique || isOnce);
    }
}

TEST(RunTask, AsksAgainInTheSameWordsWhenTheAnswerWasLost) {
    TurnHost host({breaksOff(), breaksOff(), answers(202, kDone)});
    std::vector<std::string> notes;
    TaskWatch watch;
    watch.onNote = [&notes](const std::string& text) { notes.push_back(text); };
    EXPECT_EQ(ctl::runTask(host.address(), request(), Await::End, watch).end, End::Outcome);
    EXPECT_EQ(host.body(2), host.body(0));
    EXPECT_EQ(notes, std::vector<std::string>{"the host went away; waiting for it to come back"});
}

TEST(RunTask, DoesNotAskAgainWhenTheHostCouldTakeThatForAnotherRequest) {
    const TurnHost host({breaksOff()});
    ctl::TaskRequest asked = request();
    asked.isUnique = false;
    const auto [status, text] = failureOf(host, asked);
    EXPECT_EQ(status, ctl::kNoHost);
    EXPECT_NE(text.find("not known whether it accepted the request"), std::string::npos) << text;
}

TEST(RunTask, WaitsForRoomOnlyWhenItWaitsAnyway) {
    TurnHost patient({asksLater(429), asksLater(503), answers(202, kDone)});
    EXPECT_EQ(ctl::runTask(patient.address(), request(), Await::End).end, End::Outcome);
    const TurnHost hasty({asksLater(429)});
    EXPECT_EQ(failureOf(hasty, request(), Await::Reply),
              std::make_pair(1, std::string("the host refused the request: no room")));
}

TEST(RunTask, EndsWithARefusalThatNoWaitingMends) {
    for (const int status : {403, 409, 503}) {
        const TurnHost host({answers(status, {{"error", "no"}})});
        EXPECT_EQ(failureOf(host, request()).first, ctl::kHostReportedFailure) << status;
    }
    for (const int status : {400, 412}) {
        const TurnHost host({answers(status, {{"error", "no"}})});
        EXPECT_EQ(failureOf(host, request()).first, ctl::kWrongUsage) << status;
    }
}

TEST(RunTask, DoesNotRepeatItselfToAHostThatMakesNoSense) {
    for (const json& senseless : {json::array(), json::object(), json{{"id", ""}}}) {
        const TurnHost host({answers(202, senseless)});
        EXPECT_EQ(failureOf(host, request()).first, ctl::kNoHost);
        const TurnHost later({answers(202, kQueued), answers(200, senseless)});
        EXPECT_EQ(failureOf(later, request()).first, ctl::kNoHost);
    }
}

TEST(RunTask, SendsAQueryToAHostThatKeepsNoTasks) {
    for (const int unknown : {404, 405}) {
        TurnHost host(
            {answers(unknown, {{"error", "no such path"}}), answers(200, {{"rows", {kReply}}})});
        const TaskResult result = ctl::runTask(host.address(), request(), Await::Reply);
        EXPECT_EQ(result.end, End::Accepted);
        EXPECT_EQ(result.reply, kReply);
        EXPECT_EQ(host.targets().at(1), "POST /v1/query");
    }
}

TEST(RunTask, SendsNothingThatMustBeRecognizedToAHostThatKeepsNoTasks) {
    const TurnHost host({answers(404, {{"error", "no such path"}})});
    ctl::TaskRequest asked = request();
    asked.isOnce = true;
    EXPECT_EQ(failureOf(host, asked).first, ctl::kHostReportedFailure);
}

// ---- Waiting ------------------------------------------------------------------------------------

TEST(RunTask, GoesOnWaitingWhenTheHostComesBack) {
    TurnHost host({answers(202, kQueued), breaksOff(), answers(503, {{"error", "ending"}}),
                   breaksOff(), answers(200, kDone)});
    EXPECT_EQ(ctl::runTask(host.address(), request(), Await::End).end, End::Outcome);
    EXPECT_EQ(host.targets().size(), 5U);
}

TEST(RunTask, KnowsNoOutcomeWhenTheHostComesBackWithoutTheTask) {
    const TurnHost host({answers(202, kQueued), answers(404, {{"error", "no such task"}})});
    const TaskResult result = ctl::runTask(host.address(), request(), Await::End);
    EXPECT_EQ(result.end, End::HostGone);
    EXPECT_EQ(result.reply, json());
}

TEST(RunTask, WaitsNoLongerThanItMay) {
    const TurnHost host({answers(202, kQueued), [](const Peer& peer) { peer.request(); }});
    const TaskResult result =
        ctl::runTask(host.address(std::chrono::seconds(2)), request(), Await::End);
    EXPECT_EQ(result.end, End::TimedOut);
    EXPECT_EQ(result.record, kQueued);
}

TEST(RunTask, TellsOfTheReplyOnceAndAgainOfALaterRefusal) {
    const json refusal = {{"RETVAL", 1006}};
    TurnHost host({answers(202, kQueued), answers(200, kQueued), answers(200, kQueued),
                   answers(200, task("refused", refusal))});
    std::vector<json> replies;
    TaskWatch watch;
    watch.onReply = [&replies](const json& reply) { replies.push_back(reply); };
    EXPECT_EQ(ctl::runTask(host.address(), request(), Await::End, watch).end, End::Refused);
    EXPECT_EQ(replies, (std::vector<json>{nullptr, refusal}));
}

TEST(RunTask, TellsOfARefusalThatIsThereAtOnceAlone) {
    const json refusal = {{"RETVAL", 1006}};
    TurnHost host({answers(202, kQueued), answers(200, task("refused", refusal))});
    std::vector<json> replies;
    TaskWatch watch;
    watch.onReply = [&replies](const json& reply) { replies.push_back(reply); };
    ctl::runTask(host.address(), request(), Await::End, watch);
    EXPECT_EQ(replies, std::vector<json>{refusal});
}

TEST(RunTask, KnowsEndsThatNoRowTells) {
    for (const char* state : {"refused", "cancelled", "expired", "interrupted", "done"}) {
        const TurnHost host({answers(202, task(state))});
        EXPECT_EQ(ctl::runTask(host.address(), request(), Await::End).end, End::Over) << state;
    }
    const TurnHost begun({answers(202, task("interrupted", kReply, json::array({kRow})))});
    EXPECT_EQ(ctl::runTask(begun.address(), request(), Await::End).end, End::Over);
}

TEST(RunTask, NamesTheTaskAsSoonAsItIsAccepted) {
    const TurnHost host({answers(202, kDone)});
    std::string accepted;
    TaskWatch watch;
    watch.onAccepted = [&accepted](const std::string& id) { accepted = id; };
    ctl::runTask(host.address(), request(), Await::End, watch);
    EXPECT_EQ(accepted, "j-1");
}

// ---- Without waiting ----------------------------------------------------------------------------

const json kNothingRuns = {{"tasks", json::array()}, {"next", nullptr}};

TEST(RunTask, ThatNobodyWaitsForHasTheReplyWhenNothingIsBeforeIt) {
    TurnHost host({answers(202, kQueued), answers(200, kQueued), answers(200, kNothingRuns),
                   answers(200, task("running", kReply))});
    const TaskResult result = ctl::runTask(host.address(), request(), Await::Reply);
    EXPECT_EQ(result.end, End::Accepted);
    EXPECT_EQ(result.reply, kReply);
    EXPECT_EQ(host.targets().at(2), "GET /v1/tasks?state=running&limit=1");
}

TEST(RunTask, ThatNobodyWaitsForIsAcceptedWhereAnotherIsBeforeIt) {
    TurnHost host({answers(202, kQueued), answers(200, kQueued),
                   answers(200, {{"tasks", {{{"id", "j-0"}}}}, {"next", nullptr}})});
    const TaskResult result = ctl::runTask(host.address(), request(), Await::Reply);
    EXPECT_EQ(result.end, End::Accepted);
    EXPECT_EQ(result.reply, json());
    EXPECT_EQ(host.targets().size(), 3U);
}

TEST(RunTask, ThatNobodyWaitsForIsRefusedIfThePluginSaysSoAtOnce) {
    const TurnHost host({answers(202, kQueued), answers(200, task("refused", {{"RETVAL", 1006}}))});
    EXPECT_EQ(ctl::runTask(host.address(), request(), Await::Reply).end, End::Refused);
}

TEST(RunTask, ThatNobodyWaitsForHasNoOutcomeEvenIfItIsThere) {
    const TurnHost host({answers(202, kQueued), answers(200, kDone)});
    const TaskResult result = ctl::runTask(host.address(), request(), Await::Reply);
    EXPECT_EQ(result.end, End::Accepted);
    EXPECT_EQ(result.events, json::array());
}

// ---- Installs that restart the host -------------------------------------------------------------

const json kBegun = task("running", kReply, json::array({kRow}));

TEST(RunTask, EndsAnInstallThatRestartsTheHostWithItsFirstOutcome) {
    TurnHost host(
        {answers(202, kQueued), answers(200, task("running", kReply)), answers(200, kBegun)});
    const TaskResult result =
        ctl::runTask(host.address(), restartingInstall(), Await::FirstOutcome);
    EXPECT_EQ(result.end, End::Outcome);
    EXPECT_EQ(result.events, json::array({kRow}));
    EXPECT_EQ(result.completion, json());
}

TEST(RunTask, FollowsAnInstallThroughTheRestartToItsOwnResult) {
    const json failed = {{"RETVAL", 1031}};
    TurnHost host({answers(202, kQueued), answers(200, kBegun), breaksOff(), answers(200, kBegun),
                   answers(200, task("failed", kReply, json::array({kRow, failed})))});
    int begun = 0;
    TaskWatch watch;
    watch.onBegun = [&begun] { ++begun; };
    const TaskResult result = ctl::runTask(host.address(), restartingInstall(), Await::End, watch);
    EXPECT_EQ(begun, 1);
    EXPECT_EQ(result.end, End::Outcome);
    EXPECT_EQ(result.completion, failed);
}

TEST(RunTask, KnowsOfAnInstallThatFailedWhileTheHostWasAway) {
    json failed = task("failed", kReply, json::array({kRow}));
    failed["reason"] = "it ended with 9";
    const json row = {{"RETVAL", 1031}};
    TurnHost host({answers(202, kQueued), answers(200, kBegun), answers(200, failed),
                   answers(200, {{"rows", json::array({row})}})});
    const TaskResult result = ctl::runTask(host.address(), restartingInstall(), Await::End);
    EXPECT_EQ(result.end, End::Outcome);
    EXPECT_EQ(result.completion, row);
    EXPECT_EQ(host.targets().at(3), "POST /v1/query");
}

TEST(RunTask, TakesTheHostsWordForHowAnInstallEndedWhileItWasAway) {
    json failed = task("failed", kReply, json::array({kRow}));
    failed["reason"] = "no number";
    const TurnHost host({answers(202, kQueued), answers(200, kBegun), answers(200, failed),
                         answers(200, {{"rows", json::array({kRow})}})});
    const TaskResult result = ctl::runTask(host.address(), restartingInstall(), Await::End);
    EXPECT_EQ(result.end, End::Over) << "the only row says that it has begun";
    EXPECT_EQ(result.completion, json());
}

TEST(RunTask, DoesNotSayThatAnInstallHasBegunThatHasNot) {
    const json failed = {{"RETVAL", 1031}};
    TurnHost host(
        {answers(202, kQueued), answers(200, task("failed", kReply, json::array({failed})))});
    int begun = 0;
    TaskWatch watch;
    watch.onBegun = [&begun] { ++begun; };
    const TaskResult result = ctl::runTask(host.address(), restartingInstall(), Await::End, watch);
    EXPECT_EQ(begun, 0);
    EXPECT_EQ(result.end, End::Outcome);
    EXPECT_EQ(result.completion, json());
}

// ---- Output -------------------------------------------------------------------------------------

TEST(RunTask, PassesOnWhatTheCommandsWriteIfSomebodyWantsIt) {
    const Turn output = [](const Peer& peer) {
        peer.beginStream();
        peer.send(
            "data: {\"stream\": \"stdout\", \"text\": \"one\\n\"}\n\n"
            "data: {\"stream\": \"stderr\", \"text\": \"two\\n\"}\n\n"
            "event: end\ndata: {}\n\n");
    };
    TurnHost host({answers(202, kQueued), answers(200, task("running", kReply)), output,
                   answers(200, kDone)});
    std::string seen;
    TaskWatch watch;
    watch.onOutput = [&seen](const std::string& stream, const std::string& text) {
        seen += stream + ": " + text;
    };
    EXPECT_EQ(ctl::runTask(host.address(), request(), Await::End, watch).end, End::Outcome);
    EXPECT_EQ(seen, "stdout: one\nstderr: two\n");
    EXPECT_EQ(host.targets().at(2), "GET /v1/tasks/j-1/output?follow=1");
}

TEST(RunTask, NeedsNoOutputToKnowTheEnd) {
    TurnHost host({answers(202, kQueued), answers(200, kQueued),
                   answers(404, {{"error", "no such path"}}), answers(200, kDone)});
    TaskWatch watch;
    watch.onOutput = [](const std::string&, const std::string&) {};
    EXPECT_EQ(ctl::runTask(host.address(), request(), Await::End, watch).end, End::Outcome);
}

TEST(RunTask, AsksAReturnedHostForTheOutputAgain) {
    const Turn output = [](const Peer& peer) {
        peer.beginStream();
        peer.send("data: {\"stream\": \"stdout\", \"text\": \"late\"}\n\nevent: end\ndata: {}\n\n");
    };
    TurnHost host({answers(202, kQueued), answers(200, kQueued), breaksOff(),
                   answers(200, task("running", kReply)), output, answers(200, kDone)});
    std::string seen;
    TaskWatch watch;
    watch.onOutput = [&seen](const std::string&, const std::string& text) { seen += text; };
    ctl::runTask(host.address(), request(), Await::End, watch);
    EXPECT_EQ(seen, "late");
    host.targets();
}

TEST(RunTask, AsksForTheRestOfTheOutputBehindWhatItHasPassedOn) {
    const Turn beginning = [](const Peer& peer) {
        peer.beginStream();
        peer.send("id: 3-4-0\ndata: {\"stream\": \"stdout\", \"text\": \"one\\n\"}\n\n");
    };
    const Turn rest = [](const Peer& peer) {
        peer.beginStream();
        peer.send(
            "id: 3-8-0\ndata: {\"stream\": \"stdout\", \"text\": \"two\\n\"}\n\n"
            "event: end\ndata: {}\n\n");
    };
    TurnHost host({answers(202, kQueued), answers(200, task("running", kReply)), beginning,
                   answers(200, task("running", kReply)), rest, answers(200, kDone)});
    std::string seen;
    TaskWatch watch;
    watch.onOutput = [&seen](const std::string&, const std::string& text) { seen += text; };
    EXPECT_EQ(ctl::runTask(host.address(), request(), Await::End, watch).end, End::Outcome);
    EXPECT_EQ(seen, "one\ntwo\n");
    EXPECT_EQ(host.targets().at(4), "GET /v1/tasks/j-1/output?follow=1&after=3-4-0");
}

TEST(RunTask, AsksNoHostForTheRestThatWouldRepeatTheOutput) {
    const Turn beginning = [](const Peer& peer) {
        peer.beginStream();
        peer.send("data: {\"stream\": \"stdout\", \"text\": \"one\\n\"}\n\n");
    };
    TurnHost host({answers(202, kQueued), answers(200, task("running", kReply)), beginning,
                   answers(200, kDone)});
    std::string seen;
    TaskWatch watch;
    watch.onOutput = [&seen](const std::string&, const std::string& text) { seen += text; };
    EXPECT_EQ(ctl::runTask(host.address(), request(), Await::End, watch).end, End::Outcome);
    EXPECT_EQ(seen, "one\n");
}

// ---- Following ----------------------------------------------------------------------------------

TEST(FollowTask, WaitsForATaskByAnyName) {
    TurnHost host({answers(200, task("running", kReply)), breaksOff(), answers(200, kDone)});
    EXPECT_EQ(ctl::followTask(host.address(), "deploy 7", {}).end, End::Outcome);
    const std::vector<std::string> targets = host.targets();
    EXPECT_EQ(targets.at(0), "GET /v1/tasks/deploy%207");
    EXPECT_EQ(targets.at(2).rfind("GET /v1/tasks/j-1?wait=", 0), 0U) << targets.at(2);
}

TEST(FollowTask, NeedsTheTaskToBeThere) {
    const TurnHost host({answers(404, {{"error", "there is no task \"x\""}})});
    try {
        ctl::followTask(host.address(), "x", {});
        FAIL();
    } catch (const ctl::Failure& failure) {
        EXPECT_EQ(failure.status(), ctl::kWrongUsage);
    }
}

}  // namespace
